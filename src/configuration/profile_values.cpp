#include "configuration/profile_values.h"

#include <charconv>
#include <cstddef>
#include <system_error>

namespace vela {

namespace {

constexpr double kMaxRadius = 50;
constexpr double kMaxSigma = 15;
constexpr double kMinSigma = 0.01;
constexpr double kMaxAmount = 100;

bool IsDigit(char character) {
  return character >= '0' && character <= '9';
}

/// Removes a fraction such as "0.8" or ".8" from the front of `text` and returns it.
std::optional<double> TakeFraction(std::string_view& text) {
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
  text.remove_prefix(length);
  return value;
}

/// Removes `mark` and the fraction after it and stores that in `value`; without the mark, `value`
/// is unchanged.
bool TakeMarkedFraction(std::string_view& text, char mark, double& value) {
  if (text.empty() || text.front() != mark) {
    return true;
  }
  text.remove_prefix(1);
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

}  // namespace

std::optional<UnsharpMask> ParseUnsharpMask(std::string_view text) {
  UnsharpMask mask;
  const std::optional<double> radius = TakeFraction(text);
  if (!radius || !TakeMarkedFraction(text, 'x', mask.sigma) ||
      !TakeMarkedFraction(text, '+', mask.amount) ||
      !TakeMarkedFraction(text, '+', mask.threshold) || !text.empty()) {
    return std::nullopt;
  }
  mask.radius = *radius;
  if (!IsInRange(mask)) {
    return std::nullopt;
  }
  return mask;
}

}  // namespace vela
