// Thumbnails of camera raw photos, with the real tools.

#include <optional>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

std::vector<Strings> ParametersOf(const StubTool& tool) {
  std::vector<Strings> parameters;
  for (const StubCall& call : tool.Calls()) {
    parameters.push_back(call.Parameters());
  }
  return parameters;
}

class RawThumbs : public RealProgramTest {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    InstallRealExiftool();
    daemon_.emplace();
  }

  static std::string MakeRaw(const RawRecipe& recipe, const std::string& name = "a.dng") {
    MakeRawPhoto(InPhotos(name), recipe);
    SetFileTimeFromNow(InPhotos(name), -60);
    return InPhotos(name);
  }

  /// Expects all thumbnails, showing these quadrants, and no other files.
  void ExpectThumbs(const std::string& photo, const std::string& letters) const {
    EXPECT_TRUE(HasThumbs(photo, kinds_));
    for (const Kind& kind : kinds_) {
      EXPECT_EQ(QuadrantLetters(ThumbOf(photo, kind)), letters) << kind.name;
    }
    EXPECT_THAT(ListDirectory(MetadataDirOf(photo)), SizeIs(kinds_.size()));
  }

  void ExpectMade(const RawRecipe& recipe, const std::string& letters) {
    const std::string photo = MakeRaw(recipe);
    Make();
    EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 0)));
    EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 1)));
    EXPECT_EQ(ListDirectory(MetadataDirOf(photo)).size(), 4U);
    EXPECT_EQ(Progress("completed"), 0);
    EXPECT_EQ(Progress("completed_thumb"), 4);
    Make();
    ExpectThumbs(photo, letters);
    EXPECT_EQ(Progress("completed"), 1);
    EXPECT_EQ(Progress("completed_thumb"), 6);
    ExpectNothingLeftToMake();
  }

  std::optional<DaemonPeer> daemon_;
};

}  // namespace

TEST_F(RawThumbs, AreMadeOfTheFullDecode) {
  const StubTool dcraw(kDcrawPath);
  dcraw.Plan(StubPlan().PassThrough(HostPath(kDcrawPath)));
  ExpectMade(RawRecipeOf(), "RGBY");
  const std::string photo = InPhotos("a.dng");
  // Later phases do not decode again.
  EXPECT_THAT(ParametersOf(dcraw),
              ElementsAre(ElementsAre("-e", "-c", photo), ElementsAre("-w", "-c", photo),
                          ElementsAre("-i", "-v", photo)));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawThumbs, AreMadeOfThePreview) {
  const StubTool dcraw(kDcrawPath);
  dcraw.Plan(StubPlan().PassThrough(HostPath(kDcrawPath)));
  ExpectMade(RawRecipeOf(120, 80), "RGBY");
  const std::string photo = InPhotos("a.dng");
  EXPECT_THAT(ParametersOf(dcraw),
              ElementsAre(ElementsAre("-e", "-c", photo), ElementsAre("-i", "-v", photo)));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawThumbs, AreOrientedAsThePhoto) {
  for (const bool hasPreview : {false, true}) {
    for (const int orientation : {1, 3, 6, 8}) {
      RawRecipe recipe = hasPreview ? RawRecipeOf(120, 80) : RawRecipeOf();
      recipe.orientation = orientation;
      MakeRaw(recipe, std::to_string(orientation) + (hasPreview ? "p.dng" : ".dng"));
    }
  }
  Make();
  Make();
  for (const char* name :
       {"1.dng", "1p.dng", "3.dng", "3p.dng", "6.dng", "6p.dng", "8.dng", "8p.dng"}) {
    SCOPED_TRACE(name);
    ExpectThumbs(InPhotos(name), LettersAfterOrientation(name[0] - '0'));
  }
}

TEST_F(RawThumbs, AreTurnedAsTheTagOfAnUprightPreviewSays) {
  RawRecipe recipe = RawRecipeOf(120, 80);
  recipe.rotation = 270;
  ExpectMade(recipe, LettersAfterTurn(270));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:650 Failed to rotate " + MetadataDirOf(InPhotos("a.dng")) +
                          "/VELAPHOTO_THUMB_RAW.jpg to 270 degree"));
}

TEST_F(RawThumbs, OfDamagedPhotosAreMarkedAndTheNextPhotoIsMade) {
  WriteFile(InPhotos("a.nef"), "no photo");
  WriteFile(InPhotos("b.dng"), "");
  const std::string good = MakeRaw(RawRecipeOf(), "c.dng");
  const std::string folder = SharedMediaDirectory();
  const bool hasCamera = IsRegularFile(folder + "/camera_raw.crw");
  if (hasCamera) {
    CopyFile(folder + "/camera_raw.crw", InPhotos("d.crw"));
    CopyFile(folder + "/tiny_preview.nef", InPhotos("e.nef"));
    CopyFile(folder + "/broken_preview.dng", InPhotos("f.dng"));
  }
  const std::string last = MakeJpeg(InPhotos("z.jpg"));
  for (const std::string& name : ListDirectory(kPhotos)) {
    SetFileTimeFromNow(InPhotos(name), -60);
  }
  Make();
  Make();
  EXPECT_TRUE(IsMarkedFailed(InPhotos("a.nef"), kinds_));
  EXPECT_TRUE(IsMarkedFailed(InPhotos("b.dng"), kinds_));
  ExpectThumbs(good, "RGBY");
  EXPECT_TRUE(HasThumbs(last, kinds_));
  if (hasCamera) {
    EXPECT_TRUE(HasThumbs(InPhotos("d.crw"), kinds_));
  }
  // The decoded copies have been removed, also those of the truncated photos.
  for (const std::string& path : ListTree(kPhotos)) {
    EXPECT_EQ(path.find("RAW"), std::string::npos) << path;
    EXPECT_EQ(path.find("Temp_"), std::string::npos) << path;
    EXPECT_EQ(path.find("VELAPHOTO.tmp"), std::string::npos) << path;
  }
}

}  // namespace vela_test::real
