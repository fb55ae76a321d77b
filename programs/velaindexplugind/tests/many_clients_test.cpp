// Many clients at once, and clients that do not behave.
#include <poll.h>
#include <sqlite3.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include "index_daemon.h"
#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "support/files.h"
#include "support/images.h"

namespace vela_test {
namespace {

const std::string kVersionRequest = R"({"command":"GET_INDEX_VERSION","path":"/a"})";

/// Every worker's connection to the index has a few descriptors, opened when it is first needed.
constexpr size_t kIndexDescriptors = 20;

class ManyClientsTest : public IndexDaemonTest {
 protected:
  static std::vector<Descriptor> Connect(size_t count, const std::string& bytes) {
    std::vector<Descriptor> connections;
    for (size_t i = 0; i < count; ++i) {
      connections.push_back(ConnectToDaemon());
      EXPECT_TRUE(connections.back().IsOpen());
      SendBytes(connections.back(), bytes);
    }
    return connections;
  }
};

/// Holds the index as another program that writes to it.
class IndexHolder {
 public:
  IndexHolder() {
    EXPECT_EQ(sqlite3_open(kIndexDatabase, &database_), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(database_, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
  }
  ~IndexHolder() { Release(); }
  IndexHolder(const IndexHolder&) = delete;
  IndexHolder& operator=(const IndexHolder&) = delete;

  void Release() {
    sqlite3_close(database_);
    database_ = nullptr;
  }

 private:
  sqlite3* database_ = nullptr;
};

bool HasReply(const Descriptor& connection, int milliseconds) {
  pollfd waiting = {connection.Get(), POLLIN, 0};
  return poll(&waiting, 1, milliseconds) == 1;
}

/// Processor time the process has used.
double ProcessorSeconds(pid_t pid) {
  std::ifstream file("/proc/" + std::to_string(pid) + "/stat");
  std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
  text.erase(0, text.rfind(')') + 2);
  unsigned long user = 0;
  unsigned long system = 0;
  const int count = std::sscanf(text.c_str(), "%*c %*d %*d %*d %*d %*d %*u %*u %*u %*u %*u %lu %lu",
                                &user, &system);
  EXPECT_EQ(count, 2);
  return static_cast<double>(user + system) / static_cast<double>(sysconf(_SC_CLK_TCK));
}

TEST_F(ManyClientsTest, AllAreAnswered) {
  const IndexDaemon daemon;
  MakeJpeg("/tmp/a.jpg");
  const std::vector<std::string> requests = {
      kVersionRequest, R"({"command":"POST_PHOTO_CONVERT","path":"/a.jpg"})",
      R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","path":"/tmp/a.jpg","type":1})",
      R"({"command":"IS_DISABLE_CONVERT_PHOTO"})"};
  std::vector<Descriptor> connections;
  for (size_t i = 0; i < 200; ++i) {
    connections.push_back(ConnectToDaemon());
    SendBytes(connections.back(), requests[i % requests.size()] + "\n");
  }
  for (const Descriptor& connection : connections) {
    EXPECT_EQ(ParseReply(ReceiveAll(connection))["success"], Json::Value(true));
  }
}

TEST_F(ManyClientsTest, ThoseThatStopHalfWayDoNotDelayOthers) {
  const IndexDaemon daemon;
  const std::string half = kVersionRequest.substr(0, 20);
  for (const size_t count : {200U, 1000U}) {
    const std::vector<Descriptor> silent = Connect(count / 2, "");
    const std::vector<Descriptor> halfWay = Connect(count / 2, half);
    const auto begin = std::chrono::steady_clock::now();
    for (int i = 0; i < 20; ++i) EXPECT_EQ(GetIndexVersion("/a"), 0);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(15));
    // They are still there, and are answered when they go on.
    EXPECT_FALSE(HasReply(halfWay.front(), 0));
    for (const Descriptor& connection : halfWay) SendBytes(connection, kVersionRequest.substr(20));
    SendBytes(halfWay.front(), "\n");
    EXPECT_EQ(ParseReply(ReceiveAll(halfWay.front()))["version"], 0);
  }
}

TEST_F(ManyClientsTest, LeaveNoDescriptorBehind) {
  const IndexDaemon daemon;
  const size_t before = daemon.Descriptors();
  MakeJpeg("/tmp/a.jpg");
  for (int round = 0; round < 3; ++round) {
    Connect(100, "");
    Connect(100, kVersionRequest.substr(0, 20));
    Connect(100, kVersionRequest + "\n");
    Connect(100, "x\n");
    Connect(50, std::string(100000, 'x'));
    Connect(50, R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","path":"/tmp/a.jpg","type":1})"
                "\n");
  }
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
  while (daemon.Descriptors() > before + kIndexDescriptors &&
         std::chrono::steady_clock::now() < end) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  EXPECT_LE(daemon.Descriptors(), before + kIndexDescriptors);
}

TEST_F(ManyClientsTest, RequestWithoutItsNewlineCountsWhenTheClientIsDoneWriting) {
  const IndexDaemon daemon;
  const std::vector<Descriptor> connections = Connect(1, kVersionRequest);
  shutdown(connections[0].Get(), SHUT_WR);
  EXPECT_EQ(ParseReply(ReceiveAll(connections[0]))["version"], 0);
}

TEST_F(ManyClientsTest, RequestMayComeByteByByte) {
  const IndexDaemon daemon;
  const Descriptor connection = ConnectToDaemon();
  for (const char c : kVersionRequest + "\n") {
    SendBytes(connection, std::string(1, c));
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  EXPECT_EQ(ParseReply(ReceiveAll(connection))["version"], 0);
}

TEST_F(ManyClientsTest, ThatKeepStillAreLetGo) {
  const IndexDaemon daemon({"--client-timeout", "1"});
  size_t before = 0;
  // The first round leaves the daemon's timer behind.
  for (int round = 0; round < 2; ++round) {
    before = daemon.Descriptors();
    const std::vector<Descriptor> silent = Connect(1, "");
    const std::vector<Descriptor> halfWay = Connect(1, "{");
    for (const Descriptor* connection : {&silent[0], &halfWay[0]}) {
      bool isEnded = false;
      EXPECT_EQ(ReceiveAll(*connection, &isEnded), "");
      EXPECT_TRUE(isEnded);
    }
  }
  EXPECT_TRUE(daemon.WaitForDescriptors(before));
}

TEST_F(ManyClientsTest, ThatTrickleAreLetGo) {
  const IndexDaemon daemon({"--client-timeout", "1"});
  const Descriptor connection = ConnectToDaemon();
  const auto begin = std::chrono::steady_clock::now();
  while (!HasReply(connection, 200)) {
    SendBytes(connection, "x");
    ASSERT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(60));
  }
  EXPECT_EQ(ReceiveAll(connection), "");
  EXPECT_GT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(2));
}

TEST_F(ManyClientsTest, WaitForTheIndexWithoutDelayingWhatNeedsNoWriting) {
  const IndexDaemon daemon;
  MakeJpeg("/tmp/a.jpg");
  IndexHolder holder;
  const std::vector<Descriptor> posting =
      Connect(8, R"({"command":"POST_PHOTO_CONVERT","path":"/a.jpg"})"
                 "\n");
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  EXPECT_FALSE(IsDisableConvertPhoto());
  EXPECT_EQ(AskForMedia("/tmp/a.jpg")["width"], 64);
  EXPECT_FALSE(HasReply(posting[0], 0));
  holder.Release();
  for (const Descriptor& connection : posting) {
    EXPECT_EQ(ParseReply(ReceiveAll(connection))["success"], Json::Value(true));
  }
}

TEST_F(ManyClientsTest, ThatGoWhileTheirRequestIsInHandAreForgotten) {
  const IndexDaemon daemon;
  // To the end of the connection, which the count is not to have in it.
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  const size_t before = daemon.Descriptors();
  IndexHolder holder;
  {
    const std::vector<Descriptor> posting =
        Connect(20, R"({"command":"POST_PHOTO_CONVERT","path":"/a.jpg"})"
                    "\n");
    EXPECT_TRUE(daemon.WaitForDescriptors(before + 20));
  }
  EXPECT_TRUE(daemon.WaitForDescriptors(before));
  holder.Release();
  // What they asked is done nevertheless.
  PostPhotoConvert("/b.jpg");
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), std::vector<std::string>{"3"});
}

