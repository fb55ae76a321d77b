// How the queues are searched, with a faked line search.
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <functional>

#include "platform/vlibc.h"
#include "storage/creation_queue.h"
#include "storage/velamk_thumb_status.h"
#include "support/capabilities.h"
#include "support/files.h"
#include "support/quiet_test.h"

using namespace vela;

namespace {

/// One call of the line search.
struct Search {
  std::string file;
  std::string text;
  size_t outSize;
  int flags;
};

struct FakeLineSearch {
  std::string holder;  ///< the file that has a matching line
  std::string line;    ///< that line
  int failure = 0;     ///< result of all other searches
  std::vector<Search> searches;
};

FakeLineSearch g_lineSearch;

}  // namespace

int VLIBCFileGetLine(const char* file, const char* text, char* out, size_t outSize, int flags) {
  g_lineSearch.searches.push_back({file, text, outSize, flags});
  if (file != g_lineSearch.holder) {
    return g_lineSearch.failure;
  }
  std::snprintf(out, outSize, "%s", g_lineSearch.line.c_str());
  return static_cast<int>(g_lineSearch.line.size());
}

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QueueSearch : public QuietTest, public ::testing::WithParamInterface<CreationQueue> {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_lineSearch = FakeLineSearch();
    WriteFile(GetParam().file, "");
  }

  static std::vector<std::string> Files() {
    std::vector<std::string> files;
    for (const Search& search : g_lineSearch.searches) {
      files.push_back(search.file);
    }
    return files;
  }

  static bool IsFound() { return IsQueued(GetParam(), "/a/b"); }
};

TEST_P(QueueSearch, SearchesTheFileInProgressFirst) {
  EXPECT_FALSE(IsFound());
  EXPECT_THAT(Files(), ElementsAre(GetParam().tempFile, GetParam().file));
  g_lineSearch = FakeLineSearch();
  g_lineSearch.failure = -1;
  EXPECT_FALSE(IsFound());
  EXPECT_THAT(Files(), ElementsAre(GetParam().tempFile, GetParam().file));
}

TEST_P(QueueSearch, EndsWhereTheLineIsFound) {
  g_lineSearch.line = "/a/b";
  g_lineSearch.holder = GetParam().tempFile;
  EXPECT_TRUE(IsFound());
  EXPECT_THAT(Files(), ElementsAre(GetParam().tempFile));
  g_lineSearch.holder = GetParam().file;
  EXPECT_TRUE(IsFound());
}

TEST_P(QueueSearch, SearchesTheWholePathWithTheUsualFlags) {
  IsFound();
  for (const Search& search : g_lineSearch.searches) {
    EXPECT_EQ(search.text, "/a/b");
    EXPECT_EQ(search.outSize, 4096U);
    EXPECT_EQ(search.flags, 1028);
  }
}

TEST_P(QueueSearch, ALongerLineThatBeginsWithThePathIsNoMatch) {
  for (const char* file : {GetParam().tempFile, GetParam().file}) {
    g_lineSearch.holder = file;
    for (const char* line : {"/a/bc", "/a/b/", "/a/", ""}) {
      g_lineSearch.line = line;
      EXPECT_FALSE(IsFound()) << line;
    }
  }
}

TEST_P(QueueSearch, AMatchInTheMainFileCountsAfterAPartialOneInTheFileInProgress) {
  g_lineSearch.failure = static_cast<int>(std::string("/a/bc").size());
  g_lineSearch.holder = GetParam().file;
  g_lineSearch.line = "/a/b";
  EXPECT_TRUE(IsFound());
}

TEST_P(QueueSearch, SkipsAMissingMainFile) {
  RemoveTree(GetParam().file);
  WriteFile(GetParam().tempFile, "");
  EXPECT_FALSE(IsFound());
  EXPECT_THAT(Files(), ElementsAre(GetParam().tempFile));
}

/// The result of `check` in a process to which permission bits apply. The queues are tested with
/// access(), which uses the real user, so dropping capabilities for a while is not enough.
bool CheckAsOrdinaryUser(const std::function<bool()>& check) {
  const pid_t pid = fork();
  if (pid == 0) {
    _exit(GiveUpCapabilities() == 0 && check() ? 0 : 1);
  }
  int status = -1;
  waitpid(pid, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST_P(QueueSearch, SkipsAnUnreadableMainFile) {
  const auto isSkipped = [] {
    return !IsFound() && Files() == std::vector<std::string>{GetParam().tempFile};
  };
  EXPECT_FALSE(CheckAsOrdinaryUser(isSkipped)) << "the file may be read";
  ASSERT_EQ(chmod(GetParam().file, 0), 0);
  EXPECT_TRUE(CheckAsOrdinaryUser(isSkipped));
}

INSTANTIATE_TEST_SUITE_P(Queues, QueueSearch, ::testing::Values(kPhotoQueue, kVideoQueue),
                         [](const ::testing::TestParamInfo<CreationQueue>& queue) {
                           return queue.param.file == kPhotoQueue.file ? "Photos" : "Videos";
                         });

class SearchesOfScans : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_lineSearch = FakeLineSearch();
    WriteFile("/tmp/dir/a.mp4", "video");
    WriteFile("/tmp/dir/a.jpg", "photo");
  }

  /// The searches as "file text".
  static std::vector<std::string> Searches() {
    std::vector<std::string> searches;
    for (const Search& search : g_lineSearch.searches) {
      searches.push_back(search.file + " " + search.text);
    }
    return searches;
  }
};

TEST_F(SearchesOfScans, APhotoTreeSearchesDirectories) {
  WriteFile("/var/spool/thumb_create.queue", "");
  int photos = 0;
  int thumbs = 0;
  GetDirThumbStatusRecursive("/tmp/dir", &photos, &thumbs);
  EXPECT_THAT(Searches(), ElementsAre("/var/spool/thumb_create.queue.tmp /tmp/dir",
                                      "/var/spool/thumb_create.queue /tmp/dir"));
}

TEST_F(SearchesOfScans, AVideoTreeSearchesVideosThatNeedWork) {
  WriteFile("/var/spool/flv_create.queue", "");
  EXPECT_EQ(CountVideoWork("/tmp/dir"), 1);
  EXPECT_THAT(Searches(), ElementsAre("/var/spool/flv_create.queue.tmp /tmp/dir/a.mp4",
                                      "/var/spool/flv_create.queue /tmp/dir/a.mp4"));
}

TEST_F(SearchesOfScans, AnEntryInProgressIsSkipped) {
  WriteFile("/var/spool/flv_create.queue", "/tmp/dir/a.mp4\nR:/tmp/dir\n");
  g_lineSearch.holder = "/var/spool/flv_create.queue.tmp";
  g_lineSearch.line = "/tmp/dir/a.mp4";
  EXPECT_EQ(CountVideoQueueWork("/var/spool/flv_create.queue"), 0);
  EXPECT_THAT(Searches(), ElementsAre("/var/spool/flv_create.queue.tmp /tmp/dir/a.mp4",
                                      "/var/spool/flv_create.queue.tmp R:/tmp/dir",
                                      "/var/spool/flv_create.queue.tmp /tmp/dir/a.mp4"));
}

TEST_F(SearchesOfScans, AnotherQueueFileIsNotComparedWithTheFileInProgress) {
  WriteFile("/var/spool/other.queue", "/tmp/dir/a.mp4\n");
  EXPECT_EQ(CountVideoQueueWork("/var/spool/other.queue"), 1);
  EXPECT_THAT(Searches(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
