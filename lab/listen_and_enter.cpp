// listen_and_enter --port N --target PID -- PROGRAM [ARGUMENT...]
// Binds 127.0.0.1:N here (0 = any free port), prints "listening on 127.0.0.1:N", then runs PROGRAM in the namespaces of
// process PID with the socket as descriptor 3, told by LISTEN_FDS and LISTEN_PID (sd_listen_fds(3)). So a server of a
// virtual host can be reached from the machine that the host lives on. Ends with the program's status; SIGTERM and
// SIGINT are passed on to it.
#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace {

constexpr int kFirstPassedDescriptor = 3; // SD_LISTEN_FDS_START
constexpr int kBacklog = 1024;

volatile sig_atomic_t programPid = 0;

[[noreturn]] void Die(const std::string &what) {
  std::fprintf(stderr, "listen_and_enter: %s: %s\n", what.c_str(), std::strerror(errno));
  std::_Exit(125);
}

struct Arguments {
  uint16_t port = 0;
  pid_t target = 0;
  char **program = nullptr;
};

template <typename T> bool ParseNumber(const char *text, T &out) {
  const char *end = text + std::strlen(text);
  const auto [stop, error] = std::from_chars(text, end, out);
  return error == std::errc() && stop == end;
}

bool Parse(int argc, char **argv, Arguments &out) {
  return argc > 6 && std::strcmp(argv[1], "--port") == 0 && ParseNumber(argv[2], out.port) &&
         std::strcmp(argv[3], "--target") == 0 && ParseNumber(argv[4], out.target) && out.target > 0 &&
         std::strcmp(argv[5], "--") == 0 && (out.program = argv + 6) != nullptr;
}

int Listen(uint16_t port) {
  const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const int on = 1;
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(port);
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t length = sizeof(address);
  auto *generic = reinterpret_cast<sockaddr *>(&address);
  if (listener < 0 || setsockopt(listener, SOL_SOCKET, SO_REUSEADDR, &on, sizeof(on)) != 0 ||
      bind(listener, generic, length) != 0 || listen(listener, kBacklog) != 0 ||
      getsockname(listener, generic, &length) != 0) {
    Die("127.0.0.1:" + std::to_string(port));
  }
  std::printf("listening on 127.0.0.1:%u\n", static_cast<unsigned>(ntohs(address.sin_port)));
  std::fflush(stdout);
  return listener;
}

// A descriptor of the process, and not its number, is what names it: one call enters all its namespaces or none. The
// process namespace holds for children only, hence the fork that follows.
void Enter(pid_t target) {
  const int process = static_cast<int>(syscall(SYS_pidfd_open, target, 0));
  if (process < 0 || setns(process, CLONE_NEWNS | CLONE_NEWNET | CLONE_NEWUTS | CLONE_NEWIPC | CLONE_NEWPID) != 0) {
    Die("the namespaces of process " + std::to_string(target));
  }
  close(process);
}

[[noreturn]] void RunProgram(int listener, char **program) {
  prctl(PR_SET_PDEATHSIG, SIGTERM);
  if (listener != kFirstPassedDescriptor) {
    dup2(listener, kFirstPassedDescriptor);
    close(listener);
  } else {
    fcntl(listener, F_SETFD, 0);
  }
  setenv("LISTEN_FDS", "1", 1);
  setenv("LISTEN_PID", std::to_string(getpid()).c_str(), 1);
  execvp(program[0], program);
  Die(program[0]);
}

void PassOn(int signal) {
  if (programPid > 0) {
    kill(programPid, signal);
  }
}

int AwaitEnd(pid_t program) {
  int status = 0;
  while (waitpid(program, &status, 0) < 0) {
    if (errno != EINTR) {
      Die("waitpid");
    }
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

} // namespace

int main(int argc, char **argv) {
  Arguments arguments;
  if (!Parse(argc, argv, arguments)) {
    std::fputs("usage: listen_and_enter --port N --target PID -- PROGRAM [ARGUMENT...]\n", stderr);
    return 125;
  }
  const int listener = Listen(arguments.port);
  Enter(arguments.target);
  const pid_t program = fork();
  if (program < 0) {
    Die("fork");
  }
  if (program == 0) {
    RunProgram(listener, arguments.program);
  }
  close(listener);
  programPid = program;
  std::signal(SIGTERM, PassOn);
  std::signal(SIGINT, PassOn);
  return AwaitEnd(program);
}
