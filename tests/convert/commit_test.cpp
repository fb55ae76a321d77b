// Moving outputs into place and setting their times.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>

#include "convert/convert_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;
using ::testing::UnorderedElementsAre;

std::string RenameLine(int width) {
  return "velamk_photo_thumb:430 [Error] rename: " + TempPath(width) + ", " + ThumbPath(width);
}

std::string SizeLine(int width, int size) {
  return "velamk_photo_thumb:441 [Error] file size of dest path: " + std::to_string(size) + ", " +
         ThumbPath(width);
}

/// Sets the file-creation mask for the lifetime of the object.
class Mask {
 public:
  explicit Mask(mode_t mask) : before_(umask(mask)) {}
  ~Mask() { umask(before_); }
  Mask(const Mask&) = delete;
  Mask& operator=(const Mask&) = delete;

 private:
  mode_t before_;
};

class Commit : public ConvertTest {
 protected:
  /// Runs a job of these widths with this plan for the converter.
  int Run(const StubPlan& plan, const std::vector<int>& widths = {1280, 320, 120}) {
    Converter().Plan(plan);
    PhotoConvertJob job = MakeJob(widths);
    return RunPhotoConvertJob(job);
  }

  /// Commits one output that the test has written.
  static int CommitOne(int width = 320) {
    struct stat photo = {};
    EXPECT_EQ(stat(kPhoto, &photo), 0);
    return CommitPhotoThumbs(MakeJob({width}), kPhoto, photo.st_blocks, photo.st_size);
  }
};

TEST_F(Commit, MovesEveryOutputIntoPlace) {
  EXPECT_EQ(Run(StubPlan().WriteOutput("first").WriteOutput("second").WriteOutput("third")), 0);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "320.jpg", "120.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(1280)), "first");
  EXPECT_EQ(ReadFile(ThumbPath(320)), "second");
  EXPECT_EQ(ReadFile(ThumbPath(120)), "third");
}

TEST_F(Commit, SetsMode0777RegardlessOfTheMask) {
  for (const mode_t mask : {mode_t{0}, mode_t{022}, mode_t{0777}}) {
    const Mask guard(mask);
    WriteFile(TempPath(320), "output");
    ASSERT_EQ(chmod(TempPath(320).c_str(), 0600), 0);
    EXPECT_EQ(CommitOne(), 0);
    EXPECT_EQ(ModeOf(ThumbPath(320)), 0777) << mask;
  }
}

TEST_F(Commit, ReplacesAnOldThumbWithoutTouchingIt) {
  WriteFile(ThumbPath(320), "old thumb");
  ASSERT_EQ(link(ThumbPath(320).c_str(), InOutDir("kept").c_str()), 0);
  ASSERT_EQ(chmod(ThumbPath(320).c_str(), 0400), 0);
  EXPECT_EQ(Run(StubPlan().WriteOutput("new thumb"), {320}), 0);
  EXPECT_EQ(ReadFile(ThumbPath(320)), "new thumb");
  EXPECT_EQ(ReadFile(InOutDir("kept")), "old thumb");
  EXPECT_EQ(ModeOf(InOutDir("kept")), 0400);
}

TEST_F(Commit, AnOldThumbThatIsALinkIsReplaced) {
  WriteFile("/tmp/elsewhere.jpg", "linked");
  ASSERT_EQ(symlink("/tmp/elsewhere.jpg", ThumbPath(320).c_str()), 0);
  EXPECT_EQ(Run(StubPlan().WriteOutput("new thumb"), {320}), 0);
  EXPECT_EQ(ReadFile(ThumbPath(320)), "new thumb");
  EXPECT_EQ(ReadFile("/tmp/elsewhere.jpg"), "linked");
}

TEST_F(Commit, AMissingOutputFailsAlone) {
  EXPECT_EQ(Run(StubPlan().WriteOutputs(1).SkipOutputs(1).WriteOutputs()), -1);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "120.jpg"));
  EXPECT_THAT(TakeErrorLines(), ElementsAre(RenameLine(320)));
  RemoveTree(ThumbPath(1280));
  WriteFile(ThumbPath(320), "old thumb");
  EXPECT_EQ(Run(StubPlan().SkipOutputs(2).WriteOutputs()), -1);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("320.jpg", "120.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
  EXPECT_THAT(TakeErrorLines(), ElementsAre(RenameLine(1280), RenameLine(320)));
}

TEST_F(Commit, AnOutputThatCannotBeMovedIsRemoved) {
  MakeDirectories(ThumbPath(320));
  EXPECT_EQ(Run(StubPlan().WriteOutputs()), -1);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "320.jpg", "120.jpg"));
  EXPECT_TRUE(IsDirectory(ThumbPath(320)));
  EXPECT_THAT(TakeErrorLines(), ElementsAre(RenameLine(320)));
}

TEST_F(Commit, AThumbNeedsTwoBytes) {
  WriteFile(ThumbPath(320), "old thumb");
  EXPECT_EQ(
      Run(StubPlan().WriteOutputsOfSize(1, 0).WriteOutputsOfSize(1, 1).WriteOutputsOfSize(1, 2)),
      -1);
  EXPECT_THAT(OutFiles(), ElementsAre("120.jpg"));
  EXPECT_EQ(FileSize(ThumbPath(120)), 2);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(SizeLine(1280, 0), SizeLine(320, 1)));
}

