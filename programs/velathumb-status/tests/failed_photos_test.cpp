// The list of failed photos with their reasons.
#include <sys/resource.h>

#include <csignal>

#include "status_fixture.h"
#include "support/images.h"
#include "support/raw_photos.h"
#include "support/stub_files.h"
#include "support/stub_tool.h"
#include "support/system_log.h"
#include "support/tree_record.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kConverter = "/usr/vela/bin/convert-thumb";
/// 2026-01-02 03:04:05 in UTC.
constexpr int64_t kFailureTime = 1767323045;

class FailedPhotos : public StatusTest {
 protected:
  /// Makes the marker of a thumbnail that could not be made.
  static void Mark(const std::string& photo, const std::string& kind) {
    const std::string marker = Derived(photo, "VELAPHOTO_THUMB_" + kind + ".fail");
    WriteFile(marker, "");
    SetFileTime(marker, kFailureTime);
  }

  static void MarkAll(const std::string& photo) {
    for (const char* kind : {"S", "SM", "M", "B", "L", "XL"}) {
      Mark(photo, kind);
    }
  }

  /// A failed photo with this content.
  static void MakeFailed(const std::string& name, const std::string& content = "no photo") {
    WriteFile(In(name), content);
    MarkAll(name);
  }

  static ProgramResult List(const std::vector<std::string>& arguments) {
    ProgramOptions options;
    options.addedEnvironment = {"TZ=UTC"};
    std::vector<std::string> all = {"--failed"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    return RunStatus(all, options);
  }

  /// The reason of the only failed photo.
  static std::string Reason() {
    const Json::Value list = QueryJson({"--failed", kTop})["failed"];
    EXPECT_EQ(list.size(), 1U);
    return list.size() == 1 ? list[0]["reason"].asString() : "";
  }

  static std::string Line(const std::string& name, const std::string& reason) {
    return In(name) + ": " + reason + " (S, SM, M, B, L, XL since 2026-01-02 03:04)\n";
  }
};

/// With the project's own converter; ImageMagick alone gives other reasons.
class FailedForReal : public FailedPhotos {
 protected:
  void SetUp() override {
    FailedPhotos::SetUp();
    InstallRealConverter();
  }

