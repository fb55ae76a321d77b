#include "platform/standalone/json_line.h"

#include <json/reader.h>
#include <json/value.h>
#include <json/writer.h>

#include <exception>
#include <memory>

namespace velaplatform {

namespace {

Json::StreamWriterBuilder MakeWriterBuilder() {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  return builder;
}

Json::CharReaderBuilder MakeReaderBuilder() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["rejectDupKeys"] = false;
  builder["skipBom"] = false;
  return builder;
}

bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

/// Removes the digits at the front; returns whether there were any.
bool TakeDigits(std::string_view& text) {
  const size_t before = text.size();
  while (!text.empty() && IsDigit(text.front())) text.remove_prefix(1);
  return text.size() < before;
}

/// Removes `c` or `other` from the front; returns whether one was there.
bool TakeEither(std::string_view& text, char c, char other) {
  if (text.empty() || (text.front() != c && text.front() != other)) return false;
  text.remove_prefix(1);
  return true;
}

bool IsNumber(std::string_view text) {
  TakeEither(text, '-', '-');
  const bool isZero = TakeEither(text, '0', '0');
  if (!isZero && !TakeDigits(text)) return false;
  if (TakeEither(text, '.', '.') && !TakeDigits(text)) return false;
  if (TakeEither(text, 'e', 'E')) {
    TakeEither(text, '+', '-');
    if (!TakeDigits(text)) return false;
  }
  return text.empty();
}

/// Returns the place behind the string that begins at `begin`.
size_t EndOfString(std::string_view text, size_t begin) {
  size_t at = begin + 1;
  while (at < text.size() && text[at] != '"') at += text[at] == '\\' ? 2 : 1;
  return at + 1;
}

/// Returns whether the text has what the reader lets pass and JSON does not know: comments behind
/// values, and numbers such as 01 or a single minus sign.
bool IsLoose(std::string_view text) {
  for (size_t at = 0; at < text.size();) {
    const char c = text[at];
    if (c == '/') return true;
    if (c == '"') {
      at = EndOfString(text, at);
    } else if (IsDigit(c) || c == '-' || c == '+') {
      const size_t end = text.find_first_not_of("+-.0123456789Ee", at);
      if (!IsNumber(text.substr(at, end - at))) return true;
      at = end;
    } else {
      ++at;
    }
  }
  return false;
}

}  // namespace

bool WriteJsonLine(const Json::Value& value, std::string& line) {
  static const Json::StreamWriterBuilder builder = MakeWriterBuilder();
  try {
    line = Json::writeString(builder, value);
    line += '\n';
    return true;
  } catch (const std::exception&) {
    return false;
  }
}

bool ReadJsonObject(std::string_view text, Json::Value& object) {
  static const Json::CharReaderBuilder builder = MakeReaderBuilder();
  if (IsLoose(text)) return false;
  try {
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    std::string errors;
    return reader->parse(text.data(), text.data() + text.size(), &object, &errors) &&
           object.isObject();
  } catch (const std::exception&) {
    // Nesting beyond the reader's limit, for one.
    return false;
  }
}

}  // namespace velaplatform
