#include "host/utility/line_file.h"

namespace vornhost {

namespace {

// A carriage return before the line end (a file made elsewhere) counts as a blank.
std::string_view Trim(std::string_view text) {
  constexpr std::string_view kBlanks = " \t\r";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

std::string_view Unquote(std::string_view text) {
  if (text.size() >= 2 && text.front() == '"' && text.back() == '"') {
    return text.substr(1, text.size() - 2);
  }
  return text;
}

} // namespace

Line ParseLine(std::string_view text) {
  const std::string_view line = Trim(text);
  if (line.empty() || line.front() == '#') {
    return {};
  }
  if (line.front() == '[' && line.back() == ']') {
    return {Line::Kind::kSection, line.substr(1, line.size() - 2), {}};
  }
  const size_t equals = line.find('=');
  if (equals == std::string_view::npos) {
    return {};
  }
  return {Line::Kind::kPair, Trim(line.substr(0, equals)), Unquote(Trim(line.substr(equals + 1)))};
}

bool LineReader::Next(std::string_view &text) {
  if (rest_.empty()) {
    return false;
  }
  const size_t end = rest_.find('\n');
  text = rest_.substr(0, end);
  rest_.remove_prefix(end == std::string_view::npos ? rest_.size() : end + 1);
  return true;
}

std::optional<LineFormat> LineFormat::Parse(const char *format) {
  if (format == nullptr) {
    return {};
  }
  LineFormat parsed;
  std::string part;
  for (const char *at = format; *at != '\0'; ++at) {
    if (*at == '%') {
      ++at;
      if (*at == 's') {
        parsed.parts_.push_back(std::move(part));
        part.clear();
        continue;
      }
      if (*at != '%') {
        return {};
      }
    }
    part += *at;
  }
  parsed.parts_.push_back(std::move(part));
  if (parsed.parts_.size() != 3 || parsed.parts_.back().empty() || parsed.parts_.back().back() != '\n') {
    return {};
  }
  size_t lineEnds = 0;
  for (const std::string &each : parsed.parts_) {
    for (const char byte : each) {
      lineEnds += byte == '\n' ? 1 : 0;
    }
  }
  return lineEnds == 1 ? std::optional(std::move(parsed)) : std::nullopt;
}

std::optional<std::string> LineFormat::Render(std::string_view key, std::string_view value) const {
  if (HasLineEnd(key) || HasLineEnd(value)) {
    return {};
  }
  std::string text = parts_[0];
  text.append(key).append(parts_[1]).append(value).append(parts_[2]);
  Line line = ParseLine(std::string_view(text).substr(0, text.size() - 1));
  if (line.kind == Line::Kind::kPair && line.key == key && line.value != value) {
    // The reader would take something of the value's ends away, blanks or quotes of its own: it stands in quotes then.
    text = parts_[0];
    text.append(key).append(parts_[1]).append("\"").append(value).append("\"").append(parts_[2]);
    line = ParseLine(std::string_view(text).substr(0, text.size() - 1));
  }
  if (line.kind != Line::Kind::kPair || line.key != key || line.value != value) {
    return {};
  }
  return text;
}

bool HasLineEnd(std::string_view text) {
  return text.find_first_of("\n\r") != std::string_view::npos;
}

void AppendLines(std::string &content, std::string_view lines) {
  if (!content.empty() && content.back() != '\n') {
    content += '\n';
  }
  content += lines;
}

} // namespace vornhost
