// The exchange of one JSON line in each direction over a local socket.
#include <json/reader.h>
#include <json/value.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <csignal>

#include "platform/platform_fixture.h"
#include "support/daemon_peer.h"
#include "support/descriptor.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

constexpr size_t kReplyMax = 1024 * 1024;

Json::Value Request() {
  Json::Value packet(Json::objectValue);
  packet["command"] = "GET_INDEX_VERSION";
  packet["success"] = true;  // must be cleared on failure
  return packet;
}

int Exchange(Json::Value& packet, int seconds = 10) {
  return AutoSendRecvPacket(kDaemonSocket, -1, packet, seconds);
}

/// The reply to a request, which must succeed.
Json::Value Reply(int seconds = 10) {
  Json::Value packet = Request();
  EXPECT_EQ(Exchange(packet, seconds), 0);
  return packet;
}

/// `expectedError` 0: any.
void ExpectFailure(int expectedError, int seconds = 10, Json::Value packet = Request()) {
  EXPECT_EQ(Exchange(packet, seconds), -1);
  EXPECT_TRUE(packet.isObject());
  EXPECT_TRUE(packet.empty());
  if (expectedError != 0) {
    EXPECT_EQ(VLIBCErrGet(), expectedError);
  }
}

void ExpectTimeoutAfterOneSecond(const Json::Value& packet = Request()) {
  const Stopwatch watch;
  ExpectFailure(ETIMEDOUT, 1, packet);
  watch.ExpectBetween(1.0, 3.0);
}

Json::Value RequestOfSize(size_t size) {
  Json::Value packet(Json::objectValue);
  packet["path"] = std::string(size, 'x');
  return packet;
}

class SocketExchange : public SandboxTest {};

TEST_F(SocketExchange, ReplacesTheRequestByTheReply) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(R"({"success":true,"version":3,"media":{"width":7}})"));
  const Json::Value reply = Reply();
  EXPECT_EQ(reply.size(), 3U);
  EXPECT_EQ(reply["version"].asInt(), 3);
  EXPECT_EQ(reply["media"]["width"].asInt(), 7);
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
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  ASSERT_TRUE(reader->parse(line.data(), line.data() + line.size(), &received, &errors)) << errors;
  EXPECT_EQ(received["path"].asString(), path);
}

TEST_F(SocketExchange, TakesEveryByteOfAReply) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"path\":\"/p/\xff\xc3\xa9\\n\\\"\\u00e9\x7f\"}"));
  EXPECT_EQ(Reply()["path"].asString(), "/p/\xff\xc3\xa9\n\"\xc3\xa9\x7f");
}

TEST_F(SocketExchange, TakesLargeRequestsAndReplies) {
  const std::string large(3 * 1024 * 1024, 'x');
  const std::string text(1000 * 1000, 'y');
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"text\":\"" + text + "\"}"));
  Json::Value packet(Json::objectValue);
  packet["path"] = large + "1";
  EXPECT_EQ(Exchange(packet), 0);
  EXPECT_EQ(packet["text"].asString(), text);
  ASSERT_EQ(daemon.Requests().size(), 1U);
  EXPECT_EQ(daemon.Requests()[0].bytes, "{\"path\":\"" + large + "1\"}\n");
}

TEST_F(SocketExchange, TakesRepliesHoweverTheyAreSentAndEnded) {
  const struct {
    const char* name;
    DaemonReply reply;
    int version;
  } cases[] = {
      {"byte by byte", DaemonReply::Line("{\"success\":true,\"version\":12}").ByteByByte(2), 12},
      {"more behind the newline", DaemonReply::Bytes("{\"version\":4}\n{\"version\":5}\ngarbage"),
       4},
      {"ended by the closing", DaemonReply::Bytes("{\"version\":6}"), 6},
      {"white space around the object", DaemonReply::Bytes(" \t {\"version\":6} \r\n"), 6},
  };
  DaemonPeer daemon;
  for (const auto& [name, reply, version] : cases) {
    daemon.AnswerNext(reply);
    EXPECT_EQ(Reply()["version"].asInt(), version) << name;
  }
}

TEST_F(SocketExchange, DoesNotWaitForTheEndOfTheConnection) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::BytesThenSilence("{\"version\":4}\n"));
  const Stopwatch watch;
  EXPECT_EQ(Reply()["version"].asInt(), 4);
  EXPECT_LT(watch.Seconds(), 5.0);
}

