#include "posix/escaped_text.h"

#include <cstddef>

namespace vela {

namespace {

unsigned char ByteAt(std::string_view text, size_t index) {
  return static_cast<unsigned char>(text[index]);
}

/// Returns the length of a character by its first byte, 0 when no character begins with it.
size_t LengthByFirstByte(unsigned char first) {
  if (first < 0x80) {
    return 1;
  }
  if (first >= 0xc2 && first < 0xe0) {
    return 2;
  }
  if (first >= 0xe0 && first < 0xf0) {
    return 3;
  }
  return first >= 0xf0 && first < 0xf5 ? 4 : 0;
}

/// Returns whether the two bytes begin neither an overlong form nor a surrogate nor a value beyond
/// the last character.
bool IsValidStart(unsigned char first, unsigned char second) {
  switch (first) {
    case 0xe0:
      return second >= 0xa0;
    case 0xed:
      return second < 0xa0;
    case 0xf0:
      return second >= 0x90;
    case 0xf4:
      return second < 0x90;
    default:
      return true;
  }
}

/// Returns the length of the UTF-8 character that `text` begins with, 0 when it does not begin with
/// one.
size_t CharacterLength(std::string_view text) {
  const size_t length = LengthByFirstByte(ByteAt(text, 0));
  if (length == 0 || text.size() < length) {
    return 0;
  }
  if (length > 1 && !IsValidStart(ByteAt(text, 0), ByteAt(text, 1))) {
    return 0;
  }
  for (size_t i = 1; i < length; ++i) {
    if ((ByteAt(text, i) & 0xc0) != 0x80) {
      return 0;
    }
  }
  return length;
}

bool IsHighControl(unsigned char byte) {
  return byte >= 0x80 && byte < 0xa0;
}

/// Returns whether a character of three bytes is invisible: it separates lines, changes the
/// direction of the text, has no width or is a byte order mark.
bool IsInvisibleFormat(std::string_view character) {
  const std::string_view end = character.substr(1);
  if (character == "\xef\xbb\xbf") {
    return true;
  }
  return character.front() == '\xe2' &&
         ((end >= "\x80\x8b" && end <= "\x80\x8f") || (end >= "\x80\xa8" && end <= "\x80\xae") ||
          (end >= "\x81\xa6" && end <= "\x81\xa9"));
}

/// `character` is one valid UTF-8 character.
bool IsControl(std::string_view character) {
  const unsigned char first = ByteAt(character, 0);
  if (character.size() == 1) {
    return first < 0x20 || first == 0x7f;
  }
  if (character.size() == 3) {
    return IsInvisibleFormat(character);
  }
  return first == 0xc2 && IsHighControl(ByteAt(character, 1));
}

void AppendEscaped(std::string& text, std::string_view bytes) {
  if (bytes == "\n") {
    text += "\\n";
    return;
  }
  constexpr char kDigits[] = "0123456789abcdef";
  for (size_t i = 0; i < bytes.size(); ++i) {
    text += "\\x";
    text += kDigits[ByteAt(bytes, i) / 16];
    text += kDigits[ByteAt(bytes, i) % 16];
  }
}

}  // namespace

std::string EscapeControls(std::string_view text, InvalidBytes invalidBytes) {
  std::string escaped;
  escaped.reserve(text.size());
  while (!text.empty()) {
    const size_t length = CharacterLength(text);
    const std::string_view piece = text.substr(0, length == 0 ? 1 : length);
    const bool isEscaped =
        length == 0 ? invalidBytes == InvalidBytes::kEscape || IsHighControl(ByteAt(piece, 0))
                    : IsControl(piece);
    if (isEscaped) {
      AppendEscaped(escaped, piece);
    } else {
      escaped += piece;
    }
    text.remove_prefix(piece.size());
  }
  return escaped;
}

}  // namespace vela
