// The contents of the queues.
#include <sys/stat.h>

#include <chrono>
#include <sstream>

#include "status_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

/// The queue files in the order of the report.
constexpr const char* kFiles[] = {kPhotosInProgress, kPhotoQueue, kVideosInProgress, kVideoQueue,
                                  kDeferredPhotos};

/// One queue of the text report.
struct QueueText {
  std::string heading;
  std::vector<std::string> entries;
  std::string count;
};

/// Requests the queues. Headings begin at the left margin; the last line of each queue is its
/// count.
std::vector<QueueText> QueryQueues() {
  std::vector<QueueText> queues;
  std::istringstream in(RunStatus({"--queue"}).out);
  for (std::string line; std::getline(in, line);) {
    if (line.compare(0, 4, "    ") != 0) {
      queues.push_back({line, {}, {}});
    } else if (!queues.empty()) {
      queues.back().entries.push_back(line.substr(4));
    }
  }
  for (QueueText& queue : queues) {
    if (!queue.entries.empty()) {
      queue.count = queue.entries.back();
      queue.entries.pop_back();
    }
  }
  EXPECT_EQ(queues.size(), 5U);
  queues.resize(5);
  return queues;
}

std::vector<std::string> PathsOf(const Json::Value& queue) {
  std::vector<std::string> paths;
  for (const Json::Value& entry : queue["entries"]) {
    paths.push_back(entry["path"].asString());
  }
  return paths;
}

class QueueListTest : public SandboxTest {};