TEST_F(SocketExchange, TakesAnEmptyObject) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{}"));
  const Json::Value reply = Reply();
  EXPECT_TRUE(reply.isObject());
  EXPECT_TRUE(reply.empty());
}

TEST_F(SocketExchange, TakesEveryKindOfValue) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(
      R"({"n":[0,-0,10,-1.5e+10,2E3,0.25],"t":true,"f":false,"z":null,"s":"// \\\" /* 01 -",)"
      R"("e":{},"a":[]})"));
  const Json::Value reply = Reply();
  EXPECT_EQ(reply["n"].size(), 6U);
  EXPECT_EQ(reply["n"][3].asDouble(), -1.5e+10);
  EXPECT_TRUE(reply["t"].asBool());
  EXPECT_TRUE(reply["z"].isNull());
  EXPECT_EQ(reply["s"].asString(), "// \\\" /* 01 -");
}

TEST_F(SocketExchange, FailsForTextThatIsNotOneObject) {
  const std::string deep(200000, '[');
  std::string deepObjects;
  for (int i = 0; i < 50000; ++i) deepObjects += "{\"a\":";
  const Strings replies = {
      // no object, or more than one
      "", " ", "{", "}", R"({"a":1)", R"({"a":1}})", R"({"a":1}{"b":2})", R"({"a":1} x)",
      R"(x{"a":1})", "[]", R"([{"a":1}])", "null", "true", "5", R"("text")",
      // members and lists
      R"({"a":})", "{a:1}", "{'a':1}", R"({"a":1,})", R"({"a":[1,]})",
      // comments
      R"({"a":1 /* comment */})", "// comment", R"({"a":1} // comment)",
      R"({"a" /* comment */ :1})", "{\"a\":[1 // comment\r]}",
      // numbers
      R"({"a":01})", R"({"a":-})", R"({"a":+1})", R"({"a":1.})", R"({"a":.5})", R"({"a":1e})",
      R"({"a":1-2})", R"({"a":0x10})", R"({"a":NaN})", R"({"a":Infinity})",
      // texts
      R"({"a":"open})", R"({"a":"\x"})", R"({"a":"\ud800"})",
      // other bytes, and depth
      "\xEF\xBB\xBF{\"a\":1}", std::string("\0{\"a\":1}", 8), deep, "{\"a\":" + deep + "}",
      deepObjects};
  DaemonPeer daemon;
  for (const std::string& reply : replies) {
    SCOPED_TRACE(reply.substr(0, 40));
    for (const DaemonReply& sent : {DaemonReply::Line(reply), DaemonReply::Bytes(reply)}) {
      daemon.AnswerNext(sent);
      ExpectFailure(reply.empty() ? ECONNRESET : EPROTO);
    }
  }
}

std::string ReplyOfSize(size_t size) {
  return "{\"a\":\"" + std::string(size - 8, 'x') + "\"}";
}

TEST_F(SocketExchange, TakesRepliesUpToTheLimit) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(ReplyOfSize(kReplyMax)));
  EXPECT_EQ(Reply(60)["a"].asString().size(), kReplyMax - 8);
}

TEST_F(SocketExchange, FailsForLargerReplies) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(ReplyOfSize(kReplyMax + 1)));
  ExpectFailure(EMSGSIZE, 60);
  daemon.AnswerNext(DaemonReply::BytesThenSilence(std::string(kReplyMax + 100000, ' ')));
  ExpectFailure(EMSGSIZE, 60);
}

/// Lists in lists, `levels` of them counting the object around.
std::string NestedReply(int levels) {
  const auto lists = static_cast<size_t>(levels - 1);
  return "{\"a\":" + std::string(lists, '[') + std::string(lists, ']') + "}";
}

TEST_F(SocketExchange, TakesRepliesUpToTheLimitOfDepth) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(NestedReply(64)));
  EXPECT_TRUE(Reply()["a"].isArray());
  // Only what contains each other counts, and not what a text contains.
  std::string many = "{\"a\":[";
  for (int i = 0; i < 100; ++i) {
    many += "[{}],";
  }
  daemon.AnswerNext(DaemonReply::Line(many + "\"" + std::string(100, '[') + "\\\"{{\"]}"));
  EXPECT_EQ(Reply()["a"].size(), 101U);
}

