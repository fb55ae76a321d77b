// What the pass does with the source of a photo: the decoded copy of a raw photo, and the rotation
// of its thumbnails.

#include <optional>

#include "thumb/directory_pass.h"
#include "thumb/fake_platform/index_fake.h"
#include "thumb/fake_platform/source_fake.h"
#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

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
    converter_.emplace(kConverterPath);
    daemon_.emplace();
  }

  /// Makes a photo dated this number of seconds from now.
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

  /// The rotations requested in each call, in degrees.
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

  std::optional<StubTool> converter_;
  std::optional<DaemonPeer> daemon_;
  SourceFake source_;
};

class RawSource : public PhotoSource {
 protected:
  void SetUp() override {
    PhotoSource::SetUp();
    PutPhoto(kRaw);
    source_.decode = [](const std::string& metadataDir) {
      const std::string copy = MakeJpeg(metadataDir + "/decoded.jpg");
      SetFileTime(copy, kCopyTime, 5);
      return copy;
    };
  }
};

TEST_F(RawSource, IsDecodedIntoItsMetadataDirectory) {
  RunPass();
  ASSERT_THAT(source_.decodings, SizeIs(1));
  EXPECT_EQ(source_.decodings[0].path, kRaw);
  EXPECT_EQ(source_.decodings[0].metadataDir, kRawMetadata);
  EXPECT_EQ(source_.decodings[0].profiles, 4U);
  EXPECT_THAT(Sources(), ElementsAre(kCopy, kRawReference));
  EXPECT_THAT(
      ListDirectory(kRawMetadata),
      ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawSource, VersionRequestNamesTheCopyAndReportThePhoto) {
  RunPass();
  ASSERT_THAT(daemon_->Requests(), SizeIs(2));
  EXPECT_EQ(daemon_->Requests()[0].bytes,
            std::string("{\"command\":\"GET_INDEX_VERSION\",\"path\":\"") + kCopy + "\"}\n");
  EXPECT_EQ(daemon_->Requests()[1].bytes,
            std::string("{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"") + kRaw + "\"}\n");
}

TEST_F(RawSource, PhotoItselfIsRegistered) {
  const IndexFake index;
  RunPass();
  ASSERT_THAT(index.Calls(), SizeIs(1));
  EXPECT_STREQ(index.Calls()[0].photo.path, kRaw);
  EXPECT_STREQ(index.Calls()[0].thumbnail.path, kRawReference);
}

TEST_F(RawSource, CopyIsRemovedBeforePhase1) {
  converter_->PlanCall(
      2, StubPlan().WriteOutputs().Run("/bin/mv", {kCopy, "/tmp/still.there"}).Exit(0));
  RunPass();
  EXPECT_THAT(Sources(), SizeIs(2));
  EXPECT_FALSE(Exists("/tmp/still.there"));
  EXPECT_FALSE(Exists(kCopy));
}

TEST_F(RawSource, CopyIsRemovedAfterAFailureToo) {
  converter_->Plan(StubPlan().Exit(1));
  RunPass();
  EXPECT_THAT(ListDirectory(kRawMetadata),
              ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                          "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_TRUE(Exists(kRaw));
}

TEST_F(RawSource, CopyKeepsItsDateForAPhotoOfThePast) {
  converter_->PlanCall(1, StubPlan().WriteOutputs().Run("/bin/cp", {"-p", kCopy, "/tmp/copy"}));
  RunPass();
  EXPECT_EQ(ModificationTime("/tmp/copy"), (FileTime{kCopyTime, 5}));
}

TEST_F(RawSource, CopyIsDatedLikeAPhotoOfTheFuture) {
  SetFileTimeFromNow(kRaw, 3600);
  const int64_t second = ModificationTime(kRaw).seconds;
  SetFileTime(kRaw, second, 123456789);
  converter_->PlanCall(1, StubPlan().WriteOutputs().Run("/bin/cp", {"-p", kCopy, "/tmp/copy"}));
  RunPass();
  EXPECT_EQ(ModificationTime("/tmp/copy"), (FileTime{second, 0}));
  EXPECT_EQ(AccessTime("/tmp/copy"), (FileTime{second, 0}));
  EXPECT_EQ(ModificationTime(kRawReference), (FileTime{second, 0}));
  EXPECT_EQ(ModificationTime(kRaw), (FileTime{second, 123456789}));
}

TEST_F(RawSource, CopyThatIsNoFileIsSilentlySkipped) {
  for (const bool isDirectory : {true, false}) {
    source_.decode = [=](const std::string& metadataDir) {
      const std::string copy = metadataDir + (isDirectory ? "/directory" : "/missing.jpg");
      if (isDirectory) {
        MakeDirectories(copy);
      }
      return copy;
    };
    RunPass();
    EXPECT_THAT(daemon_->Commands(), IsEmpty());
    EXPECT_THAT(Sources(), IsEmpty());
    EXPECT_FALSE(Exists(kProgress));
    EXPECT_THAT(ListDirectory(kRawMetadata), ElementsAre("directory"));
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }
}

TEST_F(RawSource, FailedDecodingMarksThePhotoAsFailed) {
  source_.decode = nullptr;
  RunPass();
  EXPECT_THAT(ListDirectory(kRawMetadata),
              ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                          "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_EQ(ReadFile(kProgress), "completed=\"1\"\ncompleted_thumb=\"4\"\n");
  EXPECT_THAT(daemon_->Commands(), ElementsAre("POST_PHOTO_CONVERT"));
  EXPECT_THAT(Sources(), IsEmpty());
  EXPECT_THAT(source_.rotations, IsEmpty());
}

TEST_F(RawSource, IsDecodedInPhase0Only) {
  for (const char* sizeClass : {"XL", "M"}) {
    MakeJpeg(std::string(kRawMetadata) + "/VELAPHOTO_THUMB_" + sizeClass + ".jpg");
  }
  RunPass();
  RunPass();
  EXPECT_THAT(source_.decodings, IsEmpty());
  EXPECT_THAT(Sources(), ElementsAre(kRawReference, kRawReference));
}

TEST_F(RawSource, RotationIsDetectedInTheCopy) {
  daemon_->SetIndexVersion(1);
  RunPass();
  ASSERT_THAT(source_.rotations, SizeIs(1));
  EXPECT_EQ(source_.rotations[0].path, kCopy);
  EXPECT_EQ(source_.rotations[0].metadataDir, kRawMetadata);
}

class OrdinarySource : public PhotoSource {
 protected:
  void SetUp() override {
    PhotoSource::SetUp();
    PutPhoto(kPhoto);
  }
};

TEST_F(OrdinarySource, IsNeitherDecodedNorRemoved) {
  RunPass();
  EXPECT_THAT(source_.decodings, IsEmpty());
  EXPECT_TRUE(Exists(kPhoto));
}

TEST_F(OrdinarySource, OfTheFutureKeepsItsDate) {
  SetFileTimeFromNow(kPhoto, 3600);
  const FileTime before = ModificationTime(kPhoto);
  RunPass();
  EXPECT_EQ(ModificationTime(kPhoto), before);
}

TEST_F(OrdinarySource, RotationOfANewIndexIsAppliedInPhase0Only) {
  daemon_->SetIndexVersion(1);
  source_.rotation = 270;
  RunPass();
  ASSERT_THAT(source_.rotations, SizeIs(1));
  EXPECT_EQ(source_.rotations[0].path, kPhoto);
  EXPECT_EQ(source_.rotations[0].metadataDir, kMetadata);
  EXPECT_EQ(source_.rotations[0].profiles, 4U);
  EXPECT_THAT(Turns(), ElementsAre(ElementsAre("270", "270"), IsEmpty()));
}

TEST_F(OrdinarySource, RotationIsNotDetectedInAnOldIndex) {
  source_.rotation = 90;
  RunPass();
  EXPECT_THAT(source_.rotations, IsEmpty());
  EXPECT_THAT(Turns(), ElementsAre(IsEmpty(), IsEmpty()));
}

TEST_F(OrdinarySource, RotationIsNotDetectedInLaterPhases) {
  daemon_->SetIndexVersion(2);
  source_.rotation = 180;
  for (const char* sizeClass : {"XL", "M"}) {
    MakeJpeg(Thumb(sizeClass));
  }
  RunPass();
  RunPass();
  EXPECT_THAT(source_.rotations, IsEmpty());
  EXPECT_THAT(Turns(), ElementsAre(IsEmpty(), IsEmpty()));
}

TEST_F(OrdinarySource, RotationOfOnePhotoIsNotThatOfTheNext) {
  PutPhoto(std::string(kDir) + "/b.jpg");
  daemon_->AnswerNext(DaemonReply::Line("{\"success\":true,\"version\":1}"));
  source_.rotation = 90;
  RunPass();
  EXPECT_THAT(Turns(), ElementsAre(ElementsAre("90", "90"), IsEmpty(), IsEmpty(), IsEmpty()));
}

}  // namespace
}  // namespace vela_test
