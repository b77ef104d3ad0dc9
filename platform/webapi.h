// The web-API framework, as a module sees it. Implemented by the framework that loads the module.
//
// A module is a shared library with one plain C symbol, GetAPITable, that returns the address of a static table of
// APIEntry rows ended by an all-zero row. The framework finds the row of (API name, version, method) for a request
// and calls its handler on one of its own threads; handlers of different requests run at the same time. A handler
// answers, by SetSuccess or SetError, before it returns; of several answers the last counts.
#ifndef PLATFORM_WEBAPI_H
#define PLATFORM_WEBAPI_H

#include <json/value.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <type_traits>

namespace VORN {

/// One request: named JSON parameters and what is known of the caller.
/// Made by the framework; a handler has it by pointer until it returns, a poll task until its function returns.
/// Every member may be called from any thread; nothing changes the request once a handler has it.
class APIRequest {
public:
  /// The framework's own record of a request; a module never sees its inside.
  struct State;
  explicit APIRequest(const State &state) : state_(&state) {}
  APIRequest(const APIRequest &) = delete;
  APIRequest &operator=(const APIRequest &) = delete;

  /// @param[in] name  a parameter's name
  /// @return true when the request carries a parameter of that name, whatever its value (null too)
  bool HasParam(const std::string &name) const;

  /// @param[in] name      a parameter's name, or "" for all parameters as one object
  /// @param[in] fallback  what is returned when the request has no parameter of that name
  /// @return a copy of the value; for the empty name always an object
  Json::Value GetParam(const std::string &name, const Json::Value &fallback) const;

  /// @return the caller's user-interface language code, such as "enu"; never empty
  std::string GetUILanguage() const;

  /// For the network library, which tells the caller where the router will be: not for modules.
  /// @return true when the request came over TLS
  bool IsSecure() const;

  /// @return the TCP port on which the request came in; 0 when there is none
  int GetServerPort() const;

private:
  const State *state_;
};

/// The answer of one request, or the state of one poll task.
/// A handler uses the response from its own thread only. A poll task has a response of its own, which it may set
/// again and again from the task's thread.
class APIResponse {
public:
  struct State;
  explicit APIResponse(State &state) : state_(&state) {}
  APIResponse(const APIResponse &) = delete;
  APIResponse &operator=(const APIResponse &) = delete;

  /// Marks the answer successful. A later call replaces an earlier one.
  /// @param[in] data  the payload, copied
  void SetSuccess(const Json::Value &data);

  /// Marks the answer failed. A later call replaces an earlier one.
  /// @param[in] code  the error code, as the API documents it
  /// @param[in] data  the payload, copied; null when there is nothing to say
  void SetError(int code, const Json::Value &data);

  /// Registers work to be done after the answer.
  /// The framework calls `function(data)` exactly once, on one of its threads, after the bytes of the answer were
  /// handed to the kernel; when the client has gone, it calls it all the same. From then on `data` belongs to the
  /// function. The function may wait; it may not touch the request or the response. A second registration on one
  /// response runs the first function at once after the answer too, in the order of registration.
  void SetCallbackFunc(void (*function)(void *), void *data);

private:
  State *state_;
};

/// Poll tasks: work that outlives its request and is asked for its state later.
/// A task belongs to the user of the request that started it and is seen by nobody else. Objects of this class live on
/// the stack for one call; the tasks themselves are the framework's. Not for use by two threads at once.
class APIPolling {
public:
  APIPolling() = default;
  /// @param[in] request  the request whose user the handle acts for; outlives the handle
  explicit APIPolling(APIRequest *request) : request_(request) {}

  void SetRequest(APIRequest *request) { request_ = request; }
  /// @param[in] group  the group that a task started by this handle belongs to, such as "admin"
  void SetGroupAttr(const std::string &group) { group_ = group; }
  /// @param[in] prefix  the kind of task; ids of this kind are found by List under it
  void SetPrefixAttr(const std::string &prefix) { prefix_ = prefix; }
  /// @param[in] remove  true: the framework drops the task when it ends; false: it stays readable until Stop, or
  ///                    until its client has not asked for it for some minutes after its end
  void SetRemoveAttr(bool remove) { remove_ = remove; }

  /// Starts `task` on a thread of its own and answers `response`: with the object {"id": <task id>, "finish": false},
  /// or with an error when no further task may run (see the framework's documentation for its codes).
  /// @param[in] response  the response of the request that starts the task
  /// @param[in] task      called once with the task's own request and response, both valid until it returns, and
  ///                      `context`. The task's request holds a copy of the parameters.
  /// @param[in] context   handed on untouched; its object may be gone when the task runs
  void Start(APIResponse *response, void (*task)(APIRequest *, APIResponse *, void *), void *context);

  /// @param[in]  prefix  the kind of task
  /// @param[in]  groups  array of group names
  /// @param[out] out     object: group name -> array of the ids of this user's tasks of that kind, oldest first
  /// @return false when `groups` is no array of texts or the handle has no request; see GetError
  bool List(const std::string &prefix, const Json::Value &groups, Json::Value &out);

  /// @param[in]  id    a task id of this user
  /// @param[out] data  the data that the task last gave to SetSuccess (an object; empty before the first time), with
  ///                   the boolean member "finish": true once the task's function has returned
  /// @return false when this user has no such task; see GetError
  bool Status(const std::string &id, Json::Value &data);

  /// Ends a task: it is no longer listed, and its result is dropped. A function that still runs is not torn down; its
  /// further answers go nowhere.
  /// @param[in] force  true: also when the function has not returned yet; false: then the call fails
  /// @return false when this user has no such task, or it still runs and `force` is false; see GetError
  bool Stop(const std::string &id, bool force);

  /// @return the error code of the last failed call on this handle; 0 when none failed
  int GetError() const { return error_; }

private:
  APIRequest *request_ = nullptr;
  std::string group_;
  std::string prefix_;
  bool remove_ = true;
  int error_ = 0;
};

using APIHandler = void (*)(APIRequest *, APIResponse *);

/// A row of a module's table.
struct APIEntry {
  const char *api;    ///< dotted API name
  int32_t version;    ///< API version, 1 and up
  const char *method; ///< method name within the API
  APIHandler handler;
};

static_assert(std::is_standard_layout_v<APIEntry> && std::is_trivial_v<APIEntry>);
static_assert(offsetof(APIEntry, api) == 0);
static_assert(offsetof(APIEntry, version) == sizeof(void *));
static_assert(offsetof(APIEntry, method) == 2 * sizeof(void *));
static_assert(offsetof(APIEntry, handler) == 3 * sizeof(void *));
static_assert(sizeof(APIEntry) == 4 * sizeof(void *));

} // namespace VORN

#endif
