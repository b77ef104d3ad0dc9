// The lines of key/value and section files, and the format that a caller gives for them.
#ifndef HOST_UTILITY_LINE_FILE_H
#define HOST_UTILITY_LINE_FILE_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

/// What one line says. The texts point into the line.
struct Line {
  enum class Kind { kNothing, kSection, kPair };
  Kind kind = Kind::kNothing;
  std::string_view key; ///< of a pair; of a section its name
  std::string_view value;
};

/// @param[in] text  a line without its line end
Line ParseLine(std::string_view text);

/// Goes through a content line by line.
class LineReader {
public:
  explicit LineReader(std::string_view content) : rest_(content) {}
  /// @param[out] text  the next line, without its line end
  /// @return false when there is none
  bool Next(std::string_view &text);
  /// What is still to be read.
  std::string_view Rest() const { return rest_; }

private:
  std::string_view rest_;
};

/// A caller's format: exactly two "%s" (key, value), "%%" for a percent sign, no other conversion, one line end, at its
/// end. It is expanded here and never handed to printf.
class LineFormat {
public:
  /// @return nothing when `format` is null or none of that kind
  static std::optional<LineFormat> Parse(const char *format);

  /// @return the line, with its line end; nothing when reading it would not give back exactly this key and this value
  std::optional<std::string> Render(std::string_view key, std::string_view value) const;

private:
  std::vector<std::string> parts_; // what stands before, between and after the two texts
};

/// Whether a key, a value or a name holds a character that ends a line.
bool HasLineEnd(std::string_view text);

/// Appends lines to a content whose last line may lack its end.
void AppendLines(std::string &content, std::string_view lines);

} // namespace vornhost

#endif
