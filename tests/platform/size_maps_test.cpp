// Size maps and their settings.
#include "platform/platform_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kSettings = "/etc/velainfo.conf";

int32_t MapOf(int kind) {
  int32_t file = -5;
  int32_t directory = -5;
  EXPECT_EQ(VELAIDX_GetThumbSizeMap("/photo/a.jpg", kind, &file), 0);
  EXPECT_EQ(VELAIDX_GetDirThumbSizeMap("/photo", kind, &directory), 0);
  EXPECT_EQ(file, directory);
  return file;
}

/// Writes the photos' setting in quotes.
void SetPhotoMap(const std::string& value) {
  WriteFile(kSettings, "photo_thumb_size_map=\"" + value + "\"\n");
}

class SizeMaps : public SandboxTest {};

TEST_F(SizeMaps, HoldAllClassesWithoutSetting) {
  EXPECT_EQ(MapOf(1), 63);
  EXPECT_EQ(MapOf(2), 63);
  WriteFile(kSettings, "other=\"1\"\n");
  EXPECT_EQ(MapOf(1), 63);
}

TEST_F(SizeMaps, HaveASettingForEachKind) {
  WriteFile(kSettings, "photo_thumb_size_map=\"18\"\nvideo_thumb_size_map=5\n");
  EXPECT_EQ(MapOf(1), 18);
  EXPECT_EQ(MapOf(2), 5);
}

TEST_F(SizeMaps, TakeEveryNumberFromZeroTo63) {
  for (int map = 0; map <= 63; ++map) {
    SetPhotoMap(std::to_string(map));
    ASSERT_EQ(MapOf(1), map);
  }
}

TEST_F(SizeMaps, HoldAllClassesForAnyOtherValue) {
  for (const char* value : {"64", "-1", "", "x", "0x10", "1x", "1 2", " 7", "+7", "1.0", "6e0",
                            "4294967297", "18446744073709551617", "99999999999999999999999"}) {
    SetPhotoMap(value);
    EXPECT_EQ(MapOf(1), 63) << value;
  }
}

TEST_F(SizeMaps, FollowEveryChangeOfTheFile) {
  // The size and, on a coarse clock, the time are the same: only the content differs.
  for (int i = 0; i < 200; ++i) {
    const int map = 10 + i % 50;
    SetPhotoMap(std::to_string(map));
    ASSERT_EQ(MapOf(1), map);
  }
}

TEST_F(SizeMaps, FollowAChangeAfterALongPause) {
  SetPhotoMap("11");
  usleep(150000);
  EXPECT_EQ(MapOf(1), 11);
  EXPECT_EQ(MapOf(1), 11);
  SetPhotoMap("12");
  EXPECT_EQ(MapOf(1), 12);
  WriteFile(kSettings, "");
  EXPECT_EQ(MapOf(1), 63);
}

TEST_F(SizeMaps, AreUnknownForOtherKinds) {
  for (const int kind : {0, 3, -1, 1000}) {
    int32_t map = -5;
    EXPECT_EQ(VELAIDX_GetThumbSizeMap("/photo/a.jpg", kind, &map), -1);
    EXPECT_EQ(VLIBCErrGet(), EINVAL);
    EXPECT_EQ(VELAIDX_GetDirThumbSizeMap("/photo", kind, &map), -1);
    EXPECT_EQ(map, -5);
  }
  EXPECT_EQ(VELAIDX_GetThumbSizeMap("/photo/a.jpg", 1, nullptr), -1);
}

TEST_F(SizeMaps, CanBeReadFromSeveralThreads) {
  SetPhotoMap("10");
  usleep(150000);
  RunInThreads(4, [](int) {
    for (int round = 0; round < 5000; ++round) EXPECT_EQ(MapOf(1), 10);
  });
}

}  // namespace
}  // namespace vela_test
