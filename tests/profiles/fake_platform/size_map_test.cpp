// The profiles of a directory with a faked index library that may or may not return its size map.
#include "platform/velaindex.h"
#include "profiles/thumbnail_profile.h"
#include "support/profile_file.h"
#include "support/quiet_test.h"

using namespace vela;

namespace {

struct FakeSizeMaps {
  int result = 0;
  bool writes = true;
  int32_t sizeMap = 0;
  int32_t before = -77;  ///< previous value of the caller's variable
  std::vector<std::string> questions;
};

FakeSizeMaps g_sizeMaps;

}  // namespace

int VELAIDX_GetThumbSizeMap(const char* /*path*/, int /*kind*/, int32_t* /*sizeMap*/) {
  ADD_FAILURE() << "the size map of a file is not needed";
  return -1;
}

int VELAIDX_GetDirThumbSizeMap(const char* dir, int kind, int32_t* sizeMap) {
  g_sizeMaps.questions.push_back(dir + (" as kind " + std::to_string(kind)));
  g_sizeMaps.before = *sizeMap;
  if (g_sizeMaps.writes) {
    *sizeMap = g_sizeMaps.sizeMap;
  }
  return g_sizeMaps.result;
}

namespace vela_test {
namespace {

using ::testing::ElementsAre;

constexpr const char* kProfileFile = "/tmp/profiles.conf";

class DirectorySizeMap : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    WriteProfileFile(kProfileFile, UsualProfiles());
  }

  int Count() {
    ThumbnailProfileList list;
    EXPECT_EQ(ParseThumbnailProfiles(list, kProfileFile, "/tmp/some photos"), 1);
    return GetProfileCount(list, kAllPhases);
  }
};

TEST_F(DirectorySizeMap, IsRequestedOnceAsThatOfPhotos) {
  g_sizeMaps.sizeMap = 63;
  EXPECT_EQ(Count(), 4);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("/tmp/some photos as kind 1"));
  EXPECT_EQ(g_sizeMaps.before, 0);
}

TEST_F(DirectorySizeMap, SelectsNothingWhenTheIndexWritesNone) {
  g_sizeMaps.result = -1;
  g_sizeMaps.writes = false;
  EXPECT_EQ(Count(), 0);
}

TEST_F(DirectorySizeMap, CountsRegardlessOfTheResult) {
  g_sizeMaps.result = -1;
  g_sizeMaps.sizeMap = 2;
  EXPECT_EQ(Count(), 1);
}

TEST_F(DirectorySizeMap, MayHaveAllBitsSet) {
  g_sizeMaps.sizeMap = -1;
  EXPECT_EQ(Count(), 4);
}

TEST_F(DirectorySizeMap, IsRequestedEvenIfTheFileIsMissing) {
  ThumbnailProfileList list;
  EXPECT_EQ(ParseThumbnailProfiles(list, "/tmp/missing.conf", "/tmp/photos"), 0);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("/tmp/photos as kind 1"));
}

}  // namespace
}  // namespace vela_test
