// The distance of two images, with a recording stub and with the real tool.
#include "source/rotation_check.h"
#include "source/source_fixture.h"

namespace vela_test {
namespace {

constexpr int kUnknown = 65535;
constexpr const char* kFirst = "/tmp/photos/first.jpg";
constexpr const char* kSecond = "/tmp/photos/second.jpg";

class Distance : public SourceTest {
 protected:
  static int DistanceAfter(const StubPlan& plan) {
    const StubTool compare(kComparePath);
    compare.Plan(plan);
    return CompareImagesMAE(kFirst, kSecond);
  }
};

TEST_F(Distance, IsMeasuredByCompare) {
  const StubTool compare(kComparePath);
  compare.Plan(StubPlan().PrintError("2841.73 (0.0433621)\n").Exit(1));
  EXPECT_EQ(CompareImagesMAE(kFirst, kSecond), 2841);
  ASSERT_EQ(ParametersOf(compare.Calls()),
            (ArgumentLists{{"-metric", "MAE", kFirst, kSecond, "null:"}}));
  EXPECT_EQ(compare.Calls().front().arguments.front(), kComparePath);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Distance, IsReadFromBothOutputs) {
  EXPECT_EQ(DistanceAfter(StubPlan().Print("12 (0.1)")), 12);
  EXPECT_EQ(DistanceAfter(StubPlan().PrintError("13 (0.1)")), 13);
  EXPECT_EQ(DistanceAfter(StubPlan().Print("14 ").PrintError("15 \n")), 14);
}

struct Printed : NamedCase {
  std::string text;
  int distance;
};

class PrintedDistance : public Distance, public ::testing::WithParamInterface<Printed> {};

TEST_P(PrintedDistance, IsRead) {
  EXPECT_EQ(DistanceAfter(StubPlan().PrintError(GetParam().text).Exit(1)), GetParam().distance);
}

// The distance is the whole part of the first word; a line is read up to its first 255 bytes.
INSTANTIATE_TEST_SUITE_P(
    Outputs, PrintedDistance,
    ::testing::Values(Printed{"Zero", "0 (0)", 0}, Printed{"Fraction", "0.99 (0)", 0},
                      Printed{"Largest", "65535 (1)\n", 65535}, Printed{"Negative", "-3 (0)", -3},
                      Printed{"NumberAndSpace", "7 ", 7}, Printed{"Word", "word 5", 0},
                      Printed{"LeadingSpace", " 5 6", 0}, Printed{"FirstLine", "5 (0)\n6 (0)\n", 5},
                      Printed{"WarningLine", "warning\n6 (0)\n", kUnknown},
                      Printed{"EmptyFirstLine", "\n6 (0)\n", kUnknown},
                      Printed{"NoSpace", "2841.73", kUnknown},
                      Printed{"Tab", "2841.73\t(0)\n", kUnknown},
                      Printed{"Newline", "\n", kUnknown},
                      Printed{"SpaceAfter255Bytes", std::string(255, '1') + " 5\n", kUnknown},
                      Printed{"LongLine", "5 " + std::string(100000, 'x') + "\n", 5},
                      Printed{"SpaceWithin255Bytes", std::string(252, '0') + "25 5\n", 25},
                      Printed{"Nothing", "", kUnknown}),
    CaseName());

TEST_F(Distance, IsUnknownWithoutOutput) {
  EXPECT_EQ(DistanceAfter(StubPlan()), kUnknown);
  EXPECT_EQ(DistanceAfter(StubPlan().DieBySignal(SIGSEGV)), kUnknown);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Distance, IsUnknownWithoutCompare) {
  RemoveTool(kComparePath);
  EXPECT_EQ(CompareImagesMAE(kFirst, kSecond), kUnknown);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:152 [Error] VLIBCPopen: /usr/bin/compare -metric MAE "
                          "/tmp/photos/first.jpg /tmp/photos/second.jpg null:"));
}

TEST_F(Distance, OfRealImages) {
  MakeJpeg(kFirst);
  CopyFile(kFirst, kSecond);
  EXPECT_EQ(CompareImagesMAE(kFirst, kSecond), 0);
  JpegRecipe grey;
  grey.colour = JpegColour::kGrey;
  MakeJpeg(kSecond, grey);
  EXPECT_GT(CompareImagesMAE(kFirst, kSecond), 1000);
  EXPECT_LT(CompareImagesMAE(kFirst, kSecond), kUnknown);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
