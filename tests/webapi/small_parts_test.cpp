// Hosts, languages, log texts, answers, callbacks.
#include "webapi/answer.h"
#include "webapi/callbacks.h"
#include "webapi/connections.h"
#include "webapi/host.h"
#include "webapi/language.h"
#include "webapi/log.h"

#include <gtest/gtest.h>

using vornwebapi::CheckHostValue;
using vornwebapi::HostVerdict;
using vornwebapi::LanguageCode;
using vornwebapi::Printable;

namespace {

TEST(Host, IsOwnByNameLoopbackOrOwnAddress) {
  const std::vector<std::string> names = {"localhost", "router.lan"};
  const auto check = [&names](const char *value) { return CheckHostValue(value, names, "192.0.2.1"); };
  for (const char *value : {"localhost", "LocalHost:80", "router.lan", "127.0.0.1", "127.1.2.3:1", "[::1]", "[::1]:80",
                            "192.0.2.1", "192.0.2.1:65535", "localhost:"}) {
    EXPECT_EQ(check(value), HostVerdict::kOwn) << value;
  }
  for (const char *value : {"evil.example", "192.0.2.2", "[2001:db8::1]", "localhost.", "xlocalhost", "localhost.lan",
                            "2130706433", "0x7f.1", "127.1"}) {
    EXPECT_EQ(check(value), HostVerdict::kForeign) << value;
  }
  for (const char *value : {"", ":80", "localhost:80x", "localhost:123456", "a b", "a@b", "a/b", "[::1", "[::1]x", "[]",
                            "::1", "[localhost]", "[127.0.0.1]", "localhost,evil", "\xC3\xA4"}) {
    EXPECT_EQ(check(value), HostVerdict::kMalformed) << value;
  }
}

TEST(Language, IsTheKnownOneWithTheGreatestWeight) {
  EXPECT_EQ(LanguageCode(""), "enu");
  EXPECT_EQ(LanguageCode("de"), "ger");
  EXPECT_EQ(LanguageCode("DE-at"), "ger");
  EXPECT_EQ(LanguageCode("xx, yy;q=0.9"), "enu");
  EXPECT_EQ(LanguageCode("en;q=0.5, fr;q=0.7, de;q=0.6"), "fre");
  EXPECT_EQ(LanguageCode("fr;q=0, de;q=0.001"), "ger");
  EXPECT_EQ(LanguageCode("fr, de"), "fre"); // of equals the first
  EXPECT_EQ(LanguageCode("*"), "enu");
  for (const char *odd : {",", ";;;", ";q=", "fr;q=x", "fr;q=0.12345", "fr;q", "=,=;", "fr;q=1.x"}) {
    EXPECT_EQ(LanguageCode(odd), "enu") << odd;
  }
  EXPECT_EQ(LanguageCode(std::string(100'000, ',') + "de"), "ger");
}

TEST(Log, ForeignTextsAreMadePrintable) {
  EXPECT_EQ(Printable("plain text"), "plain text");
  EXPECT_EQ(Printable("a\nb\r\x1b[31m\\\xC3\xA4\x7f"), "a\\x0ab\\x0d\\x1b[31m\\x5c\\xc3\\xa4\\x7f");
  EXPECT_EQ(Printable(std::string(1'000, 'a')), std::string(100, 'a') + "...");
}

TEST(Answer, SaysWhatTheConnectionDoes) {
  const std::string text = Render(vornwebapi::MethodNotAllowed(), true, false);
  EXPECT_EQ(text.substr(0, 35), "HTTP/1.1 405 Method Not Allowed\r\nDa");
  EXPECT_NE(text.find("\r\nAllow: POST\r\n"), std::string::npos);
  EXPECT_EQ(text.find("Connection"), std::string::npos);
  EXPECT_NE(text.find("\r\nContent-Length: 76\r\n"), std::string::npos);
  const std::string last = Render(vornwebapi::Stopping(), false, true);
  EXPECT_EQ(last.substr(last.size() - 23), "\r\nConnection: close\r\n\r\n");
}

TEST(ClientKey, IsTheAddressOrTheNetworkOf64Bits) {
  const auto key = [](const char *text) { return vornwebapi::KeyOf(boost::asio::ip::make_address(text)); };
  EXPECT_EQ(key("192.0.2.1"), key("::ffff:192.0.2.1"));
  EXPECT_NE(key("192.0.2.1"), key("192.0.2.2"));
  EXPECT_EQ(key("2001:db8::1"), key("2001:db8::2"));
  EXPECT_NE(key("2001:db8::1"), key("2001:db8:0:1::1"));
}

void Count(void *data) {
  ++*static_cast<int *>(data);
}

TEST(Callbacks, RunOnceWhateverBecomesOfThem) {
  int ran = 0;
  {
    vornwebapi::Callbacks first;
    first.Add(Count, &ran);
    vornwebapi::Callbacks second = std::move(first);
    EXPECT_EQ(ran, 0);
    second.Run();
    second.Run();
    EXPECT_EQ(ran, 1);
    second.Add(Count, &ran);
  }
  EXPECT_EQ(ran, 2); // at the latest when they are dropped
  vornwebapi::Callbacks third;
  third.Add(Count, &ran);
  third = vornwebapi::Callbacks();
  EXPECT_EQ(ran, 3);
}

} // namespace