TEST_F(SocketExchange, RefusesDeeperReplies) {
  std::string objects;
  for (int i = 0; i < 65; ++i) {
    objects += "{\"a\":";
  }
  objects += "1" + std::string(65, '}');
  DaemonPeer daemon;
  for (const std::string& reply : {NestedReply(65), NestedReply(500), objects}) {
    daemon.AnswerNext(DaemonReply::Line(reply));
    ExpectFailure(EPROTO);
  }
}

TEST_F(SocketExchange, RefusesALargeReplyWithLittleMemory) {
  std::string values = "{\"a\":[";
  while (values.size() < 16 * 1024 * 1024) {
    values += "[],";
  }
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(values + "[]]}"));
  const auto peakKilobytes = [] {
    rusage usage = {};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
  };
  const int result = RunForked([&] {
    const long before = peakKilobytes();
    Json::Value packet = Request();
    const bool isRefused = Exchange(packet) == -1 && VLIBCErrGet() == EMSGSIZE;
    return isRefused && peakKilobytes() - before < 8 * 1024 ? 0 : 1;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(SocketExchange, TakesABoundedAmountOfMemoryForAnyReply) {
  std::string values = "{\"a\":[";
  while (values.size() < kReplyMax - 10) {
    values += "[],";
  }
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line(values + "[]]}"));
  const int result = RunForked([&] {
    Json::Value packet = Request();
    Exchange(packet);
    rusage usage = {};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss < 256 * 1024 ? 0 : 1;
  });
  EXPECT_EQ(result, 0);
}

TEST_F(SocketExchange, FailsWithoutDaemon) {
  ExpectFailure(ENOENT);
  WriteFile(kDaemonSocket, "no socket");
  ExpectFailure(ECONNREFUSED);
  RemoveTree(kDaemonSocket);
  MakeDirectories(kDaemonSocket);
  ExpectFailure(ECONNREFUSED);
}

/// The address of the daemon's socket, for bind and connect.
class DaemonAddress {
 public:
  DaemonAddress() {
    address_.sun_family = AF_UNIX;
    std::string(kDaemonSocket).copy(address_.sun_path, sizeof(address_.sun_path) - 1);
  }
  const sockaddr* Get() const { return reinterpret_cast<const sockaddr*>(&address_); }
  static socklen_t Size() { return sizeof(sockaddr_un); }

 private:
  sockaddr_un address_ = {};
};

int MakeSocket(int flags = 0) {
  return socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | flags, 0);
}

vela_test::Descriptor BoundSocket() {
  vela_test::Descriptor server(MakeSocket());
  EXPECT_EQ(bind(server.Get(), DaemonAddress().Get(), DaemonAddress::Size()), 0);
  return server;
}

TEST_F(SocketExchange, FailsForASocketWithoutListener) {
  vela_test::Descriptor server = BoundSocket();
  ExpectFailure(ECONNREFUSED);
  server.Close();
  ExpectFailure(ECONNREFUSED);
}

TEST_F(SocketExchange, FailsForPathsThatNoSocketHas) {
  const std::string tooLong = "/tmp/" + std::string(200, 's');
  for (const char* path : {static_cast<const char*>(nullptr), "", tooLong.c_str()}) {
    Json::Value packet = Request();
    EXPECT_EQ(AutoSendRecvPacket(path, -1, packet, 10), -1);
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
    ExpectFailure(0, 10, RequestOfSize(4 * 1024 * 1024));
  }
}

TEST_F(SocketExchange, FailsAfterTheTimeLimit) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  ExpectTimeoutAfterOneSecond();
}

TEST_F(SocketExchange, CountsTheTimeOfTheWholeExchange) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Bytes(std::string(1000, ' ')).ByteByByte(20));
  ExpectTimeoutAfterOneSecond();
}

TEST_F(SocketExchange, FailsAtOnceWithATimeLimitOfZero) {
  DaemonPeer daemon;
  const Stopwatch watch;
  for (const int seconds : {0, -1, -2147483647}) {
    daemon.AnswerNext(DaemonReply::Silence());
    ExpectFailure(ETIMEDOUT, seconds);
  }
  EXPECT_LT(watch.Seconds(), 1.0);
}

TEST_F(SocketExchange, FailsInTimeWhenThePeerReadsNothing) {
  const vela_test::Descriptor server = BoundSocket();
  ASSERT_EQ(listen(server.Get(), 5), 0);
  ExpectTimeoutAfterOneSecond(RequestOfSize(8 * 1024 * 1024));
}

