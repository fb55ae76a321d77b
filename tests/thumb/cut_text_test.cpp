// Texts as a fixed-size buffer would hold them.
#include "posix/cut_text.h"
#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

TEST(CutText, KeepsWhatFitsWithItsTerminator) {
  EXPECT_EQ(CutText(""), "");
  EXPECT_EQ(CutText("abc"), "abc");
  EXPECT_EQ(CutText(std::string(4095, 'a')), std::string(4095, 'a'));
}

TEST(CutText, CutsTheRest) {
  EXPECT_EQ(CutText(std::string(4095, 'a') + "b"), std::string(4095, 'a'));
  EXPECT_EQ(CutText(std::string(10000, 'a')), std::string(4095, 'a'));
}

TEST(CutText, KnowsOtherSizes) {
  EXPECT_EQ(CutText("abcd", 4), "abc");
  EXPECT_EQ(CutText("abcd", 5), "abcd");
  EXPECT_EQ(CutText("abcd", 1), "");
}

}  // namespace
}  // namespace vela_test
