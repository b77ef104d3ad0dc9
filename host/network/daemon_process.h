// A program that runs on in the background, found again without trusting a pid file.
//
// It is known by its name, by the pid file that its command line names, and by its network namespace, looked up in
// /proc at each question. So it is found also when whoever started it died before the pid file was there, and a number
// that another process has now is never signalled.
#ifndef HOST_NETWORK_DAEMON_PROCESS_H
#define HOST_NETWORK_DAEMON_PROCESS_H

#include "host/utility/unique_fd.h"

#include <string>
#include <vector>

namespace vornhost {

class DaemonProcess {
public:
  /// @param[in] program  the file name of its first argument
  /// @param[in] option   the option before the pid file
  DaemonProcess(std::string program, std::string option, std::string pidFile);

  /// Whether it is in the background. One that still waits for its first success in the foreground does not count: its
  /// output goes to whoever started it, and without a reader it dies of it.
  bool IsRunning() const;
  /// @return a descriptor that becomes readable when it ends (pidfd_open(2)); closed when it is not in the background
  UniqueFd Watch() const { return Watch("", ""); }
  /// The same for one that was started with that option and value, too.
  UniqueFd Watch(const std::string &option, const std::string &value) const;
  /// After its start: the process that was started ends before the one that stays is ready. Throws std::runtime_error
  /// when it is not there within a second.
  void AwaitBackground() const;
  /// Ends it and removes its pid file. Throws std::runtime_error when it lives on.
  void Stop() const;
  const std::string &GetPidFile() const { return pidFile_; }

private:
  std::vector<int> Find() const;
  std::vector<int> FindInOneLook() const;
  bool IsIt(int pid) const;

  std::string program_;
  std::string option_;
  std::string pidFile_;
};

} // namespace vornhost

#endif
