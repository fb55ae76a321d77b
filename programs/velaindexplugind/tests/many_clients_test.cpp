// Many clients at once, and clients that misbehave.
#include <poll.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <iterator>
#include <thread>

#include "index_daemon.h"
#include "support/images.h"

namespace vela_test {
namespace {

using namespace ::testing;

const std::string kHalfRequest(kVersionRequest, 20);

std::string VersionLine() {
  return std::string(kVersionRequest) + "\n";
}

std::string PostLine() {
  return std::string(kPostRequest) + "\n";
}

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

bool HasReply(const Descriptor& connection, int milliseconds) {
  pollfd waiting = {connection.Get(), POLLIN, 0};
  return poll(&waiting, 1, milliseconds) == 1;
}

/// Processor time that the process has used, seconds.
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

/// Fails the test when the connection gets a reply within a second, or when the daemon uses much
/// processor time meanwhile.
void ExpectIdleWait(pid_t daemon, const Descriptor& waiting) {
  const double before = ProcessorSeconds(daemon);
  EXPECT_FALSE(HasReply(waiting, 1000));
  EXPECT_LT(ProcessorSeconds(daemon) - before, 0.5) << "it spins";
}

TEST_F(ManyClientsTest, AllAreAnswered) {
  const IndexDaemon daemon;
  MakeJpeg("/tmp/a.jpg");
  const std::vector<std::string> requests = {
      kVersionRequest, kPostRequest,
      R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","path":"/tmp/a.jpg","type":1})",
      R"({"command":"IS_DISABLE_CONVERT_PHOTO"})"};
  std::vector<Descriptor> connections;
  for (size_t i = 0; i < 200; ++i) {
    connections.push_back(SendLine(requests[i % requests.size()]));
  }
  for (const Descriptor& connection : connections) {
    ExpectSuccess(connection);
  }
}

TEST_F(ManyClientsTest, PartialRequestsDoNotDelayOthers) {
  const IndexDaemon daemon;
  for (const size_t count : {200U, 1000U}) {
    const std::vector<Descriptor> silent = Connect(count / 2, "");
    const std::vector<Descriptor> halfWay = Connect(count / 2, kHalfRequest);
    const auto begin = std::chrono::steady_clock::now();
    for (int i = 0; i < 20; ++i) EXPECT_EQ(GetIndexVersion("/a"), 0);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(15));
    // They are still connected and get an answer when they continue.
    EXPECT_FALSE(HasReply(halfWay.front(), 0));
    for (const Descriptor& connection : halfWay)
      SendBytes(connection, kVersionRequest + kHalfRequest.size());
    SendBytes(halfWay.front(), "\n");
    EXPECT_EQ(ReceiveReply(halfWay.front())["version"], 0);
  }
}

TEST_F(ManyClientsTest, LeaveNoDescriptorOpen) {
  const IndexDaemon daemon;
  const size_t before = daemon.Descriptors();
  MakeJpeg("/tmp/a.jpg");
  for (int round = 0; round < 3; ++round) {
    Connect(100, "");
    Connect(100, kHalfRequest);
    Connect(100, VersionLine());
    Connect(100, "x\n");
    Connect(50, std::string(100000, 'x'));
    Connect(50, R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","path":"/tmp/a.jpg","type":1})"
                "\n");
  }
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  EXPECT_TRUE(daemon.WaitForAtMostDescriptors(before + kIndexDescriptors));
}

TEST_F(ManyClientsTest, RequestMayEndWithTheClientsOutput) {
  const IndexDaemon daemon;
  const std::vector<Descriptor> connections = Connect(1, kVersionRequest);
  shutdown(connections[0].Get(), SHUT_WR);
  EXPECT_EQ(ReceiveReply(connections[0])["version"], 0);
}

TEST_F(ManyClientsTest, RequestMayArriveByteByByte) {
  const IndexDaemon daemon;
  const Descriptor connection = ConnectToDaemon();
  for (const char c : VersionLine()) {
    SendBytes(connection, std::string(1, c));
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  EXPECT_EQ(ReceiveReply(connection)["version"], 0);
}

TEST_F(ManyClientsTest, ThatSendNothingAreDisconnected) {
  const IndexDaemon daemon({"--client-timeout", "1"});
  size_t before = 0;
  // The first round creates the daemon's timer.
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

TEST_F(ManyClientsTest, ThatSendSlowlyAreDisconnected) {
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

TEST_F(ManyClientsTest, WaitForTheIndexWithoutDelayingReaders) {
  const IndexDaemon daemon;
  MakeJpeg("/tmp/a.jpg");
  IndexHolder holder;
  const std::vector<Descriptor> posting = Connect(8, PostLine());
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  EXPECT_FALSE(IsDisableConvertPhoto());
  EXPECT_EQ(AskForMedia("/tmp/a.jpg")["width"], 64);
  EXPECT_FALSE(HasReply(posting[0], 0));
  holder.Release();
  for (const Descriptor& connection : posting) {
    ExpectSuccess(connection);
  }
}

TEST_F(ManyClientsTest, ThatDisconnectDuringTheirRequestAreForgotten) {
  const IndexDaemon daemon;
  // Waits for the end of the connection, which must not be counted.
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  const size_t before = daemon.Descriptors();
  IndexHolder holder;
  {
    const std::vector<Descriptor> posting = Connect(20, PostLine());
    EXPECT_TRUE(daemon.WaitForDescriptors(before + 20));
  }
  EXPECT_TRUE(daemon.WaitForDescriptors(before));
  holder.Release();
  // Their requests are carried out nevertheless.
  PostPhotoConvert("/b.jpg");
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), Rows{"3"});
}

TEST_F(ManyClientsTest, WaitForALockedIndexTogether) {
  const IndexDaemon daemon;
  const IndexHolder holder;
  const auto begin = std::chrono::steady_clock::now();
  const std::vector<Descriptor> posting = Connect(6, PostLine());
  for (const Descriptor& connection : posting) {
    const Json::Value reply = ReceiveReply(connection);
    EXPECT_EQ(reply["success"], Json::Value(false));
    EXPECT_EQ(reply["error"], "index database: other writers held it for too long");
  }
  const auto took = std::chrono::steady_clock::now() - begin;
  EXPECT_GT(took, std::chrono::milliseconds(4500));
  EXPECT_LT(took, std::chrono::seconds(20));
}

TEST_F(ManyClientsTest, HaveTheirPostsWrittenTogether) {
  constexpr size_t kPosts = 60;
  constexpr int64_t kPageSize = 4096;
  const IndexDaemon daemon;
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  IndexHolder holder;
  std::vector<Descriptor> posting;
  for (size_t i = 0; i < kPosts; ++i) {
    posting.push_back(
        SendLine(R"({"command":"POST_PHOTO_CONVERT","path":"/)" + std::to_string(i) + "\"}"));
  }
  // An answer shows that the earlier requests have been received.
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  const std::string log = kIndexDatabase + std::string("-wal");
  const int64_t before = FileSize(log);
  holder.Release();
  for (const Descriptor& connection : posting) {
    ExpectSuccess(connection);
  }
  EXPECT_EQ(Query("SELECT count(*) FROM posted"),
            std::vector<std::string>{std::to_string(kPosts + 1)});
  // Each transaction writes a page at least.
  EXPECT_LT(FileSize(log) - before, static_cast<int64_t>(kPosts / 2) * kPageSize);
}

TEST_F(ManyClientsTest, ThatDisconnectBeforeTheirRequestCountUntilItIsDone) {
  const IndexDaemon daemon({"--max-clients", "4"});
  Ask(PathRequest("POST_PHOTO_CONVERT", "/first.jpg"));
  const size_t before = daemon.Descriptors();
  IndexHolder holder;
  {
    const std::vector<Descriptor> posting = Connect(4, PostLine());
    EXPECT_TRUE(daemon.WaitForDescriptors(before + 4));
  }
  EXPECT_TRUE(daemon.WaitForDescriptors(before));
  const std::vector<Descriptor> next = Connect(1, VersionLine());
  EXPECT_FALSE(HasReply(next[0], 300));
  holder.Release();
  EXPECT_EQ(ReceiveReply(next[0])["version"], 0);
}

TEST_F(ManyClientsTest, ThatDisconnectHaveNoFilesReadForThem) {
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
  IndexHolder holder;  // delays each record
  {
    std::vector<Descriptor> asking;
    for (int i = 1; i <= kPhotos; ++i) {
      asking.push_back(SendLine(R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","type":1,"path":"/tmp/)" +
                                std::to_string(i) + ".jpg\"}"));
    }
    EXPECT_EQ(GetIndexVersion("/a"), 0);
  }
  // The request in progress may have files open.
  EXPECT_TRUE(daemon.WaitForAtMostDescriptors(before + 8));
  holder.Release();
  EXPECT_EQ(AskForMedia("/tmp/0.jpg")["width"], 64);
  EXPECT_LE(std::stoi(Query("SELECT count(*) FROM media").at(0)), 1 + kPhotos / 4);
}

