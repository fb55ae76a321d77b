// The pass over a directory: the check of the volume's free space, photos that are removed
// meanwhile, and the registration.
#include "thumb/directory_pass.h"

#include <limits>
#include <optional>

#include "thumb/fake_platform/free_space_fake.h"
#include "thumb/fake_platform/index_fake.h"
#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr uint64_t kThreshold = 1073741824;
constexpr const char* kNearlyFull =
    "velathumb:893 Stopping creating thumbs as the disk space is near full, ";

class Pass : public PassTest {
 protected:
  void SetUp() override {
    PassTest::SetUp();
    converter_.emplace(kConverterPath);
    daemon_.emplace();
  }

  static void PutPhotos(const std::vector<std::string>& names) {
    for (const std::string& name : names) {
      SetFileTimeFromNow(MakeJpeg(std::string(kDir) + "/" + name), -60);
    }
  }

  /// Runs the pass on a volume with that much space.
  void RunWithSpace(uint64_t bytes) const {
    const FreeSpaceFake space([=](const std::string&) { return bytes; });
    CreateDirectoryThumbs(Job());
  }

  size_t Conversions() const { return converter_->Calls().size(); }
  std::vector<std::string> Requests() const { return daemon_->Commands(); }

 private:
  std::optional<StubTool> converter_;
  std::optional<DaemonPeer> daemon_;
};

class EnoughSpace : public Pass, public ::testing::WithParamInterface<uint64_t> {};

TEST_P(EnoughSpace, GoesOn) {
  PutPhotos({"a.jpg"});
  RunWithSpace(GetParam());
  EXPECT_EQ(Conversions(), 2U);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

// The low 32 bits of the last but one are 0; the last would be negative as a signed number.
INSTANTIATE_TEST_SUITE_P(Bytes, EnoughSpace,
                         ::testing::Values(kThreshold, kThreshold + 1, uint64_t{1} << 32,
                                           std::numeric_limits<uint64_t>::max()));

class TooLittleSpace : public Pass, public ::testing::WithParamInterface<uint64_t> {};

TEST_P(TooLittleSpace, Stops) {
  PutPhotos({"a.jpg", "b.jpg"});
  RunWithSpace(GetParam());
  EXPECT_EQ(Conversions(), 0U);
  EXPECT_THAT(Requests(), IsEmpty());
  EXPECT_THAT(ListDirectory(kMetadataRoot), ElementsAre("a.jpg"));
  EXPECT_THAT(ListDirectory(kMetadata), IsEmpty());
  EXPECT_FALSE(Exists("/var/spool/conv_progress_photo"));
  EXPECT_FALSE(Exists("/var/spool/thumb_create.queue"));
  EXPECT_THAT(ErrorLines(), ElementsAre(std::string(kNearlyFull) + "/tmp/photos/a.jpg"));
}

INSTANTIATE_TEST_SUITE_P(Bytes, TooLittleSpace, ::testing::Values(kThreshold - 1, 1, 0));

using FreeSpaceCheck = Pass;

TEST_F(FreeSpaceCheck, IsAskedOfTheDirectoryOnceForEachPhoto) {
  PutPhotos({"a.jpg", "b.jpg"});
  std::vector<std::string> asked;
  const FreeSpaceFake space([&](const std::string& path) {
    asked.push_back(path);
    return kThreshold;
  });
  CreateDirectoryThumbs(Job());
  EXPECT_THAT(asked, ElementsAre(kDir, kDir));
  EXPECT_EQ(Conversions(), 4U);
}

TEST_F(FreeSpaceCheck, IsNotAskedForAPhotoThatNeedsNothing) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"16\"\n");
  PutPhotos({"a.jpg"});
  WriteFile(Thumb("XL"), "xx");
  const FreeSpaceFake space([](const std::string&) {
    ADD_FAILURE() << "asked";
    return kThreshold;
  });
  CreateDirectoryThumbs(Job());
  EXPECT_THAT(Requests(), ElementsAre("POST_PHOTO_CONVERT"));
}

