// The removal of a photo's old failure markers.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class FailMarkers : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    WriteFile(kSettings, kThreePhasesSizeMap);
  }

  static std::string In(const std::string& name) { return std::string(kPhotos) + "/" + name; }

  /// A photo that needs no thumbnails.
  static std::string PutDonePhoto(const std::string& name) {
    MakePhoto(In(name));
    PutThumbs(In(name), {"XL", "M", "B", "S"});
    return In(name);
  }
};

TEST_F(FailMarkers, AreRemovedAlsoWhenNothingIsToBeMade) {
  const DaemonPeer daemon;
  const std::string photo = PutDonePhoto("a.jpg");
  WriteFile(Marker(photo, "XL"), "");
  WriteFile(Marker(photo, "L"), "");
  WriteFile(MetadataDirOf(photo) + "/anything.fail", "");
  WriteFile(MetadataDirOf(photo) + "/.hidden.fail", "");
  WriteFile(MetadataDirOf(photo) + "/fail", "");
  WriteFile(MetadataDirOf(photo) + "/x.fail.txt", "");
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(photo),
              ElementsAre(".hidden.fail", "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                          "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_XL.jpg", "fail", "x.fail.txt"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FailMarkers, OfOtherPhotosStay) {
  PutDonePhoto("a.jpg");
  // No photo of that name any more.
  WriteFile(Marker(In("gone.jpg"), "XL"), "");
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(In("gone.jpg")), ElementsAre("VELAPHOTO_THUMB_XL.fail"));
}

/// A photo whose name is a pattern, and a name that this pattern would match.
struct Names {
  const char* photo;
  const char* neighbour;
};

class PatternNames : public FailMarkers, public ::testing::WithParamInterface<Names> {};

TEST_P(PatternNames, AreNotTakenForPatterns) {
  const std::string photo = PutDonePhoto(GetParam().photo);
  WriteFile(Marker(photo, "M"), "");
  WriteFile(Marker(In(GetParam().neighbour), "M"), "");
  EXPECT_GOOD_END(Run());
  EXPECT_FALSE(Exists(Marker(photo, "M")));
  EXPECT_TRUE(Exists(Marker(In(GetParam().neighbour), "M")));
}

INSTANTIATE_TEST_SUITE_P(Names, PatternNames,
                         ::testing::Values(Names{"a[1].jpg", "a1.jpg"}, Names{"*.jpg", "z.jpg"},
                                           Names{"b?.jpg", "bb.jpg"}, Names{"c\\d.jpg", "cd.jpg"},
                                           Names{"[a-z].jpg", "q.jpg"}));

TEST_F(FailMarkers, DirectoryNamesAreNotTakenForPatternsEither) {
  const std::string photo = "/tmp/[ab]*/x.jpg";
  MakePhoto(photo);
  PutThumbs(photo, {"XL", "M", "B", "S"});
  WriteFile(Marker(photo, "M"), "");
  WriteFile(Marker("/tmp/a/x.jpg", "M"), "");
  EXPECT_GOOD_END(Run({"/tmp/[ab]*"}));
  EXPECT_FALSE(Exists(Marker(photo, "M")));
  EXPECT_TRUE(Exists(Marker("/tmp/a/x.jpg", "M")));
}

TEST_F(FailMarkers, OneThatStaysIsLoggedAndThePhotoIsTaken) {
  const DaemonPeer daemon;
  const std::string photo = MakePhoto(In("a[1]%s.jpg"));
  WriteFile(MetadataDirOf(photo) + "/1.fail", "");
  MakeDirectories(MetadataDirOf(photo) + "/2.fail");
  WriteFile(MetadataDirOf(photo) + "/3.fail", "");
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(photo), ElementsAre("2.fail", "VELAPHOTO_THUMB_B.jpg",
                                             "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(photo));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:880 Failed to remove files by pattern "
                                        "[/tmp/photos/@eaDir/a[1]%s.jpg/*.fail]"));
}

TEST_F(FailMarkers, ReadOnlyMetadataIsLogged) {
  const DaemonPeer daemon;
  const std::string photo = PutDonePhoto("a.jpg");
  WriteFile(Marker(photo, "XL"), "");
  const ReadOnlyMount mount(MetadataDirOf(photo));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(photo));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:880 Failed to remove files by pattern "
                                        "[/tmp/photos/@eaDir/a.jpg/*.fail]"));
}

TEST_F(FailMarkers, FailedPhotosAreTriedAgain) {
  const std::string photo = MakePhoto(In("a.jpg"));
  Converter().PlanCall(1, StubPlan().Exit(1));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(photo), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                             "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(photo), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                             "VELAPHOTO_THUMB_XL.jpg"));
}

}  // namespace
}  // namespace vela_test
