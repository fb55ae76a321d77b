// The daemon peer, tested from the other end of its socket.
#include "support/daemon_peer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>

#include "support/descriptor.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kVersionRequest = "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"}\n";

class Client {
 public:
  Client() : socket_(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, kDaemonSocket, sizeof address.sun_path - 1);
    EXPECT_EQ(connect(socket_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address),
              0);
  }

  void Send(const std::string& bytes) const {
    send(socket_.Get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
  }

  /// Reads up to the end of the connection; stores the number of pieces received.
  std::string ReadAll(int* pieces = nullptr) const {
    std::string all;
    char buffer[65536];
    ssize_t count = 0;
    while ((count = recv(socket_.Get(), buffer, sizeof buffer, 0)) > 0) {
      all.append(buffer, static_cast<size_t>(count));
      if (pieces != nullptr) {
        ++*pieces;
      }
    }
    return all;
  }

  bool ReceivesWithin(int milliseconds) const {
    pollfd waiting = {socket_.Get(), POLLIN, 0};
    return poll(&waiting, 1, milliseconds) > 0;
  }

 private:
  Descriptor socket_;
};

std::string Ask(const std::string& request) {
  const Client client;
  client.Send(request);
  return client.ReadAll();
}

class DaemonPeerTest : public SandboxTest {};

TEST_F(DaemonPeerTest, AnswersEveryCommandByDefault) {
  const DaemonPeer daemon;
  EXPECT_EQ(Ask(kVersionRequest), "{\"success\":true,\"version\":0}\n");
  EXPECT_EQ(Ask("{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/a\"}\n"), "{\"success\":true}\n");
  EXPECT_EQ(Ask("{\"command\":\"IS_DISABLE_CONVERT_PHOTO\"}\n"),
            "{\"success\":true,\"result\":false}\n");
  EXPECT_THAT(daemon.Commands(),
              ElementsAre("GET_INDEX_VERSION", "POST_PHOTO_CONVERT", "IS_DISABLE_CONVERT_PHOTO"));
}

TEST_F(DaemonPeerTest, RecordsRawBytesAndTheirPlaceInTheOrder) {
  const DaemonPeer daemon;
  const uint64_t before = NextSequence();
  const std::string request = "{\"path\":\"/\xff\\\"a\", \"command\" : \"X\"}\n";
  Ask(request);
  ASSERT_EQ(daemon.Requests().size(), 1U);
  EXPECT_EQ(daemon.Requests()[0].bytes, request);
  EXPECT_EQ(daemon.Requests()[0].command, "X");
  EXPECT_GT(daemon.Requests()[0].sequence, before);
}

TEST_F(DaemonPeerTest, RequestMayComeInPieces) {
  const DaemonPeer daemon;
  const Client client;
  client.Send("{\"command\":");
  EXPECT_FALSE(client.ReceivesWithin(20));
  client.Send("\"A\"}\n");
  EXPECT_EQ(client.ReadAll(), "{\"success\":true}\n");
  EXPECT_EQ(daemon.Requests()[0].bytes, "{\"command\":\"A\"}\n");
}

TEST_F(DaemonPeerTest, AnswersCanBeSetByCommandAndInTurn) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(3);
  daemon.AnswerNext(DaemonReply::Line("first"));
  daemon.AnswerNext(DaemonReply::Bytes("second"));
  daemon.Answer("A", DaemonReply::Line("a"));
  EXPECT_EQ(Ask(kVersionRequest), "first\n");
  EXPECT_EQ(Ask(kVersionRequest), "second");
  EXPECT_EQ(Ask(kVersionRequest), "{\"success\":true,\"version\":3}\n");
  EXPECT_EQ(Ask("{\"command\":\"A\"}\n"), "a\n");
}

TEST_F(DaemonPeerTest, ClosesEarly) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::CloseAtOnce());
  daemon.AnswerNext(DaemonReply::CloseAfterRequest());
  EXPECT_EQ(Ask(kVersionRequest), "");
  EXPECT_THAT(daemon.Requests(), IsEmpty());
  EXPECT_EQ(Ask(kVersionRequest), "");
  EXPECT_EQ(daemon.Requests().size(), 1U);
  EXPECT_EQ(daemon.Connections(), 2U);
}

TEST_F(DaemonPeerTest, CanStaySilent) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  daemon.AnswerNext(DaemonReply::BytesThenSilence("{\"succ"));
  const Client silent;
  silent.Send(kVersionRequest);
  ASSERT_TRUE(daemon.WaitForRequests(1));
  EXPECT_FALSE(silent.ReceivesWithin(50));
  const Client half;
  half.Send(kVersionRequest);
  EXPECT_TRUE(half.ReceivesWithin(10000));
  // Other requests are answered meanwhile.
  EXPECT_EQ(Ask(kVersionRequest), "{\"success\":true,\"version\":0}\n");
}

TEST_F(DaemonPeerTest, AnswersLateAndByteByByte) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("late").After(50));
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(Ask(kVersionRequest), "late\n");
  EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(50));
  daemon.AnswerNext(DaemonReply::Line("slow").ByteByByte(10));
  const Client client;
  client.Send(kVersionRequest);
  int pieces = 0;
  EXPECT_EQ(client.ReadAll(&pieces), "slow\n");
  EXPECT_GT(pieces, 1);
}

TEST_F(DaemonPeerTest, SendsLargeAnswersWhole) {
  DaemonPeer daemon;
  const std::string large(5000000, 'x');
  daemon.AnswerNext(DaemonReply::Bytes(large));
  EXPECT_EQ(Ask(kVersionRequest), large);
}

TEST_F(DaemonPeerTest, ActsWhileTheOtherSideWaits) {
  DaemonPeer daemon;
  daemon.Answer("A", DaemonReply::Line("done").Meanwhile([](const DaemonRequest& request) {
    WriteFile("/tmp/seen", request.command);
  }));
  EXPECT_EQ(Ask("{\"command\":\"A\"}\n"), "done\n");
  EXPECT_EQ(ReadFile("/tmp/seen"), "A");
}

TEST_F(DaemonPeerTest, EndsCleanlyWithOpenConnections) {
  const auto start = std::chrono::steady_clock::now();
  {
    DaemonPeer daemon;
    daemon.AnswerNext(DaemonReply::Silence());
    daemon.AnswerNext(DaemonReply::Line("late").After(100000));
    const Client silent;
    silent.Send(kVersionRequest);
    const Client late;
    late.Send(kVersionRequest);
    const Client mute;
    ASSERT_TRUE(daemon.WaitForRequests(2));
  }
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(10));
  EXPECT_FALSE(Exists(kDaemonSocket));
}

}  // namespace
}  // namespace vela_test
