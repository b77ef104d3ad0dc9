// Values of any content in the fields that decide who is let through: a row is reached only by a request that holds the
// token, or session and CSRF token, and comes from no other site.
#include "tests/fuzz/demand.h"
#include "tests/fuzz/fuzz_server.h"
#include "webapi/language.h"
#include "webapi/text.h"

#include <fuzzer/FuzzedDataProvider.h>

#include <array>
#include <cstdint>

using vornfuzz::Demand;

namespace {

constexpr std::array<const char *, 17> kNames = {
    "Cookie", "Cookie",         "X-CSRF-Token", "Authorization",     "Origin",          "Sec-Fetch-Site",
    "Host",   "Content-Length", "Content-Type", "Transfer-Encoding", "Accept-Language", "Connection",
    "Expect", "X-Poll",         "User-Agent",   "X-Forwarded-For",   "Content-Encoding"};

constexpr std::array<const char *, 20> kValues = {
    "vorn-session={ID}",
    "__Host-vorn-session={ID}",
    "vorn-session={ID}; vorn-session=x",
    "{CSRF}",
    "{ID}",
    "Bearer 5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e",
    "Bearer e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5",
    "http://localhost",
    "https://localhost",
    "null",
    "same-origin",
    "none",
    "cross-site",
    "localhost",
    "127.0.0.1",
    "application/json",
    "0",
    "2",
    "chunked",
    "close"};

constexpr std::array<const char *, 5> kTargets = {"/webapi/A/1/get", "/webapi/A/1/set", "/webapi/A/2/get",
                                                  "/webapi/logout", "/webapi/tokens/list"};

struct Field {
  std::string name;
  std::string value;
};

Field MakeField(FuzzedDataProvider &input) {
  Field field{kNames[input.ConsumeIntegralInRange<size_t>(0, kNames.size() - 1)], ""};
  while (input.ConsumeBool()) {
    const bool known = input.ConsumeBool();
    field.value += known ? kValues[input.ConsumeIntegralInRange<size_t>(0, kValues.size() - 1)]
                         : input.ConsumeRandomLengthString(24);
  }
  field.value = vornfuzz::Fill(field.value);
  return field;
}

bool Holds(const std::string &text, std::string_view part) {
  return text.find(part) != std::string::npos;
}

/// The least that a request needs, whatever the server made of it.
bool MayReach(const std::string &bytes, const std::string &target) {
  const bool person = Holds(bytes, "vorn-session=" + vornfuzz::SessionId()) && Holds(bytes, vornfuzz::SessionCsrf());
  const bool reader = Holds(bytes, vornfuzz::kReadingToken) && target.ends_with("/get");
  const bool program = Holds(bytes, vornfuzz::kToken) && target.starts_with("/webapi/A/");
  return person || reader || program;
}

/// @param[in] fields  those that stand in the header: a value may have ended it
bool ComesFromElsewhere(const std::vector<Field> &fields, bool secure) {
  for (const Field &field : fields) {
    if (field.value.find_first_of("\r\n") != std::string::npos) {
      continue; // it is less than it seems
    }
    const std::string value = vornwebapi::Lower(vornwebapi::Trim(field.value));
    if ((field.name == "Origin" && !value.empty() && !value.starts_with(secure ? "https://" : "http://")) ||
        (field.name == "Sec-Fetch-Site" && value == "cross-site")) {
      return true;
    }
  }
  return false;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  FuzzedDataProvider input(data, size);
  vornfuzz::Renew();
  const bool secure = input.ConsumeBool();
  const std::string target = kTargets[input.ConsumeIntegralInRange<size_t>(0, kTargets.size() - 1)];
  std::vector<Field> fields;
  while (input.remaining_bytes() > 0 && fields.size() < 12) {
    fields.push_back(MakeField(input));
  }
  std::string bytes = "POST " + target + " HTTP/1.1\r\nHost: localhost\r\n";
  std::vector<Field> inHeader;
  for (const Field &field : fields) {
    Demand(vornwebapi::LanguageCode(field.value).size() == 3);
    if (bytes.find("\r\n\r\n") == std::string::npos) {
      inHeader.push_back(field);
    }
    bytes += field.name + ": " + field.value + "\r\n";
  }
  bytes += "\r\n";
  const vornfuzz::Talk talk = vornfuzz::Converse(bytes, bytes.size(), secure);
  if (talk.statuses.starts_with("200 ") || talk.statuses.starts_with("500 ")) { // 500: the row that throws was reached
    Demand(MayReach(bytes, target));
    Demand(!ComesFromElsewhere(inHeader, secure));
  }
  return 0;
}
