#include <cstring>
#include <string_view>

#include "configuration/white_space.h"
#include "platform/velaindex.h"

void EscapePercentSign(const char* in, char* out, size_t outSize) {
  if (out == nullptr || outSize == 0) {
    return;
  }
  size_t left = outSize - 1;
  for (const char* c = in == nullptr ? "" : in; *c != '\0'; ++c) {
    const size_t length = *c == '%' ? 2 : 1;
    if (length > left) {
      break;
    }
    memset(out, *c, length);
    out += length;
    left -= length;
  }
  *out = '\0';
}

void StringTrim(char* text) {
  if (text == nullptr) {
    return;
  }
  const std::string_view trimmed = vela::Trimmed(text);
  memmove(text, trimmed.data(), trimmed.size());
  text[trimmed.size()] = '\0';
}
