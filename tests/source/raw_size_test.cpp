// The pixel size of photos, raw and not.

#include <cstdint>

#include "source/raw_image.h"
#include "source/source_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kNone = "none, sizes untouched";

/// The size as text, or the result of a failure.
std::string Described(int result, uint32_t width, uint32_t height) {
  const std::string size = std::to_string(width) + "x" + std::to_string(height);
  if (result == 0) {
    return size == "7x8" ? kNone : "none, but " + size;
  }
  return result == 1 ? size : "result " + std::to_string(result);
}

std::string RawSizeOf(const std::string& path) {
  uint32_t width = 7;
  uint32_t height = 8;
  const int result = GetRawImageSize(path, width, height);
  return Described(result, width, height);
}

std::string SizeOf(const std::string& path) {
  uint32_t width = 7;
  uint32_t height = 8;
  const int result = GetImageResolution(path, width, height);
  return Described(result, width, height);
}

class RawSize : public SourceTest {
 protected:
  /// The size read from a decoder with this plan.
  static std::string SizeAfter(const StubPlan& plan) {
    const StubTool decoder(kDcrawPath);
    decoder.Plan(plan);
    return RawSizeOf(kRaw);
  }
  static std::string SizeIn(const std::string& printed) {
    return SizeAfter(StubPlan().Print(printed));
  }
};

