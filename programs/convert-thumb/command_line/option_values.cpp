#include "command_line/option_values.h"

#include <strings.h>

#include <charconv>

namespace vela {

namespace {

constexpr int kLargestSide = 65535;
constexpr int kLargestTurn = 360000;
constexpr double kLargestRadius = 50;
constexpr double kLargestSigma = 15;
constexpr double kSmallestSigma = 0.01;
constexpr double kLargestAmount = 100;

bool IsDigit(char character) {
  return character >= '0' && character <= '9';
}

/// Reads a fraction such as "0.8" or ".8" off the front of `text`.
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

/// Reads `mark` and the fraction behind it into `value`, which stays when the mark is not there.
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

bool IsUsual(const UnsharpMask& mask) {
  return mask.radius <= kLargestRadius && mask.sigma >= kSmallestSigma &&
         mask.sigma <= kLargestSigma && mask.amount <= kLargestAmount && mask.threshold <= 1;
}

bool HasJpegExtension(const std::string& path) {
  const size_t dot = path.find_last_of("./");
  if (dot == std::string::npos || path[dot] != '.') {
    return false;
  }
  const char* extension = path.c_str() + dot + 1;
  return strcasecmp(extension, "jpg") == 0 || strcasecmp(extension, "jpeg") == 0;
}

}  // namespace

std::optional<int> ParseWholeNumber(const std::string& text, int least, int most) {
  int value = 0;
  const char* const last = text.data() + text.size();
  const auto [end, error] = std::from_chars(text.data(), last, value);
  if (error != std::errc() || end != last || text.front() == '-' || value < least || value > most) {
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
  const std::optional<int> width = ParseWholeNumber(text.substr(0, cross), 1, kLargestSide);
  const std::optional<int> height =
      ParseWholeNumber(text.substr(cross + 1, mark - cross - 1), 1, kLargestSide);
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
  if (!IsUsual(mask)) {
    return std::nullopt;
  }
  return mask;
}

std::optional<int> ParseQuarterTurns(const std::string& text) {
  const std::optional<int> degrees = ParseWholeNumber(text, 0, kLargestTurn);
  if (!degrees || *degrees % 90 != 0) {
    return std::nullopt;
  }
  return *degrees / 90 % 4;
}

std::optional<std::string> ParseOutputPath(const std::string& text) {
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
