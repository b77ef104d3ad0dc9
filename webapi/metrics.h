// What the server counts of itself.
#ifndef WEBAPI_METRICS_H
#define WEBAPI_METRICS_H

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace vornwebapi {

/// Every member may be called from any thread. The labels are known from the start: nothing that a client sends makes
/// one more.
class Metrics {
public:
  /// What comes before the names of Metrics' maker: requests that are nobody's, and those for files.
  static constexpr size_t kUnknown = 0;
  static constexpr size_t kPage = 1;
  static constexpr size_t kFirstName = 2;

  /// What is read at the moment.
  struct Gauges {
    size_t connections = 0;
    size_t sessions = 0;
    size_t tasks = 0;
  };

  /// @param[in] names  of rows and own calls: letters, digits, blanks and ".-_/"
  explicit Metrics(const std::vector<std::string> &names);

  /// @param[in] name    a place in `names` and kFirstName, or one of the above
  /// @param[in] failed  with status 200: the row answered with an error
  void Count(size_t name, unsigned status, bool failed, std::chrono::steady_clock::duration took);
  /// One that was refused before any of it was read.
  void CountRefused(unsigned status);

  void AddConnection() { ++connections_; }
  void RemoveConnection() { --connections_; }
  size_t Connections() const { return connections_; }

  /// The text format of Prometheus, version 0.0.4.
  std::string Text(const Gauges &gauges) const;

private:
  enum Outcome { kDone, kFailed, kRefused, kBroken, kOutcomes };
  static constexpr size_t kBuckets = 10;
  static constexpr size_t kStatuses = 18;
  static const std::array<double, kBuckets> kBounds;
  static const std::array<unsigned, kStatuses> kRefusals;

  using Counter = std::atomic<std::uint64_t>;
  struct Row {
    std::string name;
    std::array<Counter, kOutcomes> outcomes{};
  };

  void AppendRequests(std::string &out) const;
  void AppendTimes(std::string &out) const;

  std::vector<Row> rows_;
  std::array<Counter, kStatuses> refusals_{}; // by status; the last is for any other
  std::array<Counter, kBuckets + 1> times_{}; // each its own; the last is for what took longer
  Counter nanoseconds_{0};
  std::atomic<size_t> connections_{0};
};

} // namespace vornwebapi

#endif
