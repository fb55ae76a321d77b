#include "text_encoding.h"

#include <glib.h>

#include <cstdio>
#include <memory>

namespace vela {

namespace {

struct GlibDeleter {
  void operator()(gchar* text) const { g_free(text); }
};
using GlibText = std::unique_ptr<gchar, GlibDeleter>;

gssize LengthOf(std::string_view bytes) {
  return static_cast<gssize>(bytes.size());
}

/// Returns the length of the first character, 1 for a byte that begins none.
size_t FirstLength(std::string_view bytes) {
  const gunichar character = g_utf8_get_char_validated(bytes.data(), LengthOf(bytes));
  constexpr gunichar kFirstError = static_cast<gunichar>(-2);
  return character >= kFirstError
             ? 1
             : static_cast<size_t>(g_utf8_skip[static_cast<unsigned char>(bytes.front())]);
}

/// Tells whether a terminal would act on the character or byte. The codes from 80 to 9f are
/// controls too, as characters and, for some terminals, as bytes.
bool IsControl(std::string_view piece) {
  const auto first = static_cast<unsigned char>(piece.front());
  const auto last = static_cast<unsigned char>(piece.back());
  const bool isHighControl = last >= 0x80 && last < 0xa0;
  if (piece.size() == 1) {
    return first < 0x20 || first == 0x7f || isHighControl;
  }
  return piece.size() == 2 && first == 0xc2 && isHighControl;
}

void AppendEscaped(std::string& line, std::string_view piece) {
  for (const char c : piece) {
    char escape[8] = "";
    std::snprintf(escape, sizeof escape, "\\x%02x",
                  static_cast<unsigned>(static_cast<unsigned char>(c)));
    line += escape;
  }
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
  std::string line;
  while (!bytes.empty()) {
    const std::string_view piece = bytes.substr(0, FirstLength(bytes));
    bytes.remove_prefix(piece.size());
    if (piece == "\n") {
      line += "\\n";
    } else if (piece == "\\") {
      line += "\\\\";
    } else if (IsControl(piece)) {
      AppendEscaped(line, piece);
    } else {
      line += piece;
    }
  }
  return line;
}

}  // namespace vela
