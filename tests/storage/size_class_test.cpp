// The table of size classes and the size map.
#include <climits>

#include "storage/media_fixture.h"
#include "storage/velamk_util.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;

class SizeClass : public QuietTest {};

TEST_F(SizeClass, TableHasSixRowsInTheOrderOfTheirValues) {
  const EAThumbInfo* table = nullptr;
  ASSERT_EQ(GetEAThumbInfoTable(&table), 6);
  ASSERT_EQ(table, rgEAThumbInfo);
  const struct {
    const char* sizeString;
    const char* name;
    const char* oldName;
  } expected[] = {
      {"120x120", "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO:THUMB_S.jpg"},
      {"320x320", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO:THUMB_M.jpg"},
      {"640x640", "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO:THUMB_B.jpg"},
      {"800x800", "VELAPHOTO_THUMB_L.jpg", "VELAPHOTO:THUMB_L.jpg"},
      {"1280x1280", "VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO:THUMB_XL.jpg"},
      {"240x240", "VELAPHOTO_THUMB_SM.jpg", "VELAPHOTO:THUMB_SM.jpg"},
  };
  for (int i = 0; i < 6; ++i) {
    EXPECT_EQ(table[i].size, i);
    EXPECT_STREQ(table[i].sizeString, expected[i].sizeString);
    EXPECT_STREQ(table[i].name, expected[i].name);
    EXPECT_STREQ(table[i].oldName, expected[i].oldName);
  }
}

TEST_F(SizeClass, ClassesHaveFixedValues) {
  EXPECT_EQ(EA_THUMB_SIZE_S, 0);
  EXPECT_EQ(EA_THUMB_SIZE_M, 1);
  EXPECT_EQ(EA_THUMB_SIZE_B, 2);
  EXPECT_EQ(EA_THUMB_SIZE_L, 3);
  EXPECT_EQ(EA_THUMB_SIZE_XL, 4);
  EXPECT_EQ(EA_THUMB_SIZE_SM, 5);
}

TEST_F(SizeClass, SizeStrings) {
  const char* expected[] = {"120x120", "320x320", "640x640", "800x800", "1280x1280", "240x240"};
  for (int value = 0; value < 6; ++value) {
    EXPECT_STREQ(GetEAThumbSizeString(value), expected[value]);
  }
}

TEST_F(SizeClass, ANegativeValueHasNoSizeString) {
  EXPECT_EQ(GetEAThumbSizeString(-1), nullptr);
  EXPECT_EQ(GetEAThumbSizeString(INT_MIN), nullptr);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_util:47 Bad parameters.", "velamk_util:47 Bad parameters."));
}

TEST_F(SizeClass, EveryNameBelongsToExactlyOneBit) {
  const int bits[] = {kBitS, kBitM, kBitB, kBitL, kBitXL, kBitSM};
  for (int row = 0; row < 6; ++row) {
    for (const char* name : {kThumbNames[row], kOldThumbNames[row]}) {
      SCOPED_TRACE(name);
      EXPECT_EQ(IsThumbInSizeMap(name, bits[row]), 1);
      EXPECT_EQ(IsThumbInSizeMap(name, 63 & ~bits[row]), 0);
      EXPECT_EQ(IsThumbInSizeMap(name, 63), 1);
      EXPECT_EQ(IsThumbInSizeMap(name, -1), 1);
      EXPECT_EQ(IsThumbInSizeMap(name, 0), 0);
      EXPECT_EQ(IsThumbInSizeMap(name, ~63), 0);
    }
  }
}

TEST_F(SizeClass, SmIsNotS) {
  EXPECT_EQ(IsThumbInSizeMap("VELAPHOTO:THUMB_SM.jpg", 32), 1);
  EXPECT_EQ(IsThumbInSizeMap("VELAPHOTO_THUMB_SM.jpg", 2), 0);
  EXPECT_EQ(IsThumbInSizeMap("VELAPHOTO_THUMB_SM.jpg", kBitS | kBitM), 0);
}

TEST_F(SizeClass, AnyOtherNameIsLoggedAndRefused) {
  for (const std::string name :
       {"thumb.jpg", "", "velaphoto_thumb_m.jpg", "VELAPHOTO_THUMB_M.JPG", "VELAPHOTO_THUMB_M",
        "VELAPHOTO_THUMB_M.jpg ", "VELAPHOTO-THUMB_M.jpg", "VELAPHOTO:THUMB:M.jpg",
        "VELAPHOTO_THUMB_M.fail", "50%s%n.jpg"}) {
    SCOPED_TRACE(name);
    EXPECT_EQ(IsThumbInSizeMap(name.c_str(), -1), 0);
    EXPECT_THAT(TakeErrorLines(),
                ElementsAre("velamk_util:113 [Error] invalid thumb filename: " + name));
  }
}

}  // namespace
}  // namespace vela_test
