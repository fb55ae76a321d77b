// The removal of a photo's old failure markers.
#include <sys/stat.h>
#include <unistd.h>

#include "program/stub_program_test.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

class FailMarkers : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    WriteFile(kSettings, kThreePhasesSizeMap);
  }

  /// A photo that needs no thumbnails.
  static std::string PutDonePhoto(const std::string& name) {
    MakePhoto(InPhotos(name));
    PutThumbs(InPhotos(name), {"XL", "M", "B", "S"});
    return InPhotos(name);
  }
};

TEST_F(FailMarkers, AreRemovedEvenIfNothingHasToBeMade) {
  const std::string photo = PutDonePhoto("a.jpg");
  WriteFile(Marker(photo, "XL"), "");
  WriteFile(Marker(photo, "L"), "");
  WriteFile(MetadataDirOf(photo) + "/anything.fail", "");
  WriteFile(MetadataDirOf(photo) + "/.hidden.fail", "");
  WriteFile(MetadataDirOf(photo) + "/fail", "");
  WriteFile(MetadataDirOf(photo) + "/x.fail.txt", "");
  RunWithDaemon();
  EXPECT_THAT(MetadataOf(photo),
              ElementsAre(".hidden.fail", "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                          "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_XL.jpg", "fail", "x.fail.txt"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FailMarkers, OfOtherPhotosStay) {
  PutDonePhoto("a.jpg");
  // A photo of that name no longer exists.
  WriteFile(Marker(InPhotos("gone.jpg"), "XL"), "");
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(MetadataOf(InPhotos("gone.jpg")), ElementsAre("VELAPHOTO_THUMB_XL.fail"));
}

/// A photo whose name is a pattern, and a name that this pattern would match.
struct Names : NamedCase {
  const char* photo;
  const char* neighbour;
};

class PatternNames : public FailMarkers, public ::testing::WithParamInterface<Names> {};

TEST_P(PatternNames, AreNotPatterns) {
  const std::string photo = PutDonePhoto(GetParam().photo);
  WriteFile(Marker(photo, "M"), "");
  WriteFile(Marker(InPhotos(GetParam().neighbour), "M"), "");
  EXPECT_SUCCESS(Run());
  EXPECT_FALSE(Exists(Marker(photo, "M")));
  EXPECT_TRUE(Exists(Marker(InPhotos(GetParam().neighbour), "M")));
}

INSTANTIATE_TEST_SUITE_P(Names, PatternNames,
                         ::testing::Values(Names{"Set", "a[1].jpg", "a1.jpg"},
                                           Names{"Star", "*.jpg", "z.jpg"},
                                           Names{"QuestionMark", "b?.jpg", "bb.jpg"},
                                           Names{"Backslash", "c\\d.jpg", "cd.jpg"},
                                           Names{"Range", "[a-z].jpg", "q.jpg"}),
                         CaseName());

TEST_F(FailMarkers, DirectoryNamesAreNotPatternsEither) {
  const std::string photo = "/tmp/[ab]*/x.jpg";
  MakePhoto(photo);
  PutThumbs(photo, {"XL", "M", "B", "S"});
  WriteFile(Marker(photo, "M"), "");
  WriteFile(Marker("/tmp/a/x.jpg", "M"), "");
  EXPECT_SUCCESS(Run({"/tmp/[ab]*"}));
  EXPECT_FALSE(Exists(Marker(photo, "M")));
  EXPECT_TRUE(Exists(Marker("/tmp/a/x.jpg", "M")));
}

TEST_F(FailMarkers, FailureToRemoveOneIsLoggedAndThePhotoIsProcessed) {
  const std::string photo = MakePhoto(InPhotos("a[1]%s.jpg"));
  WriteFile(MetadataDirOf(photo) + "/1.fail", "");
  MakeDirectories(MetadataDirOf(photo) + "/2.fail");
  WriteFile(MetadataDirOf(photo) + "/3.fail", "");
  EXPECT_THAT(ReportedPhotos(RunWithDaemon()), ElementsAre(photo));
  EXPECT_THAT(MetadataOf(photo), ElementsAre("2.fail", "VELAPHOTO_THUMB_B.jpg",
                                             "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:880 Failed to remove files by pattern "
                                        "[/tmp/photos/@eaDir/a[1]%s.jpg/*.fail]"));
}

TEST_F(FailMarkers, ReadOnlyMetadataIsLogged) {
  const std::string photo = PutDonePhoto("a.jpg");
  WriteFile(Marker(photo, "XL"), "");
  const ReadOnlyMount mount(MetadataDirOf(photo));
  EXPECT_THAT(ReportedPhotos(RunWithDaemon()), ElementsAre(photo));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:880 Failed to remove files by pattern "
                                        "[/tmp/photos/@eaDir/a.jpg/*.fail]"));
}

TEST_F(FailMarkers, FailedPhotosAreTriedAgain) {
  const std::string photo = MakePhoto(InPhotos("a.jpg"));
  Converter().PlanCall(1, StubPlan().Exit(1));
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(photo), kAllMarkers);
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(photo), kThumbsOfFirstRun);
}

}  // namespace
}  // namespace vela_test
