// How far a raw photo's preview is turned.
#include <gmock/gmock.h>
#include <signal.h>

#include <optional>
#include <string>

#include "source/orientation.h"
#include "source/source_fixture.h"
#include "support/images.h"
#include "support/raw_photos.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPreview = "/tmp/photos/preview.jpg";

void MakePreview(int orientation) {
  JpegRecipe recipe;
  recipe.orientation = orientation;
  recipe.exif = true;
  MakeJpeg(kPreview, recipe);
}

class PreviewRotation : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    MakePreview(1);
    WriteFile(kRaw, "raw");
  }

  static int RotationAfter(const StubPlan& plan) {
    const StubTool exiftool(kExiftoolPath);
    exiftool.Plan(plan);
    return GetRawPreviewRotation(kRaw, kPreview);
  }
  static int RotationIn(const std::string& printed) {
    return RotationAfter(StubPlan().Print(printed));
  }

  /// Nobody asks for the raw photo's rotation; the preview is used as it is.
  static void ExpectNotAsked() {
    const StubTool exiftool(kExiftoolPath);
    exiftool.Plan(StubPlan().Print("Rotation: 90\n"));
    EXPECT_EQ(GetRawPreviewRotation(kRaw, kPreview), 0);
    EXPECT_THAT(exiftool.Calls(), IsEmpty());
  }
};

TEST_F(PreviewRotation, IsAskedOfExiftool) {
  const StubTool exiftool(kExiftoolPath);
  exiftool.Plan(StubPlan().Print("Rotation: 90\n"));
  EXPECT_EQ(GetRawPreviewRotation(kRaw, kPreview), 90);
  ASSERT_EQ(ParametersOf(exiftool.Calls()), (ArgumentLists{{"-S", "-Rotation", kRaw}}));
  EXPECT_EQ(exiftool.Calls().front().arguments.front(), kExiftoolPath);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PreviewRotation, IsTheNumberThatTheTagBeginsWith) {
  EXPECT_EQ(RotationIn("Rotation: 0\n"), 0);
  EXPECT_EQ(RotationIn("Rotation: 180\n"), 180);
  EXPECT_EQ(RotationIn("Rotation:270\n"), 270);
  EXPECT_EQ(RotationIn("Rotation: \t 90 \r\n"), 90);
  EXPECT_EQ(RotationIn("Rotation: 90 degrees\n"), 90);
  EXPECT_EQ(RotationIn("Rotation: 90.5\n"), 90);
  EXPECT_EQ(RotationIn("Rotation: -90\n"), -90);
  EXPECT_EQ(RotationIn("Rotation: Rotate 90 CW\n"), 0);
  EXPECT_EQ(RotationIn("Rotation: 0x5a\n"), 0);
}

TEST_F(PreviewRotation, OfTheLastLineHolds) {
  EXPECT_EQ(RotationIn("Rotation: 90\nRotation: 180\n"), 180);
  EXPECT_EQ(RotationIn("Rotation: 90\nOwner: 5\nRotation: 270\nModel: 6\n"), 270);
  EXPECT_EQ(RotationIn("Rotation: 90\nRotation: none\n"), 0);
  EXPECT_EQ(RotationIn("Rotation: 90\nRotation: \n"), 0);
}

TEST_F(PreviewRotation, IsNotInOtherLines) {
  EXPECT_EQ(RotationIn("Rotation: 90\nRotation:\n"), 90);
  EXPECT_EQ(RotationIn("Rotation: 90\nRotation\n"), 90);
  EXPECT_EQ(RotationIn("AutoRotation: 90\n"), 0);
  EXPECT_EQ(RotationIn("rotation: 90\n"), 0);
  EXPECT_EQ(RotationIn(" Rotation: 90\n"), 0);
  EXPECT_EQ(RotationIn("Rotation : 90\n"), 0);
  EXPECT_EQ(RotationIn("Owner: Rotation: 90\n"), 0);
}

TEST_F(PreviewRotation, IsReadFromALineWithoutNewline) {
  EXPECT_EQ(RotationIn("Rotation: 270"), 270);
}

