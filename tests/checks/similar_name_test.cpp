// Suggestions for misspelled names.
#include "checks/similar_name.h"

#include <gtest/gtest.h>

using namespace vela;

namespace {

const std::vector<std::string_view> kNames = {"size", "quality", "tool_timeout", "stall_timeout"};

TEST(SimilarName, IsTheOneWithTheFewestDifferences) {
  const std::pair<const char*, const char*> cases[] = {{"qualty", "quality"},
                                                       {"qualiyt", "quality"},
                                                       {"QUALITY", "quality"},
                                                       {"siez", "size"},
                                                       {"Size", "size"},
                                                       {"tool_time", "tool_timeout"},
                                                       {"tall_timeout", "stall_timeout"},
                                                       {"toll_timeout", "tool_timeout"}};
  for (const auto& [given, name] : cases) {
    EXPECT_EQ(FindSimilarName(given, kNames), name) << given;
  }
}

TEST(SimilarName, IsMissingWhenNoneIsSimilar) {
  for (const std::string given : {"", "x", "phase", "quantities", "timeout"}) {
    EXPECT_EQ(FindSimilarName(given, kNames), "") << given;
  }
  EXPECT_EQ(FindSimilarName(std::string(1000000, 'q'), kNames), "");
}

TEST(SimilarName, IsSuggestedInAMessage) {
  EXPECT_EQ(SuggestName("qualty", kNames), "; did you mean quality?");
  EXPECT_EQ(SuggestName("phase", kNames), "");
}

TEST(SimilarName, NamesAreListedWithCommas) {
  EXPECT_EQ(NameList(kNames), "size, quality, tool_timeout, stall_timeout");
  EXPECT_EQ(NameList({}), "");
}

}  // namespace
