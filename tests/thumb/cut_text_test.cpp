// Texts as a fixed-size buffer would hold them.
#include "posix/cut_text.h"

#include <gtest/gtest.h>

#include <string>

using namespace vela;

namespace vela_test {
namespace {

TEST(CutText, KeepsWhatFitsWithItsTerminator) {
  EXPECT_EQ("", CutText(""));
  EXPECT_EQ("abc", CutText("abc"));
  EXPECT_EQ(std::string(4095, 'a'), CutText(std::string(4095, 'a')));
}

TEST(CutText, CutsTheRest) {
  EXPECT_EQ(std::string(4095, 'a'), CutText(std::string(4095, 'a') + "b"));
  EXPECT_EQ(std::string(4095, 'a'), CutText(std::string(10000, 'a')));
}

TEST(CutText, KnowsOtherSizes) {
  EXPECT_EQ("abc", CutText("abcd", 4));
  EXPECT_EQ("abcd", CutText("abcd", 5));
  EXPECT_EQ("", CutText("abcd", 1));
}

}  // namespace
}  // namespace vela_test
