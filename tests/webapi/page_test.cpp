// The page's files: who gets them, in which form, and that nothing else of the file system is ever reached.
#include "tests/webapi/webapi_fixture.h"

#include <sys/stat.h>
#include <unistd.h>
#include <zlib.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <memory>
#include <random>

using vorntest::ExpectRefusal;
using vorntest::Folder;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::ServerProcess;

namespace {

namespace fs = std::filesystem;

constexpr const char *kScript = "/assets/index-DiwrgTda.js";

std::string Repeated(const std::string &text, int times) {
  std::string out;
  while (times-- > 0) {
    out += text;
  }
  return out;
}

std::string Uncompress(const std::string &gzip) {
  z_stream stream{};
  std::string out(1'000'000, '\0');
  inflateInit2(&stream, MAX_WBITS + 16);
  stream.next_in = reinterpret_cast<Bytef *>(const_cast<char *>(gzip.data()));
  stream.avail_in = static_cast<uInt>(gzip.size());
  stream.next_out = reinterpret_cast<Bytef *>(out.data());
  stream.avail_out = static_cast<uInt>(out.size());
  const int end = inflate(&stream, Z_FINISH);
  out.resize(end == Z_STREAM_END ? stream.total_out : 0);
  inflateEnd(&stream);
  return out;
}

/// A folder with a page, made before the server starts.
class PageFolder {
public:
  PageFolder() {
    Write("index.html", "<!doctype html><title>page</title>" + Repeated("<p>text</p>", 100));
    Write("assets/index-DiwrgTda.js", Repeated("console.log(1)\n", 200));
    Write("assets/style-a1b2c3d4.css", "a{}");
    Write("assets/time-controls.js", "1");
    Write("favicon.svg", "<svg/>");
    Write("noise.png", std::string("\x89PNG\0", 5) + Repeated("x", 2000));
    for (const char *name : {".hidden.txt", ".git/config.txt", "index.html~", "core", "notes.md", "a b.txt",
                             "x.html.gz", "secret.key", "noext", ".html"}) {
      Write(name, "secret");
    }
    fs::create_symlink("/etc/passwd", Path("link.txt"));
    fs::create_directory_symlink("/etc", Path("etc"));
    mkfifo(Path("pipe.txt").c_str(), 0600);
    fs::create_directories(Path("sub.html"));
  }
  std::string Path(const std::string &name) const { return folder_.Path("page/" + name); }
  std::string Root() const { return folder_.Path("page"); }
  void Write(const std::string &name, const std::string &content) const {
    fs::create_directories(fs::path(Path(name)).parent_path());
    std::ofstream(Path(name), std::ios::binary) << content;
  }
  std::string Read(const std::string &name) const {
    std::ifstream file(Path(name), std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(file), {});
  }

private:
  Folder folder_;
};

class PageTest : public testing::Test {
protected:
  PageTest() : server_({.options = {"--page", page_.Root()}}) {}
  void SetUp() override { ASSERT_NE(server_.Port(), 0) << server_.Log(); }
  void TearDown() override {
    EXPECT_EQ(vorntest::Call(server_.Port(), "VORN.Test.Echo/1/get").status, 200);
    EXPECT_EQ(server_.Stop(), 0) << server_.Log();
    EXPECT_EQ(server_.Log().find("Sanitizer"), std::string::npos) << server_.Log();
  }

  HttpAnswer Get(const std::string &target, const std::string &fields = "", const std::string &method = "GET") const {
    HttpClient client(server_.Port());
    return client.Exchange(method + " " + target + " HTTP/1.1\r\nHost: localhost\r\n" + fields + "\r\n");
  }

  PageFolder page_;
  ServerProcess server_;
};

TEST_F(PageTest, TheRootIsTheIndexWithoutALogin) {
  const HttpAnswer answer = Get("/");
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, page_.Read("index.html"));
  EXPECT_EQ(answer.fields.at("content-type"), "text/html; charset=utf-8");
  EXPECT_EQ(answer.fields.at("cache-control"), "no-cache");
  EXPECT_EQ(Get("/index.html").body, answer.body);
}

