// The list of failed photos with their reasons.
#include <sys/resource.h>
#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <sstream>
#include <thread>
#include <utility>

#include "failure_reason.h"
#include "posix/landlock.h"
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

/// The reasons of the photos that it takes.
class ReasonsOf : public vela::StatusSink {
 public:
  void TakePhoto(const vela::PhotoReport& photo) override { list_.push_back(photo.reason); }
  const std::vector<std::string>& List() const { return list_; }

 private:
  std::vector<std::string> list_;
};

/// The bitmap with another size in its header.
std::string WithBitmapSize(std::string bitmap, uint32_t width, uint32_t height) {
  constexpr size_t kSizeOffset = 18;
  for (size_t i = 0; i < 4; ++i) {
    bitmap[kSizeOffset + i] = static_cast<char>(width >> (8 * i));
    bitmap[kSizeOffset + 4 + i] = static_cast<char>(height >> (8 * i));
  }
  return bitmap;
}

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

TEST_F(FailedForReal, OfASizeAboveTheThumbnailsAreMadeFromThePhoto) {
  WriteFile(In("a.jpg"), "no photo");
  SetFileTime(In("a.jpg"), kFailureTime);
  WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_S.jpg"), ReadFile(MakeJpeg("/tmp/whole.jpg")));
  Mark("a.jpg", "XL");
  EXPECT_EQ(List({kTop}).out,
            In("a.jpg") + ": not a photo in a known format (XL since 2026-01-02 03:04)\n");
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

TEST_F(FailedPhotos, AreAllExaminedForTheListAndSomeForThePage) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().PrintError("bad\n").Exit(1));
  constexpr int kExamined = 100;
  for (int i = 0; i <= kExamined; ++i) {
    MakeFailed("a" + std::to_string(1000 + i) + ".jpg");
  }
  const Json::Value list = QueryJson({"--failed", kTop})["failed"];
  ASSERT_EQ(list.size(), 101U);
  EXPECT_EQ(list[kExamined]["reason"], "bad");

  RunStatus({"--html", "/tmp/status.html", kTop});
  const std::string page = ReadFile("/tmp/status.html");
  const std::string limited =
      "Reason: not examined: only the first 100 failed photos are, for 60 seconds; --failed "
      "examines all<";
  EXPECT_THAT(page, HasSubstr(limited));
  EXPECT_EQ(page.find(limited), page.rfind(limited));
}

TEST_F(FailedPhotos, AreExaminedForALimitedTime) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().Sleep(1100).PrintError("bad\n").Exit(1));
  ReasonsOf reasons;
  vela::ReasonFinder finder(reasons, {100, std::chrono::seconds(1)});
  vela::PhotoReport photo;
  photo.failures[0] = kFailureTime;
  for (const char* name : {"a.jpg", "b.jpg"}) {
    MakeFailed(name);
    photo.path = In(name);
    finder.TakePhoto(photo);
  }
  EXPECT_THAT(reasons.List(),
              ElementsAre("bad",
                          "not examined: only the first 100 failed photos are, for 1 "
                          "seconds; --failed examines all"));
  EXPECT_THAT(converter.Calls(), SizeIs(1));
}

TEST_F(FailedPhotos, AreNotExaminedWithoutAFailure) {
  const StubTool converter(kConverter);
  ReasonsOf reasons;
  vela::ReasonFinder finder(reasons, vela::kNoReasonLimits);
  vela::PhotoReport photo;
  photo.path = In("a.jpg");
  finder.TakePhoto(photo);
  EXPECT_THAT(reasons.List(), ElementsAre(""));
  EXPECT_THAT(converter.Calls(), IsEmpty());
}

TEST_F(FailedPhotos, AreNotExaminedInADirectoryWhoseOwnerIsUnknown) {
  const StubTool converter(kConverter);
  WriteFile("/etc/velainfo.conf", "work_as_owner=\"yes\"\n");
  vela::PhotoReport photo;
  photo.path = "/tmp/removed/a.jpg";
  EXPECT_EQ(vela::FindFailureReason(photo), "the owner of its directory is unknown");
  EXPECT_THAT(converter.Calls(), IsEmpty());
}

