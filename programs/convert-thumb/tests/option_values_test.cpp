#include "command_line/option_values.h"

#include <gtest/gtest.h>

#include "configuration/profile_values.h"

using namespace vela;

namespace {

TEST(ThumbnailBoxText, GivesBothSidesAndTheFlag) {
  const auto fit = ParseThumbnailBox("1280x720>");
  ASSERT_TRUE(fit);
  EXPECT_EQ(fit->width, 1280);
  EXPECT_EQ(fit->height, 720);
  EXPECT_FALSE(fit->fill);
  const auto fill = ParseThumbnailBox("120x120>^");
  ASSERT_TRUE(fill);
  EXPECT_TRUE(fill->fill);
}

TEST(ThumbnailBoxText, RefusesEverythingElse) {
  for (const char* text : {"", "1280", "1280x", "x720>", "1280x720", "0x10>", "10x0>", "-1x5>",
                           "1280x720<", "1280x720>!", "1280x720^>", "12.5x10>", "1280x720%>",
                           "65536x10>", "10 x10>", "99999999999x1>", "x>", ">x"}) {
    EXPECT_FALSE(ParseThumbnailBox(text)) << text;
  }
}

TEST(UnsharpText, GivesAllParts) {
  const auto mask = ParseUnsharpMask("2x0.8+0.5+0.01");
  ASSERT_TRUE(mask);
  EXPECT_DOUBLE_EQ(mask->radius, 2);
  EXPECT_DOUBLE_EQ(mask->sigma, 0.8);
  EXPECT_DOUBLE_EQ(mask->amount, 0.5);
  EXPECT_DOUBLE_EQ(mask->threshold, 0.01);
}

TEST(UnsharpText, MissingPartsHaveTheirUsualValues) {
  const auto mask = ParseUnsharpMask("0");
  ASSERT_TRUE(mask);
  EXPECT_DOUBLE_EQ(mask->sigma, 1);
  EXPECT_DOUBLE_EQ(mask->amount, 1);
  EXPECT_DOUBLE_EQ(mask->threshold, 0.05);
}

TEST(UnsharpText, RefusesEverythingElse) {
  for (const char* text :
       {"", "x", "0x", "0x0.8+", "0x0.8+0.5+0.01+1", "0x0.8,0.5", "0x-1", "-1x1", "0x0", "1e3x1",
        "nan", "inf", "0x0.8+0.5%", "0x400", "1000x1", "0x1+1+2", "0 x1", "1..2x1"}) {
    EXPECT_FALSE(ParseUnsharpMask(text)) << text;
  }
}

TEST(QuarterTurnsText, AreTakenFromDegrees) {
  EXPECT_EQ(ParseQuarterTurns("0"), 0);
  EXPECT_EQ(ParseQuarterTurns("90"), 1);
  EXPECT_EQ(ParseQuarterTurns("180"), 2);
  EXPECT_EQ(ParseQuarterTurns("270"), 3);
  EXPECT_EQ(ParseQuarterTurns("450"), 1);
  for (const char* text : {"", "45", "-90", "90.0", "90>", "90 ", "+90"}) {
    EXPECT_FALSE(ParseQuarterTurns(text)) << text;
  }
}

TEST(OutputPathText, HasSinglePercentSignsForDoubledOnes) {
  EXPECT_EQ(ParseOutputPath("/a/100%%/b%%%%.jpg"), "/a/100%/b%%.jpg");
  EXPECT_EQ(ParseOutputPath("a.JPEG"), "a.JPEG");
}

TEST(OutputPathText, RefusesExpansionsAndOtherFormats) {
  for (const char* text : {"", "/a/%d.jpg", "/a/b%.jpg", "/a/b.jpg%", "/a/b.png", "/a/b",
                           "/a.jpg/b", "jpg", "/a/jpg"}) {
    EXPECT_FALSE(ParseOutputPath(text)) << text;
  }
}

}  // namespace