TEST_F(ManyClientsTest, WaitForALockedIndexTogetherAndNotOneAfterTheOther) {
  const IndexDaemon daemon;
  const IndexHolder holder;
  const auto begin = std::chrono::steady_clock::now();
  const std::vector<Descriptor> posting =
      Connect(6, R"({"command":"POST_PHOTO_CONVERT","path":"/a.jpg"})"
                 "\n");
  for (const Descriptor& connection : posting) {
    const Json::Value reply = ParseReply(ReceiveAll(connection));
    EXPECT_EQ(reply["success"], Json::Value(false));
    EXPECT_EQ(reply["error"], "index database: other writers held it for too long");
  }
  const auto took = std::chrono::steady_clock::now() - begin;
  EXPECT_GT(took, std::chrono::milliseconds(4500));
  EXPECT_LT(took, std::chrono::seconds(20));
}

TEST_F(ManyClientsTest, HaveWhatTheyPostWrittenTogether) {
  constexpr size_t kPosts = 60;
  constexpr int64_t kPageSize = 4096;
  const IndexDaemon daemon;
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  IndexHolder holder;
  std::vector<Descriptor> posting;
  for (size_t i = 0; i < kPosts; ++i) {
    posting.push_back(ConnectToDaemon());
    SendBytes(posting.back(),
              R"({"command":"POST_PHOTO_CONVERT","path":"/)" + std::to_string(i) + "\"}\n");
  }
  // An answer tells that the requests before have been taken in.
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  const std::string log = kIndexDatabase + std::string("-wal");
  const int64_t before = FileSize(log);
  holder.Release();
  for (const Descriptor& connection : posting) {
    EXPECT_EQ(ParseReply(ReceiveAll(connection))["success"], Json::Value(true));
  }
  EXPECT_EQ(Query("SELECT count(*) FROM posted"),
            std::vector<std::string>{std::to_string(kPosts + 1)});
  // Each transaction writes a page at least.
  EXPECT_LT(FileSize(log) - before, static_cast<int64_t>(kPosts / 2) * kPageSize);
}