TEST_F(PageTest, EveryFileHasTheFieldsOfTheBrowserSide) {
  for (const char *target : {"/", kScript, "/noise.png", "/favicon.svg"}) {
    HttpAnswer answer = Get(target);
    EXPECT_EQ(answer.fields["content-security-policy"],
              "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self' data:; connect-src 'self'; "
              "font-src 'self'; manifest-src 'self'; base-uri 'none'; form-action 'none'; frame-ancestors 'none'");
    EXPECT_EQ(answer.fields["x-content-type-options"], "nosniff");
    EXPECT_EQ(answer.fields["x-frame-options"], "DENY");
    EXPECT_EQ(answer.fields["referrer-policy"], "no-referrer");
    EXPECT_EQ(answer.fields["cross-origin-opener-policy"], "same-origin");
    EXPECT_EQ(answer.fields["cross-origin-resource-policy"], "same-origin");
    EXPECT_EQ(answer.fields["permissions-policy"],
              "camera=(), display-capture=(), geolocation=(), microphone=(), payment=(), usb=()");
    EXPECT_EQ(answer.fields.count("set-cookie"), 0U);
  }
}

TEST_F(PageTest, NamesWithADigestAreKeptForAYear) {
  for (const char *target : {kScript, "/assets/style-a1b2c3d4.css"}) {
    EXPECT_EQ(Get(target).fields["cache-control"], "public, max-age=31536000, immutable") << target;
  }
  for (const char *target : {"/assets/time-controls.js", "/favicon.svg", "/noise.png"}) {
    EXPECT_EQ(Get(target).fields["cache-control"], "no-cache") << target;
  }
}

TEST_F(PageTest, TypesAreThoseOfTheExtensions) {
  EXPECT_EQ(Get(kScript).fields["content-type"], "text/javascript; charset=utf-8");
  EXPECT_EQ(Get("/assets/style-a1b2c3d4.css").fields["content-type"], "text/css; charset=utf-8");
  EXPECT_EQ(Get("/favicon.svg").fields["content-type"], "image/svg+xml");
  const HttpAnswer image = Get("/noise.png");
  EXPECT_EQ(image.fields.at("content-type"), "image/png");
  EXPECT_EQ(image.body, page_.Read("noise.png"));
}

TEST_F(PageTest, WhatTheClientHasIsNotSentAgain) {
  const std::string etag = Get("/").fields["etag"];
  ASSERT_EQ(etag.size(), 34U);
  for (const std::string &field : {etag, "W/" + etag, "\"x\", " + etag, std::string("*")}) {
    HttpAnswer answer = Get("/", "If-None-Match: " + field + "\r\n");
    EXPECT_EQ(answer.status, 304) << field;
    EXPECT_EQ(answer.body, "");
    EXPECT_EQ(answer.fields["etag"], etag);
    EXPECT_EQ(answer.fields["content-length"], "");
  }
  EXPECT_EQ(Get("/", "If-None-Match: \"x\"\r\n").status, 200);
  EXPECT_NE(Get("/", "Accept-Encoding: gzip\r\n").fields["etag"], etag);
}

TEST_F(PageTest, AConnectionGoesOnAfterFilesAndAfter304) {
  HttpClient client(server_.Port());
  const std::string etag = Get("/").fields["etag"];
  const std::string first = "GET / HTTP/1.1\r\nHost: localhost\r\nIf-None-Match: " + etag + "\r\n\r\n";
  const std::string second = std::string("GET ") + kScript + " HTTP/1.1\r\nHost: localhost\r\n\r\n";
  ASSERT_TRUE(client.Send(first + second + first));
  EXPECT_EQ(client.Read().status, 304);
  EXPECT_EQ(client.Read().body, page_.Read("assets/index-DiwrgTda.js"));
  EXPECT_EQ(client.Read().status, 304);
}

TEST_F(PageTest, TextsAreCompressedForWhoTakesIt) {
  for (const char *field : {"gzip", "deflate, GZIP;q=0.5, br", "gzip; q=1"}) {
    HttpAnswer answer = Get(kScript, std::string("Accept-Encoding: ") + field + "\r\n");
    EXPECT_EQ(answer.fields["content-encoding"], "gzip") << field;
    EXPECT_EQ(answer.fields["vary"], "Accept-Encoding");
    EXPECT_LT(answer.body.size(), 500U);
    EXPECT_EQ(Uncompress(answer.body), page_.Read("assets/index-DiwrgTda.js"));
  }
  for (const char *fields : {"", "Accept-Encoding: gzip;q=0\r\n", "Accept-Encoding: gzip;q=0.000\r\n",
                             "Accept-Encoding: br\r\n", "Accept-Encoding: xgzip\r\n", "Accept-Encoding: ,;,=\r\n"}) {
    HttpAnswer answer = Get(kScript, fields);
    EXPECT_EQ(answer.fields.count("content-encoding"), 0U) << fields;
    EXPECT_EQ(answer.fields["vary"], "Accept-Encoding");
    EXPECT_EQ(answer.body, page_.Read("assets/index-DiwrgTda.js"));
  }
  EXPECT_EQ(Get("/noise.png", "Accept-Encoding: gzip\r\n").fields.count("content-encoding"), 0U);
  EXPECT_EQ(Get("/assets/style-a1b2c3d4.css", "Accept-Encoding: gzip\r\n").body, "a{}");
}

