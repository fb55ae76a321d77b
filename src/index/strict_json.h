// JSON on single lines, parsed without extensions to the format.
#pragma once

#include <json/forwards.h>

#include <string>
#include <string_view>

namespace vela {

/// How a repeated key in an object is handled.
enum class DuplicateKeys {
  kLastWins,
  kRejected,  ///< the text is invalid
};

/// How deep objects and lists may contain each other; the outermost object is level 1.
constexpr int kJsonLevelsMax = 64;

/// Returns `value` as compact JSON in one line, without a newline at its end. Strings keep their
/// bytes, valid UTF-8 or not. Throws std::exception when the value cannot be written.
std::string ToJsonText(const Json::Value& value);

/// Reads `text`, which must be a single JSON object with only white space around it, into `object`.
/// Strings may contain any bytes. Returns false for any other text, and without parsing it when it
/// is nested deeper than kJsonLevelsMax. Throws only std::bad_alloc.
bool ReadJsonObject(std::string_view text, DuplicateKeys duplicates, Json::Value& object);

}  // namespace vela
