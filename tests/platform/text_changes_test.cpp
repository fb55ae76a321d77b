// Escaping percent signs, trimming white space.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "platform/velaindex.h"

namespace {

std::string Escaped(const char* in, size_t outSize) {
  std::vector<char> out(outSize + 1, '!');
  EscapePercentSign(in, out.data(), outSize);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  return out.data();
}

TEST(EscapePercentSignTest, DoublesEveryPercentSign) {
  EXPECT_EQ(Escaped("/100%/%d", 64), "/100%%/%%d");
  EXPECT_EQ(Escaped("%%", 64), "%%%%");
  EXPECT_EQ(Escaped("", 64), "");
  EXPECT_EQ(Escaped("plain \xff\n", 64), "plain \xff\n");
}

TEST(EscapePercentSignTest, CutsWhatDoesNotFit) {
  EXPECT_EQ(Escaped("abc", 4), "abc");
  EXPECT_EQ(Escaped("abc", 3), "ab");
  EXPECT_EQ(Escaped("abc", 1), "");
}

TEST(EscapePercentSignTest, NeverCutsBetweenThePair) {
  EXPECT_EQ(Escaped("a%b", 5), "a%%b");
  EXPECT_EQ(Escaped("a%b", 4), "a%%");
  EXPECT_EQ(Escaped("a%b", 3), "a");
  EXPECT_EQ(Escaped("%", 2), "");
}

TEST(EscapePercentSignTest, WritesNothingToAnEmptyBuffer) {
  char out = 'x';
  EscapePercentSign("abc", &out, 0);
  EXPECT_EQ(out, 'x');
  EscapePercentSign("abc", nullptr, 4);
  EXPECT_EQ(Escaped(nullptr, 4), "");
}

std::string TrimmedCopy(std::string text) {
  StringTrim(text.data());
  return text.c_str();
}

TEST(StringTrimTest, RemovesWhiteSpaceAtBothEnds) {
  EXPECT_EQ(TrimmedCopy(" \t\r\n\v\fa b\t \n"), "a b");
  EXPECT_EQ(TrimmedCopy("a"), "a");
  EXPECT_EQ(TrimmedCopy("  a"), "a");
  EXPECT_EQ(TrimmedCopy("a  "), "a");
}

TEST(StringTrimTest, LeavesNothingOfWhiteSpaceAlone) {
  EXPECT_EQ(TrimmedCopy(" \n"), "");
  EXPECT_EQ(TrimmedCopy(""), "");
}

TEST(StringTrimTest, KeepsOtherBytes) {
  EXPECT_EQ(TrimmedCopy(" \xa0\x85\x01 "), "\xa0\x85\x01");
  StringTrim(nullptr);
}

}  // namespace
