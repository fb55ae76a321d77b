// Thumbnail counts as an HTML page shows them.
#pragma once

#include <cstdint>
#include <string>

#include "status_report.h"

namespace vela {

/// The wanted thumbnails, each counted once.
struct ThumbShares {
  int64_t present = 0;
  int64_t missing = 0;  ///< missing or outdated, without a failure marker
  int64_t failed = 0;   ///< missing or outdated, with a failure marker

  int64_t Total() const { return present + missing + failed; }
  void Add(const ThumbShares& other);
};

/// Returns the shares of one photo.
ThumbShares SharesOf(const PhotoReport& photo);

/// Returns the number with its digits in groups of three.
std::string GroupDigits(int64_t number);

/// Returns the number with grouped digits and the singular or plural noun.
std::string CountText(int64_t number, const char* one, const char* many);

/// Returns a text like "12%": 0 and 100 only when they are exact. `total` is not 0.
std::string PercentText(int64_t part, int64_t total);

/// Returns a bar of the shares for the page; empty when there are no thumbnails. `cssClass` is the
/// class of its element.
std::string ShareBar(const ThumbShares& shares, const char* cssClass);

}  // namespace vela
