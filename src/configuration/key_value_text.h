// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace vela {

/// A line of such a file. The parts refer to its text.
struct KeyValueLine {
  enum class Kind {
    kBlank,    ///< blank, or a comment
    kPair,     ///< a key and a value
    kInvalid,  ///< without an equals sign
  };
  Kind kind = Kind::kBlank;
  std::string_view key = {};
  std::string_view written = {};  ///< the value with its quotes and escapes
};

/// Parses a line without its newline.
KeyValueLine ParseKeyValueLine(std::string_view line);

/// A value without quotes and escapes.
struct DecodedValue {
  std::string text;
  bool lacksClosingQuote = false;  ///< the opening quote then is a part of the value
  std::string_view rest = {};      ///< what follows the closing quote, without white space
};

/// Decodes a value as it is written in its line.
DecodedValue DecodeValue(std::string_view written);

/// Returns the value in the first line of `text` that has `key`.
std::optional<std::string> FindValue(std::string_view text, std::string_view key);

/// Returns `text` with the first line that has `key` replaced, or with a line appended; all other
/// lines stay byte for byte. IsStorable must accept the pair.
std::string WithValue(std::string_view text, std::string_view key, std::string_view value);

/// Returns whether the pair can be written as a line that is read back as the same pair.
bool IsStorable(std::string_view key, std::string_view value);

}  // namespace vela
