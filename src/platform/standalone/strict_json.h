// JSON by the letter of the format, as single lines of text.
#pragma once

#include <json/forwards.h>

#include <string>
#include <string_view>

namespace vela {

/// What a key means that an object holds more than once.
enum class DuplicateKeys {
  kLastWins,
  kRejected,  ///< the text is refused
};

/// Writes `value` to `line` as compact JSON followed by a newline. The bytes of strings are kept,
/// valid UTF-8 or not. Returns false when the value cannot be written.
bool WriteJsonLine(const Json::Value& value, std::string& line);

/// Reads `text`, which must be one whole JSON object with nothing but white space around it, into
/// `object`. Strings may hold any bytes. Returns false for any other text. Throws only
/// std::bad_alloc.
bool ReadJsonObject(std::string_view text, DuplicateKeys duplicates, Json::Value& object);

}  // namespace vela
