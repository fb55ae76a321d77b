// JSON objects as clients send them.
#pragma once

#include <json/forwards.h>

#include <string_view>

/// Reads `text`, which must be one JSON object with nothing but white space around it, by the
/// letter of the format, except that strings may have any bytes. Returns false when it is not that.
/// Throws only std::bad_alloc.
bool ReadJsonObject(std::string_view text, Json::Value& object);