TEST_F(QueueListTest, ListsTheFilesEntriesInProgressFirst) {
  WriteFile(kPhotosInProgress, "/tmp/in work\n");
  WriteFile(kPhotoQueue, "/tmp/waiting\nR:/tmp/tree\n");
  WriteFile(kVideosInProgress, "/tmp/a.mp4\n/tmp/b.mp4\n/tmp/c.mp4\n");
  WriteFile(kDeferredPhotos, "/tmp/gone\n");
  const ProgramResult result = RunStatus({"--queue"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
  const QueueText expected[] = {
      {"photo queue /var/spool/thumb_create.queue.tmp", {"/tmp/in work"}, "1 entry"},
      {"photo queue /var/spool/thumb_create.queue", {"/tmp/waiting", "R:/tmp/tree"}, "2 entries"},
      {"video queue /var/spool/flv_create.queue.tmp",
       {"/tmp/a.mp4", "/tmp/b.mp4", "/tmp/c.mp4"},
       "3 entries"},
      {"video queue /var/spool/flv_create.queue", {}, "0 entries"},
      {"photo queue /var/spool/thumb_create.queue.later, deferred", {"/tmp/gone"}, "1 entry"},
  };
  const std::vector<QueueText> queues = QueryQueues();
  for (size_t i = 0; i < queues.size(); ++i) {
    EXPECT_EQ(queues[i].heading, expected[i].heading);
    EXPECT_EQ(queues[i].entries, expected[i].entries);
    EXPECT_EQ(queues[i].count, expected[i].count);
  }
}

TEST_F(QueueListTest, AnyEntryOfAnyFileIsWork) {
  EXPECT_EQ(RunStatus({"--queue"}).exitCode, 0);
  for (const char* file : kFiles) {
    WriteFile(file, "/tmp/a\n");
    EXPECT_EQ(RunStatus({"-q"}).exitCode, 1) << file;
    EXPECT_EQ(RunStatus({"-q", "--json"}).exitCode, 1) << file;
    WriteFile(file, "");
    EXPECT_EQ(RunStatus({"-q"}).exitCode, 0) << file;
  }
}

TEST_F(QueueListTest, SkipsBlankAndTooLongLines) {
  const std::string longest = "/" + std::string(4093, 'd');
  WriteFile(kPhotoQueue, "\n\n" + longest + "\n/" + std::string(4094, 'x') + "\n\n/tmp/last");
  const QueueText queue = QueryQueues()[1];
  EXPECT_THAT(queue.entries, ElementsAre(longest, "/tmp/last"));
  EXPECT_EQ(queue.count, "2 entries");
  WriteFile(kPhotoQueue, "\n\n\n");
  EXPECT_EQ(RunStatus({"--queue"}).exitCode, 0);
}

TEST_F(QueueListTest, OddBytesStayOnOneLine) {
  WriteFile(kPhotoQueue, "/tmp/tab\t\\ \x1b[31m\xff\n");
  EXPECT_THAT(QueryQueues()[1].entries, ElementsAre("/tmp/tab\\x09\\\\ \\x1b[31m\xff"));
}

TEST_F(QueueListTest, JsonHasTheDocumentedMembers) {
  WriteFile(kPhotosInProgress, "/tmp/in work\n");
  WriteFile(kDeferredPhotos, "/tmp/gone\n");
  WriteFile(kVideoQueue, "R:/tmp/films\n/tmp/\"a\\.mp4\n");
  const Json::Value answer = QueryJson({"--queue"});
  EXPECT_THAT(answer.getMemberNames(), UnorderedElementsAre("format", "queues", "errors"));
  const Json::Value queues = answer["queues"];
  ASSERT_EQ(queues.size(), 5U);
  const char* kinds[] = {"photo", "photo", "video", "video", "photo"};
  for (Json::ArrayIndex i = 0; i < queues.size(); ++i) {
    EXPECT_THAT(queues[i].getMemberNames(),
                UnorderedElementsAre("kind", "file", "deferred", "videos_needing_work", "entries"));
    EXPECT_EQ(queues[i]["deferred"], Json::Value(i == 4));
    EXPECT_EQ(queues[i]["file"], Json::Value(kFiles[i]));
    EXPECT_EQ(queues[i]["kind"], Json::Value(kinds[i]));
    EXPECT_EQ(queues[i]["videos_needing_work"], Json::Value());
    EXPECT_TRUE(queues[i]["entries"].isArray());
  }
  EXPECT_THAT(PathsOf(queues[0]), ElementsAre("/tmp/in work"));
  EXPECT_THAT(PathsOf(queues[1]), IsEmpty());
  EXPECT_THAT(PathsOf(queues[4]), ElementsAre("/tmp/gone"));
  EXPECT_THAT(PathsOf(queues[3]), ElementsAre("R:/tmp/films", "/tmp/\"a\\.mp4"));
}

TEST_F(QueueListTest, JsonHasOddEntriesExactly) {
  WriteFile(kPhotoQueue, "/tmp/\xff\n");
  EXPECT_EQ(QueryJson({"--queue"})["queues"][1]["entries"][0],
            ReadJson("{\"path\": \"/tmp/\xef\xbf\xbd\", \"path_base64\": \"L3RtcC//\"}"));
}

TEST_F(QueueListTest, AnUnreadableFileIsAnErrorAndTheOthersAreListed) {
  WriteFile(kPhotosInProgress, "/tmp/secret\n");
  WriteFile(kPhotoQueue, "/tmp/waiting\n");
  ASSERT_EQ(chmod(kPhotosInProgress, 0), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"--queue"});
  ExpectError(result, std::string(kPhotosInProgress) + ": Permission denied");
  EXPECT_THAT(result.out, HasSubstr("    /tmp/waiting\n"));
}

TEST_F(QueueListTest, AFifoOrDirectoryIsAnErrorAtOnceAndTheOthersAreListed) {
  ASSERT_EQ(mkfifo(kPhotosInProgress, 0666), 0);
  MakeDirectories(kVideosInProgress);
  WriteFile(kPhotoQueue, "/tmp/waiting\n");
  ProgramOptions options;
  options.timeLimit = std::chrono::seconds(20);
  const ProgramResult result = RunStatus({"--queue"}, options);
  ASSERT_FALSE(result.timedOut);
  ExpectError(result, std::string(kPhotosInProgress) + ": Invalid argument\nvelathumb-status: " +
                          kVideosInProgress + ": Is a directory");
  EXPECT_THAT(result.out, HasSubstr("    /tmp/waiting\n"));
  const Json::Value answer = ReadJson(RunStatus({"--queue", "--json"}, options).out);
  EXPECT_EQ(answer["errors"].size(), 2U);
  EXPECT_THAT(PathsOf(answer["queues"][1]), ElementsAre("/tmp/waiting"));
}

}  // namespace
}  // namespace vela_test
