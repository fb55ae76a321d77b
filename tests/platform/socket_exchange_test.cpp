// The exchange of one JSON line each way over a local socket.
#include <json/reader.h>
#include <json/value.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "platform/forked_call.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace {

using std::chrono::steady_clock;
using vela_test::DaemonPeer;
using vela_test::DaemonReply;
using vela_test::kDaemonSocket;

constexpr size_t kReplyMax = 16 * 1024 * 1024;

Json::Value Request() {
  Json::Value packet(Json::objectValue);
  packet["command"] = "GET_INDEX_VERSION";
  packet["success"] = true;  // must not survive a failure
  return packet;
}

int Exchange(Json::Value& packet, int seconds = 10) {
  return AutoSendRecvPacket(kDaemonSocket, -1, packet, seconds);
}

void ExpectFailure(int expectedError, int seconds = 10) {
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet, seconds), -1);
  EXPECT_TRUE(packet.isObject());
  EXPECT_TRUE(packet.empty());
  if (expectedError != 0) {
    EXPECT_EQ(VLIBCErrGet(), expectedError);
  }
}

double SecondsSince(steady_clock::time_point start) {
  return std::chrono::duration<double>(steady_clock::now() - start).count();
}

class SocketExchange : public vela_test::SandboxTest {};

TEST_F(SocketExchange, ReplacesTheRequestByTheReply) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(R"({"success":true,"version":3,"media":{"width":7}})"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet.size(), 3U);
  EXPECT_EQ(packet["version"].asInt(), 3);
  EXPECT_EQ(packet["media"]["width"].asInt(), 7);
}

TEST_F(SocketExchange, SendsOneCompactLine) {
  DaemonPeer daemon;
  Json::Value packet(Json::objectValue);
  packet["command"] = "GET_MEDIA_FROM_PLUGIN_DB";
  packet["path"] = "/photo/a b.jpg";
  packet["type"] = 1;
  EXPECT_EQ(Exchange(packet), 0);
  ASSERT_EQ(daemon.Requests().size(), 1U);
  EXPECT_EQ(daemon.Requests()[0].bytes,
            "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/photo/a b.jpg\",\"type\":1}\n");
}

TEST_F(SocketExchange, CarriesEveryByteOfAPath) {
  std::string path;
  for (int byte = 1; byte < 256; ++byte) path += static_cast<char>(byte);
  path += "\xc3\xa9\xe2\x82\xac\xf0\x9f\x98\x80\xc3";
  DaemonPeer daemon;
  Json::Value packet(Json::objectValue);
  packet["path"] = path;
  EXPECT_EQ(Exchange(packet), 0);
  ASSERT_EQ(daemon.Requests().size(), 1U);
  const std::string line = daemon.Requests()[0].bytes;
  EXPECT_EQ(line.find('\n'), line.size() - 1);
  for (int byte = 0x80; byte < 256; ++byte) {
    EXPECT_NE(line.find(static_cast<char>(byte)), std::string::npos) << "byte " << byte;
  }
  Json::Value received;
  Json::CharReaderBuilder builder;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  ASSERT_TRUE(reader->parse(line.data(), line.data() + line.size(), &received, &errors)) << errors;
  EXPECT_EQ(received["path"].asString(), path);
}

TEST_F(SocketExchange, TakesEveryByteOfAReply) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"path\":\"/p/\xff\xc3\xa9\\n\\\"\\u00e9\x7f\"}"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["path"].asString(), "/p/\xff\xc3\xa9\n\"\xc3\xa9\x7f");
}

TEST_F(SocketExchange, TakesLargeRequestsAndReplies) {
  const std::string large(3 * 1024 * 1024, 'x');
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"text\":\"" + large + "\"}"));
  Json::Value packet(Json::objectValue);
  packet["path"] = large + "1";
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["text"].asString(), large);
  ASSERT_EQ(daemon.Requests().size(), 1U);
  EXPECT_EQ(daemon.Requests()[0].bytes, "{\"path\":\"" + large + "1\"}\n");
}

TEST_F(SocketExchange, TakesAReplyThatComesByteByByte) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"success\":true,\"version\":12}").ByteByByte(2));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["version"].asInt(), 12);
}

TEST_F(SocketExchange, DoesNotWaitForTheEndOfTheConnection) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::BytesThenSilence("{\"version\":4}\n"));
  const auto start = steady_clock::now();
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["version"].asInt(), 4);
  EXPECT_LT(SecondsSince(start), 5.0);
}

