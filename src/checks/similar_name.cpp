#include "checks/similar_name.h"

#include <algorithm>
#include <cstddef>
#include <numeric>
#include <utility>

namespace vela {

namespace {

char LowerCase(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// Returns how many bytes have to be inserted, removed or replaced to turn `a` into `b`; two
/// adjacent bytes in the wrong order count as one.
size_t EditDistance(std::string_view a, std::string_view b) {
  std::vector<size_t> beforeLast(b.size() + 1);
  std::vector<size_t> last(b.size() + 1);
  std::vector<size_t> row(b.size() + 1);
  std::iota(last.begin(), last.end(), size_t{0});
  const auto equal = [&](size_t i, size_t j) { return LowerCase(a[i]) == LowerCase(b[j]); };
  for (size_t i = 0; i < a.size(); ++i) {
    row[0] = i + 1;
    for (size_t j = 0; j < b.size(); ++j) {
      row[j + 1] = std::min({last[j + 1] + 1, row[j] + 1, last[j] + (equal(i, j) ? 0 : 1)});
      const bool isSwapped = i > 0 && j > 0 && equal(i, j - 1) && equal(i - 1, j);
      if (isSwapped) {
        row[j + 1] = std::min(row[j + 1], beforeLast[j - 1] + 1);
      }
    }
    std::swap(beforeLast, last);
    std::swap(last, row);
  }
  return last[b.size()];
}

}  // namespace

std::string_view FindSimilarName(std::string_view given,
                                 const std::vector<std::string_view>& names) {
  constexpr size_t kLongest = 64;
  constexpr size_t kShareOfName = 3;
  if (given.size() > kLongest) {
    return {};
  }
  std::string_view similar;
  size_t least = 0;
  for (const std::string_view name : names) {
    const size_t distance = EditDistance(given, name);
    const bool isSimilar = distance <= name.size() / kShareOfName;
    if (isSimilar && (similar.empty() || distance < least)) {
      similar = name;
      least = distance;
    }
  }
  return similar;
}

std::string NameList(const std::vector<std::string_view>& names) {
  std::string list;
  for (const std::string_view name : names) {
    list += (list.empty() ? "" : ", ") + std::string(name);
  }
  return list;
}

std::string SuggestName(std::string_view given, const std::vector<std::string_view>& names) {
  const std::string_view similar = FindSimilarName(given, names);
  return similar.empty() ? std::string() : "; did you mean " + std::string(similar) + '?';
}

}  // namespace vela
