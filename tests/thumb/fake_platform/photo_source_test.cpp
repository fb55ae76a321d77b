// What the pass does with the source of a photo: the decoded copy of a raw photo, and the turn that
// its owner gave it.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "support/daemon_peer.h"
#include "support/images.h"
#include "support/stub_tool.h"
#include "support/system_log.h"
#include "thumb/directory_pass.h"
#include "thumb/fake_platform/index_fake.h"
#include "thumb/fake_platform/source_fake.h"
#include "thumb/pass_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kRaw = "/tmp/photos/a.NEF";
constexpr const char* kRawMetadata = "/tmp/photos/@eaDir/a.NEF";
constexpr const char* kCopy = "/tmp/photos/@eaDir/a.NEF/decoded.jpg";
constexpr const char* kRawReference = "/tmp/photos/@eaDir/a.NEF/VELAPHOTO_THUMB_XL.jpg";
constexpr const char* kProgress = "/var/spool/conv_progress_photo";
constexpr int64_t kCopyTime = 1600000000;

class PhotoSource : public PassTest {
 protected:
  void SetUp() override {
    PassTest::SetUp();
    converter_ = std::make_unique<StubTool>(kConverterPath);
    daemon_ = std::make_unique<DaemonPeer>();
    source_ = std::make_unique<SourceFake>();
  }

  /// Puts a photo dated at this distance from now, seconds.
  static void PutPhoto(const std::string& path, int64_t secondsFromNow = -60) {
    MakeJpeg(path);
    SetFileTimeFromNow(path, secondsFromNow);
  }

  void RunPass() const { CreateDirectoryThumbs(Job()); }

  std::vector<std::string> Sources() const {
    std::vector<std::string> sources;
    for (const StubCall& call : converter_->Calls()) {
      sources.push_back(call.Parameters().at(2));
    }
    return sources;
  }

  /// The turns that each call is told, in degrees.
  std::vector<std::vector<std::string>> Turns() const {
    std::vector<std::vector<std::string>> turns;
    for (const StubCall& call : converter_->Calls()) {
      turns.emplace_back();
      for (auto it = call.arguments.begin(); it != call.arguments.end(); ++it) {
        if (*it == "-rotate") {
          turns.back().push_back(*(it + 1));
        }
      }
    }
    return turns;
  }

  const StubTool& Converter() const { return *converter_; }
  DaemonPeer& Daemon() const { return *daemon_; }
  SourceFake& Source() const { return *source_; }

 private:
  std::unique_ptr<StubTool> converter_;
  std::unique_ptr<DaemonPeer> daemon_;
  std::unique_ptr<SourceFake> source_;
};

class RawSource : public PhotoSource {
 protected:
  void SetUp() override {
    PhotoSource::SetUp();
    PutPhoto(kRaw);
    Source().decode = [](const std::string& metadataDir) {
      const std::string copy = metadataDir + "/decoded.jpg";
      MakeJpeg(copy);
      SetFileTime(copy, kCopyTime, 5);
      return copy;
    };
  }
};

TEST_F(RawSource, IsDecodedIntoItsMetadataDirectory) {
  RunPass();
  ASSERT_THAT(Source().decodings, SizeIs(1));
  EXPECT_EQ(kRaw, Source().decodings[0].path);
  EXPECT_EQ(kRawMetadata, Source().decodings[0].metadataDir);
  EXPECT_EQ(4U, Source().decodings[0].profiles);
}

