#include "webapi/service.h"

#include "webapi/config.h"
#include "webapi/handler_response.h"
#include "webapi/log.h"
#include "webapi/module.h"
#include "webapi/own_calls.h"
#include "webapi/parameters.h"
#include "webapi/text.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <map>
#include <sstream>

namespace vornwebapi {
namespace {

/// @return false when the handler threw
bool RunHandler(const Route &route, VORN::APIRequest &request, VORN::APIResponse &response) {
  try {
    route.row.handler(&request, &response);
    return true;
  } catch (const std::exception &error) {
    Log(LogKind::kModuleFault, "%s threw: %s", route.name.c_str(), Printable(error.what()).c_str());
  } catch (...) {
    Log(LogKind::kModuleFault, "%s threw something that is no std::exception", route.name.c_str());
  }
  return false;
}

Answer AnswerOf(const Route &route, HandlerResponse &response) {
  if (!response.IsAnswered()) {
    Log(LogKind::kModuleFault, "%s answered nothing", route.name.c_str());
    return HandlerFailed();
  }
  return Answered(response.TakeText());
}

/// "done", or the code of the failure: nothing else of an answer is logged.
std::string OutcomeOf(const Answer &answer) {
  constexpr std::string_view kFailed = R"({"success":false,"error":{"code":)";
  if (answer.body.compare(0, kFailed.size(), kFailed) != 0) {
    return "done";
  }
  const size_t end = answer.body.find_first_not_of("-0123456789", kFailed.size());
  return "failed with " + answer.body.substr(kFailed.size(), end - kFailed.size());
}

/// The configuration's names and localhost, lower case.
std::vector<std::string> ReadHostNames(const std::string &text) {
  std::istringstream words(Lower(text) + " localhost");
  return {std::istream_iterator<std::string>(words), std::istream_iterator<std::string>()};
}

std::string NameOf(const VORN::APIEntry &row) {
  return std::string(row.api) + " v" + std::to_string(row.version) + " " + row.method;
}

/// Own calls by their paths, then rows by their names.
std::vector<std::string> LabelsOf(const std::vector<VORN::APIEntry> &rows) {
  std::vector<std::string> labels = OwnPaths();
  std::transform(rows.begin(), rows.end(), std::back_inserter(labels), NameOf);
  return labels;
}

} // namespace

Service::Service(const Config &config, const std::vector<VORN::APIEntry> &rows)
    : access_(config), loginBodyBytes_(config.loginBodyBytes), http_{config.requestLineBytes, config.headerBytes,
                                                                     config.headerFields, config.bodyBytes},
      hostNames_(ReadHostNames(config.hostNames)), json_{config.jsonDepth, config.jsonValues},
      tasks_({config.tasks, config.taskKeepTime}), metrics_(LabelsOf(rows)) {
  size_t label = Metrics::kFirstName + OwnPaths().size();
  std::map<std::string, size_t> groups;
  for (const VORN::APIEntry &row : rows) {
    const size_t group = groups.emplace(row.api, groups.size()).first->second;
    routes_.emplace(PathOf(row), Route{row, NameOf(row), label++, Turn{group, !Reads(row.method)}});
  }
  groups_ = groups.size();
}

size_t Service::LabelOf(const Decision &decision, std::string_view path) const {
  if (decision.page) {
    return Metrics::kPage;
  }
  if (decision.own != OwnCall::kNone) {
    return Metrics::kFirstName + static_cast<size_t>(decision.own) - 1;
  }
  const Route *route = Find(path);
  return route == nullptr ? Metrics::kUnknown : route->label;
}

Answer Service::Report(OwnCall call) {
  Answer answer;
  if (call == OwnCall::kDocument) {
    answer.file = document_;
    return answer;
  }
  answer.type = "text/plain; version=0.0.4; charset=utf-8";
  answer.body = metrics_.Text({metrics_.Connections(), access_.Sessions().Count(), tasks_.Count()});
  return answer;
}

const Route *Service::Find(std::string_view path) const {
  const auto found = routes_.find(path);
  return found == routes_.end() ? nullptr : &found->second;
}

Outcome Service::Call(const Route &route, const Caller &caller, const Peer &peer, const RequestHead &head,
                      const std::string &body) {
  try {
    VORN::APIRequest::State state;
    if (const char *fault = ReadParameters(body, json_, state.parameters)) {
      Log(LogKind::kRefusedRequest, "%s from %s called %s: refused with 400, %s", caller.User().c_str(),
          peer.from.c_str(), route.name.c_str(), fault);
      return {BadBody(fault), {}};
    }
    if (!access_.Stands(caller)) {
      return {NotLoggedIn(), {}};
    }
    bool polled = false;
    state.user = caller.User();
    state.language = head.language;
    state.secure = peer.secure;
    state.serverPort = peer.serverPort;
    state.polled = &polled;
    state.tasks = &tasks_;
    HandlerResponse answered;
    VORN::APIRequest request(state);
    VORN::APIResponse response(answered);
    const bool returned = RunHandler(route, request, response);
    Answer answer = returned ? AnswerOf(route, answered) : HandlerFailed();
    if (!polled && !head.poll) {
      access_.Touch(caller);
    }
    if (!Reads(route.row.method)) {
      Log(LogKind::kChange, "%s from %s called %s: %s", caller.User().c_str(), peer.from.c_str(), route.name.c_str(),
          OutcomeOf(answer).c_str());
    }
    return {std::move(answer), answered.TakeCallbacks()};
  } catch (const std::exception &error) { // no memory
    Log(LogKind::kModuleFault, "%s: %s", route.name.c_str(), Printable(error.what()).c_str());
    return {HandlerFailed(), {}};
  }
}

Outcome Service::CallOwn(const Decision &decision, const Peer &peer, const RequestHead &head, const std::string &body) {
  try {
    Json::Value parameters;
    const Caller *caller = decision.caller ? &*decision.caller : nullptr;
    if (const char *fault = ReadParameters(body, json_, parameters)) {
      Log(LogKind::kRefusedRequest, "%s from %s sent a call of the server's own: refused with 400, %s",
          caller == nullptr ? "nobody" : caller->User().c_str(), peer.from.c_str(), fault);
      return {BadBody(fault), {}};
    }
    if (caller != nullptr && !access_.Stands(*caller)) {
      return {NotLoggedIn(), {}};
    }
    if (caller != nullptr) {
      access_.Touch(*caller);
    }
    return {RunOwnCall(decision.own, access_, caller, peer, head, parameters), {}};
  } catch (const std::exception &error) { // no memory
    Log(LogKind::kModuleFault, "own call: %s", Printable(error.what()).c_str());
    return {HandlerFailed(), {}};
  }
}

} // namespace vornwebapi
