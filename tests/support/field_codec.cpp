#include "support/field_codec.h"

#include <cstdlib>

namespace vela_test {

std::string EncodeFields(const std::vector<std::string>& fields) {
  std::string text;
  for (const std::string& field : fields) {
    text += std::to_string(field.size()) + ":" + field;
  }
  return text;
}

bool NextField(const std::string& text, size_t* position, std::string* field) {
  const size_t colon = text.find(':', *position);
  if (colon == std::string::npos) {
    return false;
  }
  const size_t length = std::strtoull(text.c_str() + *position, nullptr, 10);
  if (length > text.size() - colon - 1) {
    return false;
  }
  *field = text.substr(colon + 1, length);
  *position = colon + 1 + length;
  return true;
}

std::vector<std::string> DecodeFields(const std::string& text) {
  std::vector<std::string> fields;
  size_t position = 0;
  std::string field;
  while (NextField(text, &position, &field)) {
    fields.push_back(field);
  }
  return fields;
}

}  // namespace vela_test