TEST_F(FailedPhotos, AreTooLargeWhenTheyHaveMorePixelsThanTheSetting) {
  RawRecipe recipe;
  recipe.width = 64;
  recipe.height = 48;
  MakeRawPhoto(In("a.dng"), recipe);
  MarkAll("a.dng");
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().PrintError("bad\n").Exit(1));
  WriteFile("/etc/velainfo.conf", "raw_pixel_limit=\"3071\"\n");
  EXPECT_EQ(Reason(), "the raw photo is larger than raw_pixel_limit allows");
  WriteFile("/etc/velainfo.conf", "raw_pixel_limit=\"3072\"\n");
  EXPECT_EQ(Reason(), "bad");
}

TEST_F(FailedPhotos, HaveFilesIfTheyHaveMoreThanAboutSixteenMegapixels) {
  const StubTool converter(kConverter);
  const std::string small = ReadFile(MakeImage("/tmp/small.bmp", 8, 8));
  for (const auto& [height, hasFiles] : {std::pair(3840, false), std::pair(4096, true)}) {
    MakeFailed("a.bmp", WithBitmapSize(small, 4096, height));
    Reason();
    EXPECT_EQ(LastScratchDirectory(converter) != "/dev/null", hasFiles) << height;
  }
}

/// The attempts of a converter that a photo has taken over, in one line.
constexpr char kHostileConverter[] = R"(#!/bin/sh
did=
for file in /tmp/photos/new /tmp/photos/@eaDir/a.jpg/new /tmp/new /var/spool/new /etc/new; do
  { true >"$file"; } 2>/dev/null && did="$did wrote $file"
done
for file in /tmp/photos/a.jpg /tmp/photos/b.jpg /tmp/private/secret /etc/passwd; do
  text=
  { read -r text <"$file" || [ -n "$text" ]; } 2>/dev/null && did="$did read $file"
done
echo "did:$did" >&2
exit 1
)";

void InstallConverter(const std::string& script) {
  RemoveTree(kConverter);
  WriteFile(kConverter, script);
  ASSERT_EQ(chmod(kConverter, 0755), 0);
}

TEST_F(FailedPhotos, AreReadByAConverterThatCanReadNothingElseAndWriteNothing) {
  MakeFailed("a.jpg");
  WriteFile(In("b.jpg"), "other");
  WriteFile("/tmp/private/secret", "secret");
  InstallConverter(kHostileConverter);
  EXPECT_EQ(Reason(), vela::LandlockVersion() > 0
                          ? "did: read /tmp/photos/a.jpg"
                          : "did: wrote /tmp/photos/new wrote /tmp/photos/@eaDir/a.jpg/new wrote "
                            "/tmp/new wrote /var/spool/new wrote /etc/new read /tmp/photos/a.jpg "
                            "read /tmp/photos/b.jpg read /tmp/private/secret read /etc/passwd");
}

/// The lines of /proc/PID/status with these keys, without white space.
std::vector<std::string> StatusLines(const std::string& process,
                                     const std::vector<std::string>& keys) {
  std::vector<std::string> found;
  std::istringstream in(ReadFile("/proc/" + process + "/status"));
  for (std::string line; std::getline(in, line);) {
    line.erase(std::remove(line.begin(), line.end(), '\t'), line.end());
    for (const std::string& key : keys) {
      if (line.compare(0, key.size() + 1, key + ":") == 0) {
        found.push_back(line);
      }
    }
  }
  return found;
}

