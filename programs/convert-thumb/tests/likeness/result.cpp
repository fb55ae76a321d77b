#include "likeness/result.h"

#include <array>
#include <cstdio>
#include <fstream>

#include "support/sandbox.h"

namespace vela_test {
namespace {

std::string DecibelsText(const LikenessResult& result) {
  std::array<char, 16> text = {};
  if (HasLikeness(result)) {
    std::snprintf(text.data(), text.size(), "%.1f", result.decibels);
  }
  return text.data();
}

std::string LineOf(const LikenessResult& result) {
  std::string line;
  for (const std::string& field :
       {result.format, result.description, result.vector, result.output,
        std::to_string(result.ourExit), std::to_string(result.theirExit), result.ourSize,
        result.theirSize, DecibelsText(result), result.differences}) {
    line += field + "\t";
  }
  return line + result.remark + "\n";
}

}  // namespace

bool HasLikeness(const LikenessResult& result) {
  return !result.ourSize.empty() && result.ourSize == result.theirSize;
}

std::string ResultsDirectory() {
  return LIKENESS_RESULTS;
}

void KeepResults(const std::string& testName, const std::vector<LikenessResult>& results) {
  std::ofstream file(std::string(kWritablePlace) + "/" + testName + ".tsv", std::ios::binary);
  for (const LikenessResult& result : results) {
    file << LineOf(result);
  }
}

}  // namespace vela_test
