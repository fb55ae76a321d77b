#include "json_object.h"

#include <json/reader.h>
#include <json/value.h>

#include <exception>
#include <memory>
#include <new>
#include <string>

namespace {

Json::CharReaderBuilder MakeReaderBuilder() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["skipBom"] = false;
  return builder;
}

/// Walks over text from its front.
class Scanner {
 public:
  explicit Scanner(std::string_view text) : rest_(text) {}

  bool IsAtEnd() const { return rest_.empty(); }
  char Front() const { return rest_.empty() ? '\0' : rest_.front(); }
  void Skip() { rest_.remove_prefix(1); }

  /// Takes the next character if it is one of these.
  bool Take(std::string_view characters) {
    const bool isOne = !rest_.empty() && characters.find(rest_.front()) != std::string_view::npos;
    if (isOne) Skip();
    return isOne;
  }

  /// Takes digits; whether there were any.
  bool TakeDigits() {
    const size_t before = rest_.size();
    while (Take("0123456789")) {
    }
    return rest_.size() < before;
  }

  /// Takes a string that begins here, up to the end of the text when it has none.
  void TakeString() {
    Skip();
    while (!rest_.empty() && !Take("\"")) {
      const bool isEscape = Take("\\");
      if (!isEscape || !rest_.empty()) Skip();
    }
  }

  /// Takes a number that begins here; whether it is one.
  bool TakeNumber() {
    Take("-");
    if (!Take("0") && !TakeDigits()) return false;
    if (Take(".") && !TakeDigits()) return false;
    if (Take("eE")) {
      Take("+-");
      if (!TakeDigits()) return false;
    }
    return IsAtEnd() || std::string_view("+-.0123456789eE").find(Front()) == std::string_view::npos;
  }

 private:
  std::string_view rest_;
};

/// Returns whether the text has none of what the reader lets pass although it is no JSON: comments
/// inside an object, a lone sign as a number, leading zeros.
bool IsStrict(std::string_view text) {
  Scanner scanner(text);
  while (!scanner.IsAtEnd()) {
    const char c = scanner.Front();
    const bool isNumber = c == '-' || c == '+' || (c >= '0' && c <= '9');
    if (c == '/' || (isNumber && !scanner.TakeNumber())) return false;
    if (c == '"') {
      scanner.TakeString();
    } else if (!isNumber) {
      scanner.Skip();
    }
  }
  return true;
}

}  // namespace

bool ReadJsonObject(std::string_view text, Json::Value& object) {
  static const Json::CharReaderBuilder builder = MakeReaderBuilder();
  if (!IsStrict(text)) return false;
  try {
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    return reader->parse(text.data(), text.data() + text.size(), &object, nullptr) &&
           object.isObject();
  } catch (const std::bad_alloc&) {
    throw;
  } catch (const std::exception&) {
    // Nesting beyond the reader's limit, for one.
    return false;
  }
}