  static void MakeDamagedBitmap(const std::string& name) {
    const std::string whole = MakeImage("/tmp/whole.bmp", 300, 200);
    MakeFailed(name, ReadFile(whole).substr(0, 1000));
    RemoveTree(whole);
  }
};

TEST_F(FailedForReal, HaveALineEachWithReasonSizesAndTime) {
  MakeFailed("a.jpg");
  MakeDamagedBitmap("b.bmp");
  MakeFailed("c.nef");
  MakePhotoWith("done.jpg", kAllSizes);
  MakePhotoWith("missing.jpg", 0);
  const ProgramResult result = List({kTop});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
  EXPECT_EQ(result.out, Line("a.jpg", "not a photo in a known format") +
                            Line("b.bmp", "ImageMagick: improper image header") +
                            Line("c.nef", "dcraw: Unexpected end of file"));
}

TEST_F(FailedForReal, AreAListInJson) {
  MakeFailed("a.jpg");
  const Json::Value answer = QueryJson({"--failed", kTop});
  ASSERT_EQ(answer["failed"].size(), 1U);
  EXPECT_EQ(answer["failed"][0], ReadJson(R"({"path": "/tmp/photos/a.jpg", "since": 1767323045,
                         "kinds": ["S", "SM", "M", "B", "L", "XL"],
                         "reason": "not a photo in a known format"})"));
  EXPECT_EQ(answer["totals"]["failure_markers"], 6);
}

TEST_F(FailedForReal, HaveTheReasonOnThePage) {
  MakeFailed("a.jpg");
  RunStatus({"--html", "/tmp/status.html", kTop});
  EXPECT_THAT(ReadFile("/tmp/status.html"),
              HasSubstr("<p class=\"note\">Reason: not a photo in a known format</p>"));
}

TEST_F(FailedForReal, AreNeitherChangedNorLoggedNorIsAnythingLeftBehind) {
  MakeFailed("a.jpg");
  MakeDamagedBitmap("b.bmp");
  MakeFailed("c.nef");
  WriteFile(In("d.jpg"), ReadFile(MakeJpeg("/tmp/whole.jpg")));
  MarkAll("d.jpg");
  const TreeRecord before = RecordTree(kTop);
  const std::vector<std::string> names = ListDirectory("/tmp");
  EXPECT_THAT(List({kTop}).out, HasSubstr("d.jpg: it can be converted now"));
  EXPECT_THAT(Differences(before, RecordTree(kTop)), IsEmpty());
  EXPECT_EQ(ListDirectory("/tmp"), names);
  EXPECT_THAT(LogMessages(), IsEmpty());
}

TEST_F(FailedForReal, HaveTheErrorOfTheProfileAsReasonWhenNothingElseIsWrong) {
  WriteFile(In("a.jpg"), ReadFile(MakeJpeg("/tmp/whole.jpg")));
  MarkAll("a.jpg");
  const std::string profile = "/etc/velathumb/thumb-profiles.conf";
  const std::string begin = "[thumb_s]\nfilename = VELAPHOTO_THUMB_S.jpg\nsize = 120\n";
  WriteFile(profile, begin + "unsharp = foo\n");
  EXPECT_THAT(Reason(),
              StartsWith("it can be converted, but not with the profile " + profile +
                         ": line 4: unsharp is not RADIUSxSIGMA+AMOUNT+THRESHOLD, such as "
                         "0x0.8+0.5+0.01: \"foo\""));
  WriteFile(profile, begin + "unsharp = 0x0.8+0.5+0.01\n");
  EXPECT_THAT(Reason(), StartsWith("it can be converted now: the cause is gone, or it is in the "
                                   "profile"));
}

TEST_F(FailedForReal, OfLaterPhasesAreMadeFromTheLargestThumbnail) {
  WriteFile(In("a.jpg"), "no photo");
  SetFileTime(In("a.jpg"), kFailureTime);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_XL.jpg"), "no thumbnail");
  Mark("a.jpg", "S");
  Mark("a.jpg", "M");
  EXPECT_EQ(List({kTop}).out, In("a.jpg") +
                                  ": its largest thumbnail: not a photo in a known format "
                                  "(S, M since 2026-01-02 03:04)\n");
}

TEST_F(FailedPhotos, AreThoseOfTheWorkingDirectoryByDefault) {
  MakeFailed("a.jpg");
  ProgramOptions options;
  options.workingDirectory = kTop;
  EXPECT_EQ(RunStatus({"--failed", "-0"}, options).out, In("a.jpg") + '\0');
}

TEST_F(FailedPhotos, AreThoseBelowTheWorkingDirectoryOnRequest) {
  MakeFailed("a.jpg");
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  EXPECT_EQ(RunStatus({"--failed", "-0", "-r"}, options).out, In("a.jpg") + '\0');
}

TEST_F(FailedPhotos, ArePathsWithNullBytesOnRequestWithoutRunningAnything) {
  const StubTool converter(kConverter);
  MakeFailed("a.jpg");
  MakeFailed("b\n\x1b\xff.jpg");
  MakePhotoWith("done.jpg", kAllSizes);
  EXPECT_EQ(List({"-0", kTop}).out, In("a.jpg") + '\0' + In("b\n\x1b\xff.jpg") + '\0');
  EXPECT_THAT(converter.Calls(), IsEmpty());
}

TEST_F(FailedPhotos, NeedTheListForNullBytesAndNoOtherFormat) {
  EXPECT_EQ(RunStatus({"-0", kTop}).exitCode, 2);
  EXPECT_EQ(RunStatus({"--failed", "-0", "--json", kTop}).exitCode, 2);
}

TEST_F(FailedPhotos, HaveAReasonWithoutAConverter) {
  MakeFailed("a.jpg");
  EXPECT_EQ(Reason(), std::string(kConverter) + " cannot be started: No such file or directory");
}

TEST_F(FailedPhotos, HaveAReasonWhenTheConverterIsKilled) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().DieBySignal(SIGKILL));
  MakeFailed("a.jpg");
  EXPECT_EQ(Reason(), std::string(kConverter) +
                          " has ended without a message: it has crashed or was killed, "
                          "perhaps because tool_timeout was reached");
}

