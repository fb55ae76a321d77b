// The dates of thumbnails.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <string>

#include "convert/convert_fixture.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::Field;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;

constexpr int64_t kHour = 3600;

class PhotoTimes : public ConvertTest {
 protected:
  /// Dates the photo's last change; its last access stays an hour earlier.
  static void DatePhoto(int64_t seconds, long nanoseconds) {
    const timespec times[2] = {{seconds - kHour, 5}, {seconds, nanoseconds}};
    ASSERT_EQ(utimensat(AT_FDCWD, kPhoto, times, 0), 0);
  }

  void MakeThumbs() {
    PhotoConvertJob job = MakeJob({1280, 320});
    EXPECT_EQ(RunPhotoConvertJob(job), 0);
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }

  static void ExpectDatedNow(int width, int64_t start) {
    EXPECT_THAT(ModificationTime(ThumbPath(width)),
                Field(&FileTime::seconds, AllOf(Ge(start), Le(std::time(nullptr) + 1))));
  }
};

TEST_F(PhotoTimes, ThumbsOfAPhotoFromTheFutureAreDatedLikeIt) {
  const int64_t future = std::time(nullptr) + kHour;
  DatePhoto(future, 987654321);
  MakeThumbs();
  for (const int width : {1280, 320}) {
    EXPECT_EQ(ModificationTime(ThumbPath(width)), (FileTime{future, 0}));
    EXPECT_EQ(AccessTime(ThumbPath(width)), (FileTime{future, 0}));
  }
}

TEST_F(PhotoTimes, TheFutureBeginsSoon) {
  const int64_t future = std::time(nullptr) + 30;
  DatePhoto(future, 0);
  MakeThumbs();
  EXPECT_EQ(ModificationTime(ThumbPath(320)), (FileTime{future, 0}));
}

TEST_F(PhotoTimes, TheFutureGoesBeyondTheYear2038) {
  constexpr int64_t kFarFuture = 5000000000;
  DatePhoto(kFarFuture, 1);
  MakeThumbs();
  EXPECT_EQ(ModificationTime(ThumbPath(320)), (FileTime{kFarFuture, 0}));
}

TEST_F(PhotoTimes, ThumbsOfAnOldPhotoKeepTheirOwnDate) {
  const int64_t start = std::time(nullptr) - 1;
  DatePhoto(1000000000, 0);
  MakeThumbs();
  ExpectDatedNow(1280, start);
  ExpectDatedNow(320, start);
}

TEST_F(PhotoTimes, ThumbsOfAPhotoOfTodayKeepTheirOwnDate) {
  const int64_t start = std::time(nullptr) - 1;
  DatePhoto(std::time(nullptr) - 1, 999999999);
  MakeThumbs();
  ExpectDatedNow(320, start);
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

TEST_F(PhotoTimes, AThumbThatCannotBeDatedIsStillCommitted) {
  WriteFile("/tmp/sealed/picture.jpg", "picture");
  SetFileTime("/tmp/sealed/picture.jpg", 1000000000);
  const ReadOnlyMount sealed("/tmp/sealed");
  ASSERT_EQ(symlink("/tmp/sealed/picture.jpg", TempPath(320).c_str()), 0);
  DatePhoto(std::time(nullptr) + kHour, 0);
  struct stat photo = {};
  ASSERT_EQ(stat(kPhoto, &photo), 0);
  EXPECT_EQ(CommitPhotoThumbs(MakeJob({320}), kPhoto, photo.st_blocks, photo.st_size), 0);
  EXPECT_EQ(ModificationTime(ThumbPath(320)), (FileTime{1000000000, 0}));
}

}  // namespace
}  // namespace vela_test