TEST_F(RawSource, ThumbnailsAreMadeOfTheDecodedCopy) {
  RunPass();
  EXPECT_THAT(Sources(), ElementsAre(kCopy, kRawReference));
  EXPECT_THAT(
      ListDirectory(kRawMetadata),
      ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawSource, DaemonIsAskedAboutTheCopyAndToldOfThePhoto) {
  RunPass();
  ASSERT_THAT(Daemon().Requests(), SizeIs(2));
  EXPECT_EQ(std::string("{\"command\":\"GET_INDEX_VERSION\",\"path\":\"") + kCopy + "\"}\n",
            Daemon().Requests()[0].bytes);
  EXPECT_EQ(std::string("{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"") + kRaw + "\"}\n",
            Daemon().Requests()[1].bytes);
}

TEST_F(RawSource, PhotoItselfIsRegistered) {
  const IndexFake index;
  RunPass();
  ASSERT_THAT(index.Calls(), SizeIs(1));
  EXPECT_STREQ(kRaw, index.Calls()[0].photo.path);
  EXPECT_STREQ(kRawReference, index.Calls()[0].thumbnail.path);
}

TEST_F(RawSource, CopyIsRemovedBeforePhase1) {
  Converter().PlanCall(
      2, StubPlan().WriteOutputs().Run("/bin/mv", {kCopy, "/tmp/still.there"}).Exit(0));
  RunPass();
  EXPECT_THAT(Sources(), SizeIs(2));
  EXPECT_FALSE(Exists("/tmp/still.there"));
  EXPECT_FALSE(Exists(kCopy));
}

TEST_F(RawSource, CopyIsRemovedAfterAFailureToo) {
  Converter().Plan(StubPlan().Exit(1));
  RunPass();
  EXPECT_THAT(ListDirectory(kRawMetadata),
              ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                          "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_TRUE(Exists(kRaw));
}

TEST_F(RawSource, CopyKeepsItsDateForAPhotoOfThePast) {
  Converter().PlanCall(1, StubPlan().WriteOutputs().Run("/bin/cp", {"-p", kCopy, "/tmp/copy"}));
  RunPass();
  EXPECT_EQ((FileTime{kCopyTime, 5}), ModificationTime("/tmp/copy"));
}

TEST_F(RawSource, CopyIsDatedLikeAPhotoOfTheFuture) {
  SetFileTimeFromNow(kRaw, 3600);
  const int64_t second = ModificationTime(kRaw).seconds;
  SetFileTime(kRaw, second, 123456789);
  Converter().PlanCall(1, StubPlan().WriteOutputs().Run("/bin/cp", {"-p", kCopy, "/tmp/copy"}));
  RunPass();
  EXPECT_EQ((FileTime{second, 0}), ModificationTime("/tmp/copy"));
  EXPECT_EQ((FileTime{second, 0}), AccessTime("/tmp/copy"));
  EXPECT_EQ((FileTime{second, 0}), ModificationTime(kRawReference));
}

TEST_F(RawSource, PhotoOfTheFutureKeepsItsOwnDate) {
  SetFileTimeFromNow(kRaw, 3600);
  const FileTime before = ModificationTime(kRaw);
  RunPass();
  EXPECT_EQ(before, ModificationTime(kRaw));
}

TEST_F(RawSource, CopyThatIsNoFileIsPassedOverInSilence) {
  Source().decode = [](const std::string& metadataDir) {
    MakeDirectories(metadataDir + "/decoded.jpg");
    return metadataDir + "/decoded.jpg";
  };
  RunPass();
  EXPECT_THAT(Daemon().Commands(), IsEmpty());
  EXPECT_THAT(Sources(), IsEmpty());
  EXPECT_FALSE(Exists(kProgress));
  EXPECT_THAT(ListDirectory(kRawMetadata), ElementsAre("decoded.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawSource, CopyThatIsMissingIsPassedOverInSilence) {
  Source().decode = [](const std::string& metadataDir) { return metadataDir + "/missing.jpg"; };
  RunPass();
  EXPECT_THAT(Daemon().Commands(), IsEmpty());
  EXPECT_FALSE(Exists(kProgress));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawSource, FailedDecodingGivesThePhotoUp) {
  Source().decode = nullptr;
  RunPass();
  EXPECT_THAT(ListDirectory(kRawMetadata),
              ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                          "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_EQ("completed=\"1\"\ncompleted_thumb=\"4\"\n", ReadFile(kProgress));
  EXPECT_THAT(Daemon().Commands(), ElementsAre("POST_PHOTO_CONVERT"));
  EXPECT_THAT(Sources(), IsEmpty());
  EXPECT_THAT(Source().rotations, IsEmpty());
}

TEST_F(RawSource, IsDecodedInPhase0Only) {
  for (const char* sizeClass : {"XL", "M"}) {
    MakeJpeg(std::string(kRawMetadata) + "/VELAPHOTO_THUMB_" + sizeClass + ".jpg");
  }
  RunPass();
  RunPass();
  EXPECT_THAT(Source().decodings, IsEmpty());
  EXPECT_THAT(Sources(), ElementsAre(kRawReference, kRawReference));
}

TEST_F(RawSource, RotationIsLookedForInTheCopy) {
  Daemon().SetIndexVersion(1);
  RunPass();
  ASSERT_THAT(Source().rotations, SizeIs(1));
  EXPECT_EQ(kCopy, Source().rotations[0].path);
  EXPECT_EQ(kRawMetadata, Source().rotations[0].metadataDir);
}

class OrdinarySource : public PhotoSource {
 protected:
  void SetUp() override {
    PhotoSource::SetUp();
    PutPhoto(kPhoto);
  }
};

TEST_F(OrdinarySource, IsNotDecodedAndStays) {
  RunPass();
  EXPECT_THAT(Source().decodings, IsEmpty());
  EXPECT_TRUE(Exists(kPhoto));
}

TEST_F(OrdinarySource, OfTheFutureKeepsItsDate) {
  SetFileTimeFromNow(kPhoto, 3600);
  const FileTime before = ModificationTime(kPhoto);
  RunPass();
  EXPECT_EQ(before, ModificationTime(kPhoto));
}

TEST_F(OrdinarySource, RotationOfANewIndexIsAppliedInPhase0Only) {
  Daemon().SetIndexVersion(1);
  Source().rotation = 270;
  RunPass();
  ASSERT_THAT(Source().rotations, SizeIs(1));
  EXPECT_EQ(kPhoto, Source().rotations[0].path);
  EXPECT_EQ(kMetadata, Source().rotations[0].metadataDir);
  EXPECT_EQ(4U, Source().rotations[0].profiles);
  EXPECT_THAT(Turns(), ElementsAre(ElementsAre("270", "270"), IsEmpty()));
}

TEST_F(OrdinarySource, NoRotationIsLookedForInAnOldIndex) {
  Source().rotation = 90;
  RunPass();
  EXPECT_THAT(Source().rotations, IsEmpty());
  EXPECT_THAT(Turns(), ElementsAre(IsEmpty(), IsEmpty()));
}

TEST_F(OrdinarySource, NoRotationIsLookedForInLaterPhases) {
  Daemon().SetIndexVersion(2);
  Source().rotation = 180;
  for (const char* sizeClass : {"XL", "M"}) {
    MakeJpeg(Thumb(sizeClass));
  }
  RunPass();
  RunPass();
  EXPECT_THAT(Source().rotations, IsEmpty());
  EXPECT_THAT(Turns(), ElementsAre(IsEmpty(), IsEmpty()));
}

TEST_F(OrdinarySource, RotationOfOnePhotoIsNotThatOfTheNext) {
  PutPhoto(std::string(kDir) + "/b.jpg");
  Daemon().AnswerNext(DaemonReply::Line("{\"success\":true,\"version\":1}"));
  Source().rotation = 90;
  RunPass();
  EXPECT_THAT(Turns(), ElementsAre(ElementsAre("90", "90"), IsEmpty(), IsEmpty(), IsEmpty()));
}

}  // namespace
}  // namespace vela_test
