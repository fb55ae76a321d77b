#include "command_line/option_values.h"

#include <charconv>

#include "command_line/file_name.h"

namespace vela {

namespace {

constexpr int kMaxSide = 65535;
constexpr int kMaxTurn = 360000;
constexpr double kMaxRadius = 50;
constexpr double kMaxSigma = 15;
constexpr double kMinSigma = 0.01;
constexpr double kMaxAmount = 100;

bool IsDigit(char character) {
  return character >= '0' && character <= '9';
}

/// Removes a fraction such as "0.8" or ".8" from the front of `text` and returns it.
std::optional<double> TakeFraction(std::string& text) {
  size_t length = 0;
  while (length < text.size() && (IsDigit(text[length]) || text[length] == '.')) {
    ++length;
  }
  double value = 0;
  const auto [end, error] =
      std::from_chars(text.data(), text.data() + length, value, std::chars_format::fixed);
  if (error != std::errc() || end != text.data() + length) {
    return std::nullopt;
  }
  text.erase(0, length);
  return value;
}

/// Removes `mark` and the fraction after it and stores that in `value`; without the mark, `value`
/// is unchanged.
bool TakeMarkedFraction(std::string& text, char mark, double& value) {
  if (text.empty() || text.front() != mark) {
    return true;
  }
  text.erase(0, 1);
  const std::optional<double> fraction = TakeFraction(text);
  if (fraction) {
    value = *fraction;
  }
  return fraction.has_value();
}

bool IsInRange(const UnsharpMask& mask) {
  return mask.radius <= kMaxRadius && mask.sigma >= kMinSigma && mask.sigma <= kMaxSigma &&
         mask.amount <= kMaxAmount && mask.threshold <= 1;
}

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

std::optional<UnsharpMask> ParseUnsharpMask(const std::string& text) {
  UnsharpMask mask;
  std::string rest = text;
  const std::optional<double> radius = TakeFraction(rest);
  if (!radius || !TakeMarkedFraction(rest, 'x', mask.sigma) ||
      !TakeMarkedFraction(rest, '+', mask.amount) ||
      !TakeMarkedFraction(rest, '+', mask.threshold) || !rest.empty()) {
    return std::nullopt;
  }
  mask.radius = *radius;
  if (!IsInRange(mask)) {
    return std::nullopt;
  }
  return mask;
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
