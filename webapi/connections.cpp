#include "webapi/connections.h"

#include "webapi/connection.h"
#include "webapi/log.h"

#include <algorithm>

namespace vornwebapi {

ClientKey KeyOf(const boost::asio::ip::address &address) {
  ClientKey key{};
  if (address.is_v4()) {
    const auto bytes = address.to_v4().to_bytes();
    std::copy(bytes.begin(), bytes.end(), key.begin());
    return key;
  }
  const auto v6 = address.to_v6();
  const auto bytes = v6.to_bytes();
  if (v6.is_v4_mapped()) {
    std::copy(bytes.begin() + 12, bytes.end(), key.begin());
  } else {
    std::copy(bytes.begin(), bytes.begin() + 8, key.begin());
  }
  return key;
}

Connections::Connections(size_t most, size_t mostOfClient, size_t mostTls)
    : most_(most), mostOfClient_(mostOfClient), mostTls_(mostTls) {}

Connections::~Connections() = default;

Connections::Admission Connections::Admit(const ClientKey &client) {
  const std::lock_guard lock(mutex_);
  if (count_ >= most_) {
    return Admission::kTooMany;
  }
  size_t &ofClient = counts_[client];
  if (ofClient >= mostOfClient_) {
    return Admission::kTooManyOfClient;
  }
  ++ofClient;
  ++count_;
  return Admission::kAdmitted;
}

void Connections::Add(Connection &connection) {
  const std::lock_guard lock(mutex_);
  list_.push_back(connection);
}

void Connections::Remove(Connection &connection, const ClientKey &client) {
  const std::lock_guard lock(mutex_);
  list_.erase(list_.iterator_to(connection));
  tls_.erase(std::remove(tls_.begin(), tls_.end(), &connection), tls_.end());
  ReleaseLocked(client);
}

void Connections::Release(const ClientKey &client) {
  const std::lock_guard lock(mutex_);
  ReleaseLocked(client);
}

// REQUIRES: mutex_ is held.
void Connections::ReleaseLocked(const ClientKey &client) {
  const auto counted = counts_.find(client);
  if (--counted->second == 0) {
    counts_.erase(counted);
  }
  if (--count_ == 0) {
    none_.notify_all();
  }
}

void Connections::HoldTls(Connection &connection) {
  const std::lock_guard lock(mutex_);
  if (tls_.size() >= mostTls_) {
    const auto longest = std::min_element(tls_.begin(), tls_.end(), [](const Connection *a, const Connection *b) {
      return a->WaitsUntil() < b->WaitsUntil();
    });
    (*longest)->Cut();
    tls_.erase(longest);
    Log(LogKind::kConnectionLimit, "too many TLS connections: the one that waited longest was cut");
  }
  tls_.push_back(&connection);
}

void Connections::Sweep(Clock::time_point time) {
  const std::lock_guard lock(mutex_);
  for (Connection &connection : list_) {
    connection.ExpireBefore(time);
  }
}

void Connections::Stop() {
  const std::lock_guard lock(mutex_);
  for (Connection &connection : list_) {
    connection.Stop();
  }
}

void Connections::Abort() {
  const std::lock_guard lock(mutex_);
  for (Connection &connection : list_) {
    connection.Abort();
  }
}

bool Connections::WaitForNone(Clock::time_point deadline) {
  std::unique_lock lock(mutex_);
  return none_.wait_until(lock, deadline, [this] { return count_ == 0; });
}

} // namespace vornwebapi
