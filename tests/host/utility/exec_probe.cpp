// The program that the execution tests run. It writes what it was started with to a file and does as it is told.
//   exec_probe FILE WORD...   FILE gets one record an argument, then descriptors, signals, group, environment, input
#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

namespace {

std::string Descriptors() {
  std::vector<int> found;
  DIR *folder = opendir("/proc/self/fd");
  while (const dirent *entry = readdir(folder)) {
    const long number = std::strtol(entry->d_name, nullptr, 10);
    if (entry->d_name[0] != '.' && number != dirfd(folder)) {
      found.push_back(static_cast<int>(number));
    }
  }
  closedir(folder);
  std::sort(found.begin(), found.end());
  std::string out;
  for (const int each : found) {
    out += std::to_string(each) + " ";
  }
  return out;
}

std::string Signals() {
  std::string out;
  sigset_t blocked;
  sigprocmask(SIG_SETMASK, nullptr, &blocked);
  for (int number = 1; number < SIGRTMIN; ++number) {
    struct sigaction action {};
    sigaction(number, nullptr, &action);
    if (action.sa_handler != SIG_DFL || sigismember(&blocked, number) == 1) {
      out += std::to_string(number) + " ";
    }
  }
  return out;
}

std::string InputName() {
  char name[256] = {};
  return readlink("/proc/self/fd/0", name, sizeof(name) - 1) > 0 ? name : "";
}

} // namespace

int main(int argc, char **argv) {
  std::FILE *out = std::fopen(argv[1], "we");
  if (out == nullptr) {
    return 99;
  }
  const std::string descriptors = Descriptors();
  for (int at = 0; at < argc; ++at) {
    if (at != 1) {
      std::fprintf(out, "argument <%s>\n", argv[at]);
    }
  }
  std::string listed = descriptors;
  const std::string own = std::to_string(fileno(out)) + " ";
  listed.erase(listed.find(own), own.size());
  std::fprintf(out, "descriptors %s\n", listed.c_str());
  std::fprintf(out, "signals %s\n", Signals().c_str());
  std::fprintf(out, "leader %d\n", getpgrp() == getpid() ? 1 : 0);
  std::fprintf(out, "input %s\n", InputName().c_str());
  for (char **each = environ; *each != nullptr; ++each) {
    std::fprintf(out, "environment %s\n", *each);
  }
  return std::fclose(out);
}
