# Warnings and instrumentation of every target of this project.
add_compile_options(-Wall -Wextra -Wpedantic -Wconversion -Wshadow -Werror)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  # False alarm on "text" + std::string in this compiler (gcc.gnu.org, PR 105651).
  add_compile_options(-Wno-restrict)
endif()
add_link_options(-Wl,-z,relro,-z,now -Wl,--as-needed)

if(CMAKE_BUILD_TYPE STREQUAL "Release")
  add_compile_options(-fstack-protector-strong -D_FORTIFY_SOURCE=2)
endif()

if(VORN_SANITIZE)
  add_compile_options(-fsanitize=${VORN_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${VORN_SANITIZE})
  # The sanitizers' own functions are found when the program starts, not when a library is linked.
  set(VORN_NO_UNDEFINED "")
else()
  set(VORN_NO_UNDEFINED "-Wl,-z,defs")
endif()

if(VORN_COVERAGE)
  add_compile_options(--coverage -fprofile-update=atomic)
  add_link_options(--coverage)
endif()

find_program(VORN_CCACHE ccache)
if(VORN_CCACHE)
  set(CMAKE_CXX_COMPILER_LAUNCHER ${VORN_CCACHE})
endif()