/// The child of the process that has this name, once it is there.
std::string AwaitChild(pid_t parent, const std::string& name) {
  const std::string own = std::to_string(parent);
  for (int i = 0; i < 2000; ++i) {
    std::istringstream children(ReadFile("/proc/" + own + "/task/" + own + "/children"));
    for (std::string child; children >> child;) {
      if (ReadFile("/proc/" + child + "/comm") == name + "\n") {
        return child;
      }
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  ADD_FAILURE() << "no " << name;
  return "self";
}

TEST_F(FailedPhotos, AreReadByAConverterWithoutPrivilegesLikeThatOfAnOrdinaryRun) {
  MakeFailed("a.jpg");
  InstallConverter("#!/bin/sh\nwhile :; do :; done\n");
  Program status = StartProgram(StatusProgramPath(), {"--failed", kTop});
  const std::string converter = AwaitChild(status.Pid(), "convert-thumb");
  EXPECT_THAT(StatusLines(converter, {"NoNewPrivs", "Seccomp", "CapEff", "CapBnd"}),
              ElementsAre("CapEff:0000000000000006", "CapBnd:0000000000000006", "NoNewPrivs:1",
                          "Seccomp:2"));
  kill(std::stoi(converter), SIGKILL);
  EXPECT_THAT(status.Wait()->out, HasSubstr("has ended without a message"));
}

/// A file name that attacks a terminal, a script or a reader of JSON.
struct HostileName {
  const char* name;
  const char* shown;   ///< in text
  const char* base64;  ///< of the path; empty for valid UTF-8
};

constexpr HostileName kHostileNames[] = {
    {"a\nb.jpg", "a\\nb.jpg", ""},
    {"a\x1b]0;title\x07.jpg", "a\\x1b]0;title\\x07.jpg", ""},
    {"a\x1b[2J\r.jpg", "a\\x1b[2J\\x0d.jpg", ""},
    // The control sequence introducer of one byte, and as a character.
    {"a\x9b[2J.jpg", "a\\x9b[2J.jpg", "L3RtcC9waG90b3MvYZtbMkouanBn"},
    {"a\u009b[2J.jpg", "a\\xc2\\x9b[2J.jpg", ""},
    // The rest from right to left.
    {"a\u202egpj.jpg", "a\\xe2\\x80\\xaegpj.jpg", ""},
    {"a\xff\xc3.jpg", "a\xff\xc3.jpg", "L3RtcC9waG90b3MvYf/DLmpwZw=="},
    {"a\\n.jpg", "a\\\\n.jpg", ""},
    {"a\"},{\"path\":\"x.jpg", "a\"},{\"path\":\"x.jpg", ""},
    {"-0 $(touch x).jpg", "-0 $(touch x).jpg", ""},
};

TEST_F(FailedPhotos, WithHostileNamesAreOneLineEachWithoutControlCharacters) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().PrintError("bad\n").Exit(1));
  for (const auto& [name, shown, base64] : kHostileNames) {
    SCOPED_TRACE(shown);
    RemoveTree(kTop);
    MakeFailed(name);
    EXPECT_EQ(List({kTop}).out, In(shown) + ": bad (S, SM, M, B, L, XL since 2026-01-02 03:04)\n");
  }
}

TEST_F(FailedPhotos, WithHostileNamesAreOneValidObjectEachInJson) {
  const StubTool converter(kConverter);
  converter.Plan(StubPlan().PrintError("bad\n").Exit(1));
  for (const auto& [name, shown, base64] : kHostileNames) {
    SCOPED_TRACE(shown);
    RemoveTree(kTop);
    MakeFailed(name);
    // Checks that all of it is valid UTF-8 and strict JSON.
    const Json::Value list = QueryJson({"--failed", kTop})["failed"];
    ASSERT_EQ(list.size(), 1U);
    EXPECT_EQ(list[0]["reason"], "bad");
    const bool isText = std::string(base64).empty();
    EXPECT_EQ(list[0].isMember("path_base64"), !isText);
    EXPECT_EQ(list[0][isText ? "path" : "path_base64"], isText ? In(name) : base64);
  }
}

TEST_F(FailedPhotos, WithHostileNamesAreUnchangedBetweenNullBytes) {
  for (const auto& [name, shown, base64] : kHostileNames) {
    SCOPED_TRACE(shown);
    RemoveTree(kTop);
    MakeFailed(name);
    EXPECT_EQ(List({"-0", kTop}).out, In(name) + '\0');
  }
}

}  // namespace
}  // namespace vela_test
