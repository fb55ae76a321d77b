// Text made safe for a terminal or a log line.
#include "posix/escaped_text.h"

#include <gtest/gtest.h>

#include <string>

using namespace vela;

namespace vela_test {
namespace {

struct EscapeCase {
  const char* text;
  const char* kept;     ///< with InvalidBytes::kKeep
  const char* escaped;  ///< with InvalidBytes::kEscape
};

TEST(EscapedText, EscapesControlsAndOnRequestInvalidBytes) {
  constexpr EscapeCase kCases[] = {
      {"", "", ""},
      {"plain \\ \"text\"", "plain \\ \"text\"", "plain \\ \"text\""},
      {"a\nb\t\x1b\x7f", "a\\nb\\x09\\x1b\\x7f", "a\\nb\\x09\\x1b\\x7f"},
      // Characters of two, three and four bytes.
      {"\xc3\xa4 \xe2\x82\xac \xf0\x9f\x93\xb7", "\xc3\xa4 \xe2\x82\xac \xf0\x9f\x93\xb7",
       "\xc3\xa4 \xe2\x82\xac \xf0\x9f\x93\xb7"},
      // The controls from 80 to 9f, as characters and as bytes.
      {"\xc2\x9b \xc2\xa0 \x9b", "\\xc2\\x9b \xc2\xa0 \\x9b", "\\xc2\\x9b \xc2\xa0 \\x9b"},
      // Line and paragraph separators and direction marks; their neighbours are kept.
      {"\xe2\x80\xa8 \xe2\x80\xa9 \xe2\x80\xae \xe2\x81\xa6 \xe2\x80\x8f",
       "\\xe2\\x80\\xa8 \\xe2\\x80\\xa9 \\xe2\\x80\\xae \\xe2\\x81\\xa6 \\xe2\\x80\\x8f",
       "\\xe2\\x80\\xa8 \\xe2\\x80\\xa9 \\xe2\\x80\\xae \\xe2\\x81\\xa6 \\xe2\\x80\\x8f"},
      // Characters without a width, and a byte order mark; their neighbours are kept.
      {"\xe2\x80\x8b\xe2\x80\x8c\xe2\x80\x8d \xef\xbb\xbf",
       "\\xe2\\x80\\x8b\\xe2\\x80\\x8c\\xe2\\x80\\x8d \\xef\\xbb\\xbf",
       "\\xe2\\x80\\x8b\\xe2\\x80\\x8c\\xe2\\x80\\x8d \\xef\\xbb\\xbf"},
      {"\xe2\x80\x8a\xe2\x80\x90\xef\xbb\xbe", "\xe2\x80\x8a\xe2\x80\x90\xef\xbb\xbe",
       "\xe2\x80\x8a\xe2\x80\x90\xef\xbb\xbe"},
      {"\xe2\x80\xa7\xe2\x80\xaf\xe2\x81\xaa", "\xe2\x80\xa7\xe2\x80\xaf\xe2\x81\xaa",
       "\xe2\x80\xa7\xe2\x80\xaf\xe2\x81\xaa"},
      // A byte that cannot begin a character, a truncated character, one followed by another
      // character.
      {"\xff", "\xff", "\\xff"},
      {"\xe2\xac", "\xe2\xac", "\\xe2\\xac"},
      {"\xc3 x", "\xc3 x", "\\xc3 x"},
      // Overlong forms, a surrogate, a value beyond the last character.
      {"\xc0\xaf", "\xc0\xaf", "\\xc0\\xaf"},
      {"\xe0\xa0\x80 \xe0\xbf", "\xe0\xa0\x80 \xe0\xbf", "\xe0\xa0\x80 \\xe0\\xbf"},
      {"\xed\xa0\xa0", "\xed\xa0\xa0", "\\xed\\xa0\\xa0"},
      {"\xf0\x8f\xbf\xbf", "\xf0\\x8f\xbf\xbf", "\\xf0\\x8f\\xbf\\xbf"},
      {"\xf4\x90\xa0\xa0", "\xf4\\x90\xa0\xa0", "\\xf4\\x90\\xa0\\xa0"},
      {"\xf5\xa0\xa0\xa0", "\xf5\xa0\xa0\xa0", "\\xf5\\xa0\\xa0\\xa0"},
  };
  for (const EscapeCase& test : kCases) {
    EXPECT_EQ(EscapeControls(test.text, InvalidBytes::kKeep), test.kept);
    EXPECT_EQ(EscapeControls(test.text, InvalidBytes::kEscape), test.escaped);
  }
}

TEST(EscapedText, EscapesANullByte) {
  EXPECT_EQ(EscapeControls(std::string_view("a\0b", 3), InvalidBytes::kKeep), "a\\x00b");
}

}  // namespace
}  // namespace vela_test