TEST_F(RawSize, IsReadByTheDecoder) {
  const StubTool decoder(kDcrawPath);
  decoder.Plan(StubPlan().Print("Output size: 4000 x 3000\n"));
  EXPECT_EQ(RawSizeOf(kRaw), "4000x3000");
  ASSERT_EQ(ParametersOf(decoder.Calls()), (ArgumentLists{{"-i", "-v", kRaw}}));
  EXPECT_EQ(decoder.Calls().front().arguments.front(), kDcrawPath);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

struct Printed : NamedCase {
  std::string text;
  std::string size;
};

class PrintedSize : public RawSize, public ::testing::WithParamInterface<Printed> {};

TEST_P(PrintedSize, IsRead) {
  EXPECT_EQ(SizeIn(GetParam().text), GetParam().size);
}

// Two numbers with an x, in the range of picture sizes.
INSTANTIATE_TEST_SUITE_P(
    Values, PrintedSize,
    ::testing::Values(Printed{"NoSpaces", "Output size:3x4\n", "3x4"},
                      Printed{"Tab", "Output size:\t3 x 4 pixels\n", "3x4"},
                      Printed{"NoNewline", "Output size: 30 x 40", "30x40"},
                      Printed{"NoValue", "Output size:\n", kNone},
                      Printed{"Space", "Output size: \n", kNone},
                      Printed{"OneNumber", "Output size: 3\n", kNone},
                      Printed{"NoHeight", "Output size: 3 x\n", kNone},
                      Printed{"NoWidth", "Output size: x 4\n", kNone},
                      Printed{"OtherWord", "Output size: 3 by 4\n", kNone},
                      Printed{"Largest", "Output size: 4294967295 x 1\n", "4294967295x1"},
                      Printed{"TooWide", "Output size: 4294967296 x 1\n", kNone},
                      Printed{"TooHigh", "Output size: 1 x 99999999999999999999999\n", kNone},
                      Printed{"ZeroWidth", "Output size: 0 x 4\n", kNone},
                      Printed{"ZeroHeight", "Output size: 3 x 0\n", kNone},
                      Printed{"Negative", "Output size: -3 x 4\n", kNone}),
    CaseName());

const std::string kLongOwner = "Owner: " + std::string(10000, 'x');
const char* const kSeveralSizes =
    "\nFilename: a.dng\nThumb size:   160 x 120\nFull size:    640 x 480\n"
    "Image size:   630 x 470\nOutput size:  600 x 400\nRaw colors: 3\n";

// The first valid line is used; a line is split after every 255 bytes.
INSTANTIATE_TEST_SUITE_P(
    Lines, PrintedSize,
    ::testing::Values(
        Printed{"AmongOthers", kSeveralSizes, "600x400"},
        Printed{"First", "Output size: 3 x 4\nOutput size: 5 x 6\n", "3x4"},
        Printed{"FirstGoodOne", "Output size: wide\nOutput size: 5 x 6\n", "5x6"},
        Printed{"OtherNames", "Image size: 3 x 4\nFull size: 5 x 6\n", kNone},
        Printed{"LeadingSpace", " Output size: 3 x 4\n", kNone},
        Printed{"SpaceBeforeColon", "Output size : 3 x 4\n", kNone},
        Printed{"OtherCase", "output size: 3 x 4\n", kNone},
        Printed{"NoColon", "Output size 3 x 4\n", kNone},
        Printed{"LongerName", "The Output size: 3 x 4\n", kNone},
        Printed{"AfterALongLine", kLongOwner + "\nOutput size: 3 x 4\n", "3x4"},
        Printed{"After255Bytes", std::string(255, 'x') + "Output size: 3 x 4\n", "3x4"},
        Printed{"After254Bytes", std::string(254, 'x') + "Output size: 3 x 4\n", kNone},
        Printed{"After256Bytes", std::string(256, 'x') + "Output size: 3 x 4\n", kNone}),
    CaseName());

TEST_F(RawSize, IsMissingInAnEmptyOutput) {
  EXPECT_EQ(SizeIn(""), kNone);
  EXPECT_EQ(SizeAfter(StubPlan().Exit(1)), kNone);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawSize, DependsOnTheOutputNotOnTheStatus) {
  EXPECT_EQ(SizeAfter(StubPlan().PrintError("Output size: 3 x 4\n")), kNone);
  EXPECT_EQ(SizeAfter(StubPlan().Print("Output size: 3 x 4\n").Exit(1)), "3x4");
  EXPECT_EQ(SizeAfter(StubPlan().Print("Output size: 3 x 4\n").DieBySignal(SIGSEGV)), "3x4");
  EXPECT_EQ(SizeAfter(StubPlan().Print("Full size: 3 x 4\nOutput si").DieBySignal(SIGSEGV)), kNone);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RawSize, NeedsTheDecoder) {
  RemoveTool(kDcrawPath);
  EXPECT_EQ(RawSizeOf(kRaw), kNone);
  EXPECT_THAT(
      ErrorLines(),
      ElementsAre("velathumb:83 [Error] VLIBCPopen: /usr/bin/dcraw -i -v /tmp/photos/a.dng"));
}

using PhotoSize = SourceTest;

TEST_F(PhotoSize, OfARawPhotoIsThatOfItsFullDecode) {
  RawRecipe recipe;
  recipe.width = 96;
  recipe.height = 64;
  recipe.preview.emplace();
  EXPECT_EQ(SizeOf(MakeRawPhoto(kRaw, recipe)), "96x64");
  recipe.orientation = 6;
  EXPECT_EQ(SizeOf(MakeRawPhoto(kRaw, recipe)), "64x96");
}

TEST_F(PhotoSize, OfABrokenRawPhoto) {
  WriteFile(kRaw, "no photo");
  EXPECT_EQ(SizeOf(kRaw), kNone);
  EXPECT_EQ(SizeOf("/tmp/photos/missing.nef"), kNone);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoSize, IsReadByTheDecoderForRawNamesOnly) {
  const StubTool decoder(kDcrawPath);
  decoder.Plan(StubPlan().Print("Output size: 3 x 4\n"));
  for (const char* name : {"a.dng", "a.NEF", "a.b.Cr2"}) {
    EXPECT_EQ(SizeOf(MakeJpeg(std::string("/tmp/photos/") + name)), "3x4");
  }
  for (const char* name : {"a.jpg", "a.dng.png", "dng"}) {
    EXPECT_EQ(SizeOf(MakeJpeg(std::string("/tmp/photos/") + name)), "64x48");
  }
  EXPECT_EQ(decoder.Calls().size(), 3U);
}

TEST_F(PhotoSize, OfOtherPhotosIsThatOfTheirPixelsAsStored) {
  JpegRecipe recipe;
  recipe.orientation = 6;
  EXPECT_EQ(SizeOf(MakeJpeg("/tmp/photos/a.jpg", recipe)), "64x48");
}

TEST_F(PhotoSize, OfOtherFiles) {
  WriteFile("/tmp/photos/a.jpg", "no photo");
  EXPECT_EQ(SizeOf("/tmp/photos/a.jpg"), kNone);
  EXPECT_EQ(SizeOf("/tmp/photos/missing.jpg"), kNone);
  EXPECT_EQ(SizeOf("/tmp/photos"), kNone);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
