// Texts truncated to the size of a buffer.
#include "posix/truncated_text.h"
#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

TEST(TruncatedText, KeepsWhatFitsWithItsTerminator) {
  EXPECT_EQ(Truncated(""), "");
  EXPECT_EQ(Truncated("abc"), "abc");
  EXPECT_EQ(Truncated(std::string(4095, 'a')), std::string(4095, 'a'));
}

TEST(TruncatedText, DropsTheRest) {
  EXPECT_EQ(Truncated(std::string(4095, 'a') + "b"), std::string(4095, 'a'));
  EXPECT_EQ(Truncated(std::string(10000, 'a')), std::string(4095, 'a'));
}

TEST(TruncatedText, AcceptsOtherSizes) {
  EXPECT_EQ(Truncated("abcd", 4), "abc");
  EXPECT_EQ(Truncated("abcd", 5), "abcd");
  EXPECT_EQ(Truncated("abcd", 1), "");
}

}  // namespace
}  // namespace vela_test
