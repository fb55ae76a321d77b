// JSON objects as single lines of text.
#pragma once

#include <json/forwards.h>

#include <string>
#include <string_view>

namespace velaplatform {

/// Writes `value` to `line` as compact JSON with a newline behind it. The bytes of strings stay as
/// they are, valid UTF-8 or not. Returns false when the value cannot be written.
bool WriteJsonLine(const Json::Value& value, std::string& line);

/// Reads `text`, which must be one whole JSON object and nothing else but white space, into
/// `object`. Returns false when it is not that.
bool ReadJsonObject(std::string_view text, Json::Value& object);

}  // namespace velaplatform
