// What every connection serves: the loaded rows, and the call of one.
#ifndef WEBAPI_SERVICE_H
#define WEBAPI_SERVICE_H

#include "webapi/access.h"
#include "webapi/answer.h"
#include "webapi/callbacks.h"
#include "webapi/gate.h"
#include "webapi/json_scanner.h"
#include "webapi/metrics.h"
#include "webapi/request_reader.h"
#include "webapi/request_state.h"
#include "webapi/static_files.h"
#include "webapi/task_registry.h"

#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace vornwebapi {

struct Config;

/// A row with its path and its name in log lines.
struct Route {
  VORN::APIEntry row;
  std::string name;
  size_t label = 0; ///< in the metrics
  Turn turn;        ///< the group are the rows of one API, in all its versions
};

/// What came of a call.
struct Outcome {
  Answer answer;
  Callbacks callbacks; ///< to be run when the answer was handed to the kernel, or could not be
};

/// Every member may be called from any thread, once the page is loaded; nothing changes then but the tasks and who is
/// logged in.
class Service {
public:
  Service(const Config &config, const std::vector<VORN::APIEntry> &rows);

  const HttpLimits &Limits() const { return http_; }
  const std::vector<std::string> &HostNames() const { return hostNames_; }
  TaskRegistry &Tasks() { return tasks_; }
  Access &Gate() { return access_; }
  StaticFiles &Page() { return page_; }
  Metrics &Counts() { return metrics_; }
  void SetDocument(std::string document) { document_ = std::move(document); } ///< before anything is served
  size_t LoginBodyBytes() const { return loginBodyBytes_; }
  size_t Groups() const { return groups_; } ///< of calls that wait for each other

  /// @param[in] path  the request's target, compared byte by byte
  /// @return null when there is no such row
  const Route *Find(std::string_view path) const;

  /// What a request is counted as.
  /// @param[in] decision  that on it; none was made yet for one that is malformed
  size_t LabelOf(const Decision &decision, std::string_view path) const;

  /// Answers a call that tells of the server.
  Answer Report(OwnCall call);

  /// Runs a row's handler. No exception leaves it.
  Outcome Call(const Route &route, const Caller &caller, const Peer &peer, const RequestHead &head,
               const std::string &body);
  /// Runs one of the server's own calls. No exception leaves it.
  Outcome CallOwn(const Decision &decision, const Peer &peer, const RequestHead &head, const std::string &body);

private:
  struct Hash {
    using is_transparent = void; // NOLINT(readability-identifier-naming): the standard library's name
    size_t operator()(std::string_view text) const { return std::hash<std::string_view>()(text); }
  };

  Access access_;
  size_t loginBodyBytes_;
  size_t groups_ = 0;
  HttpLimits http_;
  std::vector<std::string> hostNames_; // lower case
  JsonLimits json_;
  TaskRegistry tasks_;
  StaticFiles page_;
  Metrics metrics_;
  std::string document_; // OpenAPI
  std::unordered_map<std::string, Route, Hash, std::equal_to<>> routes_;
};

} // namespace vornwebapi

#endif