TEST_F(PreviewRotation, IsFoundBehindALongLine) {
  EXPECT_EQ(RotationIn("Owner: " + std::string(100000, 'x') + "\nRotation: 90\n"), 90);
  EXPECT_EQ(RotationIn(std::string(255, 'x') + "Rotation: 90\n"), 90);
  EXPECT_EQ(RotationIn(std::string(254, 'x') + "Rotation: 90\n"), 0);
}

TEST_F(PreviewRotation, IsNoneWithoutOutput) {
  EXPECT_EQ(RotationIn(""), 0);
  EXPECT_EQ(RotationAfter(StubPlan().PrintError("Rotation: 90\n")), 0);
  EXPECT_EQ(RotationAfter(StubPlan().Exit(1)), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PreviewRotation, GoesByTheOutputNotByTheStatus) {
  EXPECT_EQ(RotationAfter(StubPlan().Print("Rotation: 90\n").Exit(1)), 90);
  EXPECT_EQ(RotationAfter(StubPlan().Print("Rotation: 90\nRot").DieBySignal(SIGSEGV)), 90);
  EXPECT_EQ(RotationAfter(StubPlan().Print("Rot").DieBySignal(SIGSEGV)), 0);
}

TEST_F(PreviewRotation, NeedsExiftool) {
  RemoveTool(kExiftoolPath);
  EXPECT_EQ(GetRawPreviewRotation(kRaw, kPreview), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:196 [Error] VLIBCPopen: /usr/vela/bin/exiftool -S -Rotation "
                          "/tmp/photos/a.dng"));
}

TEST_F(PreviewRotation, IsNoneForAPreviewThatSaysHowItStands) {
  for (int orientation = 2; orientation <= 8; ++orientation) {
    SCOPED_TRACE(orientation);
    MakePreview(orientation);
    ExpectNotAsked();
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PreviewRotation, IsNoneForAPreviewWithoutOrientation) {
  MakePreview(0);
  ExpectNotAsked();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PreviewRotation, IsNoneForAnOrientationThatDoesNotExist) {
  MakePreview(9);
  ExpectNotAsked();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

class PreviewWithoutExif : public PreviewRotation {
 protected:
  static void ExpectLogged() {
    ExpectNotAsked();
    EXPECT_THAT(ErrorLines(),
                ElementsAre("velathumb:696 velathumb (696) File not readable or no EXIF data in "
                            "file /tmp/photos/preview.jpg.\n"));
  }
};

TEST_F(PreviewWithoutExif, IsNotTurned) {
  MakeJpeg(kPreview);
  ExpectLogged();
}

TEST_F(PreviewWithoutExif, BecauseItIsMissing) {
  RemoveTree(kPreview);
  ExpectLogged();
}

TEST_F(PreviewWithoutExif, BecauseItIsNoPicture) {
  WriteFile(kPreview, "no picture");
  ExpectLogged();
}

TEST_F(PreviewWithoutExif, BecauseItIsEmpty) {
  WriteFile(kPreview, "");
  ExpectLogged();
}

TEST_F(PreviewWithoutExif, BecauseItIsADirectory) {
  RemoveTree(kPreview);
  MakeDirectories(kPreview);
  ExpectLogged();
}

class RealRotation : public PreviewRotation {
 protected:
  void SetUp() override {
    PreviewRotation::SetUp();
    InstallRealExiftool();
  }

  static int RotationOf(std::optional<int> stated) {
    RawRecipe recipe;
    recipe.rotation = stated;
    MakeRawPhoto(kRaw, recipe);
    return GetRawPreviewRotation(kRaw, kPreview);
  }
};

TEST_F(RealRotation, IsWhatTheRawPhotoStates) {
  for (const int degrees : {0, 90, 180, 270}) {
    EXPECT_EQ(RotationOf(degrees), degrees);
  }
  EXPECT_EQ(RotationOf(std::nullopt), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RealRotation, IsNoneForABrokenOrMissingRawPhoto) {
  EXPECT_EQ(GetRawPreviewRotation(kRaw, kPreview), 0);  // its content is no photo
  EXPECT_EQ(GetRawPreviewRotation("/tmp/photos/missing.dng", kPreview), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