/// A server whose queue of pending connections is full.
class FullServer {
 public:
  FullServer() {
    EXPECT_EQ(listen(listener_.Get(), 0), 0);
    for (;;) {
      vela_test::Descriptor client(MakeSocket(SOCK_NONBLOCK));
      if (connect(client.Get(), DaemonAddress().Get(), DaemonAddress::Size()) != 0) {
        EXPECT_EQ(errno, EAGAIN);
        return;
      }
      clients_.push_back(std::move(client));
    }
  }

  void Close() { listener_.Close(); }

  /// Accepts all pending connections and answers the last one.
  void ServeLast() {
    const size_t pending = clients_.size() + 1;
    for (size_t i = 0; i < pending; ++i) {
      const vela_test::Descriptor connection(
          accept4(listener_.Get(), nullptr, nullptr, SOCK_CLOEXEC));
      ASSERT_TRUE(connection.IsOpen());
      if (i + 1 < pending) continue;
      char request[4096];
      EXPECT_GT(recv(connection.Get(), request, sizeof(request), 0), 0);
      constexpr char kReply[] = "{\"version\":8}\n";
      send(connection.Get(), kReply, sizeof(kReply) - 1, MSG_NOSIGNAL);
    }
  }

 private:
  vela_test::Descriptor listener_ = BoundSocket();
  std::vector<vela_test::Descriptor> clients_;
};

TEST_F(SocketExchange, WaitsForAPlaceInAFullQueue) {
  FullServer server;
  std::thread serving([&server] {
    usleep(300000);
    server.ServeLast();
  });
  const Stopwatch watch;
  EXPECT_EQ(Reply()["version"].asInt(), 8);
  watch.ExpectBetween(0.25, 5.0);
  serving.join();
}

TEST_F(SocketExchange, FailsInTimeWhenTheQueueStaysFull) {
  FullServer server;
  ExpectTimeoutAfterOneSecond();
}

TEST_F(SocketExchange, FailsWhenADaemonWithAFullQueueEnds) {
  FullServer server;
  std::thread closing([&server] {
    usleep(200000);
    server.Close();
  });
  const Stopwatch watch;
  ExpectFailure(0);
  EXPECT_LT(watch.Seconds(), 5.0);
  closing.join();
}

TEST_F(SocketExchange, ContinuesAfterInterruptions) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Line("{\"version\":9}").After(300));
  EXPECT_EQ(RunInterrupted([] { return Reply()["version"].asInt(); }), 9);
}

/// An interrupted exchange of one second at most; returns 0 when it has timed out.
int TimeOutInterrupted() {
  return RunInterrupted([] {
    Json::Value packet = Request();
    return Exchange(packet, 1) == -1 && VLIBCErrGet() == ETIMEDOUT ? 0 : 1;
  });
}

TEST_F(SocketExchange, KeepsItsTimeLimitAcrossInterruptions) {
  DaemonPeer daemon;
  daemon.AnswerNext(DaemonReply::Silence());
  const Stopwatch watch;
  EXPECT_EQ(TimeOutInterrupted(), 0);
  watch.ExpectBetween(1.0, 3.0);
}

TEST_F(SocketExchange, WaitsForAFullQueueAcrossInterruptions) {
  FullServer server;
  const Stopwatch watch;
  EXPECT_EQ(TimeOutInterrupted(), 0);
  watch.ExpectBetween(1.0, 3.0);
}

TEST_F(SocketExchange, CanBeMadeFromSeveralThreads) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(5);
  RunInThreads(4, [](int) {
    for (int round = 0; round < 25; ++round) EXPECT_EQ(Reply()["version"].asInt(), 5);
  });
}

TEST_F(SocketExchange, LeavesNoDescriptorOpen) {
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 10; ++i) {
      Json::Value packet = Request();
      Exchange(packet);
      packet = Request();
      AutoSendRecvPacket("/tmp", -1, packet, 1);
    }
  });
}

/// What a listener does with connections.
enum class Listener { kSilent, kFullQueue, kAnswering };