TEST_F(FreeSpaceCheck, IsAskedBeforeThePhaseIsChosen) {
  // The size map asks for more kinds than the profiles make: nothing is left to be made, but that
  // is detected after the free space has been checked.
  PutPhotos({"a.jpg"});
  for (const char* sizeClass : {"XL", "M", "B", "S"}) {
    WriteFile(Thumb(sizeClass), "xx");
  }
  RunWithSpace(kThreshold);
  EXPECT_THAT(Requests(), ElementsAre("POST_PHOTO_CONVERT"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
  RunWithSpace(kThreshold - 1);
  EXPECT_THAT(Requests(), SizeIs(1));
  EXPECT_THAT(ErrorLines(), ElementsAre(std::string(kNearlyFull) + kPhoto));
}

TEST_F(FreeSpaceCheck, StopsBeforeTheNextPhotoAndStillQueues) {
  PutPhotos({"a.jpg", "b.jpg", "c.jpg"});
  int asked = 0;
  const FreeSpaceFake space(
      [&](const std::string&) { return ++asked == 1 ? kThreshold : kThreshold - 1; });
  CreateDirectoryThumbs(Job());
  EXPECT_EQ(asked, 2);
  EXPECT_THAT(Requests(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
  EXPECT_THAT(ListDirectory(kMetadataRoot), ElementsAre("a.jpg", "b.jpg"));
  EXPECT_EQ(ReadFile("/var/spool/thumb_create.queue"), "/tmp/photos\n");
  EXPECT_THAT(ErrorLines(), ElementsAre(std::string(kNearlyFull) + "/tmp/photos/b.jpg"));
}

/// A photo that is removed between its first examination and its conversion.
class LostPhoto : public Pass {
 protected:
  /// Runs the pass over a.jpg and b.jpg; `lose` is called with the path of a.jpg when the free
  /// space is checked for it.
  void RunAndLose(const std::function<void(const char*)>& lose) const {
    PutPhotos({"a.jpg"});
    PutPhotos({"b.jpg"});
    bool lost = false;
    const FreeSpaceFake space([&](const std::string&) {
      if (!lost) {
        lose(kPhoto);
        lost = true;
      }
      return kThreshold;
    });
    CreateDirectoryThumbs(Job());
  }
};

TEST_F(LostPhoto, IsSilentlySkipped) {
  const std::function<void()> losses[] = {[] {},  // removed
                                          [] { ASSERT_EQ(mkdir(kPhoto, 0777), 0); },
                                          [] { ASSERT_EQ(mkfifo(kPhoto, 0666), 0); }};
  for (const auto& replace : losses) {
    SetUp();
    RunAndLose([&](const char* photo) {
      ASSERT_EQ(unlink(photo), 0);
      replace();
    });
    EXPECT_EQ(Conversions(), 2U);
    EXPECT_THAT(Requests(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
    EXPECT_THAT(ListDirectory(kMetadata), IsEmpty());
    EXPECT_EQ(ReadFile("/var/spool/conv_progress_photo"), "completed_thumb=\"3\"\n");
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }
}

using PassRegistration = Pass;

TEST_F(PassRegistration, NamesTheLargestThumbnailOfPhase0) {
  PutPhotos({"a.jpg"});
  const IndexFake index;
  CreateDirectoryThumbs(Job());
  ASSERT_THAT(index.Calls(), SizeIs(1));
  EXPECT_STREQ(index.Calls()[0].photo.path, kPhoto);
  EXPECT_STREQ(index.Calls()[0].thumbnail.path, Thumb("XL").c_str());
}

TEST_F(PassRegistration, IsNotMadeInLaterPhases) {
  PutPhotos({"a.jpg"});
  for (const char* sizeClass : {"XL", "M"}) {
    MakeJpeg(Thumb(sizeClass));
  }
  const IndexFake index;
  CreateDirectoryThumbs(Job());  // makes B
  CreateDirectoryThumbs(Job());  // makes S
  EXPECT_EQ(Conversions(), 2U);
  EXPECT_THAT(index.Calls(), IsEmpty());
}

TEST_F(PassRegistration, NamesTheThumbnailAsItIsWritten) {
  UseProfiles({{"thumb_m", 320, 80, std::nullopt, "VELAPHOTO:THUMB_M.jpg", 0}});
  PutPhotos({"a.jpg"});
  const IndexFake index;
  CreateDirectoryThumbs(Job());
  ASSERT_THAT(index.Calls(), SizeIs(1));
  EXPECT_STREQ(index.Calls()[0].thumbnail.path, Thumb("M").c_str());
}

TEST_F(PassRegistration, RefusalChangesNothing) {
  PutPhotos({"a.jpg"});
  const IndexFake index(-1);
  CreateDirectoryThumbs(Job());
  EXPECT_EQ(Conversions(), 2U);
  EXPECT_THAT(Requests(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