TEST_F(PageTest, HeadHasTheSameHeaderAndNoBody) {
  HttpClient client(server_.Port());
  client.Send("HEAD / HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n");
  const std::string bytes = client.Bytes(std::chrono::seconds(5));
  EXPECT_EQ(bytes.substr(0, 15), "HTTP/1.1 200 OK");
  EXPECT_NE(bytes.find("Content-Length: " + std::to_string(page_.Read("index.html").size()) + "\r\n"),
            std::string::npos);
  EXPECT_EQ(bytes.substr(bytes.size() - 4), "\r\n\r\n");
  EXPECT_EQ(bytes.find("\r\n\r\n"), bytes.size() - 4);
  EXPECT_TRUE(client.ClosedByServer());
}

TEST_F(PageTest, NoWayLeadsOutOfTheFolder) {
  for (const char *target : {"/../../etc/shadow",
                             "/../../../../../../../../etc/passwd",
                             "/%2e%2e%2fetc/passwd",
                             "/..%2f..%2fetc/passwd",
                             "/..%5c..%5cetc/passwd",
                             "/..\\..\\etc\\passwd",
                             "/%252e%252e%252fetc/passwd",
                             "/%c0%ae%c0%ae/etc/passwd",
                             "/index%00.html",
                             "/index.html%00.css",
                             "//etc/passwd",
                             "//index.html",
                             "/./index.html",
                             "/assets/../index.html",
                             "/assets/./index-DiwrgTda.js",
                             "/index.html/",
                             "/index.html/.",
                             "/INDEX.HTML",
                             "/index.html?a",
                             "/?a",
                             "/index.html;x",
                             "/index.html#a",
                             "/%69ndex.html",
                             "/link.txt",
                             "/etc/passwd",
                             "/etc",
                             "/etc/",
                             "/assets",
                             "/assets/",
                             "/sub.html",
                             "/sub.html/",
                             "/.git",
                             "/.git/",
                             "/.git/config.txt",
                             "/.hidden.txt",
                             "/.html",
                             "/index.html~",
                             "/core",
                             "/notes.md",
                             "/a%20b.txt",
                             "/x.html.gz",
                             "/secret.key",
                             "/noext",
                             "/pipe.txt",
                             "/.",
                             "/..",
                             "//",
                             "/static/",
                             "/static/..%2fwebapi/VORN.Test.Echo/1/get",
                             "//webapi/VORN.Test.Echo/1/get",
                             "/WEBAPI/VORN.Test.Echo/1/get"}) {
    ExpectRefusal(Get(target), 404);
  }
}

TEST_F(PageTest, TheApiIsNoPartOfThePage) {
  for (const char *target : {"/webapi", "/webapi/", "/webapi/VORN.Test.Echo/1/get", "/webapi?x/static/",
                             "/webapi%00.css", "/webapi/.", "/webapi;x", "/webapi/../index.html"}) {
    ExpectRefusal(Get(target), 401);
    ExpectRefusal(Get(target, "Sec-Fetch-Site: none\r\nSec-Fetch-Mode: navigate\r\nSec-Fetch-Dest: document\r\n"), 401);
    ExpectRefusal(Get(target, "Sec-Fetch-Site: cross-site\r\nSec-Fetch-Mode: navigate\r\nSec-Fetch-Dest: document\r\n"),
                  403);
  }
  for (const char *method : {"POST", "PUT", "DELETE", "OPTIONS", "TRACE"}) {
    ExpectRefusal(Get("/", "", method), 401);
    ExpectRefusal(Get("/", VORN_TEST_LOGIN, method), 404);
  }
}