TEST_F(SocketExchange, IgnoresWhatFollowsTheNewline) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Bytes("{\"version\":4}\n{\"version\":5}\ngarbage"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["version"].asInt(), 4);
}

TEST_F(SocketExchange, TakesAReplyThatTheClosingEnds) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Bytes("{\"version\":6}"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["version"].asInt(), 6);
}

TEST_F(SocketExchange, TakesWhiteSpaceAroundTheObject) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Bytes(" \t {\"version\":6} \r\n"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["version"].asInt(), 6);
}

TEST_F(SocketExchange, TakesAnEmptyObject) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{}"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_TRUE(packet.isObject());
  EXPECT_TRUE(packet.empty());
}

TEST_F(SocketExchange, TakesAllThatJsonKnows) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(
      R"({"n":[0,-0,10,-1.5e+10,2E3,0.25],"t":true,"f":false,"z":null,"s":"// \\\" /* 01 -",)"
      R"("e":{},"a":[]})"));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["n"].size(), 6U);
  EXPECT_EQ(packet["n"][3].asDouble(), -1.5e+10);
  EXPECT_TRUE(packet["t"].asBool());
  EXPECT_TRUE(packet["z"].isNull());
  EXPECT_EQ(packet["s"].asString(), "// \\\" /* 01 -");
}

TEST_F(SocketExchange, FailsForTextThatIsNotOneObject) {
  const std::string deep(200000, '[');
  const std::string deepObjects = [] {
    std::string text;
    for (int i = 0; i < 50000; ++i) text += "{\"a\":";
    return text;
  }();
  const std::vector<std::string> replies = {
      "",
      " ",
      "{",
      "}",
      "{\"a\":1",
      "{\"a\":1}}",
      "{\"a\":1}{\"b\":2}",
      "{\"a\":1} x",
      "x{\"a\":1}",
      "[]",
      "[{\"a\":1}]",
      "null",
      "true",
      "5",
      "\"text\"",
      "{\"a\":}",
      "{a:1}",
      "{'a':1}",
      "{\"a\":1,}",
      "{\"a\":[1,]}",
      "{\"a\":1 /* comment */}",
      "// comment",
      "{\"a\":1} // comment",
      "{\"a\" /* comment */ :1}",
      "{\"a\":[1 // comment\r]}",
      "{\"a\":01}",
      "{\"a\":-}",
      "{\"a\":+1}",
      "{\"a\":1.}",
      "{\"a\":.5}",
      "{\"a\":1e}",
      "{\"a\":1-2}",
      "{\"a\":0x10}",
      "{\"a\":NaN}",
      "{\"a\":Infinity}",
      "{\"a\":\"open}",
      "{\"a\":\"\\x\"}",
      "{\"a\":\"\\ud800\"}",
      "\xEF\xBB\xBF{\"a\":1}",
      std::string("\0{\"a\":1}", 8),
      deep,
      "{\"a\":" + deep + "}",
      deepObjects,
  };
  DaemonPeer daemon;
  for (const std::string& reply : replies) {
    SCOPED_TRACE(reply.substr(0, 40));
    daemon.AnswerNext(DaemonReply::Line(reply));
    ExpectFailure(reply.empty() ? ECONNRESET : EPROTO);
    daemon.AnswerNext(DaemonReply::Bytes(reply));
    ExpectFailure(reply.empty() ? ECONNRESET : EPROTO);
  }
}

std::string ReplyOfSize(size_t size) {
  return "{\"a\":\"" + std::string(size - 8, 'x') + "\"}";
}

TEST_F(SocketExchange, TakesRepliesUpToTheLimit) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(ReplyOfSize(kReplyMax)));
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet, 60), 0);
  EXPECT_EQ(packet["a"].asString().size(), kReplyMax - 8);
}

TEST_F(SocketExchange, FailsForLargerReplies) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(ReplyOfSize(kReplyMax + 1)));
  ExpectFailure(EMSGSIZE, 60);
  daemon.AnswerNext(DaemonReply::BytesThenSilence(std::string(kReplyMax + 100000, ' ')));
  ExpectFailure(EMSGSIZE, 60);
}

TEST_F(SocketExchange, FailsWithoutDaemon) {
  ExpectFailure(ENOENT);
  vela_test::WriteFile(kDaemonSocket, "no socket");
  ExpectFailure(ECONNREFUSED);
  vela_test::RemoveTree(kDaemonSocket);
  vela_test::MakeDirectories(kDaemonSocket);
  ExpectFailure(ECONNREFUSED);
}

