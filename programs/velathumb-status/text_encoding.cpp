#include "text_encoding.h"

#include <glib.h>

#include <memory>

#include "posix/escaped_text.h"

namespace vela {

namespace {

struct GlibDeleter {
  void operator()(gchar* text) const { g_free(text); }
};
using GlibText = std::unique_ptr<gchar, GlibDeleter>;

gssize LengthOf(std::string_view bytes) {
  return static_cast<gssize>(bytes.size());
}

}  // namespace

std::string ToUtf8(std::string_view bytes) {
  return GlibText(g_utf8_make_valid(bytes.data(), LengthOf(bytes))).get();
}

bool IsUtf8(std::string_view bytes) {
  return g_utf8_validate(bytes.data(), LengthOf(bytes), nullptr) != FALSE;
}

std::string ToHtml(std::string_view bytes) {
  const std::string text = ToUtf8(bytes);
  return GlibText(g_markup_escape_text(text.data(), LengthOf(text))).get();
}

std::string ToBase64(std::string_view bytes) {
  const auto* data = reinterpret_cast<const guchar*>(bytes.data());
  return GlibText(g_base64_encode(data, bytes.size())).get();
}

std::string ToPlainLine(std::string_view bytes) {
  std::string text;
  text.reserve(bytes.size());
  for (const char c : bytes) {
    if (c == '\\') {
      text += '\\';
    }
    text += c;
  }
  return EscapeControls(text, InvalidBytes::kKeep);
}

}  // namespace vela
