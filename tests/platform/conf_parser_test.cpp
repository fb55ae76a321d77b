// Sectioned configuration files.
#include <sys/stat.h>

#include <climits>
#include <string>
#include <thread>
#include <vector>

#include "platform/forked_call.h"
#include "platform/velautils.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace {

using Names = std::vector<std::string>;

constexpr const char* kFile = "/tmp/thumb.conf";

class ConfParserTest : public vela_test::SandboxTest {
 protected:
  bool Load(const std::string& text) {
    vela_test::WriteFile(kFile, text);
    return parser_.loadFromFile(kFile);
  }

  std::string Value(const std::string& section, const std::string& key) {
    return parser_.getString(section, key, "(default)");
  }

  VELAUtils::ConfParser parser_;
};

TEST_F(ConfParserTest, ReadsSectionsAndPairs) {
  ASSERT_TRUE(Load("[thumb_s]\nsize = 120\nfilename=S.jpg\n\n[thumb_m]\nsize=320\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"thumb_s", "thumb_m"}));
  EXPECT_EQ(Value("thumb_s", "size"), "120");
  EXPECT_EQ(Value("thumb_s", "filename"), "S.jpg");
  EXPECT_EQ(Value("thumb_m", "size"), "320");
  EXPECT_EQ(Value("thumb_m", "filename"), "(default)");
  EXPECT_EQ(Value("other", "size"), "(default)");
}

TEST_F(ConfParserTest, IsEmptyBeforeAFileIsLoaded) {
  EXPECT_TRUE(parser_.enumSections().empty());
  EXPECT_EQ(Value("a", "b"), "(default)");
  EXPECT_EQ(parser_.getInt("a", "b", 7), 7);
}

TEST_F(ConfParserTest, ListsSectionsInFileOrderAlsoWithoutKeys) {
  ASSERT_TRUE(Load("[z]\n[a]\nk=1\n[m]\n; nothing\n[b]"));
  EXPECT_EQ(parser_.enumSections(), (Names{"z", "a", "m", "b"}));
}

TEST_F(ConfParserTest, JoinsASectionThatAppearsTwice) {
  ASSERT_TRUE(Load("[a]\nx=1\ny=2\n[b]\nx=3\n[a]\ny=4\nz=5\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"a", "b"}));
  EXPECT_EQ(Value("a", "x"), "1");
  EXPECT_EQ(Value("a", "y"), "4");
  EXPECT_EQ(Value("a", "z"), "5");
  EXPECT_EQ(Value("b", "x"), "3");
}

TEST_F(ConfParserTest, LastValueOfAKeyHolds) {
  ASSERT_TRUE(Load("[a]\nx=1\nx=2\nx=\n"));
  EXPECT_EQ(Value("a", "x"), "");
}

TEST_F(ConfParserTest, NamesAreCaseSensitive) {
  ASSERT_TRUE(Load("[Thumb]\nSize=1\nsize=2\n[thumb]\nsize=3\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"Thumb", "thumb"}));
  EXPECT_EQ(Value("Thumb", "Size"), "1");
  EXPECT_EQ(Value("Thumb", "size"), "2");
  EXPECT_EQ(Value("thumb", "size"), "3");
  EXPECT_EQ(Value("thumb", "SIZE"), "(default)");
}

TEST_F(ConfParserTest, DropsWhiteSpaceAroundNamesAndValues) {
  ASSERT_TRUE(Load("  [ thumb one ]  \r\n\t key one \t=\t value one \t\r\n  b=2\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"thumb one"}));
  EXPECT_EQ(Value("thumb one", "key one"), "value one");
  EXPECT_EQ(Value("thumb one", "b"), "2");
}

TEST_F(ConfParserTest, SkipsCommentsAndBlankLines) {
  ASSERT_TRUE(Load("; one\n# two\n\n   \n  ; three\n\t# four\n[a]\n;x=1\n#x=2\nx=3\n;[b]\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"a"}));
  EXPECT_EQ(Value("a", "x"), "3");
}

TEST_F(ConfParserTest, KeepsCommentMarksInValues) {
  ASSERT_TRUE(Load("[a]\nx=1 ; no comment\ny = 2 # neither\nz=;\nu=#\n"));
  EXPECT_EQ(Value("a", "x"), "1 ; no comment");
  EXPECT_EQ(Value("a", "y"), "2 # neither");
  EXPECT_EQ(Value("a", "z"), ";");
  EXPECT_EQ(Value("a", "u"), "#");
}

TEST_F(ConfParserTest, KeepsEqualsSignsColonsQuotesAndBracketsInValues) {
  ASSERT_TRUE(Load("[a]\nx=a=b\ny=a:b\nz=\"q\"\nu=[v]\nw==\n"));
  EXPECT_EQ(Value("a", "x"), "a=b");
  EXPECT_EQ(Value("a", "y"), "a:b");
  EXPECT_EQ(Value("a", "z"), "\"q\"");
  EXPECT_EQ(Value("a", "u"), "[v]");
  EXPECT_EQ(Value("a", "w"), "=");
}

TEST_F(ConfParserTest, EndsAKeyAtTheEqualsSignOnly) {
  ASSERT_TRUE(Load("[a]\nb:c = d\n"));
  EXPECT_EQ(Value("a", "b:c"), "d");
}

TEST_F(ConfParserTest, DoesNotJoinIndentedLines) {
  ASSERT_TRUE(Load("[a]\nx=1\n  y=2\n\tz=3\n   [b]\n   x=4\n"));
  EXPECT_EQ(Value("a", "x"), "1");
  EXPECT_EQ(Value("a", "y"), "2");
  EXPECT_EQ(Value("a", "z"), "3");
  EXPECT_EQ(Value("b", "x"), "4");
}

TEST_F(ConfParserTest, IgnoresKeysBeforeTheFirstSection) {
  ASSERT_TRUE(Load("x=1\n[a]\ny=2\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"a"}));
  EXPECT_EQ(Value("a", "x"), "(default)");
  EXPECT_EQ(Value("", "x"), "(default)");
}

TEST_F(ConfParserTest, ToleratesAByteOrderMark) {
  ASSERT_TRUE(Load("\xEF\xBB\xBF[a]\nx=1\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{"a"}));
  EXPECT_EQ(Value("a", "x"), "1");
}

TEST_F(ConfParserTest, LoadsAnEmptyFile) {
  EXPECT_TRUE(Load(""));
  EXPECT_TRUE(parser_.enumSections().empty());
  EXPECT_TRUE(Load("\n\n"));
  EXPECT_TRUE(Load("\xEF\xBB\xBF"));
}

TEST_F(ConfParserTest, FailsForLinesThatAreNothingOfThis) {
  for (const char* line : {"word", "key: value", "[open", "[a]b", "[a] ; c", "[a]]", "]", "[]",
                           "[ ]", "= value", "=", "[a", "\xEF\xBB\xBFword"}) {
    EXPECT_FALSE(Load("[first]\nx=1\n" + std::string(line) + "\n[last]\ny=2\n")) << line;
    EXPECT_FALSE(Load(line)) << line;
  }
  EXPECT_FALSE(Load("[a]\n\xEF\xBB\xBF\n")) << "a mark anywhere but at the beginning";
  EXPECT_FALSE(Load(std::string("[a]\nx=1\0\n", 9))) << "a byte that no text has";
}

TEST_F(ConfParserTest, FailsForFilesThatCannotBeRead) {
  EXPECT_FALSE(parser_.loadFromFile("/tmp/absent"));
  EXPECT_FALSE(parser_.loadFromFile("/tmp"));
  EXPECT_FALSE(parser_.loadFromFile(""));
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
  EXPECT_EQ(parser_.enumSections(), (Names{"b"}));
  EXPECT_EQ(Value("a", "x"), "(default)");
}

TEST_F(ConfParserTest, TellsLongNamesApart) {
  const std::string common(300, 'n');
  ASSERT_TRUE(Load("[" + common + "1]\n" + common + "1=a\n" + common + "2=b\n[" + common + "2]\n" +
                   common + "1=c\n"));
  EXPECT_EQ(parser_.enumSections(), (Names{common + "1", common + "2"}));
  EXPECT_EQ(Value(common + "1", common + "1"), "a");
  EXPECT_EQ(Value(common + "1", common + "2"), "b");
  EXPECT_EQ(Value(common + "2", common + "1"), "c");
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

TEST_F(ConfParserTest, KeepsEveryByteOfNamesAndValues) {
  ASSERT_TRUE(Load("[\xff%s]\n\xfe\x01=\xc3\xa9 %d\n"));
  EXPECT_EQ(Value("\xff%s", "\xfe\x01"), "\xc3\xa9 %d");
}

struct IntCase {
  const char* value;
  int expected;
};

constexpr int kDefault = -77;
constexpr IntCase kInts[] = {
    {"320", 320},
    {"-5", -5},
    {"+5", 5},
    {"007", 7},
    {"12px", 12},
    {"3.9", 3},
    {"1e3", 1},
    {"0x10", 0},
    {"", kDefault},
    {"px", kDefault},
    {"-", kDefault},
    {"+", kDefault},
    {"+-5", kDefault},
    {"-+5", kDefault},
    {"--5", kDefault},
    {"- 5", kDefault},
    {"2147483647", INT_MAX},
    {"2147483648", INT_MAX},
    {"-2147483648", INT_MIN},
    {"-99999999999999999999", INT_MIN},
    {"99999999999999999999", INT_MAX},
    {"+99999999999", INT_MAX},
};

TEST_F(ConfParserTest, ReadsTheLeadingDigitsOfIntegers) {
  for (const IntCase& one : kInts) {
    ASSERT_TRUE(Load(std::string("[a]\nx=") + one.value + "\n"));
    EXPECT_EQ(parser_.getInt("a", "x", kDefault), one.expected) << one.value;
  }
}

TEST_F(ConfParserTest, GivesTheDefaultForAbsentIntegers) {
  ASSERT_TRUE(Load("[a]\nx=1\n"));
  EXPECT_EQ(parser_.getInt("a", "y", 5), 5);
  EXPECT_EQ(parser_.getInt("b", "x", 6), 6);
}

TEST_F(ConfParserTest, CanBeUsedByThreadsAtOnce) {
  vela_test::WriteFile(kFile, "[a]\nx=1\n[b]\nx=" + std::string(1000, 'v') + "\n");
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int round = 0; round < 200; ++round) {
        VELAUtils::ConfParser parser;
        EXPECT_TRUE(parser.loadFromFile(kFile));
        EXPECT_EQ(parser.getString("b", "x", ""), std::string(1000, 'v'));
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST_F(ConfParserTest, LeavesNoDescriptorOpen) {
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 10; ++i) {
    Load("[a]\nx=1\n");
    Load("word\n");
    parser_.loadFromFile("/tmp");
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

}  // namespace
