// iptablestool --insmod GROUP MODULE.ko... | --rmmod GROUP MODULE.ko...
// Loads the packet filter's modules that a subject (the group) needs, or lets them go, in the given order. A module
// that is built into the kernel counts as loaded. One that somebody else still uses stays.
#include "host/utility/log.h"
#include "host/utility/program_runner.h"

#include <sys/syscall.h>
#include <sys/utsname.h>
#include <syslog.h>
#include <unistd.h>
#include <zlib.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace {

constexpr int kFailed = 1;
constexpr int kUsage = 2;

// The kernel's build options of the modules, for a kernel that was built without support for loading any: it has no
// list of what is built in (modules.builtin).
struct ModuleOption {
  std::string_view module;
  std::string_view option;
};
constexpr std::array kOptions = {
    ModuleOption{"x_tables", "CONFIG_NETFILTER_XTABLES"},
    ModuleOption{"xt_tcpudp", "CONFIG_NETFILTER_XTABLES"},
    ModuleOption{"ip_tables", "CONFIG_IP_NF_IPTABLES"},
    ModuleOption{"iptable_filter", "CONFIG_IP_NF_FILTER"},
    ModuleOption{"iptable_nat", "CONFIG_IP_NF_NAT"},
    ModuleOption{"xt_mac", "CONFIG_NETFILTER_XT_MATCH_MAC"},
    ModuleOption{"xt_state", "CONFIG_NETFILTER_XT_MATCH_STATE"},
};

std::string KernelRelease() {
  utsname name{};
  return uname(&name) == 0 ? name.release : "";
}

bool IsLoaded(const std::string &module) {
  return std::filesystem::exists("/sys/module/" + module);
}

// Lines such as "kernel/net/netfilter/xt_mac.ko".
bool IsListedAsBuiltIn(const std::string &module) {
  std::ifstream list("/lib/modules/" + KernelRelease() + "/modules.builtin");
  const std::string ending = "/" + module + ".ko";
  for (std::string line; std::getline(list, line);) {
    if (line.ends_with(ending)) {
      return true;
    }
  }
  return false;
}

// Reads compressed and plain files alike.
bool HasLine(const char *path, const std::string &wanted) {
  const std::unique_ptr<gzFile_s, int (*)(gzFile)> file(gzopen(path, "re"), gzclose);
  std::array<char, 4096> line{};
  while (file && gzgets(file.get(), line.data(), static_cast<int>(line.size())) != nullptr) {
    if (line.data() == wanted + "\n") {
      return true;
    }
  }
  return false;
}

bool IsConfiguredAsBuiltIn(const std::string &module) {
  const auto *known =
      std::find_if(kOptions.begin(), kOptions.end(), [&module](const auto &each) { return each.module == module; });
  return known != kOptions.end() && HasLine("/proc/config.gz", std::string(known->option) + "=y");
}

bool Load(const std::string &module) {
  if (IsLoaded(module) || IsListedAsBuiltIn(module) || IsConfiguredAsBuiltIn(module)) {
    return true;
  }
  if (vornhost::ProgramRunner().Run({"/sbin/modprobe", "--", module}) == 0) {
    return true;
  }
  vornhost::LogError("module %s cannot be loaded", module.c_str());
  return false;
}

// The kernel refuses while a module is in use, and it does not know one that is built in or not loaded.
bool Unload(const std::string &module) {
  if (syscall(SYS_delete_module, module.c_str(), O_NONBLOCK) == 0 || errno == ENOENT || errno == ENOSYS) {
    return true;
  }
  if (errno == EWOULDBLOCK || errno == EBUSY) {
    vornhost::LogInfo("module %s stays, it is in use", module.c_str());
    return true;
  }
  vornhost::LogError("module %s cannot be unloaded: %s", module.c_str(), std::strerror(errno));
  return false;
}

bool IsName(std::string_view name) {
  return !name.empty() && name.size() < 56 && name.front() != '-' &&
         std::all_of(name.begin(), name.end(), [](char byte) {
           return std::isalnum(static_cast<unsigned char>(byte)) != 0 || byte == '_' || byte == '-';
         });
}

// "xt_mac.ko" -> "xt_mac"; the kernel writes '_' for '-'.
bool TakeModules(int argc, char **argv, std::vector<std::string> &modules) {
  for (int i = 3; i < argc; ++i) {
    std::string module = argv[i];
    if (!module.ends_with(".ko")) {
      return false;
    }
    module.resize(module.size() - 3);
    if (!IsName(module)) {
      return false;
    }
    std::replace(module.begin(), module.end(), '-', '_');
    modules.push_back(std::move(module));
  }
  return !modules.empty();
}

int Run(int argc, char **argv) {
  std::vector<std::string> modules;
  const std::string action = argc > 3 ? argv[1] : "";
  if ((action != "--insmod" && action != "--rmmod") || !IsName(argv[2]) || !TakeModules(argc, argv, modules)) {
    std::fputs("usage: iptablestool --insmod GROUP MODULE.ko... | --rmmod GROUP MODULE.ko...\n", stderr);
    return kUsage;
  }
  const auto step = action == "--insmod" ? Load : Unload;
  return std::all_of(modules.begin(), modules.end(), step) ? 0 : kFailed;
}

} // namespace

int main(int argc, char **argv) {
  openlog("iptablestool", LOG_PID | (isatty(STDERR_FILENO) == 1 ? LOG_PERROR : 0), LOG_DAEMON);
  try {
    return Run(argc, argv);
  } catch (const std::exception &error) {
    vornhost::LogError("%s", vornhost::LogText(error.what()).c_str());
    return kFailed;
  }
}
