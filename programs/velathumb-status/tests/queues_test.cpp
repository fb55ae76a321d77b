// What the queues hold.
#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/stat.h>

#include <chrono>
#include <sstream>
#include <string>
#include <vector>

#include "status_program.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kPhotoWork = "/var/spool/thumb_create.queue.tmp";
constexpr const char* kPhotoWaiting = "/var/spool/thumb_create.queue";
constexpr const char* kVideoWork = "/var/spool/flv_create.queue.tmp";
constexpr const char* kVideoWaiting = "/var/spool/flv_create.queue";

/// One queue of the text answer.
struct QueueText {
  std::string heading;
  std::vector<std::string> entries;
  std::string count;
};

/// Reads the text answer: headings at the beginning of lines, the last line below each the count.
std::vector<QueueText> ReadQueues(const std::string& text) {
  std::vector<QueueText> queues;
  std::istringstream in(text);
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
  return queues;
}

std::vector<std::string> PathsOf(const Json::Value& queue) {
  std::vector<std::string> paths;
  for (const Json::Value& entry : queue["entries"]) {
    paths.push_back(entry["path"].asString());
  }
  return paths;
}

class QueueAnswer : public SandboxTest {};

TEST_F(QueueAnswer, TellsTheFourFilesWhatIsInWorkFirst) {
  WriteFile(kPhotoWork, "/tmp/in work\n");
  WriteFile(kPhotoWaiting, "/tmp/waiting\nR:/tmp/tree\n");
  WriteFile(kVideoWork, "/tmp/a.mp4\n/tmp/b.mp4\n/tmp/c.mp4\n");
  const ProgramResult result = RunStatus({"--queue"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "");
  const std::vector<QueueText> queues = ReadQueues(result.out);
  ASSERT_EQ(queues.size(), 4U);
  EXPECT_EQ(queues[0].heading, std::string("photo queue ") + kPhotoWork);
  EXPECT_THAT(queues[0].entries, ElementsAre("/tmp/in work"));
  EXPECT_EQ(queues[0].count, "1 entry");
  EXPECT_EQ(queues[1].heading, std::string("photo queue ") + kPhotoWaiting);
  EXPECT_THAT(queues[1].entries, ElementsAre("/tmp/waiting", "R:/tmp/tree"));
  EXPECT_EQ(queues[1].count, "2 entries");
  EXPECT_EQ(queues[2].heading, std::string("video queue ") + kVideoWork);
  EXPECT_THAT(queues[2].entries, ElementsAre("/tmp/a.mp4", "/tmp/b.mp4", "/tmp/c.mp4"));
  EXPECT_EQ(queues[2].count, "3 entries");
  EXPECT_EQ(queues[3].heading, std::string("video queue ") + kVideoWaiting);
  EXPECT_THAT(queues[3].entries, IsEmpty());
  EXPECT_EQ(queues[3].count, "0 entries");
}

TEST_F(QueueAnswer, AnyEntryOfAnyFileIsWork) {
  EXPECT_EQ(RunStatus({"--queue"}).exitCode, 0);
  for (const char* file : {kPhotoWork, kPhotoWaiting, kVideoWork, kVideoWaiting}) {
    WriteFile(file, "/tmp/a\n");
    EXPECT_EQ(RunStatus({"-q"}).exitCode, 1) << file;
    EXPECT_EQ(RunStatus({"-q", "--json"}).exitCode, 1) << file;
    WriteFile(file, "");
    EXPECT_EQ(RunStatus({"-q"}).exitCode, 0) << file;
  }
}

TEST_F(QueueAnswer, PassesOverBlankLinesAndTooLongOnes) {
  const std::string longest = "/" + std::string(4093, 'd');
  WriteFile(kPhotoWaiting, "\n\n" + longest + "\n/" + std::string(4094, 'x') + "\n\n/tmp/last");
  const std::vector<QueueText> queues = ReadQueues(RunStatus({"--queue"}).out);
  ASSERT_EQ(queues.size(), 4U);
  EXPECT_THAT(queues[1].entries, ElementsAre(longest, "/tmp/last"));
  EXPECT_EQ(queues[1].count, "2 entries");
  WriteFile(kPhotoWaiting, "\n\n\n");
  EXPECT_EQ(RunStatus({"--queue"}).exitCode, 0);
}

TEST_F(QueueAnswer, OddBytesStayOnOneLine) {
  WriteFile(kPhotoWaiting, "/tmp/tab\t\\ \x1b[31m\xff\n");
  const std::vector<QueueText> queues = ReadQueues(RunStatus({"--queue"}).out);
  ASSERT_EQ(queues.size(), 4U);
  EXPECT_THAT(queues[1].entries, ElementsAre("/tmp/tab\\x09\\\\ \\x1b[31m\xff"));
}

TEST_F(QueueAnswer, JsonHasTheDocumentedMembers) {
  WriteFile(kPhotoWork, "/tmp/in work\n");
  WriteFile(kVideoWaiting, "R:/tmp/films\n/tmp/\"a\\.mp4\n");
  const Json::Value answer = AskForJson({"--queue"});
  EXPECT_THAT(answer.getMemberNames(), UnorderedElementsAre("format", "queues", "errors"));
  const Json::Value queues = answer["queues"];
  ASSERT_EQ(queues.size(), 4U);
  const char* files[] = {kPhotoWork, kPhotoWaiting, kVideoWork, kVideoWaiting};
  const char* kinds[] = {"photo", "photo", "video", "video"};
  for (Json::ArrayIndex i = 0; i < 4; ++i) {
    EXPECT_THAT(queues[i].getMemberNames(),
                UnorderedElementsAre("kind", "file", "videos_needing_work", "entries"));
    EXPECT_EQ(queues[i]["file"], Json::Value(files[i]));
    EXPECT_EQ(queues[i]["kind"], Json::Value(kinds[i]));
    EXPECT_EQ(queues[i]["videos_needing_work"], Json::Value());
    EXPECT_TRUE(queues[i]["entries"].isArray());
  }
  EXPECT_THAT(PathsOf(queues[0]), ElementsAre("/tmp/in work"));
  EXPECT_THAT(PathsOf(queues[1]), IsEmpty());
  EXPECT_THAT(PathsOf(queues[3]), ElementsAre("R:/tmp/films", "/tmp/\"a\\.mp4"));
}

TEST_F(QueueAnswer, JsonHasOddEntriesExactly) {
  WriteFile(kPhotoWaiting, "/tmp/\xff\n");
  const Json::Value entry = AskForJson({"--queue"})["queues"][1]["entries"][0];
  EXPECT_THAT(entry.getMemberNames(), UnorderedElementsAre("path", "path_base64"));
  EXPECT_EQ(entry["path"], Json::Value("/tmp/\xef\xbf\xbd"));
  EXPECT_EQ(entry["path_base64"], Json::Value("L3RtcC//"));
}

TEST_F(QueueAnswer, AnUnreadableFileIsAnErrorAndTheOthersAreAnswered) {
  WriteFile(kPhotoWork, "/tmp/secret\n");
  WriteFile(kPhotoWaiting, "/tmp/waiting\n");
  ASSERT_EQ(chmod(kPhotoWork, 0), 0);
  const ProgramResult result = RunStatusAsOrdinaryUser({"--queue"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, std::string("velathumb-status: ") + kPhotoWork + ": Permission denied\n");
  EXPECT_THAT(result.out, HasSubstr("    /tmp/waiting\n"));
}

TEST_F(QueueAnswer, WhatIsNoFileIsAnErrorAtOnceAndTheOthersAreAnswered) {
  ASSERT_EQ(mkfifo(kPhotoWork, 0666), 0);
  MakeDirectories(kVideoWork);
  WriteFile(kPhotoWaiting, "/tmp/waiting\n");
  ProgramOptions options;
  options.timeLimit = std::chrono::seconds(20);
  const ProgramResult result = RunStatus({"--queue"}, options);
  ASSERT_FALSE(result.timedOut);
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err, std::string("velathumb-status: ") + kPhotoWork +
                            ": Invalid argument\nvelathumb-status: " + kVideoWork +
                            ": Is a directory\n");
  EXPECT_THAT(result.out, HasSubstr("    /tmp/waiting\n"));
  const Json::Value answer = ReadJson(RunStatus({"--queue", "--json"}, options).out);
  EXPECT_EQ(answer["errors"].size(), 2U);
  EXPECT_THAT(PathsOf(answer["queues"][1]), ElementsAre("/tmp/waiting"));
}

}  // namespace
}  // namespace vela_test
