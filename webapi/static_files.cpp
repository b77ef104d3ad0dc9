#include "webapi/static_files.h"

#include "host/utility/unique_fd.h"
#include "webapi/log.h"
#include "webapi/password.h"
#include "webapi/text.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zlib.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <optional>
#include <utility>

namespace vornwebapi {
namespace {

constexpr size_t kLargestFile = 4'194'304;
constexpr size_t kMostBytes = 16'777'216; // of all files, as they lie in the folder
constexpr size_t kMostFiles = 1'000;
constexpr int kMostFolders = 8; // deepest nesting

struct Type {
  std::string_view extension;
  std::string_view name;
  bool text; ///< worth compressing
};

constexpr std::array<Type, 11> kTypes = {{{".html", "text/html; charset=utf-8", true},
                                          {".css", "text/css; charset=utf-8", true},
                                          {".js", "text/javascript; charset=utf-8", true},
                                          {".svg", "image/svg+xml", true},
                                          {".png", "image/png", false},
                                          {".webp", "image/webp", false},
                                          {".woff2", "font/woff2", false},
                                          {".ico", "image/vnd.microsoft.icon", true},
                                          {".webmanifest", "application/manifest+json", true},
                                          {".txt", "text/plain; charset=utf-8", true},
                                          {".json", "application/json", true}}};

/// Scripts, styles and data of this server only, and no frame around the page.
constexpr std::string_view kPageFields =
    "X-Content-Type-Options: nosniff\r\n"
    "Content-Security-Policy: default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self' data:; "
    "connect-src 'self'; font-src 'self'; manifest-src 'self'; base-uri 'none'; form-action 'none'; "
    "frame-ancestors 'none'\r\n"
    "X-Frame-Options: DENY\r\nReferrer-Policy: no-referrer\r\nCross-Origin-Opener-Policy: same-origin\r\n"
    "Cross-Origin-Resource-Policy: same-origin\r\n"
    "Permissions-Policy: camera=(), display-capture=(), geolocation=(), microphone=(), payment=(), usb=()\r\n";

const Type *TypeOf(std::string_view name) {
  const size_t dot = name.rfind('.');
  const std::string_view extension = dot == std::string_view::npos ? "" : name.substr(dot);
  const auto *found =
      std::find_if(kTypes.begin(), kTypes.end(), [extension](const Type &each) { return each.extension == extension; });
  return found == kTypes.end() ? nullptr : found;
}

/// A name that stands in a path as it is.
bool IsPlainName(std::string_view name) {
  return !name.empty() && name.front() != '.' && std::all_of(name.begin(), name.end(), [](char c) {
    return IsAlphanumeric(c) || c == '.' || c == '_' || c == '-';
  });
}

/// Bundlers put a digest of the content, eight characters of the alphabet of URLs, behind the last part of a name:
/// assets/index-DiwrgTda.js. A word of eight small letters may be just that, a word.
bool HasDigestInName(std::string_view target) {
  constexpr std::string_view kFolder = "/assets/";
  constexpr size_t kDigest = 8;
  const std::string_view name = target.substr(target.rfind('/') + 1);
  const std::string_view stem = name.substr(0, name.rfind('.'));
  if (target.substr(0, kFolder.size()) != kFolder || stem.size() < kDigest + 2 ||
      stem[stem.size() - kDigest - 1] != '-') {
    return false;
  }
  const std::string_view digest = stem.substr(stem.size() - kDigest);
  return digest.find('.') == std::string_view::npos &&
         std::any_of(digest.begin(), digest.end(), [](char c) { return c < 'a' || c > 'z'; });
}

/// @return how many bytes were read, fewer than asked for at the end of the file or after a fault
size_t ReadBytes(int file, char *buffer, size_t size) {
  size_t at = 0;
  while (at < size) {
    const ssize_t got = read(file, buffer + at, size - at);
    if (got <= 0) {
      break;
    }
    at += static_cast<size_t>(got);
  }
  return at;
}

/// @return what a regular file has, links not followed; none when it cannot be read or is too large
std::optional<std::string> ReadFile(const std::string &path) {
  const vornhost::UniqueFd file(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  struct stat info {};
  if (!file.IsOpen() || fstat(file.Get(), &info) != 0 || !S_ISREG(info.st_mode) ||
      static_cast<size_t>(info.st_size) > kLargestFile) {
    return std::nullopt;
  }
  std::string content(static_cast<size_t>(info.st_size), '\0');
  if (ReadBytes(file.Get(), content.data(), content.size()) != content.size()) {
    return std::nullopt;
  }
  return content;
}

/// @return empty when it would not be shorter by a tenth
std::string Compress(const std::string &text) {
  constexpr int kGzip = MAX_WBITS + 16;
  constexpr int kMemory = 8;
  z_stream stream{};
  std::string out(text.size() - text.size() / 10, '\0');
  if (out.empty() ||
      deflateInit2(&stream, Z_BEST_COMPRESSION, Z_DEFLATED, kGzip, kMemory, Z_DEFAULT_STRATEGY) != Z_OK) {
    return {};
  }
  stream.next_in = reinterpret_cast<Bytef *>(const_cast<char *>(text.data())); // zlib writes nothing there
  stream.avail_in = static_cast<uInt>(text.size());
  stream.next_out = reinterpret_cast<Bytef *>(out.data());
  stream.avail_out = static_cast<uInt>(out.size());
  const bool whole = deflate(&stream, Z_FINISH) == Z_STREAM_END;
  out.resize(whole ? stream.total_out : 0);
  deflateEnd(&stream);
  return out;
}

void SetFields(const Type &type, bool keep, bool gzip, bool varies, FileForm &form) {
  const std::string cache = keep ? "public, max-age=31536000, immutable" : "no-cache"; // a year
  form.fields = "Cache-Control: " + cache + "\r\nETag: " + form.etag + "\r\n" +
                (varies ? "Vary: Accept-Encoding\r\n" : "") + std::string(kPageFields) +
                "Content-Type: " + std::string(type.name) + "\r\n" + (gzip ? "Content-Encoding: gzip\r\n" : "");
}

/// The weight of a list's parameter "q": only a zero is told from the rest (RFC 9110, section 12.4.2).
bool IsZeroWeight(std::string_view parameters) {
  const size_t equals = parameters.find('=');
  if (equals == std::string_view::npos || Lower(Trim(parameters.substr(0, equals))) != "q") {
    return false;
  }
  return Trim(parameters.substr(equals + 1)).find_first_not_of("0.") == std::string_view::npos;
}

/// Calls `take` with each part of comma-separated values, until it returns true.
template <typename Take> bool AnyPart(const std::vector<std::string> &values, Take take) {
  for (const std::string &value : values) {
    std::string_view rest = value;
    while (!rest.empty()) {
      const size_t comma = std::min(rest.find(','), rest.size());
      if (take(Trim(rest.substr(0, comma)))) {
        return true;
      }
      rest.remove_prefix(std::min(comma + 1, rest.size()));
    }
  }
  return false;
}

bool TakesGzip(const RequestHead &head) {
  return AnyPart(head.acceptEncoding, [](std::string_view part) {
    const size_t semicolon = std::min(part.find(';'), part.size());
    return Lower(Trim(part.substr(0, semicolon))) == "gzip" &&
           !IsZeroWeight(part.substr(std::min(semicolon + 1, part.size())));
  });
}

/// The client has this form already (RFC 9110, section 13.1.2: the weak comparison).
bool Has(const RequestHead &head, const FileForm &form) {
  return AnyPart(head.ifNoneMatch, [&form](std::string_view part) {
    return part == "*" || part == form.etag || (part.substr(0, 2) == "W/" && part.substr(2) == form.etag);
  });
}

} // namespace

bool StaticFiles::Add(const std::string &path, std::string_view target, size_t &bytes) {
  const Type *type = TypeOf(target);
  std::optional<std::string> content = ReadFile(path);
  if (!content || bytes + content->size() > kMostBytes || files_.size() >= kMostFiles) {
    return false;
  }
  bytes += content->size();
  File file;
  const std::string digest = DigestOf(*content).substr(0, 32);
  const bool keep = HasDigestInName(target);
  file.gzip.body = type->text ? Compress(*content) : "";
  file.plain.body = std::move(*content);
  file.plain.etag = '"' + digest + '"';
  file.gzip.etag = '"' + digest + "-gz\"";
  const bool varies = !file.gzip.body.empty();
  SetFields(*type, keep, false, varies, file.plain);
  SetFields(*type, keep, true, varies, file.gzip);
  files_.emplace(target, std::move(file));
  return true;
}

void StaticFiles::Load(const std::string &folder) {
  namespace fs = std::filesystem;
  std::error_code fault;
  size_t bytes = 0;
  fs::recursive_directory_iterator each(folder, fault);
  for (; !fault && each != fs::recursive_directory_iterator(); each.increment(fault)) {
    const std::string name = each->path().filename().string();
    const fs::file_type kind = each->symlink_status(fault).type();
    if (kind == fs::file_type::directory && (!IsPlainName(name) || each.depth() + 1 >= kMostFolders)) {
      each.disable_recursion_pending();
    }
    if (kind != fs::file_type::regular || !IsPlainName(name) || TypeOf(name) == nullptr) {
      continue;
    }
    const std::string path = each->path().string();
    if (!Add(path, '/' + fs::path(path).lexically_relative(folder).string(), bytes)) {
      Log(LogKind::kLifecycle, "the page's file %s is left out: unreadable, or one too many or too large",
          Printable(path, 1000).c_str());
    }
  }
}

Answer StaticFiles::Get(const RequestHead &head) const {
  const auto found = files_.find(head.target == "/" ? "/index.html" : head.target);
  if (found == files_.end()) {
    return head.target == "/" ? NoPage() : NoSuchFile();
  }
  const File &file = found->second;
  const FileForm &form = !file.gzip.body.empty() && TakesGzip(head) ? file.gzip : file.plain;
  const bool unchanged = Has(head, form);
  Answer answer;
  answer.status = unchanged ? 304 : 200;
  answer.fileFields = form.fields;
  answer.file = unchanged ? std::string_view() : form.body;
  return answer;
}

} // namespace vornwebapi
