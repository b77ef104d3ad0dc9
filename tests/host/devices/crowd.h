// Many devices at the other end of one cable, played by one thread: they answer ARP requests, each from a MAC address
// of its own, and count what the router sends them.
#ifndef TESTS_HOST_DEVICES_CROWD_H
#define TESTS_HOST_DEVICES_CROWD_H

#include "host/utility/unique_fd.h"

#include <atomic>
#include <cstdint>
#include <string>
#include <thread>

namespace hosttest {

class Crowd {
public:
  /// @param[in] port  the end of the cable
  explicit Crowd(const std::string &port);
  ~Crowd();

  /// So many are there from now on; the new ones announce themselves by asking for the router.
  void Grow(int count);
  /// Frames that came from the router so far.
  int Received() const { return received_; }

private:
  void Serve();
  void Send(int device, uint16_t operation, const uint8_t *targetMac, uint32_t targetIp);

  int index_;
  vornhost::UniqueFd socket_;
  std::atomic<int> count_{0};
  std::atomic<int> received_{0};
  std::atomic<bool> ends_{false};
  std::thread thread_;
};

} // namespace hosttest

#endif
