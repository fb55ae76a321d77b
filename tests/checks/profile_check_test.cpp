// Mistakes in a profile file.
#include <sys/stat.h>

#include <cerrno>
#include <chrono>

#include "check_fixture.h"
#include "support/build_paths.h"
#include "support/privileges.h"
#include "support/program.h"
#include "support/stub_tool.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kProfile = "/tmp/profiles.conf";
constexpr const char* kSettings = "/etc/velainfo.conf";

class ProfileCheckTest : public QuietTest {
 protected:
  static std::vector<std::string> Check(const std::string& text) {
    WriteFile(kProfile, text);
    const CheckResult result = CheckProfile(kProfile);
    EXPECT_THAT(result.unchecked, IsEmpty());
    return LinesOf(result);
  }
};

class ProfileFindings : public ProfileCheckTest, public WithParamInterface<FindingsCase> {};

TEST_P(ProfileFindings, AreReportedWithTheirLine) {
  EXPECT_THAT(Check(GetParam().text), ElementsAreArray(GetParam().findings));
}

/// A section that is right, four lines long, with more lines.
std::string Section(const std::string& kind, int size, int phase, const std::string& more = "") {
  return "[thumb_" + kind + "]\nfilename = VELAPHOTO_THUMB_" + kind +
         ".jpg\nsize = " + std::to_string(size) + "\nphase = " + std::to_string(phase) + "\n" +
         more;
}

std::string Reference(const std::string& more = "") {
  return Section("XL", 1280, 0, more);
}

