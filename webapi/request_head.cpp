#include "webapi/request_head.h"

#include "webapi/host.h"
#include "webapi/language.h"
#include "webapi/text.h"

#include <algorithm>
#include <array>
#include <boost/beast/core/string.hpp>

namespace vornwebapi {
namespace {

namespace http = boost::beast::http;

constexpr std::string_view kTokenMarks = "!#$%&'*+-.^_`|~"; // RFC 9110, section 5.6.2

bool IsToken(std::string_view text) {
  return !text.empty() && std::all_of(text.begin(), text.end(), [](char c) {
    return IsAlphanumeric(c) || kTokenMarks.find(c) != std::string_view::npos;
  });
}

bool IsDigits(std::string_view text) {
  return !text.empty() && text.find_first_not_of("0123456789") == std::string_view::npos;
}

std::string_view View(boost::beast::string_view text) {
  return {text.data(), text.size()};
}

bool SameIgnoringCase(std::string_view a, std::string_view b) {
  return boost::beast::iequals({a.data(), a.size()}, {b.data(), b.size()});
}

/// How often a field stands, and its first value.
struct Field {
  size_t count = 0;
  std::string_view value;
};

Field Find(const http::request_header<> &header, http::field name) {
  const auto [begin, end] = header.equal_range(name);
  Field field;
  for (auto at = begin; at != end; ++at) {
    field.value = field.count++ == 0 ? Trim(View(at->value())) : field.value;
  }
  return field;
}

std::vector<std::string> Values(const http::request_header<> &header, boost::beast::string_view name) {
  std::vector<std::string> values;
  const auto [begin, end] = header.equal_range(name);
  for (auto at = begin; at != end; ++at) {
    values.emplace_back(Trim(View(at->value())));
  }
  return values;
}

/// Length and transfer coding: exactly one way to tell where a body ends (RFC 9112, section 6.3, the strict readings).
std::optional<Answer> ReadFraming(const http::request_header<> &header, RequestHead &head) {
  const Field length = Find(header, http::field::content_length);
  const Field coding = Find(header, http::field::transfer_encoding);
  if (length.count + coding.count > 1) {
    return BadRequest("more than one body length");
  }
  constexpr size_t kLongestLength = 18; // digits: what follows cannot overflow
  if (length.count == 1 && (!IsDigits(length.value) || length.value.size() > kLongestLength)) {
    return BadRequest("bad Content-Length");
  }
  if (coding.count == 1) {
    if (header.version() == 10) {
      return BadRequest("Transfer-Encoding in HTTP/1.0");
    }
    if (!SameIgnoringCase(coding.value, "chunked")) {
      return UnknownTransferCoding();
    }
    head.chunked = true;
  }
  head.hasBody = head.chunked || (length.count == 1 && length.value.find_first_not_of('0') != std::string_view::npos);
  return std::nullopt;
}

/// A comma-separated list of tokens, none of them empty.
std::optional<Answer> ReadConnection(const http::request_header<> &header, RequestHead &head) {
  head.keepAlive = header.version() == 11;
  const auto [begin, end] = header.equal_range(http::field::connection);
  for (auto at = begin; at != end; ++at) {
    std::string_view rest = View(at->value());
    for (bool more = true; more;) {
      const size_t comma = rest.find(',');
      const std::string_view option = Trim(rest.substr(0, comma));
      if (!IsToken(option)) {
        return BadRequest("bad Connection");
      }
      head.keepAlive = head.keepAlive && !SameIgnoringCase(option, "close");
      more = comma != std::string_view::npos;
      rest.remove_prefix(more ? comma + 1 : rest.size());
    }
  }
  return std::nullopt;
}

std::optional<Answer> CheckHost(const http::request_header<> &header, const HostRule &hosts) {
  const Field host = Find(header, http::field::host);
  if (host.count > 1 || (host.count == 0 && header.version() == 11)) {
    return BadRequest("Host must stand once");
  }
  if (host.count == 0) {
    return std::nullopt;
  }
  switch (CheckHostValue(host.value, *hosts.names, hosts.ownAddress)) {
  case HostVerdict::kOwn:
    return std::nullopt;
  case HostVerdict::kForeign:
    return MisdirectedRequest();
  default:
    return BadRequest("bad Host");
  }
}

std::optional<Answer> ReadExpectation(const http::request_header<> &header, RequestHead &head) {
  const Field expect = Find(header, http::field::expect);
  if (expect.count == 0) {
    return std::nullopt;
  }
  if (expect.count > 1 || !SameIgnoringCase(expect.value, "100-continue")) {
    return ExpectationFailed();
  }
  head.expectsContinue = header.version() == 11 && head.hasBody;
  return std::nullopt;
}

/// "application/json", alone or with charset=utf-8, and not compressed.
bool SaysJson(const http::request_header<> &header) {
  const Field type = Find(header, http::field::content_type);
  if (type.count != 1 || Find(header, http::field::content_encoding).count > 0) {
    return false;
  }
  const size_t semicolon = type.value.find(';');
  if (!SameIgnoringCase(Trim(type.value.substr(0, semicolon)), "application/json")) {
    return false;
  }
  const std::string_view parameter = semicolon == std::string_view::npos ? "" : Trim(type.value.substr(semicolon + 1));
  return parameter.empty() || SameIgnoringCase(parameter, "charset=utf-8") ||
         SameIgnoringCase(parameter, "charset=\"utf-8\"");
}

} // namespace

std::optional<Answer> CheckRequestLine(std::string_view line) {
  const size_t first = line.find(' ');
  const size_t second = first == std::string_view::npos ? first : line.find(' ', first + 1);
  if (second == std::string_view::npos || line.find(' ', second + 1) != std::string_view::npos) {
    return BadRequest("bad request line");
  }
  const std::string_view method = line.substr(0, first);
  const std::string_view target = line.substr(first + 1, second - first - 1);
  const std::string_view version = line.substr(second + 1);
  const auto visible = [](char c) { return c > 0x20 && c < 0x7f; };
  if (!IsToken(method) || target.empty() || !std::all_of(target.begin(), target.end(), visible)) {
    return BadRequest("bad request line");
  }
  const bool shaped = version.size() == 8 && version.substr(0, 5) == "HTTP/" && IsDigits(version.substr(5, 1)) &&
                      version[6] == '.' && IsDigits(version.substr(7, 1));
  if (!shaped) {
    return BadRequest("bad version");
  }
  if (version != "HTTP/1.1" && version != "HTTP/1.0") {
    return UnknownVersion();
  }
  if (boost::beast::http::string_to_verb({method.data(), method.size()}) == http::verb::unknown) {
    return UnknownMethod();
  }
  if (target.front() != '/') {
    return BadRequest("a target is a path");
  }
  return std::nullopt;
}

std::optional<Answer> CheckFieldLine(std::string_view line) {
  const size_t colon = line.find(':');
  if (colon == std::string_view::npos || !IsToken(line.substr(0, colon))) {
    return BadRequest("bad header field");
  }
  const auto allowed = [](char c) { return c == '\t' || (static_cast<unsigned char>(c) >= 0x20 && c != 0x7f); };
  const std::string_view value = line.substr(colon + 1);
  if (!std::all_of(value.begin(), value.end(), allowed)) {
    return BadRequest("bad header field");
  }
  return std::nullopt;
}

std::optional<Answer> ReadHead(const http::request_header<> &header, const HostRule &hosts, RequestHead &head) {
  head.method = View(header.method_string());
  std::optional<Answer> refused = ReadFraming(header, head);
  if (!refused) {
    refused = ReadConnection(header, head);
  }
  if (!refused) {
    refused = CheckHost(header, hosts);
  }
  if (!refused) {
    refused = ReadExpectation(header, head);
  }
  if (refused) {
    return refused;
  }
  head.target = View(header.target());
  head.json = SaysJson(header);
  head.host = Find(header, http::field::host).value;
  head.origin = Values(header, "Origin");
  head.fetchSite = Values(header, "Sec-Fetch-Site");
  head.fetchMode = Values(header, "Sec-Fetch-Mode");
  head.fetchDest = Values(header, "Sec-Fetch-Dest");
  head.authorization = Values(header, "Authorization");
  head.cookies = Values(header, "Cookie");
  head.csrf = Values(header, "X-CSRF-Token");
  head.acceptEncoding = Values(header, "Accept-Encoding");
  head.ifNoneMatch = Values(header, "If-None-Match");
  head.poll = !Values(header, "X-Poll").empty();
  const Field language = Find(header, http::field::accept_language);
  head.language = LanguageCode(language.count == 1 ? language.value : "");
  return std::nullopt;
}

} // namespace vornwebapi