/// A process of user 1 (of user 0 when there is no other) that listens at `path`.
class ListenerOfAnotherUser {
 public:
  ListenerOfAnotherUser(const std::string& path, Listener kind) {
    process_ = Fork([&] {
      if (HasOtherUsers() && (setgid(1) != 0 || setuid(1) != 0)) {
        return 1;
      }
      Listen(path, kind);
      return 0;
    });
    EXPECT_TRUE(WaitUntilExists("/tmp/listening"));
  }
  ListenerOfAnotherUser(const ListenerOfAnotherUser&) = delete;
  ListenerOfAnotherUser& operator=(const ListenerOfAnotherUser&) = delete;
  ~ListenerOfAnotherUser() {
    kill(process_, SIGKILL);
    Join(process_);
    RemoveTree("/tmp/listening");
  }

 private:
  static void Listen(const std::string& path, Listener kind) {
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof(address.sun_path) - 1);
    const auto* generic = reinterpret_cast<const sockaddr*>(&address);
    const vela_test::Descriptor server(MakeSocket());
    umask(0);
    if (bind(server.Get(), generic, sizeof(address)) != 0 ||
        listen(server.Get(), kind == Listener::kFullQueue ? 0 : 5) != 0) {
      return;
    }
    const vela_test::Descriptor client(MakeSocket());
    if (kind == Listener::kFullQueue) {
      connect(client.Get(), generic, sizeof(address));
    }
    WriteFile("/tmp/listening", "");
    while (kind == Listener::kAnswering) {
      const vela_test::Descriptor connection(accept4(server.Get(), nullptr, nullptr, SOCK_CLOEXEC));
      constexpr char kReply[] = "{\"success\":true,\"result\":true,\"version\":1}\n";
      send(connection.Get(), kReply, sizeof(kReply) - 1, MSG_NOSIGNAL);
    }
    pause();
  }

  pid_t process_ = 0;
};

/// In a sandbox with one user the listeners are its own, and are believed.
void ExpectRefusedAtOnce(Listener kind) {
  const Stopwatch watch;
  if (HasOtherUsers()) {
    ExpectFailure(ECONNREFUSED, 10);
    EXPECT_LT(watch.Seconds(), 1.0);
  } else if (kind == Listener::kAnswering) {
    EXPECT_EQ(Reply()["version"].asInt(), 1);
  }
}

TEST_F(SocketExchange, RefusesAListenerOfAnotherUserAtOnce) {
  ASSERT_EQ(chmod("/tmp", 01777), 0);
  for (const Listener kind : {Listener::kSilent, Listener::kFullQueue, Listener::kAnswering}) {
    SCOPED_TRACE(static_cast<int>(kind));
    const ListenerOfAnotherUser listener(kDaemonSocket, kind);
    ExpectRefusedAtOnce(kind);
    RemoveTree(kDaemonSocket);
  }
}

TEST_F(SocketExchange, RefusesAListenerOfAnotherUserWhoseSocketSeemsToBeRoots) {
  ASSERT_EQ(chmod("/tmp", 01777), 0);
  const ListenerOfAnotherUser listener(kDaemonSocket, Listener::kAnswering);
  ASSERT_EQ(chown(kDaemonSocket, 0, 0), 0);
  ExpectRefusedAtOnce(Listener::kAnswering);
}

TEST_F(SocketExchange, FollowsALinkOfTheUserButNotOfAnother) {
  DaemonPeer daemon("/tmp/elsewhere");
  ASSERT_EQ(symlink("/tmp/elsewhere", kDaemonSocket), 0);
  daemon.SetIndexVersion(3);
  EXPECT_EQ(Reply()["version"].asInt(), 3);
  if (HasOtherUsers()) {
    ASSERT_EQ(lchown(kDaemonSocket, 1, 1), 0);
    ExpectFailure(ECONNREFUSED);
    EXPECT_EQ(daemon.Requests().size(), 1U);
  }
}

TEST_F(SocketExchange, WaitsForNothingThatIsNoSocket) {
  ASSERT_EQ(mkfifo(kDaemonSocket, 0666), 0);
  ExpectFailure(ECONNREFUSED);
  RemoveTree(kDaemonSocket);
  ASSERT_EQ(symlink(kDaemonSocket, kDaemonSocket), 0);
  ExpectFailure(ELOOP);
  RemoveTree(kDaemonSocket);
  ASSERT_EQ(symlink("/tmp/absent", kDaemonSocket), 0);
  ExpectFailure(ENOENT);
}

}  // namespace
}  // namespace vela_test
