#include "html_counts.h"

#include <algorithm>
#include <cmath>

namespace vela {

namespace {

std::string Segment(const char* cssClass, int64_t part) {
  if (part == 0) {
    return std::string();
  }
  return std::string("<span class=\"") + cssClass + "\" style=\"flex-grow:" + std::to_string(part) +
         "\"></span>";
}

}  // namespace

void ThumbShares::Add(const ThumbShares& other) {
  present += other.present;
  missing += other.missing;
  failed += other.failed;
}

ThumbShares SharesOf(const PhotoReport& photo) {
  ThumbShares shares;
  for (size_t size = 0; size < photo.thumbs.states.size(); ++size) {
    switch (photo.thumbs.states[size]) {
      case ThumbState::kNotWanted:
        break;
      case ThumbState::kPresent:
        ++shares.present;
        break;
      case ThumbState::kMissing:
      case ThumbState::kOutdated:
        ++(photo.failures[size] ? shares.failed : shares.missing);
        break;
    }
  }
  return shares;
}

std::string GroupDigits(int64_t number) {
  std::string digits = std::to_string(number);
  for (size_t end = digits.size(); end > 3; end -= 3) {
    digits.insert(end - 3, 1, ',');
  }
  return digits;
}

std::string CountText(int64_t number, const char* one, const char* many) {
  return GroupDigits(number) + ' ' + (number == 1 ? one : many);
}

std::string PercentText(int64_t part, int64_t total) {
  if (part == 0 || part == total) {
    return part == 0 ? "0%" : "100%";
  }
  const double share = 100.0 * static_cast<double>(part) / static_cast<double>(total);
  return std::to_string(std::clamp(std::lround(share), 1L, 99L)) + '%';
}

std::string ShareBar(const ThumbShares& shares, const char* cssClass) {
  if (shares.Total() == 0) {
    return std::string();
  }
  return std::string("<div class=\"") + cssClass +
         "\" role=\"img\" aria-label=\"Thumbnails: " + GroupDigits(shares.present) + " present, " +
         GroupDigits(shares.missing) + " missing, " + GroupDigits(shares.failed) + " failed\">" +
         Segment("present", shares.present) + Segment("missing", shares.missing) +
         Segment("failed", shares.failed) + "</div>\n";
}

}  // namespace vela
