// The text of key/value files: one `key="value"` per line. The first line with a key counts.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace vela {

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
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

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
KeyValueLine ParseKeyValueLine(std::string_view line);

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
struct DecodedValue {
  std::string text;
  bool lacksClosingQuote = false;  ///< the opening quote then is a part of the value
  std::string_view rest = {};      ///< what follows the closing quote, without white space
};

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
DecodedValue DecodeValue(std::string_view written);

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
std::optional<std::string> FindValue(std::string_view text, std::string_view key);

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts. The text of key/value files: one `key="value"` per line. Of a key given twice, the first
// line counts.
std::string WithValue(std::string_view text, std::string_view key, std::string_view value);

// The text of key/value files: one `key="value"` per line. Of a key given twice, the first line
// counts.
bool IsStorable(std::string_view key, std::string_view value);

}  // namespace vela
