#include "webapi/json_scanner.h"

#include "webapi/text.h"
#include "webapi/utf8.h"

#include <bitset>

namespace vornwebapi {
namespace {

class Scanner {
public:
  Scanner(std::string_view text, const JsonLimits &limits) : rest_(text), limits_(limits) {}

  JsonFault Run();

private:
  enum class Expect { kValue, kValueOrEnd, kKey, kKeyOrEnd, kCommaOrEnd, kNothing };

  void SkipBlanks();
  bool Take(char c);
  char Peek() const { return rest_.empty() ? '\0' : rest_.front(); }

  void Step();
  void Value();
  void Open(bool object);
  void Close();
  void Key();
  void CommaOrEnd();
  void Scalar();
  void Literal(std::string_view word);
  void Number();
  bool Digits();
  void String();
  void Escape();
  bool HexUnit(unsigned &unit);
  void Fail(JsonFault fault) { fault_ = fault; }

  bool InObject() const { return objects_[depth_ - 1]; }

  std::string_view rest_;
  const JsonLimits &limits_;
  size_t depth_ = 0;
  size_t values_ = 0;
  std::bitset<64> objects_; // per level: an object, else an array
  Expect expect_ = Expect::kValue;
  JsonFault fault_ = JsonFault::kNone;
};

JsonFault Scanner::Run() {
  SkipBlanks();
  while (fault_ == JsonFault::kNone && expect_ != Expect::kNothing) {
    Step();
    SkipBlanks();
  }
  if (fault_ == JsonFault::kNone && !rest_.empty()) {
    Fail(JsonFault::kSyntax);
  }
  return fault_;
}

void Scanner::SkipBlanks() {
  const size_t end = rest_.find_first_not_of(" \t\r\n");
  rest_.remove_prefix(end == std::string_view::npos ? rest_.size() : end);
}

bool Scanner::Take(char c) {
  if (rest_.empty() || rest_.front() != c) {
    return false;
  }
  rest_.remove_prefix(1);
  return true;
}

void Scanner::Step() {
  switch (expect_) {
  case Expect::kValueOrEnd:
    if (Take(']')) {
      Close();
      break;
    }
    [[fallthrough]];
  case Expect::kValue:
    Value();
    break;
  case Expect::kKeyOrEnd:
    if (Take('}')) {
      Close();
      break;
    }
    [[fallthrough]];
  case Expect::kKey:
    Key();
    break;
  case Expect::kCommaOrEnd:
    CommaOrEnd();
    break;
  case Expect::kNothing:
    break;
  }
}

void Scanner::Value() {
  if (++values_ > limits_.values) {
    Fail(JsonFault::kTooManyValues);
  } else if (Take('{')) {
    Open(true);
  } else if (Take('[')) {
    Open(false);
  } else {
    Scalar();
    expect_ = depth_ == 0 ? Expect::kNothing : Expect::kCommaOrEnd;
  }
}

void Scanner::Open(bool object) {
  if (depth_ == limits_.depth || depth_ == objects_.size()) {
    Fail(JsonFault::kTooDeep);
    return;
  }
  objects_[depth_++] = object;
  expect_ = object ? Expect::kKeyOrEnd : Expect::kValueOrEnd;
}

void Scanner::Close() {
  --depth_;
  expect_ = depth_ == 0 ? Expect::kNothing : Expect::kCommaOrEnd;
}

void Scanner::Key() {
  if (!Take('"')) {
    Fail(JsonFault::kSyntax);
    return;
  }
  String();
  SkipBlanks();
  if (fault_ == JsonFault::kNone && !Take(':')) {
    Fail(JsonFault::kSyntax);
  }
  expect_ = Expect::kValue;
}

void Scanner::CommaOrEnd() {
  if (Take(',')) {
    expect_ = InObject() ? Expect::kKey : Expect::kValue;
  } else if (Take(InObject() ? '}' : ']')) {
    Close();
  } else {
    Fail(JsonFault::kSyntax);
  }
}

void Scanner::Scalar() {
  switch (Peek()) {
  case '"':
    rest_.remove_prefix(1);
    String();
    break;
  case 't':
    Literal("true");
    break;
  case 'f':
    Literal("false");
    break;
  case 'n':
    Literal("null");
    break;
  default:
    Number();
  }
}

void Scanner::Literal(std::string_view word) {
  if (rest_.substr(0, word.size()) != word) {
    Fail(JsonFault::kSyntax);
    return;
  }
  rest_.remove_prefix(word.size());
}

bool Scanner::Digits() {
  const size_t before = rest_.size();
  while (IsDigit(Peek())) {
    rest_.remove_prefix(1);
  }
  return rest_.size() < before;
}

void Scanner::Number() {
  Take('-');
  bool good = Take('0') || Digits();
  if (good && Take('.')) {
    good = Digits();
  }
  if (good && (Take('e') || Take('E'))) {
    if (!Take('-')) {
      Take('+');
    }
    good = Digits();
  }
  if (!good) {
    Fail(JsonFault::kSyntax);
  }
}

// After the opening quote, to the closing one.
void Scanner::String() {
  while (fault_ == JsonFault::kNone) {
    if (rest_.empty() || static_cast<unsigned char>(rest_.front()) < 0x20) {
      Fail(JsonFault::kSyntax);
    } else if (Take('"')) {
      return;
    } else if (Take('\\')) {
      Escape();
    } else if (const size_t length = Utf8Length(rest_); length > 0) {
      rest_.remove_prefix(length);
    } else {
      Fail(JsonFault::kNoUtf8);
    }
  }
}

bool Scanner::HexUnit(unsigned &unit) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  if (rest_.size() < 4) {
    return false;
  }
  unit = 0;
  for (const char c : rest_.substr(0, 4)) {
    const size_t digit = kDigits.find(c >= 'A' && c <= 'F' ? static_cast<char>(c + ('a' - 'A')) : c);
    if (digit == std::string_view::npos) {
      return false;
    }
    unit = unit * 16 + static_cast<unsigned>(digit);
  }
  rest_.remove_prefix(4);
  return true;
}

// After the backslash.
void Scanner::Escape() {
  constexpr std::string_view kSimple = "\"\\/bfnrt";
  if (!rest_.empty() && kSimple.find(rest_.front()) != std::string_view::npos) {
    rest_.remove_prefix(1);
    return;
  }
  unsigned high = 0;
  unsigned low = 0;
  bool good = Take('u') && HexUnit(high);
  if (good && high >= 0xD800 && high <= 0xDFFF) {
    good = high < 0xDC00 && Take('\\') && Take('u') && HexUnit(low) && low >= 0xDC00 && low <= 0xDFFF;
  }
  if (!good) {
    Fail(JsonFault::kSyntax);
  }
}

} // namespace

JsonFault ScanJson(std::string_view text, const JsonLimits &limits) {
  return Scanner(text, limits).Run();
}

} // namespace vornwebapi
