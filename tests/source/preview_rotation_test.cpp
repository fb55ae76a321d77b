// The rotation of a raw photo's preview.

#include <functional>

#include "source/orientation.h"
#include "source/source_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kPicture = "/tmp/photos/preview.jpg";

void MakePreview(int orientation) {
  JpegRecipe recipe;
  recipe.orientation = orientation;
  recipe.exif = true;
  MakeJpeg(kPicture, recipe);
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
    return GetRawPreviewRotation(kRaw, kPicture);
  }
  static int RotationIn(const std::string& printed) {
    return RotationAfter(StubPlan().Print(printed));
  }

  /// The raw photo's rotation is not read; the preview is used as it is.
  static void ExpectNotAsked() {
    const StubTool exiftool(kExiftoolPath);
    exiftool.Plan(StubPlan().Print("Rotation: 90\n"));
    EXPECT_EQ(GetRawPreviewRotation(kRaw, kPicture), 0);
    EXPECT_THAT(exiftool.Calls(), IsEmpty());
  }
};

TEST_F(PreviewRotation, IsReadByExiftool) {
  const StubTool exiftool(kExiftoolPath);
  exiftool.Plan(StubPlan().Print("Rotation: 90\n"));
  EXPECT_EQ(GetRawPreviewRotation(kRaw, kPicture), 90);
  ASSERT_EQ(ParametersOf(exiftool.Calls()), (ArgumentLists{{"-S", "-Rotation", kRaw}}));
  EXPECT_EQ(exiftool.Calls().front().arguments.front(), kExiftoolPath);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

struct Printed : NamedCase {
  std::string text;
  int rotation;
};

class PrintedRotation : public PreviewRotation, public ::testing::WithParamInterface<Printed> {};

TEST_P(PrintedRotation, IsRead) {
  EXPECT_EQ(RotationIn(GetParam().text), GetParam().rotation);
}

// The number that the tag begins with.
INSTANTIATE_TEST_SUITE_P(Values, PrintedRotation,
                         ::testing::Values(Printed{"Zero", "Rotation: 0\n", 0},
                                           Printed{"Half", "Rotation: 180\n", 180},
                                           Printed{"NoSpace", "Rotation:270\n", 270},
                                           Printed{"WhiteSpace", "Rotation: \t 90 \r\n", 90},
                                           Printed{"Unit", "Rotation: 90 degrees\n", 90},
                                           Printed{"Fraction", "Rotation: 90.5\n", 90},
                                           Printed{"Negative", "Rotation: -90\n", -90},
                                           Printed{"Words", "Rotation: Rotate 90 CW\n", 0},
                                           Printed{"Hexadecimal", "Rotation: 0x5a\n", 0},
                                           Printed{"NoNewline", "Rotation: 270", 270},
                                           Printed{"Nothing", "", 0}),
                         CaseName());

// The last line with the tag is used; a line longer than 255 bytes is read as several.
const std::string kLongOwner = "Owner: " + std::string(100000, 'x');

INSTANTIATE_TEST_SUITE_P(
    Lines, PrintedRotation,
    ::testing::Values(Printed{"Last", "Rotation: 90\nRotation: 180\n", 180},
                      Printed{"LastAmongOthers",
                              "Rotation: 90\nOwner: 5\nRotation: 270\nModel: 6\n", 270},
                      Printed{"LastIsAWord", "Rotation: 90\nRotation: none\n", 0},
                      Printed{"LastIsASpace", "Rotation: 90\nRotation: \n", 0},
                      Printed{"LastIsEmpty", "Rotation: 90\nRotation:\n", 90},
                      Printed{"LastHasNoColon", "Rotation: 90\nRotation\n", 90},
                      Printed{"LongerName", "AutoRotation: 90\n", 0},
                      Printed{"OtherCase", "rotation: 90\n", 0},
                      Printed{"LeadingSpace", " Rotation: 90\n", 0},
                      Printed{"SpaceBeforeColon", "Rotation : 90\n", 0},
                      Printed{"InAnotherValue", "Owner: Rotation: 90\n", 0},
                      Printed{"AfterALongLine", kLongOwner + "\nRotation: 90\n", 90},
                      Printed{"After255Bytes", std::string(255, 'x') + "Rotation: 90\n", 90},
                      Printed{"After254Bytes", std::string(254, 'x') + "Rotation: 90\n", 0}),
    CaseName());

TEST_F(PreviewRotation, IsZeroWithoutOutput) {
  EXPECT_EQ(RotationAfter(StubPlan().PrintError("Rotation: 90\n")), 0);
  EXPECT_EQ(RotationAfter(StubPlan().Exit(1)), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PreviewRotation, DependsOnTheOutputNotOnTheStatus) {
  EXPECT_EQ(RotationAfter(StubPlan().Print("Rotation: 90\n").Exit(1)), 90);
  EXPECT_EQ(RotationAfter(StubPlan().Print("Rotation: 90\nRot").DieBySignal(SIGSEGV)), 90);
  EXPECT_EQ(RotationAfter(StubPlan().Print("Rot").DieBySignal(SIGSEGV)), 0);
}

TEST_F(PreviewRotation, NeedsExiftool) {
  RemoveTool(kExiftoolPath);
  EXPECT_EQ(GetRawPreviewRotation(kRaw, kPicture), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:196 [Error] VLIBCPopen: /usr/vela/bin/exiftool -S -Rotation "
                          "/tmp/photos/a.dng"));
}

TEST_F(PreviewRotation, IsZeroForAPreviewThatIsNotUpright) {
  for (const int orientation : {0, 2, 3, 4, 5, 6, 7, 8, 9}) {  // 0: no such tag, 9: no such value
    SCOPED_TRACE(orientation);
    MakePreview(orientation);
    ExpectNotAsked();
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

struct BadPreview : NamedCase {
  std::function<void()> make;
};

class PreviewWithoutExif : public PreviewRotation,
                           public ::testing::WithParamInterface<BadPreview> {};

TEST_P(PreviewWithoutExif, IsLoggedAndNotTurned) {
  RemoveTree(kPicture);
  GetParam().make();
  ExpectNotAsked();
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:696 velathumb (696) File not readable or no EXIF data in "
                          "file /tmp/photos/preview.jpg.\n"));
}

INSTANTIATE_TEST_SUITE_P(
    Previews, PreviewWithoutExif,
    ::testing::Values(BadPreview{"Picture", [] { MakeJpeg(kPicture); }},
                      BadPreview{"Missing", [] {}},
                      BadPreview{"Text", [] { WriteFile(kPicture, "no picture"); }},
                      BadPreview{"Empty", [] { WriteFile(kPicture, ""); }},
                      BadPreview{"Directory", [] { MakeDirectories(kPicture); }}),
    CaseName());

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
    return GetRawPreviewRotation(kRaw, kPicture);
  }
};

TEST_F(RealRotation, IsReadFromTheRawPhoto) {
  for (const int degrees : {0, 90, 180, 270}) {
    EXPECT_EQ(RotationOf(degrees), degrees);
  }
  EXPECT_EQ(RotationOf(std::nullopt), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RealRotation, IsZeroForABrokenOrMissingRawPhoto) {
  EXPECT_EQ(GetRawPreviewRotation(kRaw, kPicture), 0);  // its content is not a photo
  EXPECT_EQ(GetRawPreviewRotation("/tmp/photos/missing.dng", kPicture), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