TEST_F(SocketExchange, FailsForASocketThatNobodyListensOn) {
  const int server = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address;
  memset(&address, 0, sizeof(address));
  address.sun_family = AF_UNIX;
  strncpy(address.sun_path, kDaemonSocket, sizeof(address.sun_path) - 1);
  ASSERT_EQ(bind(server, reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
  ExpectFailure(ECONNREFUSED);
  close(server);
  ExpectFailure(ECONNREFUSED);
}

TEST_F(SocketExchange, FailsForPathsThatNoSocketHas) {
  Json::Value packet = Request();
  EXPECT_EQ(AutoSendRecvPacket(nullptr, -1, packet, 10), -1);
  EXPECT_TRUE(packet.isObject() && packet.empty());
  for (const std::string& path : {std::string(), "/tmp/" + std::string(200, 's')}) {
    packet = Request();
    EXPECT_EQ(AutoSendRecvPacket(path.c_str(), -1, packet, 10), -1);
    EXPECT_TRUE(packet.isObject() && packet.empty());
  }
}

TEST_F(SocketExchange, TakesTheLongestPathOfASocket) {
  const std::string path = "/tmp/" + std::string(107 - 5, 's');
  DaemonPeer daemon(path);
  Json::Value packet = Request();
  EXPECT_EQ(AutoSendRecvPacket(path.c_str(), -1, packet, 10), 0);
}

TEST_F(SocketExchange, FailsWhenTheConnectionIsClosed) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::CloseAfterRequest());
  ExpectFailure(0);
  daemon.AnswerNext(DaemonReply::CloseAtOnce());
  ExpectFailure(0);
  daemon.AnswerNext(DaemonReply::Bytes("{\"success\":tr"));
  ExpectFailure(EPROTO);
}

TEST_F(SocketExchange, NeverRaisesSigpipe) {
  DaemonPeer daemon;
  for (int round = 0; round < 20; ++round) {
    daemon.AnswerNext(DaemonReply::CloseAtOnce());
    Json::Value packet(Json::objectValue);
    packet["path"] = std::string(4 * 1024 * 1024, 'x');
    EXPECT_EQ(Exchange(packet), -1);
    EXPECT_TRUE(packet.empty());
  }
}

TEST_F(SocketExchange, FailsWhenTheTimeIsOver) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  const auto start = steady_clock::now();
  ExpectFailure(ETIMEDOUT, 1);
  EXPECT_GE(SecondsSince(start), 1.0);
  EXPECT_LT(SecondsSince(start), 3.0);
}

TEST_F(SocketExchange, CountsTheTimeOfTheWholeExchange) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Bytes(std::string(1000, ' ')).ByteByByte(20));
  const auto start = steady_clock::now();
  ExpectFailure(ETIMEDOUT, 1);
  EXPECT_GE(SecondsSince(start), 1.0);
  EXPECT_LT(SecondsSince(start), 3.0);
}

TEST_F(SocketExchange, FailsAtOnceWithoutTime) {
  DaemonPeer daemon;
  const auto start = steady_clock::now();
  for (const int seconds : {0, -1, -2147483647}) {
    daemon.AnswerNext(DaemonReply::Silence());
    ExpectFailure(ETIMEDOUT, seconds);
  }
  EXPECT_LT(SecondsSince(start), 1.0);
}