TEST_F(ManyClientsTest, BeyondTheLimitWaitUntilThereIsRoom) {
  IndexDaemon daemon({"--max-clients", "4"});
  std::vector<Descriptor> silent = Connect(4, "");
  const std::vector<Descriptor> waiting = Connect(1, VersionLine());
  ExpectIdleWait(daemon.Process().Pid(), waiting[0]);
  silent.pop_back();
  EXPECT_EQ(ReceiveReply(waiting[0])["version"], 0);
}

TEST_F(ManyClientsTest, WaitWhenThereAreNoDescriptorsLeft) {
  IndexDaemon daemon;
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  const pid_t pid = daemon.Process().Pid();
  rlimit old{};
  ASSERT_EQ(prlimit(pid, RLIMIT_NOFILE, nullptr, &old), 0);
  const rlimit none = {3, old.rlim_max};
  ASSERT_EQ(prlimit(pid, RLIMIT_NOFILE, &none, nullptr), 0);
  const std::vector<Descriptor> waiting = Connect(1, VersionLine());
  EXPECT_TRUE(daemon.WaitForLog("event=accept"));
  ExpectIdleWait(pid, waiting[0]);
  ASSERT_EQ(prlimit(pid, RLIMIT_NOFILE, &old, nullptr), 0);
  EXPECT_EQ(ReceiveReply(waiting[0])["version"], 0);
}

TEST_F(ManyClientsTest, AreAsManyAsTheDescriptorsAllow) {
  ProgramOptions options;
  options.beforeExec.push_back(LimitResource(RLIMIT_NOFILE, 80));
  const IndexDaemon daemon({}, options);
  std::vector<Descriptor> silent = Connect(100, "");
  const std::vector<Descriptor> waiting = Connect(1, VersionLine());
  EXPECT_FALSE(HasReply(waiting[0], 200));
  silent.clear();
  EXPECT_EQ(ReceiveReply(waiting[0])["version"], 0);
}

}  // namespace
}  // namespace vela_test