const FindingsCase kCases[] = {
    {"EverythingRight",
     "\xEF\xBB\xBF; comment\n" + Reference("quality = 100\nunsharp = 0x0.8+0.5+0.01\n") +
         "[thumb]\nfilename = VELAPHOTO:THUMB_S.jpg\nunsharp =\nquality=+1\nphase=2\n",
     {}},
    {"Quality",
     Reference("quality = 900\n"),
     {"5: warning: quality is not a number from 1 to 100: \"900\"; the converter leaves the photos "
      "to ImageMagick"}},
    {"QualityZero",
     Reference("quality = 0\n"),
     {"5: warning: quality is not a number from 1 to 100: \"0\"; the converter leaves the photos "
      "to ImageMagick"}},
    {"NoNumber",
     Reference("quality = high\n"),
     {"5: warning: quality is not a number: \"high\"; 80 is used"}},
    {"EmptyNumber",
     Reference("quality =\n"),
     {"5: warning: quality is not a number: \"\"; 80 is used"}},
    {"CommentAfterANumber",
     Reference("quality = 85 ; good\n"),
     {"5: warning: the text after the number is ignored: \" ; good\"; a comment needs a line of "
      "its own"}},
    {"Phase",
     Reference() + Section("S", 120, 7),
     {"5: warning: S fits into its box, but XL (\"thumb_XL\" in line 1) in the same phase fills "
      "its box: their modes are applied in the opposite order",
      "8: warning: phase is not 0, 1 or 2: \"7\"; 0 is used"}},
    {"NegativePhase",
     Section("XL", 1280, -1),
     {"4: warning: phase is not 0, 1 or 2: \"-1\"; 0 is used"}},
    {"MisspelledKey",
     Reference("qualty = 90\nflavour = x\n"),
     {"5: warning: there is no key \"qualty\"; did you mean quality?",
      "6: warning: there is no key \"flavour\"; the keys are filename, size, quality, unsharp, "
      "phase"}},
    {"UnsharpThatFailsEveryPhoto",
     Reference("unsharp = foo\n"),
     {"5: error: unsharp is not RADIUSxSIGMA+AMOUNT+THRESHOLD, such as 0x0.8+0.5+0.01: \"foo\"; "
      "every photo fails"}},
    {"CommentAfterUnsharp",
     Reference("unsharp = 0x0.8+0.5+0.01 ; soft\n"),
     {"5: error: unsharp is not RADIUSxSIGMA+AMOUNT+THRESHOLD, such as 0x0.8+0.5+0.01: "
      "\"0x0.8+0.5+0.01 ; soft\"; every photo fails"}},
    {"UnsharpOutOfRange",
     Reference("unsharp = 0x400\n"),
     {"5: warning: unsharp is not RADIUSxSIGMA+AMOUNT+THRESHOLD, such as 0x0.8+0.5+0.01: "
      "\"0x400\"; the converter leaves the photos to ImageMagick"}},
    {"SizeBelowOne",
     Section("XL", 0, 0),
     {"3: error: size is not a number of pixels from 1: \"0\"; no thumbnail has the right size"}},
    {"SizeOfNoJpeg",
     Section("XL", 65536, 0),
     {"3: warning: size is not a number from 1 to 65535: \"65536\"; the converter leaves the "
      "photos "
      "to ImageMagick"}},
    {"NoSize",
     "[thumb_xl]\nfilename=VELAPHOTO_THUMB_XL.jpg\n",
     {"1: warning: the section \"thumb_xl\" has no size; 120 is used, other programs expect 1280"}},
    {"ModesMixed",
     Reference() + Section("B", 640, 1) + Section("S", 120, 1) + Section("M", 320, 1),
     {"13: warning: M fills its box, but B (\"thumb_B\" in line 5) in the same phase fits into its "
      "box: their modes are applied in the opposite order"}},
    {"ModesThatAreTheSameInBothOrders",
     Reference() + Section("S", 120, 1) + Section("M", 320, 1) + Section("B", 640, 1),
     {"9: warning: M fills its box, but S (\"thumb_S\" in line 5) in the same phase fits into its "
      "box: their modes are applied in the opposite order"}},
    {"NoPhase0",
     Section("S", 120, 1),
     {" error: no thumbnail is made in phase 0; those of phases 1 and 2 are made from the largest "
      "one of phase 0, so nothing is made"}},
    {"Empty",
     "# nothing\n",
     {" error: no section defines a thumbnail that photo_thumb_size_map (63) asks for, so nothing "
      "is made"}},
    {"UnknownSection",
     Reference() + "[Thumb_s]\nquality = 900\nodd = 1\n",
     {"5: warning: the section \"Thumb_s\" is ignored: the name of a thumbnail's section begins "
      "with \"thumb\""}},
    {"UnknownKind",
     Reference() + "[thumb_s]\nfilename=VELAPHOTO_THUMB_s.jpg\n",
     {"6: warning: the section \"thumb_s\" is ignored: \"VELAPHOTO_THUMB_s.jpg\" is none of "
      "VELAPHOTO_THUMB_S.jpg, VELAPHOTO_THUMB_SM.jpg, VELAPHOTO_THUMB_M.jpg, "
      "VELAPHOTO_THUMB_B.jpg, VELAPHOTO_THUMB_L.jpg, VELAPHOTO_THUMB_XL.jpg; did you mean "
      "VELAPHOTO_THUMB_S.jpg?"}},
    {"NoFilename",
     Reference() + "[thumb_s]\nsize=120\n[thumb_m]\nfilename=\n",
     {"5: warning: the section \"thumb_s\" is ignored: it has no filename",
      "8: warning: the section \"thumb_m\" is ignored: it has no filename"}},
    {"SameSectionTwice",
     Reference() + "[other]\n[thumb_XL]\nquality=85\n",
     {"5: warning: the section \"other\" is ignored: the name of a thumbnail's section begins with "
      "\"thumb\"",
      "6: warning: the section \"thumb_XL\" is already in line 1; both define one thumbnail"}},
    {"SameKeyTwice",
     Reference("quality = 900\nquality = 85\n"),
     {"5: warning: the line is ignored: quality is given again in line 6"}},
    {"SameKindTwice",
     Reference() + "[thumb_2]\nfilename=VELAPHOTO:THUMB_XL.jpg\nsize=1000\n",
     {"5: warning: the section \"thumb_2\" makes the same file as \"thumb_XL\" in line 1; one of "
      "them is overwritten"}},
    {"LargerThanItsSource",
     Section("S", 120, 0) + Section("B", 640, 1),
     {"5: warning: the thumbnail is larger than the largest one of phase 0, from which it is made "
      "(\"thumb_S\" in line 1); it is not enlarged"}},
    {"KeyBeforeTheFirstSection",
     "quality = 85\n" + Reference(),
     {"1: warning: the line is ignored: it is before the first section"}},
    {"InvalidLine",
     Reference("quality 85\n"),
     {"5: error: neither [section] nor key = value nor a comment: \"quality 85\"; the whole file "
      "is "
      "rejected"}},
    {"InvalidSection",
     Reference() + "[thumb_s] # small\n",
     {"5: error: a section is a name in brackets, alone in its line: \"[thumb_s] # small\"; the "
      "whole file is rejected"}},
    {"ZeroByte",
     Reference() + std::string("# \0\n", 4),
     {"5: error: the line contains a zero byte; the whole file is rejected"}},
    {"HostileBytes",
     Reference("\x1b]0;x\x07 = \xff\n") + "[\x9b"
                                          "2J]\n",
     {"5: warning: there is no key \"\\x1b]0;x\\x07\"; the keys are filename, size, quality, "
      "unsharp, phase",
      "6: warning: the section \"\\x9b2J\" is ignored: the name of a thumbnail's section begins "
      "with \"thumb\""}},
};