TEST_F(ManyClientsTest, ThatGoBeforeTheirRequestIsInHandKeepTheirPlaceUntilItIsDone) {
  const IndexDaemon daemon({"--max-clients", "4"});
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  const size_t before = daemon.Descriptors();
  IndexHolder holder;
  {
    const std::vector<Descriptor> posting =
        Connect(4, R"({"command":"POST_PHOTO_CONVERT","path":"/a.jpg"})"
                   "\n");
    EXPECT_TRUE(daemon.WaitForDescriptors(before + 4));
  }
  EXPECT_TRUE(daemon.WaitForDescriptors(before));
  const std::vector<Descriptor> next = Connect(1, kVersionRequest + "\n");
  EXPECT_FALSE(HasReply(next[0], 300));
  holder.Release();
  EXPECT_EQ(ParseReply(ReceiveAll(next[0]))["version"], 0);
}

TEST_F(ManyClientsTest, ThatGoWithoutTheirRecordsHaveNoFilesReadForThem) {
  constexpr int kPhotos = 40;
  const IndexDaemon daemon({"--workers", "1"});
  for (int i = 0; i <= kPhotos; ++i) {
    const std::string path = "/tmp/" + std::to_string(i) + ".jpg";
    MakeJpeg(path);
    SetFileTimeFromNow(path, -3600);
  }
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  AskForMedia("/tmp/0.jpg");
  const size_t before = daemon.Descriptors();
  IndexHolder holder;  // makes each record take its time
  {
    std::vector<Descriptor> asking;
    for (int i = 1; i <= kPhotos; ++i) {
      asking.push_back(ConnectToDaemon());
      SendBytes(asking.back(), R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","type":1,"path":"/tmp/)" +
                                   std::to_string(i) + ".jpg\"}\n");
    }
    EXPECT_EQ(GetIndexVersion("/a"), 0);
  }
  // The one in hand may have files open.
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
  while (daemon.Descriptors() > before + 8 && std::chrono::steady_clock::now() < end) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  holder.Release();
  EXPECT_EQ(AskForMedia("/tmp/0.jpg")["width"], 64);
  EXPECT_LE(std::stoi(Query("SELECT count(*) FROM media").at(0)), 1 + kPhotos / 4);
}

TEST_F(ManyClientsTest, BeyondTheLimitWaitUntilThereIsRoom) {
  IndexDaemon daemon({"--max-clients", "4"});
  std::vector<Descriptor> silent = Connect(4, "");
  const std::vector<Descriptor> waiting = Connect(1, kVersionRequest + "\n");
  const double before = ProcessorSeconds(daemon.Process().Pid());
  EXPECT_FALSE(HasReply(waiting[0], 1000));
  EXPECT_LT(ProcessorSeconds(daemon.Process().Pid()) - before, 0.5) << "it spins";
  silent.pop_back();
  EXPECT_EQ(ParseReply(ReceiveAll(waiting[0]))["version"], 0);
}

TEST_F(ManyClientsTest, WaitWhenThereAreNoDescriptorsLeft) {
  IndexDaemon daemon;
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  const pid_t pid = daemon.Process().Pid();
  rlimit old{};
  ASSERT_EQ(prlimit(pid, RLIMIT_NOFILE, nullptr, &old), 0);
  const rlimit none = {3, old.rlim_max};
  ASSERT_EQ(prlimit(pid, RLIMIT_NOFILE, &none, nullptr), 0);
  const std::vector<Descriptor> waiting = Connect(1, kVersionRequest + "\n");
  EXPECT_TRUE(daemon.WaitForLog("event=accept"));
  const double before = ProcessorSeconds(pid);
  EXPECT_FALSE(HasReply(waiting[0], 1000));
  EXPECT_LT(ProcessorSeconds(pid) - before, 0.5) << "it spins";
  ASSERT_EQ(prlimit(pid, RLIMIT_NOFILE, &old, nullptr), 0);
  EXPECT_EQ(ParseReply(ReceiveAll(waiting[0]))["version"], 0);
}

TEST_F(ManyClientsTest, AreAsManyAsTheDescriptorsAllow) {
  ProgramOptions options;
  options.beforeExec.push_back(LimitResource(RLIMIT_NOFILE, 80));
  const IndexDaemon daemon({}, options);
  std::vector<Descriptor> silent = Connect(100, "");
  const std::vector<Descriptor> waiting = Connect(1, kVersionRequest + "\n");
  EXPECT_FALSE(HasReply(waiting[0], 200));
  silent.clear();
  EXPECT_EQ(ParseReply(ReceiveAll(waiting[0]))["version"], 0);
}

}  // namespace
}  // namespace vela_test
