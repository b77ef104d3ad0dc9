// The module that the server's tests call: one row a behaviour.
#include "platform/webapi.h"

#include <sched.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>

#define TEST_EXPORT __attribute__((visibility("default")))

using VORN::APIPolling;
using VORN::APIRequest;
using VORN::APIResponse;

namespace {

std::string Text(APIRequest *request, const char *name, const char *fallback = "") {
  return request->GetParam(name, fallback).asString();
}

void WaitForFile(const std::string &path) {
  while (access(path.c_str(), F_OK) != 0) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
}

void AppendLine(const std::string &path, const std::string &line) {
  std::ofstream(path, std::ios::app) << line + "\n";
}

void Echo(APIRequest *request, APIResponse *response) {
  response->SetSuccess(request->GetParam("", Json::Value()));
}

void EchoError(APIRequest *request, APIResponse *response) {
  response->SetError(request->GetParam("code", 4300).asInt(), request->GetParam("data", Json::Value()));
}

void Caller(APIRequest *request, APIResponse *response) {
  Json::Value data;
  data["language"] = request->GetUILanguage();
  data["secure"] = request->IsSecure();
  data["port"] = request->GetServerPort();
  data["has_a"] = request->HasParam("a");
  data["a"] = request->GetParam("a", "fallback");
  response->SetSuccess(data);
}

void ThrowStandard(APIRequest * /*request*/, APIResponse *response) {
  response->SetSuccess("not to be sent");
  throw std::runtime_error("a line\nof two");
}

void ThrowNumber(APIRequest * /*request*/, APIResponse * /*response*/) {
  throw 42;
}

void Silent(APIRequest * /*request*/, APIResponse * /*response*/) {}

void Twice(APIRequest * /*request*/, APIResponse *response) {
  response->SetError(117, Json::Value());
  response->SetSuccess("second");
}

// Says that it is inside, then waits for the file that lets it out.
void Wait(APIRequest *request, APIResponse *response) {
  AppendLine(Text(request, "entered", "/dev/null"), "in");
  WaitForFile(Text(request, "until"));
  response->SetSuccess("waited");
}

// Keeps its processor for a moment and says which it was.
void Processor(APIRequest * /*request*/, APIResponse *response) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(2);
  while (std::chrono::steady_clock::now() < end) {
  }
  response->SetSuccess(sched_getcpu());
}

void Large(APIRequest *request, APIResponse *response) {
  response->SetSuccess(std::string(request->GetParam("bytes", 1).asUInt(), 'x'));
}

struct Record {
  std::string path;
  std::string line;
  std::string until;
  bool throws = false;
};

void RunRecord(void *data) {
  const std::unique_ptr<Record> record(static_cast<Record *>(data));
  if (!record->until.empty()) {
    WaitForFile(record->until);
  }
  AppendLine(record->path, record->line);
  if (record->throws) {
    throw std::runtime_error("thrown in a callback");
  }
}

// Registers a callback for each word of "lines"; what then happens is chosen by "then".
void Callback(APIRequest *request, APIResponse *response) {
  const Json::Value lines = request->GetParam("lines", Json::Value(Json::arrayValue));
  for (const Json::Value &line : lines) {
    response->SetCallbackFunc(RunRecord,
                              new Record{Text(request, "path"), line.asString(), Text(request, "callback_until"),
                                         request->GetParam("callback_throws", false).asBool()});
  }
  if (request->HasParam("until")) {
    AppendLine(Text(request, "entered", "/dev/null"), "in");
    WaitForFile(Text(request, "until"));
  }
  const std::string then = Text(request, "then", "answer");
  if (then == "throw") {
    throw std::runtime_error("after registering");
  }
  if (then == "answer") {
    response->SetSuccess(std::string(request->GetParam("bytes", 8).asUInt(), 'x'));
  }
}

void TaskFunction(APIRequest *request, APIResponse *response, void * /*context*/) {
  if (request->HasParam("data")) {
    response->SetSuccess(request->GetParam("data", Json::Value()));
  }
  if (request->HasParam("entered")) {
    AppendLine(Text(request, "entered"), "in");
  }
  if (request->HasParam("until")) {
    WaitForFile(Text(request, "until"));
  }
  if (request->HasParam("throws")) {
    throw std::runtime_error("thrown in a task");
  }
  if (request->HasParam("last")) {
    response->SetSuccess(request->GetParam("last", Json::Value()));
  }
}

void TaskStart(APIRequest *request, APIResponse *response) {
  APIPolling polling;
  polling.SetRequest(request);
  polling.SetGroupAttr("admin");
  polling.SetPrefixAttr(Text(request, "prefix", "test"));
  polling.SetRemoveAttr(request->GetParam("remove", false).asBool());
  polling.Start(response, TaskFunction, nullptr);
}

void TaskList(APIRequest *request, APIResponse *response) {
  APIPolling polling(request);
  Json::Value groups(Json::arrayValue);
  groups.append("admin");
  Json::Value out;
  if (!polling.List(Text(request, "prefix", "test"), request->GetParam("groups", groups), out)) {
    response->SetError(117, polling.GetError());
    return;
  }
  response->SetSuccess(out);
}

void TaskStatus(APIRequest *request, APIResponse *response) {
  APIPolling polling(request);
  Json::Value data;
  if (!polling.Status(Text(request, "id"), data)) {
    response->SetError(117, polling.GetError());
    return;
  }
  response->SetSuccess(data);
}

void TaskStop(APIRequest *request, APIResponse *response) {
  APIPolling polling(request);
  if (!polling.Stop(Text(request, "id"), request->GetParam("force", true).asBool())) {
    response->SetError(117, polling.GetError());
    return;
  }
  response->SetSuccess(Json::Value());
}

VORN::APIEntry rows[] = {{"VORN.Test.Echo", 1, "get", Echo},
                         {"VORN.Test.Echo", 1, "error", EchoError},
                         {"VORN.Test.Echo", 2, "get", Echo},
                         {"VORN.Test.Caller", 1, "get", Caller},
                         {"VORN.Test.Throw", 1, "standard", ThrowStandard},
                         {"VORN.Test.Throw", 1, "number", ThrowNumber},
                         {"VORN.Test.Silent", 1, "get", Silent},
                         {"VORN.Test.Twice", 1, "get", Twice},
                         {"VORN.Test.Wait", 1, "get", Wait},
                         {"VORN.Test.Wait", 2, "set", Wait},
                         {"VORN.Test.Processor", 1, "get", Processor},
                         {"VORN.Test.Large", 1, "get", Large},
                         {"VORN.Test.Callback", 1, "set", Callback},
                         {"VORN.Test.Task", 1, "start", TaskStart},
                         {"VORN.Test.Task", 1, "list", TaskList},
                         {"VORN.Test.Task", 1, "status", TaskStatus},
                         {"VORN.Test.Task", 1, "stop", TaskStop},
                         {nullptr, 0, nullptr, nullptr}};

} // namespace

extern "C" TEST_EXPORT VORN::APIEntry *GetAPITable() {
  return rows;
}
