// The platform calls of a run for files and their times, with a faked platform.
#include <sys/stat.h>

#include <ctime>

#include "convert/velamk_photo_thumb.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/quiet_test.h"
#include "support/stub_tool.h"

using namespace vela;

namespace {

struct TimesCall {
  std::string path;
  int options;
  VLIBCFileTimes times;
};

struct FakeFiles {
  VLIBCFileStatus status = {};
  std::vector<int> results;  ///< of the calls in order; later calls return 0
  std::vector<std::string> questions;
  std::vector<TimesCall> times;
  int timesResult = 0;
};

FakeFiles g_files;

}  // namespace

int VLIBCFileStat(const char* path, int options, VLIBCFileStatus* out) {
  const size_t call = g_files.questions.size();
  g_files.questions.push_back(path + (" with " + std::to_string(options)));
  *out = g_files.status;
  return call < g_files.results.size() ? g_files.results[call] : 0;
}

int VLIBCFileUTime(const char* path, int options, const VLIBCFileTimes* times) {
  g_files.times.push_back({path, options, *times});
  return g_files.timesResult;
}

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kPhoto = "/tmp/photo/a.jpg";  // never created: known only to the platform

auto IsTime(int64_t seconds, int64_t nanoseconds) {
  return AllOf(Field(&VLIBCTime::seconds, seconds), Field(&VLIBCTime::nanoseconds, nanoseconds));
}

class FileStatus : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_files = FakeFiles();
    g_files.status.mode = S_IFREG | 0644;
    g_files.status.size = 1000;
    g_files.status.blocks = 8;
    MakeDirectories("/tmp/out");
  }

  static int Run() {
    const StubTool converter(kConverterPath);
    PhotoConvertJob job;
    PhotoThumbSetting setting;
    setting.srcPath = kPhoto;
    setting.destPath = "/tmp/out/thumb.jpg";
    setting.tempPath = "/tmp/out/temp.jpg";
    job.settings.push_back(setting);
    return RunPhotoConvertJob(job);
  }
};

TEST_F(FileStatus, IsReadBeforeAndAfterTheRun) {
  EXPECT_EQ(Run(), 0);
  EXPECT_THAT(g_files.questions, ElementsAre("/tmp/photo/a.jpg with 9", "/tmp/photo/a.jpg with 9"));
  EXPECT_THAT(g_files.times, IsEmpty());
}

TEST_F(FileStatus, AnyResultButZeroIsAFailure) {
  for (const int result : {-1, 1}) {
    g_files.questions.clear();
    g_files.results = {result};
    EXPECT_EQ(Run(), -1);
    g_files.questions.clear();
    g_files.results = {0, result};
    EXPECT_EQ(Run(), -1);
  }
  const std::string before = "velamk_photo_thumb:117 [Error] failed to stat file: /tmp/photo/a.jpg";
  const std::string after =
      "velamk_photo_thumb:397 Failed to VLIBCFileStat() path [/tmp/photo/a.jpg]";
  EXPECT_THAT(TakeErrorLines(), ElementsAre(before, after, before, after));
  EXPECT_THAT(ListDirectory("/tmp/out"), IsEmpty());
}

TEST_F(FileStatus, AThumbOfAPhotoFromTheFutureGetsThreeTimes) {
  const int64_t future = std::time(nullptr) + 3600;
  g_files.status.access = {11, 12};
  g_files.status.modification = {future, 22};
  g_files.status.change = {31, 32};
  g_files.timesResult = -1;  // not a failure of the commit
  EXPECT_EQ(Run(), 0);
  ASSERT_THAT(g_files.times, SizeIs(1));
  const TimesCall& call = g_files.times.front();
  EXPECT_EQ(call.path, "/tmp/out/thumb.jpg");
  EXPECT_EQ(call.options, 3);
  EXPECT_THAT(call.times.access, IsTime(future, 0));
  EXPECT_THAT(call.times.modification, IsTime(future, 0));
  EXPECT_THAT(call.times.change, IsTime(31, 32));
}

}  // namespace
}  // namespace vela_test