TEST_F(SocketExchange, FailsInTimeWhenThePeerReadsNothing) {
  const int server = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address;
  memset(&address, 0, sizeof(address));
  address.sun_family = AF_UNIX;
  strncpy(address.sun_path, kDaemonSocket, sizeof(address.sun_path) - 1);
  ASSERT_EQ(bind(server, reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
  ASSERT_EQ(listen(server, 5), 0);
  Json::Value packet(Json::objectValue);
  packet["path"] = std::string(8 * 1024 * 1024, 'x');
  const auto start = steady_clock::now();
  EXPECT_EQ(Exchange(packet, 1), -1);
  EXPECT_EQ(VLIBCErrGet(), ETIMEDOUT);
  EXPECT_TRUE(packet.empty());
  EXPECT_GE(SecondsSince(start), 1.0);
  EXPECT_LT(SecondsSince(start), 3.0);
  close(server);
}

/// A server whose queue of waiting connections is full.
class FullServer {
 public:
  FullServer() : listener_(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    memset(&address_, 0, sizeof(address_));
    address_.sun_family = AF_UNIX;
    strncpy(address_.sun_path, kDaemonSocket, sizeof(address_.sun_path) - 1);
    EXPECT_EQ(bind(listener_, Address(), sizeof(address_)), 0);
    EXPECT_EQ(listen(listener_, 0), 0);
    for (;;) {
      const int client = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
      if (connect(client, Address(), sizeof(address_)) != 0) {
        EXPECT_EQ(errno, EAGAIN);
        close(client);
        return;
      }
      clients_.push_back(client);
    }
  }
  ~FullServer() {
    Close();
    for (const int client : clients_) close(client);
  }

  void Close() {
    if (listener_ >= 0) close(listener_);
    listener_ = -1;
  }

  /// Accepts all connections there are and answers the last one.
  void ServeLast() {
    const size_t waiting = clients_.size() + 1;
    for (size_t i = 0; i < waiting; ++i) {
      const int connection = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
      ASSERT_GE(connection, 0);
      if (i + 1 == waiting) {
        char request[4096];
        EXPECT_GT(recv(connection, request, sizeof(request), 0), 0);
        constexpr char kReply[] = "{\"version\":8}\n";
        send(connection, kReply, sizeof(kReply) - 1, MSG_NOSIGNAL);
      }
      close(connection);
    }
  }

 private:
  sockaddr* Address() { return reinterpret_cast<sockaddr*>(&address_); }

  sockaddr_un address_;
  int listener_;
  std::vector<int> clients_;
};

TEST_F(SocketExchange, WaitsForAPlaceInAFullQueue) {
  FullServer server;
  std::thread serving([&server] {
    usleep(300000);
    server.ServeLast();
  });
  const auto start = steady_clock::now();
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["version"].asInt(), 8);
  EXPECT_GE(SecondsSince(start), 0.25);
  EXPECT_LT(SecondsSince(start), 5.0);
  serving.join();
}

TEST_F(SocketExchange, FailsInTimeWhenTheQueueStaysFull) {
  FullServer server;
  const auto start = steady_clock::now();
  ExpectFailure(ETIMEDOUT, 1);
  EXPECT_GE(SecondsSince(start), 1.0);
  EXPECT_LT(SecondsSince(start), 3.0);
}

TEST_F(SocketExchange, FailsWhenAFullDaemonGoesAway) {
  FullServer server;
  std::thread closing([&server] {
    usleep(200000);
    server.Close();
  });
  const auto start = steady_clock::now();
  ExpectFailure(0);
  EXPECT_LT(SecondsSince(start), 5.0);
  closing.join();
}

int RunInterrupted(const std::function<int()>& call) {
  return platform_test::RunForked([&] {
    struct sigaction action;
    memset(&action, 0, sizeof(action));
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    const itimerval often = {{0, 2000}, {0, 2000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    return call();
  });
}

TEST_F(SocketExchange, GoesOnAfterInterruptions) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"version\":9}").After(300));
  EXPECT_EQ(RunInterrupted([] {
              Json::Value packet = Request();
              return Exchange(packet) == 0 && packet["version"].asInt() == 9 ? 0 : 1;
            }),
            0);
}

TEST_F(SocketExchange, KeepsItsTimeAcrossInterruptions) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  const auto start = steady_clock::now();
  EXPECT_EQ(RunInterrupted([] {
              Json::Value packet = Request();
              return Exchange(packet, 1) == -1 && VLIBCErrGet() == ETIMEDOUT ? 0 : 1;
            }),
            0);
  EXPECT_GE(SecondsSince(start), 1.0);
  EXPECT_LT(SecondsSince(start), 3.0);
}

TEST_F(SocketExchange, WaitsForAFullQueueAcrossInterruptions) {
  FullServer server;
  const auto start = steady_clock::now();
  EXPECT_EQ(RunInterrupted([] {
              Json::Value packet = Request();
              return Exchange(packet, 1) == -1 && VLIBCErrGet() == ETIMEDOUT ? 0 : 1;
            }),
            0);
  EXPECT_GE(SecondsSince(start), 1.0);
  EXPECT_LT(SecondsSince(start), 3.0);
}

TEST_F(SocketExchange, CanBeMadeFromSeveralThreads) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(5);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int round = 0; round < 25; ++round) {
        Json::Value packet = Request();
        EXPECT_EQ(Exchange(packet), 0);
        EXPECT_EQ(packet["version"].asInt(), 5);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST_F(SocketExchange, LeavesNoDescriptorOpen) {
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 10; ++i) {
    Json::Value packet = Request();
    Exchange(packet);
    packet = Request();
    AutoSendRecvPacket("/tmp", -1, packet, 1);
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

}  // namespace
