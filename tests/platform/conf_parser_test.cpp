// Sectioned configuration files.
#include <climits>

#include <array>

#include "platform/platform_fixture.h"
#include "platform/velautils.h"
#include "support/named_case.h"

namespace vela_test {
namespace {

constexpr const char* kFile = "/tmp/thumb.conf";
constexpr const char* kAbsent = "(default)";

class ConfParserTest : public SandboxTest {
 protected:
  bool Load(const std::string& text) {
    WriteFile(kFile, text);
    return parser_.loadFromFile(kFile);
  }

  std::string Value(const std::string& section, const std::string& key) {
    return parser_.getString(section, key, kAbsent);
  }

  VELAUtils::ConfParser parser_;
};

struct SyntaxCase : NamedCase {
  std::string text;
  Strings sections;
  std::vector<std::array<std::string, 3>> values;  ///< section, key, value
};

class ConfParserSyntax : public ConfParserTest, public testing::WithParamInterface<SyntaxCase> {};

TEST_P(ConfParserSyntax, IsRead) {
  ASSERT_TRUE(Load(GetParam().text));
  EXPECT_EQ(parser_.enumSections(), GetParam().sections);
  for (const auto& [section, key, value] : GetParam().values) {
    EXPECT_EQ(Value(section, key), value) << "[" << section << "] " << key;
  }
}

const std::string kLong(300, 'n');

const SyntaxCase kSyntaxCases[] = {
    {"SectionsAndPairs",
     "[thumb_s]\nsize = 120\nfilename=S.jpg\n\n[thumb_m]\nsize=320\n",
     {"thumb_s", "thumb_m"},
     {{"thumb_s", "size", "120"},
      {"thumb_s", "filename", "S.jpg"},
      {"thumb_m", "size", "320"},
      {"thumb_m", "filename", kAbsent},
      {"other", "size", kAbsent}}},
    {"SectionsInFileOrderAlsoWithoutKeys",
     "[z]\n[a]\nk=1\n[m]\n; nothing\n[b]",
     {"z", "a", "m", "b"},
     {}},
    {"SectionThatAppearsTwice",
     "[a]\nx=1\ny=2\n[b]\nx=3\n[a]\ny=4\nz=5\n",
     {"a", "b"},
     {{"a", "x", "1"}, {"a", "y", "4"}, {"a", "z", "5"}, {"b", "x", "3"}}},
    {"LastValueOfAKey", "[a]\nx=1\nx=2\nx=\n", {"a"}, {{"a", "x", ""}}},
    {"CaseSensitiveNames",
     "[Thumb]\nSize=1\nsize=2\n[thumb]\nsize=3\n",
     {"Thumb", "thumb"},
     {{"Thumb", "Size", "1"},
      {"Thumb", "size", "2"},
      {"thumb", "size", "3"},
      {"thumb", "SIZE", kAbsent}}},
    {"WhiteSpaceAroundNamesAndValues",
     "  [ thumb one ]  \r\n\t key one \t=\t value one \t\r\n  b=2\n",
     {"thumb one"},
     {{"thumb one", "key one", "value one"}, {"thumb one", "b", "2"}}},
    {"CommentsAndBlankLines",
     "; one\n# two\n\n   \n  ; three\n\t# four\n[a]\n;x=1\n#x=2\nx=3\n;[b]\n",
     {"a"},
     {{"a", "x", "3"}}},
    {"CommentMarksInValues",
     "[a]\nx=1 ; no comment\ny = 2 # neither\nz=;\nu=#\n",
     {"a"},
     {{"a", "x", "1 ; no comment"}, {"a", "y", "2 # neither"}, {"a", "z", ";"}, {"a", "u", "#"}}},
    {"EqualsSignsColonsQuotesAndBracketsInValues",
     "[a]\nx=a=b\ny=a:b\nz=\"q\"\nu=[v]\nw==\n",
     {"a"},
     {{"a", "x", "a=b"},
      {"a", "y", "a:b"},
      {"a", "z", "\"q\""},
      {"a", "u", "[v]"},
      {"a", "w", "="}}},
    {"KeyThatEndsAtTheEqualsSignOnly", "[a]\nb:c = d\n", {"a"}, {{"a", "b:c", "d"}}},
    {"IndentedLines",
     "[a]\nx=1\n  y=2\n\tz=3\n   [b]\n   x=4\n",
     {"a", "b"},
     {{"a", "x", "1"}, {"a", "y", "2"}, {"a", "z", "3"}, {"b", "x", "4"}}},
    {"KeysBeforeTheFirstSection",
     "x=1\n[a]\ny=2\n",
     {"a"},
     {{"a", "x", kAbsent}, {"", "x", kAbsent}}},
    {"ByteOrderMark", "\xEF\xBB\xBF[a]\nx=1\n", {"a"}, {{"a", "x", "1"}}},
    {"EmptyFile", "", {}, {}},
    {"BlankFile", "\n\n", {}, {}},
    {"ByteOrderMarkOnly", "\xEF\xBB\xBF", {}, {}},
    {"LongNamesThatDifferAtTheEnd",
     "[" + kLong + "1]\n" + kLong + "1=a\n" + kLong + "2=b\n[" + kLong + "2]\n" + kLong + "1=c\n",
     {kLong + "1", kLong + "2"},
     {{kLong + "1", kLong + "1", "a"},
      {kLong + "1", kLong + "2", "b"},
      {kLong + "2", kLong + "1", "c"}}},
    {"EveryByteInNamesAndValues",
     "[\xff%s]\n\xfe\x01=\xc3\xa9 %d\n",
     {"\xff%s"},
     {{"\xff%s", "\xfe\x01", "\xc3\xa9 %d"}}},
};

INSTANTIATE_TEST_SUITE_P(ConfParser, ConfParserSyntax, testing::ValuesIn(kSyntaxCases), CaseName());

TEST_F(ConfParserTest, IsEmptyBeforeAFileIsLoaded) {
  EXPECT_TRUE(parser_.enumSections().empty());
  EXPECT_EQ(Value("a", "b"), kAbsent);
  EXPECT_EQ(parser_.getInt("a", "b", 7), 7);
}

TEST_F(ConfParserTest, FailsForAnyOtherLine) {
  for (const char* line : {"word", "key: value", "[open", "[a]b", "[a] ; c", "[a]]", "]", "[]",
                           "[ ]", "= value", "=", "[a", "\xEF\xBB\xBFword"}) {
    EXPECT_FALSE(Load("[first]\nx=1\n" + std::string(line) + "\n[last]\ny=2\n")) << line;
    EXPECT_FALSE(Load(line)) << line;
  }
  EXPECT_FALSE(Load("[a]\n\xEF\xBB\xBF\n")) << "a mark anywhere but at the beginning";
  EXPECT_FALSE(Load(std::string("[a]\nx=1\0\n", 9))) << "a NUL byte";
}

TEST_F(ConfParserTest, FailsForFilesThatCannotBeRead) {
  for (const char* path : {"/tmp/absent", "/tmp", ""}) {
    EXPECT_FALSE(parser_.loadFromFile(path)) << path;
  }
}

TEST_F(ConfParserTest, HoldsNothingAfterAFailure) {
  ASSERT_TRUE(Load("[a]\nx=1\n"));
  EXPECT_FALSE(Load("[b]\nword\n"));
  EXPECT_TRUE(parser_.enumSections().empty());
  ASSERT_TRUE(Load("[c]\nx=1\n"));
  EXPECT_FALSE(parser_.loadFromFile("/tmp/absent"));
  EXPECT_TRUE(parser_.enumSections().empty());
}

TEST_F(ConfParserTest, HoldsTheLastFileLoaded) {
  ASSERT_TRUE(Load("[a]\nx=1\n"));
  ASSERT_TRUE(Load("[b]\ny=2\n"));
  EXPECT_EQ(parser_.enumSections(), Strings{"b"});
  EXPECT_EQ(Value("a", "x"), kAbsent);
}

TEST_F(ConfParserTest, ReadsLinesOfAnyLength) {
  for (const size_t length :
       {190U, 194U, 195U, 196U, 197U, 198U, 199U, 200U,  201U,   394U,    395U,
        396U, 397U, 398U, 399U, 400U, 790U, 799U, 1600U, 70000U, 2000000U}) {
    const std::string value(length, 'v');
    ASSERT_TRUE(Load("[a]\nx=" + value + "\ny=next\n[b]\nz=1\n; " + value + "\nu=2"));
    ASSERT_EQ(Value("a", "x"), value);
    ASSERT_EQ(Value("a", "y"), "next");
    ASSERT_EQ(Value("b", "z"), "1");
    ASSERT_EQ(Value("b", "u"), "2");
  }
}

TEST_F(ConfParserTest, ReadsManySectionsAndKeys) {
  std::string text;
  for (int i = 0; i < 500; ++i) {
    text += "[s" + std::to_string(i) + "]\nk=" + std::to_string(i) + "\n";
  }
  ASSERT_TRUE(Load(text));
  EXPECT_EQ(parser_.enumSections().size(), 500U);
  EXPECT_EQ(parser_.getInt("s499", "k", 0), 499);
}

TEST_F(ConfParserTest, ReadsTheLeadingDigitsOfIntegers) {
  constexpr int kDefault = -77;
  const struct {
    const char* value;
    int expected;
  } cases[] = {{"320", 320},
               {"-5", -5},
               {"+5", 5},
               {"007", 7},
               {"12px", 12},
               {"3.9", 3},
               {"1e3", 1},
               {"0x10", 0},
               {"2147483647", INT_MAX},
               {"2147483648", INT_MAX},
               {"-2147483648", INT_MIN},
               {"-99999999999999999999", INT_MIN},
               {"99999999999999999999", INT_MAX},
               {"+99999999999", INT_MAX}};
  for (const auto& [value, expected] : cases) {
    ASSERT_TRUE(Load(std::string("[a]\nx=") + value + "\n"));
    EXPECT_EQ(parser_.getInt("a", "x", kDefault), expected) << value;
  }
  for (const char* value : {"", "px", "-", "+", "+-5", "-+5", "--5", "- 5"}) {
    ASSERT_TRUE(Load(std::string("[a]\nx=") + value + "\n"));
    EXPECT_EQ(parser_.getInt("a", "x", kDefault), kDefault) << value;
  }
}

TEST_F(ConfParserTest, GivesTheDefaultForAbsentIntegers) {
  ASSERT_TRUE(Load("[a]\nx=1\n"));
  EXPECT_EQ(parser_.getInt("a", "y", 5), 5);
  EXPECT_EQ(parser_.getInt("b", "x", 6), 6);
}

TEST_F(ConfParserTest, CanBeUsedByThreadsAtOnce) {
  WriteFile(kFile, "[a]\nx=1\n[b]\nx=" + std::string(1000, 'v') + "\n");
  RunInThreads(4, [](int) {
    for (int round = 0; round < 200; ++round) {
      VELAUtils::ConfParser parser;
      EXPECT_TRUE(parser.loadFromFile(kFile));
      EXPECT_EQ(parser.getString("b", "x", ""), std::string(1000, 'v'));
    }
  });
}

TEST_F(ConfParserTest, LeavesNoDescriptorOpen) {
  ExpectNoDescriptorLeak([this] {
    for (int i = 0; i < 10; ++i) {
      Load("[a]\nx=1\n");
      Load("word\n");
      parser_.loadFromFile("/tmp");
    }
  });
}

}  // namespace
}  // namespace vela_test