INSTANTIATE_TEST_SUITE_P(Profiles, ProfileFindings, ValuesIn(kCases), CaseName());

/// Returns whether ImageMagick makes a picture with the text as its unsharp mask.
bool DoesImageMagickSharpen(const std::string& text) {
  const std::string output = "/tmp/sharp.jpg";
  RemoveTree(output);
  const ProgramResult result =
      RunProgram(kImageMagickPath, {"xc:red", "-unsharp", text, output}, ProgramOptions());
  return result.exitCode == 0 && FileSize(output) > 0;
}

TEST_F(ProfileCheckTest, AnUnsharpMaskIsNoErrorWhenImageMagickAcceptsIt) {
  for (const char* text :
       {"1e0x1",  "(0x0.8)", "0x0.8\t+0.5", "0x0.8 +0.5", "x",         "X",        "-",
        ".",      "0/2x1",   "0:1",         "@5",         "%5",        "0x0.8!",   "0x0.8^",
        "0x0.8<", "0x0.8>",  "0x0.8,1",     "0x1E0",      "0\v\f\rx1", "0\xd7\x31"}) {
    ASSERT_TRUE(DoesImageMagickSharpen(text)) << text;
    EXPECT_THAT(Check(Reference(std::string("unsharp = ") + text + "\n")),
                ElementsAre(AllOf(StartsWith("5: warning: unsharp is not "),
                                  EndsWith("; the converter leaves the photos to ImageMagick"))))
        << text;
  }
}

TEST_F(ProfileCheckTest, AnUnsharpMaskIsAnErrorWhenImageMagickRejectsIt) {
  for (const char* text :
       {"foo", "0x0.8+0.5+0.01 ; soft", "1~", "0x0.8 # soft", "0xA", "\"0x0.8\"", "0x1p3", "inf",
        "0x0.8+nan", "0x0.8_", "0*0.8", "0=0.8", "0x0.8|", "[0x0.8]", "0\xc3\x97\x30.8"}) {
    ASSERT_FALSE(DoesImageMagickSharpen(text)) << text;
    EXPECT_THAT(Check(Reference(std::string("unsharp = ") + text + "\n")),
                ElementsAre(AllOf(StartsWith("5: error: unsharp is not "),
                                  EndsWith("; every photo fails"))))
        << text;
  }
}

TEST_F(ProfileCheckTest, TheSampleProfileIsRight) {
  EXPECT_THAT(Check(ReadFile(SourceDirectory() + "/config/thumb-profiles.conf")), IsEmpty());
}

