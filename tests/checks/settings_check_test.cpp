// Mistakes in /etc/velainfo.conf.
#include <sys/stat.h>

#include <cerrno>

#include "check_fixture.h"
#include "support/privileges.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kSettings = "/etc/velainfo.conf";

class SettingsCheckTest : public QuietTest {
 protected:
  static std::vector<std::string> Check(const std::string& text) {
    WriteFile(kSettings, text);
    const CheckResult result = CheckSettings();
    EXPECT_THAT(result.unchecked, IsEmpty());
    return LinesOf(result);
  }
};

class SettingsFindings : public SettingsCheckTest, public WithParamInterface<FindingsCase> {};

TEST_P(SettingsFindings, AreReportedWithTheirLine) {
  EXPECT_THAT(Check(GetParam().text), ElementsAreArray(GetParam().findings));
}

std::string Repeated(const std::string& text, int times) {
  std::string result;
  for (int i = 0; i < times; ++i) {
    result += text;
  }
  return result;
}

const FindingsCase kCases[] = {
    {"EverythingRight",
     "# comment\n\n photo_thumb_size_map = \"17\"\nvideo_thumb_size_map=63\ntool_timeout=\"0\"\n"
     "raw_pixel_limit=1\nwork_as_owner=\"no\"\nstall_timeout=\"90\" # seconds\n"
     "convert_memory_limit=\"1G\"\nenable_mobile_video=\"yes\"\nthumb_conv_resume_time=\"-1\"\n"
     "index_version=\"3\"\ndisable_convert_photo=\"yes\"\ndisable_convert_video=\"no\"",
     {}},
    {"SizeMap",
     "\nphoto_thumb_size_map=99\n",
     {"2: warning: photo_thumb_size_map is not a number from 0 to 63: \"99\"; 63 is used"}},
    {"Timeout",
     "tool_timeout=soon\n",
     {"1: warning: tool_timeout is not a number of seconds, or 0 for no limit: \"soon\"; 600 is "
      "used"}},
    {"Switch",
     "work_as_owner=\"Yes\"\n",
     {"1: warning: work_as_owner is not yes or no: \"Yes\"; no is used"}},
    {"Memory",
     "convert_memory_limit=\"lots\"\n",
     {"1: warning: convert_memory_limit is not a number of bytes from 1, such as 536870912 or "
      "512M: \"lots\"; 536870912 is used"}},
    {"TooLittleMemory",
     "convert_memory_limit=\"512K\"\n",
     {"1: error: convert_memory_limit is less than 1M: \"512K\"; photos fail"}},
    {"ResumeTime",
     "thumb_conv_resume_time=\"17 h\"\n",
     {"1: warning: thumb_conv_resume_time is not a number of seconds since the epoch: \"17 h\"; "
      "the number that it begins with is used, or 0"}},
    {"UnknownKey",
     "tool_timout=\"5\"\nflavour=\"x\"\n",
     {"1: warning: there is no setting \"tool_timout\"; did you mean tool_timeout?",
      "2: warning: there is no setting \"flavour\"; see velainfo.conf(5)"}},
    {"KeyOfOtherSoftware",
     "thumb_conv_paused=\"yes\"\n",
     {"1: warning: thumb_conv_paused has no effect here; thumb_conv_resume_time pauses the "
      "conversion"}},
    {"LineWithoutEqualsSign",
     "[settings]\n",
     {"1: warning: the line is ignored: it is neither key=\"value\" nor a comment"}},
    {"LineWithoutKey", " = \"5\"\n", {"1: warning: the line is ignored: it has no key"}},
    {"SameKeyTwice",
     "index_version=\"1\"\n#\nindex_version=\"x\"\n",
     {"3: warning: index_version is already in line 1; this line is ignored"}},
    {"OpenQuote",
     "tool_timeout=\"5\n",
     {"1: warning: tool_timeout is not a number of seconds, or 0 for no limit: \"\"5\", without a "
      "closing quote; 600 is used"}},
    {"TextAfterTheValue",
     "tool_timeout=\"5\" seconds\n",
     {"1: warning: the text after the value is ignored: \"seconds\""}},
    {"CommentAfterABareValue",
     "tool_timeout=5 # seconds\n",
     {"1: warning: tool_timeout is not a number of seconds, or 0 for no limit: \"5 # seconds\"; "
      "600 is used"}},
    {"HostileBytes",
     "\x1b[2J\xff\u202e=\"1\"\ntool_timeout=\"\x07\n",
     {"1: warning: there is no setting \"\\x1b[2J\\xff\\xe2\\x80\\xae\"; see velainfo.conf(5)",
      "2: warning: tool_timeout is not a number of seconds, or 0 for no limit: \"\"\\x07\", "
      "without a closing quote; 600 is used"}},
    {"LongKey",
     std::string(100, 'k') + "=1",
     {"1: warning: there is no setting \"" + std::string(80, 'k') + "...\"; see velainfo.conf(5)"}},
    {"LongKeyOfLargeCharacters",
     std::string(79, 'k') + "\u20ac" + "k=1",
     {"1: warning: there is no setting \"" + std::string(79, 'k') + "...\"; see velainfo.conf(5)"}},
    {"LongKeyThatEndsBetweenCharacters",
     std::string(77, 'k') + "\u20ac\u20ac" + "=1",
     {"1: warning: there is no setting \"" + std::string(77, 'k') +
      "\u20ac...\"; see velainfo.conf(5)"}},
    {"LongKeyOfContinuationBytes",
     std::string(100, '\xbf') + "=1",
     {"1: warning: there is no setting \"" + Repeated("\\xbf", 76) +
      "...\"; see velainfo.conf(5)"}},
    {"ByteOrderMark",
     "\xef\xbb\xbftool_timeout=\"5\"\n",
     {"1: warning: there is no setting \"\\xef\\xbb\\xbftool_timeout\"; did you mean "
      "tool_timeout?"}},
};

INSTANTIATE_TEST_SUITE_P(Settings, SettingsFindings, ValuesIn(kCases), CaseName());

TEST_F(SettingsCheckTest, AMissingFileIsRight) {
  RemoveTree(kSettings);
  EXPECT_THAT(LinesOf(CheckSettings()), IsEmpty());
}

TEST_F(SettingsCheckTest, ManyFindingsAreCut) {
  std::string text;
  for (int i = 0; i < 5000; ++i) {
    text += "x\n";
  }
  const std::vector<std::string> lines = Check(text);
  ASSERT_THAT(lines, SizeIs(1001));
  EXPECT_THAT(lines[999], StartsWith("1000: warning: the line is ignored"));
  EXPECT_EQ(lines[1000], " warning: further findings are not listed");
  EXPECT_THAT(FindingsForLog(CheckSettings()), SizeIs(21));
  EXPECT_EQ(FindingsForLog(CheckSettings()).back().message,
            "981 more findings; velathumb-status --check-config lists all");
}

TEST_F(SettingsCheckTest, AFileThatMayNotBeReadIsNotChecked) {
  WriteFile(kSettings, "tool_timeout=soon\n");
  ASSERT_EQ(chmod(kSettings, 0), 0);
  const WithoutCapabilities unprivileged;
  const CheckResult result = CheckSettings();
  EXPECT_THAT(result.findings, IsEmpty());
  ASSERT_THAT(result.unchecked, SizeIs(1));
  EXPECT_EQ(result.unchecked[0].file, kSettings);
  EXPECT_EQ(result.unchecked[0].error, EACCES);
}

}  // namespace
}  // namespace vela_test
