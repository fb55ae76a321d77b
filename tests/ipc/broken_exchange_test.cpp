// Daemons that are missing, slow or send invalid replies: every operation returns its failure value
// and logs one line.
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>

#include "ipc/client_operations.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/quiet_test.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;

class BrokenExchange : public ClientTest {
 protected:
  static void ExpectAllFail() {
    for (const ClientOperation& operation : ClientOperations()) {
      ExpectFailure(operation);
    }
    ExpectRecordUntouched();
  }

  /// Calls every operation with a daemon that gives this reply.
  static void ExpectAllFailWith(const DaemonReply& reply) {
    DaemonPeer daemon;
    constexpr int kCalls = 7;  // of ExpectAllFail
    for (int i = 0; i < kCalls; ++i) {
      daemon.AnswerNext(reply);
    }
    ExpectAllFail();
  }

  static void ExpectAllFailWithBytes(const std::string& bytes) {
    SCOPED_TRACE("reply of " + std::to_string(bytes.size()) + " bytes: " + bytes.substr(0, 60));
    ExpectAllFailWith(DaemonReply::Bytes(bytes));
  }

  static void ExpectAllSucceedWith(DaemonReply reply) {
    DaemonPeer daemon;
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(operation.command);
      daemon.AnswerNext(reply);
      operation.call(kPath);
    }
    daemon.AnswerNext(reply);
    EXPECT_EQ(GetIndexVersion(kPath), 3);
  }

 private:
  static void ExpectRecordUntouched() {
    VELA_MEDIA_INFO media;
    VELA_MEDIA_INFO before;
    std::memset(&media, 0x5A, sizeof media);
    std::memset(&before, 0x5A, sizeof before);
    EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), -1);
    EXPECT_EQ(std::memcmp(&media, &before, sizeof media), 0);
    EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_ipc:30 fail"));
  }
};

/// A bound socket without a listener, as a killed daemon leaves it.
void LeaveStaleSocket(const char* path) {
  const int descriptor = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  ASSERT_GE(descriptor, 0);
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path, sizeof address.sun_path - 1);
  EXPECT_EQ(bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  close(descriptor);
}

TEST_F(BrokenExchange, NoDaemon) {
  ExpectAllFail();
  LeaveStaleSocket(kDaemonSocket);
  ExpectAllFail();
  RemoveTree(kDaemonSocket);
  WriteFile(kDaemonSocket, "{\"success\":true}\n");
  ExpectAllFail();
  RemoveTree(kDaemonSocket);
  MakeDirectories(kDaemonSocket);
  ExpectAllFail();
}

TEST_F(BrokenExchange, ClosedBeforeOrAfterTheRequest) {
  ExpectAllFailWith(DaemonReply::CloseAtOnce());
  ExpectAllFailWith(DaemonReply::CloseAfterRequest());
}

TEST_F(BrokenExchange, InvalidReplies) {
  const std::string replies[] = {
      // The connection is closed in the middle of the reply.
      "{",
      R"({"success":tru)",
      R"({"success":true)",
      R"({"success":true,"version":)",
      R"({"success":true,"text":"never en)",
      // The reply is not an object.
      "\n",
      "   \n",
      "[]\n",
      "[{\"success\":true}]\n",
      "true\n",
      "1\n",
      "null\n",
      "\"success\"\n",
      // The reply is not JSON.
      "OK\n",
      "HTTP/1.1 200 OK\r\n\r\n{\"success\":true}\n",
      "success=true\n",
      "{success:true}\n",
      "{\"success\":true}}\n",
      "{\"success\":true}{\"success\":true}\n",
      "x{\"success\":true}\n",
      std::string("{\"success\":tr\0ue}\n", 18),
      std::string("\0\xFF\xFE\x01garbage\x80\n", 14),
  };
  for (const std::string& reply : replies) {
    ExpectAllFailWithBytes(reply);
  }
}

TEST_F(BrokenExchange, RepliesWithAbsurdNesting) {
  constexpr size_t kDepth = 200000;
  std::string open;
  for (size_t i = 0; i < kDepth; ++i) {
    open += "{\"a\":";
  }
  ExpectAllFailWithBytes(open + "\n");
  ExpectAllFailWithBytes("{\"a\":" + std::string(kDepth, '[') + std::string(kDepth, ']') + "}\n");
}

TEST_F(BrokenExchange, UnusualRepliesThatAreValid) {
  const std::string reply = R"({"success":true,"version":3})";
  ExpectAllSucceedWith(DaemonReply::Line(reply).ByteByByte());
  // Without a newline the end of the connection ends the reply.
  ExpectAllSucceedWith(DaemonReply::Bytes(reply));
  // With a newline the connection may stay open, and what follows is not read.
  ExpectAllSucceedWith(DaemonReply::Bytes(reply + "\n[garbage"));
  ExpectAllSucceedWith(DaemonReply::BytesThenSilence(reply + "\n"));
  ExpectAllSucceedWith(DaemonReply::Line("{\"success\":true,\"version\":3,\"text\":\"" +
                                         std::string(1000000, 'x') + "\"}"));
}

TEST_F(BrokenExchange, ASlowDaemonIsWaitedFor) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(R"({"success":true,"version":3})").After(1000));
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(GetIndexVersion(kPath), 3);
  EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(900));
}

TEST_F(BrokenExchange, AFailureDoesNotAffectTheNextCall) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(2);
  daemon.AnswerNext(DaemonReply::CloseAtOnce());
  EXPECT_EQ(GetIndexVersion(kPath), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_ipc:57 fail"));
  EXPECT_EQ(GetIndexVersion(kPath), 2);
}

}  // namespace
}  // namespace vela_test
