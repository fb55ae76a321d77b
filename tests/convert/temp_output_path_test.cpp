// The temporary names of the converter's outputs.
#include <sys/stat.h>
#include <unistd.h>

#include <set>

#include "convert/convert_command.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/privileges.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::IsEmpty;
using ::testing::MatchesRegex;

constexpr const char* kDirectory = "/tmp/out.d";

class TempOutputPath : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    MakeDirectories(kDirectory);
  }
};

TEST_F(TempOutputPath, IsInTheDirectoryOfTheThumbAndHasItsExtension) {
  const std::string pattern = "/tmp/out\\.d/VELAPHOTO\\.tmp\\.[A-Za-z0-9]{6}";
  EXPECT_THAT(MakeTempOutputPath("/tmp/out.d/VELAPHOTO_THUMB_XL.jpg"),
              MatchesRegex(pattern + "\\.jpg"));
  EXPECT_THAT(MakeTempOutputPath("/tmp/out.d/a.b.PNG"), MatchesRegex(pattern + "\\.PNG"));
  EXPECT_THAT(MakeTempOutputPath("/tmp/out.d/thumb"), MatchesRegex(pattern));
  EXPECT_THAT(MakeTempOutputPath("/tmp/out.d/thumb."), MatchesRegex(pattern));
}

TEST_F(TempOutputPath, IsUniqueAndLeavesNoFile) {
  std::set<std::string> names;
  for (int i = 0; i < 500; ++i) {
    names.insert(MakeTempOutputPath("/tmp/out.d/thumb.jpg"));
  }
  EXPECT_EQ(names.size(), 500U);
  EXPECT_EQ(names.count("/tmp/out.d/VELAPHOTO.tmp.XXXXXX"), 0U);
  EXPECT_THAT(ListDirectory(kDirectory), IsEmpty());
}

TEST_F(TempOutputPath, LeavesNoDescriptor) {
  const size_t before = ListDirectory("/proc/self/fd").size();
  for (int i = 0; i < 20; ++i) {
    MakeTempOutputPath("/tmp/out.d/thumb.jpg");
    MakeTempOutputPath("/tmp/missing/thumb.jpg");
  }
  EXPECT_EQ(ListDirectory("/proc/self/fd").size(), before);
}

TEST_F(TempOutputPath, ContainsTheBytesOfTheDirectory) {
  const std::string directory = "/tmp/100% \"\xC3\xBC\xFF\nXXXXXX.d";
  MakeDirectories(directory);
  const std::string path = MakeTempOutputPath(directory + "/thumb.jpg");
  EXPECT_EQ(path.substr(0, directory.size()), directory);
  EXPECT_THAT(path.substr(directory.size()),
              MatchesRegex("/VELAPHOTO\\.tmp\\.[A-Za-z0-9]{6}\\.jpg"));
}

TEST_F(TempOutputPath, WithoutDirectoryIsInTheCurrentOne) {
  ASSERT_EQ(chdir(kDirectory), 0);
  EXPECT_THAT(MakeTempOutputPath("thumb.jpg"),
              MatchesRegex("\\./VELAPHOTO\\.tmp\\.[A-Za-z0-9]{6}\\.jpg"));
  EXPECT_THAT(ListDirectory(kDirectory), IsEmpty());
}

TEST_F(TempOutputPath, IsTheBareTemplateWhereNoFileCanBeMade) {
  EXPECT_EQ(MakeTempOutputPath("/tmp/missing/thumb.jpg"), "/tmp/missing/VELAPHOTO.tmp.XXXXXX");
  EXPECT_FALSE(Exists("/tmp/missing"));
  WriteFile("/tmp/file", "x");
  EXPECT_EQ(MakeTempOutputPath("/tmp/file/thumb.jpg"), "/tmp/file/VELAPHOTO.tmp.XXXXXX");
  {
    const ReadOnlyMount readOnly(kDirectory);
    EXPECT_EQ(MakeTempOutputPath("/tmp/out.d/thumb.jpg"), "/tmp/out.d/VELAPHOTO.tmp.XXXXXX");
    EXPECT_EQ(MakeTempOutputPath("/tmp/out.d/other.png"), "/tmp/out.d/VELAPHOTO.tmp.XXXXXX");
  }
  ASSERT_EQ(chmod(kDirectory, 0555), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(MakeTempOutputPath("/tmp/out.d/thumb.jpg"), "/tmp/out.d/VELAPHOTO.tmp.XXXXXX");
}

}  // namespace
}  // namespace vela_test
