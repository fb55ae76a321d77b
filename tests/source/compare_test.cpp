// The distance of two images, with a recording stub and with the real tool.
#include <gmock/gmock.h>
#include <signal.h>

#include <string>

#include "source/rotation_check.h"
#include "source/source_fixture.h"
#include "support/images.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

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
  static int DistanceIn(const std::string& printed) {
    return DistanceAfter(StubPlan().PrintError(printed).Exit(1));
  }
};

TEST_F(Distance, IsAskedOfCompare) {
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

TEST_F(Distance, IsTheWholePartOfTheFirstWord) {
  EXPECT_EQ(DistanceIn("0 (0)"), 0);
  EXPECT_EQ(DistanceIn("0.99 (0)"), 0);
  EXPECT_EQ(DistanceIn("65535 (1)\n"), 65535);
  EXPECT_EQ(DistanceIn("-3 (0)"), -3);
  EXPECT_EQ(DistanceIn("7 "), 7);
  EXPECT_EQ(DistanceIn("word 5"), 0);
  EXPECT_EQ(DistanceIn(" 5 6"), 0);
}

TEST_F(Distance, IsReadFromTheFirstLineOnly) {
  EXPECT_EQ(DistanceIn("5 (0)\n6 (0)\n"), 5);
  EXPECT_EQ(DistanceIn("warning\n6 (0)\n"), kUnknown);
  EXPECT_EQ(DistanceIn("\n6 (0)\n"), kUnknown);
}

TEST_F(Distance, IsUnknownWithoutASpace) {
  EXPECT_EQ(DistanceIn("2841.73"), kUnknown);
  EXPECT_EQ(DistanceIn("2841.73\t(0)\n"), kUnknown);
  EXPECT_EQ(DistanceIn("\n"), kUnknown);
  EXPECT_EQ(DistanceIn(std::string(255, '1') + " 5\n"), kUnknown);
}

TEST_F(Distance, IsReadFromThe255BytesThatALineBeginsWith) {
  EXPECT_EQ(DistanceIn("5 " + std::string(100000, 'x') + "\n"), 5);
  EXPECT_EQ(DistanceIn(std::string(252, '0') + "25 5\n"), 25);
}

TEST_F(Distance, IsUnknownWithoutOutput) {
  EXPECT_EQ(DistanceIn(""), kUnknown);
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
