#include "index/strict_json.h"

#include <json/reader.h>
#include <json/value.h>
#include <json/writer.h>

#include <exception>
#include <memory>
#include <new>

namespace vela {

namespace {

Json::StreamWriterBuilder MakeWriterBuilder() {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  return builder;
}

Json::CharReaderBuilder MakeReaderBuilder(DuplicateKeys duplicates) {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["rejectDupKeys"] = duplicates == DuplicateKeys::kRejected;
  builder["skipBom"] = false;
  return builder;
}

bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

/// Removes the digits at the front. Returns true when there were any.
bool SkipDigits(std::string_view& text) {
  const size_t before = text.size();
  while (!text.empty() && IsDigit(text.front())) {
    text.remove_prefix(1);
  }
  return text.size() < before;
}

/// Removes one of `characters` from the front. Returns true when one was there.
bool SkipOneOf(std::string_view characters, std::string_view& text) {
  if (text.empty() || characters.find(text.front()) == std::string_view::npos) {
    return false;
  }
  text.remove_prefix(1);
  return true;
}

bool IsNumber(std::string_view text) {
  SkipOneOf("-", text);
  const bool isZero = SkipOneOf("0", text);
  if (!isZero && !SkipDigits(text)) {
    return false;
  }
  if (SkipOneOf(".", text) && !SkipDigits(text)) {
    return false;
  }
  if (SkipOneOf("eE", text)) {
    SkipOneOf("+-", text);
    if (!SkipDigits(text)) {
      return false;
    }
  }
  return text.empty();
}

/// Returns the position after the string that begins at `begin`.
size_t EndOfString(std::string_view text, size_t begin) {
  size_t at = begin + 1;
  while (at < text.size() && text[at] != '"') {
    at += text[at] == '\\' ? 2 : 1;
  }
  return at + 1;
}

/// Returns true when the text contains extensions that JsonCpp accepts: comments, and numbers such
/// as 01 or a single minus sign.
bool HasExtensions(std::string_view text) {
  for (size_t at = 0; at < text.size();) {
    const char c = text[at];
    if (c == '/') {
      return true;
    }
    if (c == '"') {
      at = EndOfString(text, at);
    } else if (IsDigit(c) || c == '-' || c == '+') {
      const size_t end = text.find_first_not_of("+-.0123456789Ee", at);
      if (!IsNumber(text.substr(at, end - at))) {
        return true;
      }
      at = end;
    } else {
      ++at;
    }
  }
  return false;
}

/// Returns true when objects and lists contain each other deeper than kJsonLevelsMax. For text that
/// is not valid JSON, the answer is an upper bound of what a parser can see before it notices.
bool IsTooDeep(std::string_view text) {
  int level = 0;
  for (size_t at = 0; at < text.size(); ++at) {
    const char c = text[at];
    if (c == '"') {
      at = EndOfString(text, at) - 1;
    } else if (c == '{' || c == '[') {
      if (++level > kJsonLevelsMax) {
        return true;
      }
    } else if ((c == '}' || c == ']') && level > 0) {
      --level;
    }
  }
  return false;
}

}  // namespace

std::string ToJsonText(const Json::Value& value) {
  static const Json::StreamWriterBuilder builder = MakeWriterBuilder();
  return Json::writeString(builder, value);
}

bool ReadJsonObject(std::string_view text, DuplicateKeys duplicates, Json::Value& object) {
  static const Json::CharReaderBuilder lenient = MakeReaderBuilder(DuplicateKeys::kLastWins);
  static const Json::CharReaderBuilder strict = MakeReaderBuilder(DuplicateKeys::kRejected);
  if (IsTooDeep(text) || HasExtensions(text)) {
    return false;
  }
  const Json::CharReaderBuilder& builder =
      duplicates == DuplicateKeys::kRejected ? strict : lenient;
  try {
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    return reader->parse(text.data(), text.data() + text.size(), &object, nullptr) &&
           object.isObject();
  } catch (const std::bad_alloc&) {
    throw;
  } catch (const std::exception&) {
    // JsonCpp also throws where it could return an error, for example at its own limit of depth.
    return false;
  }
}

}  // namespace vela
