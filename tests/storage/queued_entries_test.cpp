// The entries of the creation queues.
#include <sys/stat.h>

#include <cerrno>
#include <ostream>

#include "storage/creation_queue.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela {

/// Shows the file instead of the addresses of the members, which would become part of test names.
static void PrintTo(const CreationQueue& queue, std::ostream* out) {
  *out << queue.file;
}

}  // namespace vela

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kFile = "/var/spool/some.queue";

class QueueFile : public QuietTest {
 protected:
  static std::vector<std::string> Entries() {
    std::vector<std::string> entries;
    EXPECT_EQ(ForEachQueueEntry(kFile,
                                [&entries](const std::string& entry) { entries.push_back(entry); }),
              QueueRead::kComplete);
    return entries;
  }
};

TEST_F(QueueFile, EntriesComeInOrderWithoutTheirNewlines) {
  WriteFile(kFile, "/b\nR:/a\n\n /c \r\n/b\nlast");
  EXPECT_THAT(Entries(), ElementsAre("/b", "R:/a", "", " /c \r", "/b", "last"));
  WriteFile(kFile, "/a\n");
  EXPECT_THAT(Entries(), ElementsAre("/a"));
  WriteFile(kFile, "");
  EXPECT_THAT(Entries(), IsEmpty());
}

TEST_F(QueueFile, LongLinesAreSkipped) {
  const std::string longest(4094, 'x');
  WriteFile(kFile, "/a\n" + longest + "x\n" + longest + "\n" + std::string(300000, 'y') + "\n/b\n" +
                       longest + "x");
  EXPECT_THAT(Entries(), ElementsAre("/a", longest, "/b", longest + "x"));
  WriteFile(kFile, "/a\n" + longest + "xx");
  EXPECT_THAT(Entries(), ElementsAre("/a"));
}

TEST_F(QueueFile, AnUnreadableOneDiffersFromAnEmptyOne) {
  const auto visit = [](const std::string&) { ADD_FAILURE() << "there is no entry"; };
  EXPECT_EQ(ForEachQueueEntry(kFile, visit), QueueRead::kNotOpened);
  EXPECT_EQ(errno, ENOENT);
  WriteFile(kFile, "/a\n");
  ASSERT_EQ(chmod(kFile, 0), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(ForEachQueueEntry(kFile, visit), QueueRead::kNotOpened);
  EXPECT_EQ(errno, EACCES);
}

TEST_F(QueueFile, OnlyARegularFileIsRead) {
  const auto visit = [](const std::string&) { ADD_FAILURE() << "there is no entry"; };
  ASSERT_EQ(mkfifo(kFile, 0600), 0);
  EXPECT_EQ(ForEachQueueEntry(kFile, visit), QueueRead::kNotOpened);
  EXPECT_EQ(errno, EINVAL);
  EXPECT_EQ(ForEachQueueEntry("/var/spool", visit), QueueRead::kNotOpened);
  EXPECT_EQ(errno, EISDIR);
}

TEST_F(QueueFile, LeavesNoDescriptorOpen) {
  WriteFile(kFile, "/a\n");
  const size_t before = ListDirectory("/proc/self/fd").size();
  for (int i = 0; i < 5; ++i) {
    EXPECT_THAT(Entries(), ElementsAre("/a"));
    EXPECT_TRUE(HasQueueLine(kFile, "/a"));
  }
  EXPECT_EQ(ListDirectory("/proc/self/fd").size(), before);
}

TEST_F(QueueFile, HasWholeLinesOnly) {
  WriteFile(kFile, "/a/bc\n/d\nlast");
  EXPECT_TRUE(HasQueueLine(kFile, "/a/bc"));
  EXPECT_TRUE(HasQueueLine(kFile, "/d"));
  EXPECT_TRUE(HasQueueLine(kFile, "last"));
  for (const char* text : {"/a/b", "/a", "a/bc", "/a/bcd", "/d\nlast", "", "las"}) {
    EXPECT_FALSE(HasQueueLine(kFile, text)) << text;
  }
  EXPECT_FALSE(HasQueueLine("/var/spool/none.queue", "/d"));
}

class Queued : public QuietTest, public ::testing::WithParamInterface<CreationQueue> {};

TEST_P(Queued, IsAnEntryOfEitherFile) {
  EXPECT_FALSE(IsQueued(GetParam(), "/a"));
  WriteFile(GetParam().file, "/a\n/both\n");
  EXPECT_TRUE(IsQueued(GetParam(), "/a"));
  WriteFile(GetParam().tempFile, "/b\n/both\n");
  EXPECT_TRUE(IsQueued(GetParam(), "/a"));
  EXPECT_TRUE(IsQueued(GetParam(), "/b"));
  EXPECT_TRUE(IsQueued(GetParam(), "/both"));
  EXPECT_FALSE(IsQueued(GetParam(), "/c"));
  EXPECT_FALSE(IsQueued(GetParam(), ""));
  RemoveTree(GetParam().file);
  EXPECT_TRUE(IsQueued(GetParam(), "/b"));
  EXPECT_FALSE(IsQueued(GetParam(), "/a"));
}

INSTANTIATE_TEST_SUITE_P(Queues, Queued, ::testing::Values(kPhotoQueue, kVideoQueue),
                         [](const ::testing::TestParamInfo<CreationQueue>& queue) {
                           return queue.param.file == kPhotoQueue.file ? "Photos" : "Videos";
                         });

}  // namespace
}  // namespace vela_test
