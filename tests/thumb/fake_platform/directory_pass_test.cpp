// The pass over a directory where it asks for the volume's free space, and what may happen to a
// photo while it does.
#include "thumb/directory_pass.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <limits>
#include <string>
#include <vector>

#include "support/daemon_peer.h"
#include "support/images.h"
#include "support/stub_tool.h"
#include "support/system_log.h"
#include "thumb/fake_platform/free_space_fake.h"
#include "thumb/fake_platform/index_fake.h"
#include "thumb/pass_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr uint64_t kThreshold = 1073741824;
constexpr const char* kNearlyFull =
    "velathumb:893 Stopping creating thumbs as the disk space is near full, ";

class Pass : public PassTest {
 protected:
  void SetUp() override {
    PassTest::SetUp();
    converter_ = std::make_unique<StubTool>(kConverterPath);
    daemon_ = std::make_unique<DaemonPeer>();
  }

  static void PutPhoto(const std::string& name) {
    MakeJpeg(std::string(kDir) + "/" + name);
    SetFileTimeFromNow(std::string(kDir) + "/" + name, -60);
  }

  size_t Conversions() const { return converter_->Calls().size(); }
  std::vector<std::string> Requests() const { return daemon_->Commands(); }

 private:
  std::unique_ptr<StubTool> converter_;
  std::unique_ptr<DaemonPeer> daemon_;
};

class EnoughSpace : public Pass, public ::testing::WithParamInterface<uint64_t> {};

TEST_P(EnoughSpace, GoesOn) {
  PutPhoto("a.jpg");
  const FreeSpaceFake space([](const std::string&) { return GetParam(); });
  CreateDirectoryThumbs(Job());
  EXPECT_EQ(2U, Conversions());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

// The last but one has its low 32 bits all 0, the last would be negative with a sign.
INSTANTIATE_TEST_SUITE_P(Bytes, EnoughSpace,
                         ::testing::Values(kThreshold, kThreshold + 1, uint64_t{1} << 32,
                                           std::numeric_limits<uint64_t>::max()));

class TooLittleSpace : public Pass, public ::testing::WithParamInterface<uint64_t> {};

TEST_P(TooLittleSpace, Stops) {
  PutPhoto("a.jpg");
  PutPhoto("b.jpg");
  const FreeSpaceFake space([](const std::string&) { return GetParam(); });
  CreateDirectoryThumbs(Job());
  EXPECT_EQ(0U, Conversions());
  EXPECT_THAT(Requests(), IsEmpty());
  EXPECT_THAT(ListDirectory(kMetadataRoot), ElementsAre("a.jpg"));
  EXPECT_THAT(ListDirectory(kMetadata), IsEmpty());
  EXPECT_FALSE(Exists("/var/spool/conv_progress_photo"));
  EXPECT_FALSE(Exists("/var/spool/thumb_create.queue"));
  EXPECT_THAT(ErrorLines(), ElementsAre(std::string(kNearlyFull) + "/tmp/photos/a.jpg"));
}

INSTANTIATE_TEST_SUITE_P(Bytes, TooLittleSpace, ::testing::Values(kThreshold - 1, 1, 0));

class SpaceQuestion : public Pass {};

TEST_F(SpaceQuestion, IsAskedOfTheDirectoryOnceForEachPhoto) {
  PutPhoto("a.jpg");
  PutPhoto("b.jpg");
  std::vector<std::string> asked;
  const FreeSpaceFake space([&](const std::string& path) {
    asked.push_back(path);
    return kThreshold;
  });
  CreateDirectoryThumbs(Job());
  EXPECT_THAT(asked, ElementsAre(kDir, kDir));
  EXPECT_EQ(4U, Conversions());
}

TEST_F(SpaceQuestion, IsNotAskedForAPhotoThatNeedsNothing) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"16\"\n");
  PutPhoto("a.jpg");
  WriteFile(Thumb("XL"), "xx");
  const FreeSpaceFake space([](const std::string&) {
    ADD_FAILURE() << "asked";
    return kThreshold;
  });
  CreateDirectoryThumbs(Job());
  EXPECT_THAT(Requests(), ElementsAre("POST_PHOTO_CONVERT"));
}

TEST_F(SpaceQuestion, IsAskedBeforeThePhaseIsChosen) {
  // The size map asks for more kinds than the profiles make: nothing is left to be made, but that
  // is found out after the question.
  PutPhoto("a.jpg");
  for (const char* sizeClass : {"XL", "M", "B", "S"}) {
    WriteFile(Thumb(sizeClass), "xx");
  }
  {
    const FreeSpaceFake space([](const std::string&) { return kThreshold; });
    CreateDirectoryThumbs(Job());
    EXPECT_THAT(Requests(), ElementsAre("POST_PHOTO_CONVERT"));
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }
  const FreeSpaceFake space([](const std::string&) { return kThreshold - 1; });
  CreateDirectoryThumbs(Job());
  EXPECT_THAT(Requests(), SizeIs(1));
  EXPECT_THAT(ErrorLines(), ElementsAre(std::string(kNearlyFull) + kPhoto));
}

