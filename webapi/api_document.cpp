#include "webapi/api_document.h"

#include "webapi/access.h"
#include "webapi/json_writer.h"
#include "webapi/module.h"
#include "webapi/own_calls_text.h"

#include <json/reader.h>

#include <exception>
#include <fstream>
#include <iterator>
#include <memory>
#include <set>
#include <string_view>
#include <utility>

namespace vornwebapi {
namespace {

constexpr const char *kJson = "application/json";

Json::Value Read(const std::string &text) {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value value;
  try {
    reader->parse(text.c_str(), text.c_str() + text.size(), &value, nullptr);
  } catch (const std::exception &) { // nested too deeply
    value = Json::Value();
  }
  return value.isObject() ? value : Json::Value(Json::objectValue);
}

Json::Value Object(const char *type) {
  Json::Value schema(Json::objectValue);
  schema["type"] = type;
  return schema;
}

Json::Value Reference(const std::string &where) {
  Json::Value reference(Json::objectValue);
  reference["$ref"] = "#/components/" + where;
  return reference;
}

/// An object that has these members and no others.
Json::Value Closed(const Json::Value &properties) {
  Json::Value schema = Object("object");
  schema["properties"] = properties;
  for (const std::string &name : properties.getMemberNames()) {
    schema["required"].append(name);
  }
  schema["additionalProperties"] = false;
  return schema;
}

Json::Value Succeeded(const Json::Value &data) {
  Json::Value properties;
  properties["success"]["const"] = true;
  properties["data"] = data;
  return Closed(properties);
}

/// @param[in] errors  code to meaning
Json::Value Failed(const Json::Value &errors) {
  Json::Value code = Object("integer");
  for (const std::string &each : errors.getMemberNames()) {
    code["enum"].append(Read("{\"code\":" + each + "}")["code"]);
  }
  Json::Value error;
  error["code"] = code;
  error["data"] = Json::Value(Json::objectValue);
  Json::Value properties;
  properties["success"]["const"] = false;
  properties["error"] = Closed(error);
  return Closed(properties);
}

void SetContent(const char *type, const Json::Value &schema, Json::Value &body) {
  body["content"][type]["schema"] = schema;
}

const std::vector<std::string> &StatusesOfRows() {
  static const std::vector<std::string> statuses = {"400", "401", "403", "413", "415"};
  return statuses;
}

void SetRefusals(const std::vector<std::string> &statuses, Json::Value &responses) {
  for (const std::string &status : statuses) {
    responses[status] = Reference("responses/" + status);
  }
  responses["default"] = Reference("responses/default");
}

Json::Value OperationOf(const VORN::APIEntry &row, const Json::Value &described) {
  Json::Value operation;
  operation["operationId"] = std::string(row.api) + ".v" + std::to_string(row.version) + '.' + row.method;
  operation["tags"].append(row.api);
  operation["x-access"] = Reads(row.method) ? "read" : "write";
  operation["summary"] = described.get("summary", "");
  Json::Value &body = operation["requestBody"];
  const Json::Value parameters = described.get("parameters", Object("object"));
  body["required"] = parameters.isMember("required");
  SetContent(kJson, parameters, body);
  Json::Value &responses = operation["responses"];
  Json::Value &answer = responses["200"];
  answer["description"] = "what the row answered";
  Json::Value schema = Succeeded(described.get("data", Json::Value(Json::objectValue)));
  if (described["errors"].isObject() && !described["errors"].empty()) {
    Json::Value either;
    either["oneOf"].append(schema);
    either["oneOf"].append(Failed(described["errors"]));
    schema = either;
    answer["x-errors"] = described["errors"];
  }
  SetContent(kJson, schema, answer);
  SetRefusals(StatusesOfRows(), responses);
  return operation;
}

/// @param[in] access  "none", "cookie" (no CSRF token), "session" or "any" (a token too)
Json::Value SecurityOf(const std::string &access) {
  Json::Value person(Json::objectValue);
  person["session"] = Json::Value(Json::arrayValue);
  if (access != "cookie") {
    person["csrf"] = Json::Value(Json::arrayValue);
  }
  Json::Value security(Json::arrayValue);
  if (access != "none") {
    security.append(person);
  }
  if (access == "any") {
    Json::Value program(Json::objectValue);
    program["token"] = Json::Value(Json::arrayValue);
    security.append(program);
  }
  return security;
}

Json::Value OperationOfServer(const std::string &path, const Json::Value &described) {
  Json::Value operation;
  operation["operationId"] = "server" + path;
  operation["tags"].append("server");
  operation["summary"] = described["summary"];
  operation["security"] = SecurityOf(described["access"].asString());
  Json::Value &answer = operation["responses"]["200"];
  answer["description"] = "done";
  if (described.isMember("parameters")) {
    operation["requestBody"]["required"] = described["parameters"].isMember("required");
    SetContent(kJson, described["parameters"], operation["requestBody"]);
    SetContent(kJson, Succeeded(described["data"]), answer);
  } else {
    SetContent(described["type"].asCString(), Json::Value(Json::objectValue), answer);
  }
  std::vector<std::string> statuses;
  for (const Json::Value &status : described["statuses"]) {
    statuses.push_back(status.asString());
  }
  SetRefusals(statuses, operation["responses"]);
  return operation;
}

Json::Value Components(const Json::Value &description, bool secure) {
  Json::Value components;
  Json::Value &schemas = components["schemas"] = description.get("schemas", Json::Value(Json::objectValue));
  Json::Value error;
  error["code"] = Object("integer");
  error["message"] = Object("string");
  Json::Value refusal;
  refusal["success"]["const"] = false;
  refusal["error"] = Closed(error);
  schemas["Refusal"] = Closed(refusal);
  const std::vector<std::pair<const char *, const char *>> meanings = {
      {"400", "malformed, or parameters that cannot be"},
      {"401", "no session and no good token, or a wrong password"},
      {"403", "another site's request, no CSRF token, a token that may not, or the first password still stands"},
      {"413", "the body is too large"},
      {"415", "a body that is not application/json"},
      {"429", "too many tries"},
      {"default", "any other status: the request did not get to the row"}};
  for (const auto &[status, meaning] : meanings) {
    Json::Value &response = components["responses"][status];
    response["description"] = meaning;
    SetContent(kJson, Reference("schemas/Refusal"), response);
  }
  Json::Value &schemes = components["securitySchemes"];
  schemes["session"]["type"] = schemes["csrf"]["type"] = "apiKey";
  schemes["session"]["in"] = "cookie";
  schemes["session"]["name"] = std::string(CookieName(secure));
  schemes["csrf"]["in"] = "header";
  schemes["csrf"]["name"] = "X-CSRF-Token";
  schemes["token"]["type"] = "http";
  schemes["token"]["scheme"] = "bearer";
  return components;
}

/// @return what is wrong with a row's description; empty when nothing is
std::string FaultOf(const Json::Value &described) {
  if (!described.isObject()) {
    return "is not described";
  }
  if (!described["summary"].isString() || described["summary"].empty()) {
    return "has no summary";
  }
  for (const char *member : {"parameters", "data", "errors"}) {
    if (!described[member].isObject()) {
      return std::string("has no object \"") + member + '"';
    }
  }
  return {};
}

/// @param[in] described  by "API/version/method"
void AddRows(const std::vector<VORN::APIEntry> &rows, const Json::Value &described, Json::Value &paths,
             std::vector<std::string> &faults) {
  const auto add = [&faults](std::string name, const std::string &fault) {
    faults.push_back(std::move(name.append(" ").append(fault)));
  };
  std::set<std::string> known;
  for (const VORN::APIEntry &row : rows) {
    const std::string path = PathOf(row);
    const std::string name = path.substr(std::string_view("/webapi/").size());
    const Json::Value &each = described[name];
    const std::string fault = FaultOf(each);
    if (!fault.empty()) {
      add(name, fault);
    }
    known.insert(name);
    paths[path]["post"] = OperationOf(row, fault.empty() ? each : Json::Value(Json::objectValue));
  }
  for (const std::string &name : described.getMemberNames()) {
    if (known.count(name) == 0) {
      add(name, "is described and is no row");
    }
  }
}

/// A description's members of another type than theirs are taken for missing.
Json::Value ReadDescribed(const std::string &text) {
  Json::Value described = Read(text);
  for (const char *member : {"rows", "schemas"}) {
    if (!described[member].isObject()) {
      described[member] = Json::Value(Json::objectValue);
    }
  }
  return described;
}

} // namespace

std::string MakeApiDocument(const std::vector<VORN::APIEntry> &rows, const std::string &description, bool secure,
                            std::vector<std::string> &faults) {
  const Json::Value described = ReadDescribed(description);
  const Json::Value own = Read(kOwnCallsText);
  Json::Value document;
  document["openapi"] = "3.1.0";
  document["info"]["title"] = described.get("title", "module");
  document["info"]["version"] = described.get("version", "0");
  document["security"] = SecurityOf("any");
  document["components"] = Components(described, secure);
  Json::Value &paths = document["paths"];
  AddRows(rows, described["rows"], paths, faults);
  for (const std::string &path : own.getMemberNames()) {
    paths[path][own[path]["method"].asString()] = OperationOfServer(path, own[path]);
  }
  std::string text;
  WriteJson(document, text);
  return text;
}

bool ReadDescription(const std::string &path, std::string &description) {
  std::ifstream file(path, std::ios::binary);
  description.assign(std::istreambuf_iterator<char>(file), {});
  return file.is_open() && !file.bad();
}

} // namespace vornwebapi