TEST_F(PageTest, ALinkElsewhereLeadsHereAndNothingElseDoes) {
  for (const char *site : {"none", "same-origin", "same-site", "cross-site"}) {
    EXPECT_EQ(Get("/", std::string("Sec-Fetch-Mode: navigate\r\nSec-Fetch-Dest: document\r\nSec-Fetch-Site: ") + site +
                           "\r\n")
                  .status,
              200)
        << site;
  }
  for (const char *fields : {"", "Sec-Fetch-Mode: no-cors\r\nSec-Fetch-Dest: script\r\n",
                             "Sec-Fetch-Mode: navigate\r\nSec-Fetch-Dest: iframe\r\n", "Sec-Fetch-Mode: navigate\r\n",
                             "Sec-Fetch-Dest: document\r\n",
                             "Sec-Fetch-Mode: navigate\r\nSec-Fetch-Dest: document\r\nOrigin: http://evil.example\r\n",
                             "Sec-Fetch-Mode: navigate\r\nSec-Fetch-Mode: cors\r\nSec-Fetch-Dest: document\r\n"}) {
    ExpectRefusal(Get(kScript, std::string("Sec-Fetch-Site: cross-site\r\n") + fields), 403);
  }
  HttpClient client(server_.Port());
  ExpectRefusal(client.Exchange("GET / HTTP/1.1\r\nHost: evil.example\r\n\r\n"), 421);
}

TEST_F(PageTest, WhatChangesAfterTheStartIsNotSeen) {
  const std::string before = page_.Read("index.html");
  page_.Write("index.html", "changed");
  page_.Write("new.html", "new");
  EXPECT_EQ(Get("/").body, before);
  ExpectRefusal(Get("/new.html"), 404);
}

TEST(PageLoadTest, WithoutAFolderThereIsNoPage) {
  ServerProcess server({.options = {"--page", "/nonexistent"}});
  HttpClient client(server.Port());
  const HttpAnswer answer = client.Exchange("GET / HTTP/1.1\r\nHost: localhost\r\n\r\n");
  ExpectRefusal(answer, 404);
  EXPECT_NE(answer.body.find("no page is installed here"), std::string::npos);
  EXPECT_EQ(server.Stop(), 0);
}

TEST(PageLoadTest, WhatIsTooLargeIsLeftOutAndSaid) {
  PageFolder page;
  page.Write("large.js", std::string(4'194'305, 'x'));
  for (const char *name : {"1.js", "2.js", "3.js", "4.js", "5.js"}) {
    page.Write(std::string("many/") + name, std::string(4'194'304, 'x'));
  }
  ServerProcess server({.options = {"--page", page.Root()}});
  HttpClient client(server.Port());
  ExpectRefusal(client.Exchange("GET /large.js HTTP/1.1\r\nHost: localhost\r\n\r\n"), 404);
  int served = 0;
  for (const char *name : {"1.js", "2.js", "3.js", "4.js", "5.js"}) {
    served += client.Exchange(std::string("GET /many/") + name + " HTTP/1.1\r\nHost: localhost\r\n\r\n").status == 200;
  }
  EXPECT_LE(served, 4);
  EXPECT_GE(served, 3);
  EXPECT_TRUE(server.LogShows("page/large.js is left out"));
  EXPECT_EQ(server.Stop(), 0);
}

// The page lies in memory once, however many take it slowly.
TEST(PageLoadTest, SlowReadersShareTheFile) {
  PageFolder page;
  std::string noise(4'000'000, '\0');
  std::minstd_rand random(1);
  std::generate(noise.begin(), noise.end(), [&random] { return static_cast<char>(random()); });
  page.Write("large.png", noise);
  ServerProcess server({.options = {"--page", page.Root(), "--connections-per-address", "200"}});
  const auto memory = [&server] {
    std::ifstream file("/proc/" + std::to_string(server.Pid()) + "/statm");
    size_t total = 0;
    size_t resident = 0;
    file >> total >> resident;
    return resident * 4096;
  };
  const std::string request = "GET /large.png HTTP/1.1\r\nHost: localhost\r\n\r\n";
  EXPECT_EQ(HttpClient(server.Port()).Exchange(request).body, noise);
  const size_t before = memory();
  std::vector<std::unique_ptr<HttpClient>> readers;
  for (int count = 0; count < 100; ++count) {
    readers.push_back(std::make_unique<HttpClient>(server.Port(), 4096));
    ASSERT_TRUE(readers.back()->Send(request));
  }
  EXPECT_EQ(HttpClient(server.Port()).Exchange(request).body, noise);
  EXPECT_LT(memory(), before + 20'000'000);
  EXPECT_EQ(readers.front()->Read().body, noise);
  readers.clear();
  EXPECT_EQ(server.Stop(), 0);
}

} // namespace
