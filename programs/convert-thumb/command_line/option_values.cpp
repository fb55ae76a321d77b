#include "command_line/option_values.h"

#include <charconv>

#include "command_line/file_name.h"
#include "configuration/profile_values.h"
#include "platform/system_rules.h"

namespace vela {

namespace {

constexpr int kMaxTurn = 360000;

bool HasJpegExtension(const std::string& path) {
  const std::string_view extension = ExtensionOf(path);
  return EqualsIgnoringCase(extension, "jpg") || EqualsIgnoringCase(extension, "jpeg");
}

}  // namespace

std::optional<int> ParseWholeNumber(const std::string& text, int min, int max) {
  int value = 0;
  const char* const last = text.data() + text.size();
  const auto [end, error] = std::from_chars(text.data(), last, value);
  if (error != std::errc() || end != last || text.front() == '-' || value < min || value > max) {
    return std::nullopt;
  }
  return value;
}

std::optional<ThumbnailBox> ParseThumbnailBox(const std::string& text) {
  const size_t cross = text.find('x');
  const size_t mark = text.find('>');
  if (cross == std::string::npos || mark == std::string::npos || mark < cross) {
    return std::nullopt;
  }
  const std::string flags = text.substr(mark);
  if (flags != ">" && flags != ">^") {
    return std::nullopt;
  }
  const std::optional<int> width = ParseWholeNumber(text.substr(0, cross), 1, kMaxSide);
  const std::optional<int> height =
      ParseWholeNumber(text.substr(cross + 1, mark - cross - 1), 1, kMaxSide);
  if (!width || !height) {
    return std::nullopt;
  }
  return ThumbnailBox{*width, *height, flags == ">^"};
}

std::optional<int> ParseQuarterTurns(const std::string& text) {
  const std::optional<int> degrees = ParseWholeNumber(text, 0, kMaxTurn);
  if (!degrees || *degrees % 90 != 0) {
    return std::nullopt;
  }
  return *degrees / 90 % 4;
}

std::optional<std::string> ParseOutputPath(const std::string& text) {
  if (text == kDiscardedOutput) {
    return text.substr(text.find('/'));
  }
  std::string path;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] == '%') {
      ++i;
      if (i == text.size() || text[i] != '%') {
        return std::nullopt;
      }
    }
    path += text[i];
  }
  if (!HasJpegExtension(path)) {
    return std::nullopt;
  }
  return path;
}

}  // namespace vela