/// What another user may have put in the place of an output.
struct Planted {
  const char* name;
  void (*plant)(const std::string& path);
};

constexpr const char* kVictim = "/tmp/elsewhere.jpg";

constexpr Planted kPlanted[] = {
    {"link", [](const std::string& path) { ASSERT_EQ(symlink(kVictim, path.c_str()), 0); }},
    {"dangling link",
     [](const std::string& path) { ASSERT_EQ(symlink("/tmp/nowhere.jpg", path.c_str()), 0); }},
    {"second name of a file",
     [](const std::string& path) { ASSERT_EQ(link(kVictim, path.c_str()), 0); }},
    {"pipe", [](const std::string& path) { ASSERT_EQ(mkfifo(path.c_str(), 0666), 0); }},
};

TEST_F(Commit, OnlyAFileOfItsOwnIsMovedIntoPlace) {
  for (const Planted& planted : kPlanted) {
    SCOPED_TRACE(planted.name);
    WriteFile(kVictim, "precious");
    ASSERT_EQ(chmod(kVictim, 0600), 0);
    SetFileTime(kVictim, 1000000000);
    planted.plant(TempPath(320));
    EXPECT_EQ(CommitOne(), -1);
    EXPECT_THAT(OutFiles(), IsEmpty());
    EXPECT_THAT(TakeErrorLines(), ElementsAre(RenameLine(320)));
    EXPECT_EQ(ReadFile(kVictim), "precious");
    EXPECT_EQ(ModeOf(kVictim), 0600);
    EXPECT_EQ(ModificationTime(kVictim), (FileTime{1000000000, 0}));
    EXPECT_FALSE(Exists("/tmp/nowhere.jpg"));
  }
}

TEST_F(Commit, EveryFailureIsReportedAndTheRestContinues) {
  MakeDirectories(ThumbPath(800));
  EXPECT_EQ(Run(StubPlan()
                    .WriteOutputs(1)
                    .WriteOutputs(1)
                    .SkipOutputs(1)
                    .WriteOutputsOfSize(1, 1)
                    .WriteOutputs(),
                {1280, 800, 640, 320, 120}),
            -1);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "800.jpg", "120.jpg"));
  EXPECT_THAT(TakeErrorLines(), ElementsAre(RenameLine(800), RenameLine(640), SizeLine(320, 1)));
}

TEST_F(Commit, TwoOutputsOfOneNameFailAtTheSecond) {
  PhotoConvertJob job = MakeJob({1280, 320});
  job.settings[1].tempPath = TempPath(1280);
  Converter().Plan(StubPlan().WriteOutput("first").WriteOutput("second"));
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(OutFiles(), ElementsAre("1280.jpg"));
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_photo_thumb:430 [Error] rename: " +
                                            TempPath(1280) + ", " + ThumbPath(320)));
}

constexpr int64_t kHour = 3600;

class PhotoTimes : public ConvertTest {
 protected:
  /// Sets the photo's modification time, and its access time an hour earlier.
  static void DatePhoto(int64_t seconds, long nanoseconds) {
    const timespec times[2] = {{seconds - kHour, 5}, {seconds, nanoseconds}};
    ASSERT_EQ(utimensat(AT_FDCWD, kPhoto, times, 0), 0);
  }

  void MakeThumbs() {
    PhotoConvertJob job = MakeJob({1280, 320});
    EXPECT_EQ(RunPhotoConvertJob(job), 0);
  }

  static void ExpectDated(int width, int64_t seconds) {
    EXPECT_EQ(ModificationTime(ThumbPath(width)), (FileTime{seconds, 0}));
    EXPECT_EQ(AccessTime(ThumbPath(width)), (FileTime{seconds, 0}));
  }
};

TEST_F(PhotoTimes, ThumbsOfAPhotoFromTheFutureGetItsDate) {
  // The last one is after 2038.
  for (const int64_t future : {std::time(nullptr) + kHour, std::time(nullptr) + 30, 5000000000L}) {
    DatePhoto(future, 987654321);
    MakeThumbs();
    ExpectDated(1280, future);
    ExpectDated(320, future);
  }
}

TEST_F(PhotoTimes, ThumbsOfOtherPhotosKeepTheirOwnDate) {
  const int64_t start = std::time(nullptr) - 1;
  for (const FileTime time : {FileTime{1000000000, 0}, FileTime{start, 999999999}}) {
    DatePhoto(time.seconds, time.nanoseconds);
    MakeThumbs();
    for (const int width : {1280, 320}) {
      EXPECT_THAT(ModificationTime(ThumbPath(width)),
                  Field(&FileTime::seconds, AllOf(Ge(start), Le(std::time(nullptr) + 1))));
    }
  }
}

TEST_F(PhotoTimes, ThePhotoItselfIsNotDated) {
  const int64_t future = std::time(nullptr) + kHour;
  DatePhoto(future, 123);
  MakeThumbs();
  EXPECT_EQ(ModificationTime(kPhoto), (FileTime{future, 123}));
}

TEST_F(PhotoTimes, ThePhotosDateIsThatAtTheCommit) {
  const int64_t future = std::time(nullptr) + kHour;
  Converter().Plan(StubPlan().WriteOutputs().SetFileTime(StubPlan::kSource, future));
  MakeThumbs();
  EXPECT_EQ(ModificationTime(ThumbPath(320)), (FileTime{future, 0}));
}

}  // namespace
}  // namespace vela_test