TEST_F(ProfileCheckTest, WhatTheSettingsDoNotAskForIsNotMade) {
  const std::string text = Reference("unsharp = foo\n") + Section("S", 120, 2);
  WriteFile(kSettings, "photo_thumb_size_map=\"1\"\n");
  EXPECT_THAT(Check(text), ElementsAre(StartsWith("5: warning: unsharp is not "),
                                       StartsWith(" error: no thumbnail is made in phase 0")));
  WriteFile(kSettings, "photo_thumb_size_map=\"0\"\n");
  EXPECT_THAT(Check(text), ElementsAre(StartsWith("5: warning: unsharp is not "),
                                       " error: no section defines a thumbnail that "
                                       "photo_thumb_size_map (0) asks for, so nothing is made"));
}

TEST_F(ProfileCheckTest, AFileThatCannotBeOneIsAnError) {
  EXPECT_THAT(LinesOf(CheckProfile("/tmp/none.conf")),
              ElementsAre(" error: cannot be read: No such file or directory; nothing is made"));
  EXPECT_THAT(LinesOf(CheckProfile("/tmp")),
              ElementsAre(" error: cannot be read: Is a directory; nothing is made"));
}

TEST_F(ProfileCheckTest, AFileThatMayNotBeReadIsNotChecked) {
  WriteFile(kProfile, "odd");
  ASSERT_EQ(chmod(kProfile, 0), 0);
  const WithoutCapabilities unprivileged;
  const CheckResult result = CheckProfile(kProfile);
  EXPECT_THAT(result.findings, IsEmpty());
  ASSERT_THAT(result.unchecked, SizeIs(1));
  EXPECT_EQ(result.unchecked[0].error, EACCES);
}

TEST_F(ProfileCheckTest, AFileThatIsTooLargeIsAnError) {
  WriteFileOfSize(kProfile, (size_t{64} << 20) + 1);
  EXPECT_THAT(LinesOf(CheckProfile(kProfile)),
              ElementsAre(" error: is larger than 67108864 bytes; the whole file is rejected"));
}

TEST_F(ProfileCheckTest, ManySectionsTakeNoLongerThanTheirNumber) {
  std::string text = Reference();
  for (int i = 0; i < 300000; ++i) {
    text += "[thumb" + std::to_string(i) + "]\n";
  }
  const auto start = std::chrono::steady_clock::now();
  EXPECT_THAT(Check(text), SizeIs(1001));
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(20));
}

TEST_F(ProfileCheckTest, AnErrorAfterManyWarningsIsReported) {
  std::string text = Reference();
  for (int i = 0; i < 1500; ++i) {
    text += "odd = 1\n";
  }
  const std::vector<std::string> lines = Check(text + "unsharp = foo\n");
  ASSERT_THAT(lines, SizeIs(1002));
  EXPECT_THAT(lines[1000], StartsWith("1505: error: unsharp is not "));
  EXPECT_EQ(lines[1001], " warning: further findings are not listed");
  EXPECT_FALSE(LogFindings(kProfile));
}

TEST_F(ProfileCheckTest, TheLogHasErrorsBeforeWarningsOfOtherFiles) {
  std::string settings;
  for (int i = 0; i < 30; ++i) {
    settings += "foreign_key_" + std::to_string(i) + "=1\n";
  }
  WriteFile(kSettings, settings);
  WriteFile(kProfile, Reference("odd = 1\nunsharp = foo\n"));
  CheckResult result = CheckSettings();
  result.Add(CheckProfile(kProfile));
  result.unchecked.push_back({"/tmp/other", EACCES});
  const std::vector<Finding> log = FindingsForLog(result);
  ASSERT_THAT(log, SizeIs(21));
  EXPECT_THAT(FindingText(log[0]), StartsWith("/tmp/profiles.conf:6: error: unsharp is not "));
  EXPECT_EQ(FindingText(log[1]), "/tmp/other: warning: cannot be checked: Permission denied");
  EXPECT_THAT(FindingText(log[2]), StartsWith("/etc/velainfo.conf:1: warning: "));
  EXPECT_EQ(log[20].message, "13 more findings; velathumb-status --check-config lists all");
}

TEST_F(ProfileCheckTest, AFifoIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(kProfile, 0600), 0);
  EXPECT_THAT(LinesOf(CheckProfile(kProfile)), ElementsAre(StartsWith(" error: ")));
}

}  // namespace
}  // namespace vela_test
