// daemon -P PID_FILE MICROSECONDS: goes into the background after that time, and lives for ten seconds.
#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>

int main(int, char **argv) {
  usleep(static_cast<useconds_t>(std::strtoul(argv[3], nullptr, 10)));
  if (fork() != 0) {
    _exit(0);
  }
  dup2(open("/dev/null", O_RDWR | O_CLOEXEC), STDOUT_FILENO);
  sleep(10);
  _exit(0);
}
