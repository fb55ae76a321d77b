// Daemons that are not there, slow, or talk nonsense: every operation ends with its failure value
// and one line in the system log.
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <string>
#include <vector>

#include "ipc/client_operations.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPath = "/volume1/photo/a.jpg";

class BrokenExchange : public SandboxTest {
 protected:
  /// Calls every operation and expects it to fail as it should.
  static void ExpectAllFail() {
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(operation.command);
      ClearLog();
      EXPECT_EQ(operation.call(kPath), operation.failure);
      EXPECT_THAT(ErrorLines(), ElementsAre(operation.failLine));
    }
    ExpectRecordUntouched();
  }

  /// Every operation, with a daemon that treats it so.
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
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }

 private:
  static void ExpectRecordUntouched() {
    VELA_MEDIA_INFO media;
    VELA_MEDIA_INFO before;
    std::memset(&media, 0x5A, sizeof media);
    std::memset(&before, 0x5A, sizeof before);
    EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), -1);
    EXPECT_EQ(std::memcmp(&media, &before, sizeof media), 0);
  }
};

/// A bound socket of the name that nobody listens at, as a killed daemon leaves it.
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
}

TEST_F(BrokenExchange, ADaemonThatIsGone) {
  LeaveStaleSocket(kDaemonSocket);
  ExpectAllFail();
}

TEST_F(BrokenExchange, AFileInPlaceOfTheSocket) {
  WriteFile(kDaemonSocket, "{\"success\":true}\n");
  ExpectAllFail();
}

TEST_F(BrokenExchange, ADirectoryInPlaceOfTheSocket) {
  MakeDirectories(kDaemonSocket);
  ExpectAllFail();
}

TEST_F(BrokenExchange, ClosedBeforeTheRequest) {
  ExpectAllFailWith(DaemonReply::CloseAtOnce());
}

TEST_F(BrokenExchange, ClosedAfterTheRequest) {
  ExpectAllFailWith(DaemonReply::CloseAfterRequest());
}

TEST_F(BrokenExchange, ClosedInTheMiddleOfTheReply) {
  ExpectAllFailWithBytes("{");
  ExpectAllFailWithBytes(R"({"success":tru)");
  ExpectAllFailWithBytes(R"({"success":true)");
  ExpectAllFailWithBytes(R"({"success":true,"version":)");
  ExpectAllFailWithBytes(R"({"success":true,"text":"never en)");
}

TEST_F(BrokenExchange, RepliesThatAreNoObject) {
  for (const char* reply : {"\n", "   \n", "[]\n", "[{\"success\":true}]\n", "true\n", "1\n",
                            "null\n", "\"success\"\n"}) {
    ExpectAllFailWithBytes(reply);
  }
}

TEST_F(BrokenExchange, RepliesThatAreNoJson) {
  ExpectAllFailWithBytes("OK\n");
  ExpectAllFailWithBytes("HTTP/1.1 200 OK\r\n\r\n{\"success\":true}\n");
  ExpectAllFailWithBytes("success=true\n");
  ExpectAllFailWithBytes("{success:true}\n");
  ExpectAllFailWithBytes("{\"success\":true}}\n");
  ExpectAllFailWithBytes("{\"success\":true}{\"success\":true}\n");
  ExpectAllFailWithBytes("x{\"success\":true}\n");
  ExpectAllFailWithBytes(std::string("{\"success\":tr\0ue}\n", 18));
  ExpectAllFailWithBytes(std::string("\0\xFF\xFE\x01garbage\x80\n", 14));
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

TEST_F(BrokenExchange, AReplyByteByByteIsAReply) {
  DaemonReply reply = DaemonReply::Line(R"({"success":true,"version":3})");
  ExpectAllSucceedWith(reply.ByteByByte());
}

TEST_F(BrokenExchange, AReplyThatOnlyTheClosingEndsIsAReply) {
  ExpectAllSucceedWith(DaemonReply::Bytes(R"({"success":true,"version":3})"));
}

TEST_F(BrokenExchange, WhatFollowsTheReplysNewlineIsNotRead) {
  ExpectAllSucceedWith(DaemonReply::Bytes("{\"success\":true,\"version\":3}\n[garbage"));
}

TEST_F(BrokenExchange, AReplyEndsAtItsNewlineThoughTheConnectionStays) {
  ExpectAllSucceedWith(DaemonReply::BytesThenSilence("{\"success\":true,\"version\":3}\n"));
}

TEST_F(BrokenExchange, ALargeReplyIsAReply) {
  ExpectAllSucceedWith(DaemonReply::Line("{\"success\":true,\"version\":3,\"text\":\"" +
                                         std::string(1 << 20, 'x') + "\"}"));
}

TEST_F(BrokenExchange, ASlowDaemonIsWaitedFor) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(R"({"success":true,"version":3})").After(1000));
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(GetIndexVersion(kPath), 3);
  EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(900));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(BrokenExchange, AFailureLeavesTheNextCallAlone) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(2);
  daemon.AnswerNext(DaemonReply::CloseAtOnce());
  EXPECT_EQ(GetIndexVersion(kPath), -1);
  EXPECT_EQ(GetIndexVersion(kPath), 2);
}

}  // namespace
}  // namespace vela_test
