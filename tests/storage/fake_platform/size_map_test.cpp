// The thumbnail status when the index library does not know the size map, which is played here.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace {

struct FakeSizeMaps {
  int result = 0;
  int32_t sizeMap = 0;
  std::vector<std::string> questions;
};

FakeSizeMaps g_sizeMaps;

}  // namespace

int VELAIDX_GetThumbSizeMap(const char* path, int kind, int32_t* sizeMap) {
  g_sizeMaps.questions.push_back(path + (" as kind " + std::to_string(kind)));
  *sizeMap = g_sizeMaps.sizeMap;
  return g_sizeMaps.result;
}

int VELAIDX_GetDirThumbSizeMap(const char* /*dir*/, int /*kind*/, int32_t* /*sizeMap*/) {
  return -1;
}

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class UnknownSizeMap : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    WriteFile("/tmp/a.jpg", "photo");
  }

  void Ask(int sizeMap) { GetThumbStatus("/tmp/a.jpg", &missing_, &present_, sizeMap); }

  int missing_ = -77;
  int present_ = -77;
};

TEST_F(UnknownSizeMap, IsAskedForOnceAsAPhotos) {
  g_sizeMaps.sizeMap = 3;
  Ask(-1);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("/tmp/a.jpg as kind 1"));
  EXPECT_EQ(missing_, 2);
}

TEST_F(UnknownSizeMap, IsNotAskedForWhenTheCallerHasOne) {
  Ask(63);
  EXPECT_THAT(g_sizeMaps.questions, IsEmpty());
  EXPECT_EQ(missing_, 6);
}

TEST_F(UnknownSizeMap, EndsInALineWhenTheIndexHasNoneEither) {
  g_sizeMaps.sizeMap = 63;
  g_sizeMaps.result = -1;
  Ask(-1);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:96 [Error] get thumb size map: /tmp/a.jpg"));
  EXPECT_EQ(missing_, 0);
  EXPECT_EQ(present_, 0);
}

TEST_F(UnknownSizeMap, IsKnownWhateverPositiveResultTheIndexGives) {
  g_sizeMaps.sizeMap = 1;
  g_sizeMaps.result = 5;
  Ask(-1);
  EXPECT_EQ(missing_, 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
