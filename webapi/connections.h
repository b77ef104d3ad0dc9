// Every open connection: how many there are, and whose time is over.
#ifndef WEBAPI_CONNECTIONS_H
#define WEBAPI_CONNECTIONS_H

#include <array>
#include <boost/asio/ip/address.hpp>
#include <boost/intrusive/list.hpp>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <map>
#include <mutex>
#include <vector>

namespace vornwebapi {

class Connection;

/// What bounds of connections count as one client: an IPv4 address, or the /64 of an IPv6 one.
using ClientKey = std::array<unsigned char, 8>;
ClientKey KeyOf(const boost::asio::ip::address &address);

using ListHook = boost::intrusive::list_base_hook<boost::intrusive::link_mode<boost::intrusive::normal_link>>;

/// Every member may be called from any thread.
class Connections {
public:
  using Clock = std::chrono::steady_clock;
  enum class Admission { kAdmitted, kTooMany, kTooManyOfClient };

  /// @param[in] mostTls  that hold TLS's keys and buffers, some 15 to 50 KB each
  Connections(size_t most, size_t mostOfClient, size_t mostTls);
  Connections(const Connections &) = delete;
  Connections &operator=(const Connections &) = delete;
  ~Connections();

  /// Counts one more, which Remove or Release gives back.
  Admission Admit(const ClientKey &client);
  void Release(const ClientKey &client); ///< an admitted one that came to nothing
  void Add(Connection &connection);
  /// Takes an admitted one out; it waits until no sweep looks at it.
  void Remove(Connection &connection, const ClientKey &client);

  /// An added one begins with TLS. With as many as may, the one that has waited longest for its client is cut: a
  /// client that speaks is through before its turn comes.
  void HoldTls(Connection &connection);

  /// Interrupts each whose deadline is before `time`.
  void Sweep(Clock::time_point time);
  void Stop();  ///< lets each finish its call and no more
  void Abort(); ///< cuts them all
  /// @return false when some are still open at the deadline
  bool WaitForNone(Clock::time_point deadline);

private:
  void ReleaseLocked(const ClientKey &client);

  const size_t most_;
  const size_t mostOfClient_;
  const size_t mostTls_;
  std::mutex mutex_;
  std::condition_variable none_;
  size_t count_ = 0;
  std::map<ClientKey, size_t> counts_;
  boost::intrusive::list<Connection, boost::intrusive::base_hook<ListHook>> list_;
  std::vector<Connection *> tls_; // of list_
};

} // namespace vornwebapi

#endif
