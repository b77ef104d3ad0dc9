// The platform under the module as the tests want it: every call is recorded, with its arguments, in one list that the
// answers are in too, and each can be told what to give back.
#ifndef TESTS_ROUTER_SCRIPTED_PLATFORM_H
#define TESTS_ROUTER_SCRIPTED_PLATFORM_H

#include "platform/webapi.h"

#include <json/value.h>

#include <initializer_list>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace scripted {

using Lines = std::vector<std::string>;
using Pairs = std::vector<std::pair<std::string, std::string>>;

struct Lan {
  std::string name;
  std::string ip;
  std::string mask;
};

/// One section of a section file.
struct Section {
  std::string name;
  Pairs pairs;
};

struct RuleRecord {
  std::string name;
  Pairs pairs;
};

struct Platform {
  std::vector<std::string> calls; ///< "Function(argument, argument)", in order
  std::vector<std::string> log;   ///< messages at LOG_ERR without the line: "unit: message"

  std::string topology = "router";
  int topologyResult = 0;
  std::string supportedMode = "router,bridge";
  int supportedModeResult = 0;
  bool supportsTopology = true;
  bool hasDongle = false;
  std::vector<std::string> existingFiles;
  int checkKeyValueResult = 0;
  int loadDataResult = 0;
  Json::Value redirect;
  bool serverReady = true;
  int switchResult = 0;
  int packageResult = 1;
  Json::Value packages;
  std::string language = "enu";

  std::map<std::string, int> results;           ///< what a call, as recorded, gives back instead of success
  std::set<std::string> folders;                ///< those that exist; QARDCExec of mkdir makes none
  std::map<std::string, std::string> keyValues; ///< "path key" -> value
  std::vector<Lan> lans;
  std::map<std::string, std::set<std::string>> subnets; ///< interface address -> the addresses in its subnet
  std::vector<RuleRecord> ruleFile;
  int hashes = 0; ///< made so far; the first one is "hash 0"
  int liveHashes = 0;
  int liveLists = 0;
  int errorCode = 0x0300;

  int gatewayListResult = 0;
  Json::Value gateways = Json::Value(Json::arrayValue);
  int filterListResult = 0;
  Json::Value filteredGateways = Json::Value(Json::arrayValue); ///< what FilterList leaves
  std::vector<int> addGatewayResults;                           ///< one a call; 0 when there are no more
  int setKeyValueResult = 0;
  int refreshResult = 0;

  Json::Value deviceList = Json::Value(Json::objectValue); ///< what GetDeviceListData gives out

  Json::Value adapters = Json::Value(Json::arrayValue);
  std::map<std::string, Json::Value> adapterConfigs; ///< by adapter; one that is not here cannot be read
  std::map<std::string, int> applyResults;           ///< by adapter; what ApplyAdapter gives back instead of success
  std::map<std::string, Json::Value> wifiStations;   ///< by network; one that is not here cannot be read

  Json::Value tasks = Json::Value(Json::objectValue); ///< what APIPolling::List gives out
  Json::Value taskStatus;                             ///< what APIPolling::Status gives out
  int pollError = 0;                                  ///< List and Status fail with it when it is not 0
  Json::Value startReply;                             ///< what APIPolling::Start answers
  void (*startedTask)(VORN::APIRequest *, VORN::APIResponse *, void *) = nullptr; ///< what was last given to Start
  void *startedContext = nullptr;

  int routeResult = 0;   ///< of the static-route call that the test makes
  Json::Value routeData; ///< what that call gives out

  std::map<std::string, std::vector<Section>> sectionFiles;
  std::vector<std::string> schedulerRecords; ///< the bytes of each one that was set
  int slot = 0;                              ///< of the weekly schedule, now
};

/// The platform of the test that runs. Replaced by a fresh one with Reset.
Platform &Get();
void Reset();

/// Records a call.
/// @return what Platform::results says for it, or `normal`
int Call(const std::string &call, int normal = 0);

/// The lines of all parts, in order.
Lines Join(std::initializer_list<Lines> parts);

/// One line of JSON.
std::string Text(const Json::Value &value);
/// The value of a JSON text; the test fails when it is none.
Json::Value Parse(const std::string &text);

/// Calls a handler as the framework would.
class Exchange {
public:
  explicit Exchange(Json::Value parameters = Json::Value(Json::objectValue));
  ~Exchange();
  Exchange(const Exchange &) = delete;
  Exchange &operator=(const Exchange &) = delete;

  void Run(VORN::APIHandler handler);
  /// Runs the task that was last started, with this exchange as the task's own.
  void RunTask();
  /// Runs what the handler registered for after the answer.
  void RunCallbacks();
  /// "SetSuccess(...)" or "SetError(...)" of the last Run.
  const std::string &Answer() const;
  size_t AnswerCount() const;
  /// Those of the last Run or RunTask, in order.
  const std::vector<std::string> &Answers() const;

private:
  struct Parts;
  Parts *parts_;
};

} // namespace scripted

#endif
