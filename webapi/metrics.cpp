#include "webapi/metrics.h"

#include <algorithm>
#include <cstdio>

namespace vornwebapi {
namespace {

void AppendHead(const char *name, const char *type, const char *help, std::string &out) {
  out.append("# HELP ").append(name).append(" ").append(help).append("\n");
  out.append("# TYPE ").append(name).append(" ").append(type).append("\n");
}

void AppendGauge(const char *name, const char *help, size_t value, std::string &out) {
  AppendHead(name, "gauge", help, out);
  out.append(name).append(" ").append(std::to_string(value)).append("\n");
}

std::string Number(double value) {
  std::array<char, 32> text{};
  std::snprintf(text.data(), text.size(), "%.9g", value); // the process keeps the C locale
  return text.data();
}

} // namespace

// Seconds: a read from memory, one from the kernel, a password's digest, programs that a call waits for.
const std::array<double, Metrics::kBuckets> Metrics::kBounds = {0.0005, 0.001, 0.005, 0.01, 0.05, 0.1, 0.5, 1, 5, 15};

const std::array<unsigned, Metrics::kStatuses> Metrics::kRefusals = {400, 401, 403, 404, 405, 408, 413, 414, 415,
                                                                     417, 421, 429, 431, 500, 501, 503, 505, 0};

Metrics::Metrics(const std::vector<std::string> &names) : rows_(kFirstName + names.size()) {
  rows_[kUnknown].name = "none";
  rows_[kPage].name = "page";
  for (size_t at = 0; at < names.size(); ++at) {
    rows_[kFirstName + at].name = names[at];
  }
}

void Metrics::Count(size_t name, unsigned status, bool failed, std::chrono::steady_clock::duration took) {
  const Outcome answered = failed ? kFailed : kDone;
  ++rows_[name].outcomes[status < 400 ? answered : status < 500 ? kRefused : kBroken];
  if (status >= 400) {
    CountRefused(status);
    return;
  }
  const double seconds = std::chrono::duration<double>(took).count();
  const auto *bound = std::lower_bound(kBounds.begin(), kBounds.end(), seconds);
  ++times_[static_cast<size_t>(bound - kBounds.begin())];
  nanoseconds_ += static_cast<std::uint64_t>(std::chrono::nanoseconds(took).count());
}

void Metrics::CountRefused(unsigned status) {
  const auto *found = std::find(kRefusals.begin(), kRefusals.end() - 1, status);
  ++refusals_[static_cast<size_t>(found - kRefusals.begin())];
}

void Metrics::AppendRequests(std::string &out) const {
  constexpr std::array<const char *, kOutcomes> kNames = {"done", "failed", "refused", "broken"};
  AppendHead("vornwebd_requests_total", "counter", "Requests that were answered, by row and what came of them.", out);
  for (const Row &row : rows_) {
    for (size_t outcome = 0; outcome < kOutcomes; ++outcome) {
      out.append("vornwebd_requests_total{row=\"").append(row.name).append("\",outcome=\"").append(kNames[outcome]);
      out.append("\"} ").append(std::to_string(row.outcomes[outcome])).append("\n");
    }
  }
  AppendHead("vornwebd_refusals_total", "counter", "Requests and connections that were refused, by status.", out);
  for (size_t at = 0; at < kStatuses; ++at) {
    const std::string status = kRefusals[at] == 0 ? "other" : std::to_string(kRefusals[at]);
    out.append("vornwebd_refusals_total{status=\"").append(status).append("\"} ");
    out.append(std::to_string(refusals_[at])).append("\n");
  }
}

void Metrics::AppendTimes(std::string &out) const {
  AppendHead("vornwebd_request_duration_seconds", "histogram",
             "From the end of a request's header to its answer, of those that were not refused.", out);
  std::uint64_t count = 0;
  for (size_t at = 0; at <= kBuckets; ++at) {
    count += times_[at];
    out.append("vornwebd_request_duration_seconds_bucket{le=\"").append(at < kBuckets ? Number(kBounds[at]) : "+Inf");
    out.append("\"} ").append(std::to_string(count)).append("\n");
  }
  const double sum = static_cast<double>(nanoseconds_) / 1e9;
  out.append("vornwebd_request_duration_seconds_sum ").append(Number(sum)).append("\n");
  out.append("vornwebd_request_duration_seconds_count ").append(std::to_string(count)).append("\n");
}

std::string Metrics::Text(const Gauges &gauges) const {
  std::string out;
  AppendRequests(out);
  AppendTimes(out);
  AppendGauge("vornwebd_connections", "Open connections.", gauges.connections, out);
  AppendGauge("vornwebd_sessions", "People logged in.", gauges.sessions, out);
  AppendGauge("vornwebd_tasks", "Poll tasks, running and kept.", gauges.tasks, out);
  return out;
}

} // namespace vornwebapi