TEST_F(SpaceQuestion, StopsBeforeTheNextPhotoAndStillQueues) {
  for (const char* name : {"a.jpg", "b.jpg", "c.jpg"}) {
    PutPhoto(name);
  }
  int asked = 0;
  const FreeSpaceFake space(
      [&](const std::string&) { return ++asked == 1 ? kThreshold : kThreshold - 1; });
  CreateDirectoryThumbs(Job());
  EXPECT_EQ(2, asked);
  EXPECT_THAT(Requests(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
  EXPECT_THAT(ListDirectory(kMetadataRoot), ElementsAre("a.jpg", "b.jpg"));
  EXPECT_EQ("/tmp/photos\n", ReadFile("/var/spool/thumb_create.queue"));
  EXPECT_THAT(ErrorLines(), ElementsAre(std::string(kNearlyFull) + "/tmp/photos/b.jpg"));
}

/// What becomes of a photo between its first examination and its conversion.
class LostPhoto : public Pass {
 protected:
  /// Runs the pass over a.jpg and b.jpg; `lose` is called with the path of a.jpg when the free
  /// space is asked for on its behalf.
  void RunAndLose(const std::function<void(const char*)>& lose) const {
    PutPhoto("a.jpg");
    PutPhoto("b.jpg");
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

  /// Nothing was done for a.jpg, and nothing said; b.jpg has its thumbnails.
  void ExpectOnlyTheOtherPhoto() const {
    EXPECT_EQ(2U, Conversions());
    EXPECT_THAT(Requests(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
    EXPECT_THAT(ListDirectory(kMetadata), IsEmpty());
    EXPECT_EQ("completed_thumb=\"3\"\n", ReadFile("/var/spool/conv_progress_photo"));
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }
};

TEST_F(LostPhoto, RemovedOneIsPassedOver) {
  RunAndLose([](const char* photo) { ASSERT_EQ(0, unlink(photo)); });
  ExpectOnlyTheOtherPhoto();
}

TEST_F(LostPhoto, OneThatBecameADirectoryIsPassedOver) {
  RunAndLose([](const char* photo) {
    ASSERT_EQ(0, unlink(photo));
    ASSERT_EQ(0, mkdir(photo, 0777));
  });
  ExpectOnlyTheOtherPhoto();
}

TEST_F(LostPhoto, OneThatBecameAPipeIsPassedOver) {
  RunAndLose([](const char* photo) {
    ASSERT_EQ(0, unlink(photo));
    ASSERT_EQ(0, mkfifo(photo, 0666));
  });
  ExpectOnlyTheOtherPhoto();
}

class PassRegistration : public Pass {};

TEST_F(PassRegistration, TellsTheLargestThumbnailOfPhase0) {
  PutPhoto("a.jpg");
  const IndexFake index;
  CreateDirectoryThumbs(Job());
  ASSERT_THAT(index.Calls(), SizeIs(1));
  EXPECT_STREQ(kPhoto, index.Calls()[0].photo.path);
  EXPECT_STREQ(Thumb("XL").c_str(), index.Calls()[0].thumbnail.path);
}

TEST_F(PassRegistration, TellsNothingOfLaterPhases) {
  PutPhoto("a.jpg");
  for (const char* sizeClass : {"XL", "M"}) {
    MakeJpeg(Thumb(sizeClass));
  }
  const IndexFake index;
  CreateDirectoryThumbs(Job());  // makes B
  CreateDirectoryThumbs(Job());  // makes S
  EXPECT_EQ(2U, Conversions());
  EXPECT_THAT(index.Calls(), IsEmpty());
}

TEST_F(PassRegistration, NamesTheThumbnailAsItIsWritten) {
  UseProfiles({{"thumb_m", 320, 80, std::nullopt, "VELAPHOTO:THUMB_M.jpg", 0}});
  PutPhoto("a.jpg");
  const IndexFake index;
  CreateDirectoryThumbs(Job());
  ASSERT_THAT(index.Calls(), SizeIs(1));
  EXPECT_STREQ(Thumb("M").c_str(), index.Calls()[0].thumbnail.path);
}

TEST_F(PassRegistration, RefusalChangesNothing) {
  PutPhoto("a.jpg");
  const IndexFake index(-1);
  CreateDirectoryThumbs(Job());
  EXPECT_EQ(2U, Conversions());
  EXPECT_THAT(Requests(), ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