TEST_F(FailedPhotos, HaveAReasonWhenThereIsNoSpaceForTheDecodedPhoto) {
  MakeRawPhoto(In("a.dng"));
  MarkAll("a.dng");
  ProgramOptions options;
  options.addedEnvironment = {"TZ=UTC"};
  options.beforeExec = {LimitResource(RLIMIT_FSIZE, 1000), IgnoreSignal(SIGXFSZ)};
  EXPECT_EQ(RunStatus({"--failed", kTop}, options).out,
            Line("a.dng", "its decoded form does not fit into /tmp"));
}

/// The directory for temporary files that the last run of the converter was given.
std::string LastScratchDirectory(const StubTool& converter) {
  const std::string define = converter.Calls().back().Parameters().at(1);
  return define.substr(define.find('=') + 1);
}

TEST_F(FailedPhotos, HaveFilesOnlyIfTheyDoNotFitIntoTheMemoryOfTheConverter) {
  const StubTool converter(kConverter);
  WriteFile(In("a.jpg"), ReadFile(MakeImage("/tmp/whole.jpg", 300, 200)));
  MarkAll("a.jpg");
  Reason();
  EXPECT_EQ(LastScratchDirectory(converter), "/dev/null");
  WriteFile("/etc/velainfo.conf", "convert_memory_limit=\"1M\"\n");
  Reason();
  EXPECT_THAT(LastScratchDirectory(converter), StartsWith("/tmp/velathumb."));
}

TEST_F(FailedPhotos, HaveOneLineOfTheConverterAtMost500BytesLong) {
  const StubTool converter(kConverter);
  MakeFailed("a.jpg");
  converter.Plan(StubPlan().PrintError("first\nsecond\n").Exit(1));
  EXPECT_EQ(Reason(), "first");
  converter.Plan(StubPlan().PrintError("odd\nconvert-thumb: own\nodd\n").Exit(1));
  EXPECT_EQ(Reason(), "own");
  // ImageMagick alone, under the converter's name.
  converter.Plan(StubPlan()
                     .PrintError("convert-thumb: bad @ error/bmp.c/A/1.\n"
                                 "convert-thumb: none @ error/convert.c/B/2.\n")
                     .Exit(1));
  EXPECT_EQ(Reason(), "bad");
  converter.Plan(StubPlan().PrintErrorRepeated("0123456789", 100000).Exit(1));
  EXPECT_EQ(Reason().size(), 500U);
}

TEST_F(FailedPhotos, AreEscapedWhateverTheReason) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().PrintError("\x1b[2J<script>\\\r&\xff\n").Exit(1));
  MakeFailed("a.jpg");
  EXPECT_EQ(List({kTop}).out, Line("a.jpg", "\\x1b[2J<script>\\\\\\x0d&\xff"));
  EXPECT_EQ(Reason(), "\x1b[2J<script>\\\r&\xef\xbf\xbd");
  RunStatus({"--html", "/tmp/status.html", kTop});
  const std::string page = ReadFile("/tmp/status.html");
  EXPECT_THAT(page, HasSubstr("&lt;script&gt;"));
  EXPECT_EQ(page.find("<script"), std::string::npos);
  EXPECT_EQ(page.find('\x1b'), std::string::npos);
}

TEST_F(FailedPhotos, AreExaminedUpToALimit) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().PrintError("bad\n").Exit(1));
  constexpr int kExamined = 100;
  for (int i = 0; i <= kExamined; ++i) {
    MakeFailed("a" + std::to_string(1000 + i) + ".jpg");
  }
  const Json::Value list = QueryJson({"--failed", kTop})["failed"];
  ASSERT_EQ(list.size(), 101U);
  EXPECT_EQ(list[kExamined - 1]["reason"], "bad");
  EXPECT_EQ(list[kExamined]["reason"],
            "not examined: only the first 100 failed photos are, for 60 seconds");
}

}  // namespace
}  // namespace vela_test
