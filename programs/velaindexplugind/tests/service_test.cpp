// The daemon as a service: beginning, end, sockets and who may use them.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <sqlite3.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "index_daemon.h"
#include "ipc/velamk_ipc.h"
#include "support/files.h"

namespace vela_test {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class ServiceTest : public IndexDaemonTest {};

ProgramResult RunDaemon(const std::vector<std::string>& arguments = {}) {
  return RunProgram(IndexDaemonPath(), arguments);
}

size_t LineCount(const std::string& text) {
  return static_cast<size_t>(std::count(text.begin(), text.end(), '\n'));
}

sockaddr_un AddressOf(const char* path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path, sizeof address.sun_path - 1);
  return address;
}

Descriptor ListenAt(const char* path) {
  const sockaddr_un address = AddressOf(path);
  Descriptor made(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  EXPECT_EQ(bind(made.Get(), generic, sizeof address), 0);
  EXPECT_EQ(listen(made.Get(), 100), 0);
  return made;
}

/// A socket that listens at the daemon's path.
Descriptor ListenAtSocket() {
  return ListenAt(PluginDaemonSocketPath);
}

Descriptor ConnectTo(const char* path) {
  const sockaddr_un address = AddressOf(path);
  Descriptor made(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  EXPECT_EQ(connect(made.Get(), generic, sizeof address), 0);
  return made;
}

/// Starts the daemon as a service manager does that listens for it.
Program StartGiven(const Descriptor& given) {
  const std::string number = std::to_string(given.Get());
  ProgramOptions options;
  options.keptDescriptors = {given.Get()};
  const std::string script = "exec 3<&" + number + " " + (number == "3" ? "" : number + "<&-") +
                             "; LISTEN_FDS=1 LISTEN_PID=$$ exec \"$0\"";
  return StartProgram("/bin/bash", {"-c", script, IndexDaemonPath()}, options);
}

/// Whether the sandbox has other users and groups than user 0: it has when it was made by root.
bool HasOtherUsers() {
  std::ifstream map("/proc/self/uid_map");
  unsigned long inside = 0;
  unsigned long outside = 0;
  unsigned long count = 0;
  map >> inside >> outside >> count;
  return count > 65535;
}

bool BecomeOther(uid_t user, gid_t group) {
  return setgroups(0, nullptr) == 0 && setgid(group) == 0 && setuid(user) == 0;
}

/// What `action` returns when another user carries it out, 0 to 254.
int RunAs(uid_t user, gid_t group, const std::function<int()>& action) {
  const pid_t child = fork();
  if (child == 0) _exit(BecomeOther(user, group) ? action() : 255);
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  return WEXITSTATUS(status);
}

/// The errno value that a connection of another user fails with, 0 when it succeeds.
int ConnectAs(uid_t user, gid_t group) {
  return RunAs(user, group, [] { return ConnectToDaemon().IsOpen() ? 0 : errno; });
}

TEST_F(ServiceTest, EndsCleanlyAtSignals) {
  for (const int signal : {SIGTERM, SIGINT}) {
    IndexDaemon daemon;
    EXPECT_EQ(GetIndexVersion("/a"), 0);
    const ProgramResult result = daemon.End(signal);
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_FALSE(Exists(PluginDaemonSocketPath));
    EXPECT_THAT(result.err, HasSubstr("event=start"));
    EXPECT_THAT(result.err, HasSubstr("event=stop signal=SIG"));
    EXPECT_EQ(result.out, "");
  }
}

TEST_F(ServiceTest, AnswersWhatIsInHandBeforeItEnds) {
  IndexDaemon daemon;
  sqlite3* other = nullptr;
  ASSERT_EQ(sqlite3_open(kIndexDatabase, &other), SQLITE_OK);
  ASSERT_EQ(sqlite3_exec(other, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
  const Descriptor posting = ConnectToDaemon();
  SendBytes(posting, "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/a.jpg\"}\n");
  const Descriptor halfWay = ConnectToDaemon();
  SendBytes(halfWay, "{\"command\":");
  daemon.Process().Kill(SIGTERM);
  EXPECT_EQ(ReceiveAll(halfWay), "");
  EXPECT_FALSE(ConnectToDaemon().IsOpen());
  ASSERT_EQ(sqlite3_close(other), SQLITE_OK);
  EXPECT_EQ(ParseReply(ReceiveAll(posting))["success"], Json::Value(true));
  EXPECT_EQ(daemon.Process().Wait()->exitCode, 0);
}

TEST_F(ServiceTest, AnswersWhoCameBeforeTheSignal) {
  IndexDaemon daemon;
  daemon.Process().Kill(SIGSTOP);
  std::vector<Descriptor> early;
  for (int i = 0; i < 40; ++i) {
    early.push_back(ConnectToDaemon());
    SendBytes(early.back(), "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"}\n");
  }
  daemon.Process().Kill(SIGTERM);
  daemon.Process().Kill(SIGCONT);
  for (const Descriptor& connection : early) {
    EXPECT_EQ(ParseReply(ReceiveAll(connection))["version"], 0);
  }
  EXPECT_EQ(daemon.Process().Wait()->exitCode, 0);
}

TEST_F(ServiceTest, SecondSignalEndsItAtOnce) {
  IndexDaemon daemon;
  sqlite3* other = nullptr;
  ASSERT_EQ(sqlite3_open(kIndexDatabase, &other), SQLITE_OK);
  ASSERT_EQ(sqlite3_exec(other, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
  const Descriptor posting = ConnectToDaemon();
  SendBytes(posting, "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/a.jpg\"}\n");
  daemon.Process().Kill(SIGTERM);
  ASSERT_TRUE(daemon.WaitForLog("event=stop"));
  const ProgramResult result = daemon.End(SIGTERM);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, HasSubstr("requests_left=1"));
  EXPECT_EQ(sqlite3_close(other), SQLITE_OK);
}

TEST_F(ServiceTest, SecondInstanceRefusesToStart) {
  const IndexDaemon daemon;
  const ProgramResult result = RunDaemon();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(LineCount(result.err), 1U);
  EXPECT_THAT(result.err, HasSubstr("another instance uses /var/lib/velaindex/index.db"));
  EXPECT_EQ(GetIndexVersion("/a"), 0);
}

TEST_F(ServiceTest, SecondInstanceWithAnotherDatabaseRefusesToStart) {
  const IndexDaemon daemon;
  const ProgramResult result = RunDaemon({"--database", "/tmp/other/index.db"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(LineCount(result.err), 1U);
  EXPECT_THAT(result.err, HasSubstr("another instance listens at /tmp/velaindexplugind_sock"));
  EXPECT_EQ(GetIndexVersion("/a"), 0);
}

TEST_F(ServiceTest, SocketLeftByADeadInstanceIsReplaced) {
  {
    IndexDaemon daemon;
    daemon.End(SIGKILL);
  }
  ASSERT_TRUE(Exists(PluginDaemonSocketPath));
  const IndexDaemon daemon;
  EXPECT_EQ(GetIndexVersion("/a"), 0);
}

TEST_F(ServiceTest, SomethingElseThanASocketIsLeftAlone) {
  WriteFile(PluginDaemonSocketPath, "precious");
  ProgramResult result = RunDaemon();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("is not a socket"));
  EXPECT_EQ(ReadFile(PluginDaemonSocketPath), "precious");
  RemoveTree(PluginDaemonSocketPath);

  // Nor is a link followed to where it leads.
  ASSERT_EQ(symlink("/tmp/elsewhere", PluginDaemonSocketPath), 0);
  result = RunDaemon();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("is not a socket"));
  EXPECT_TRUE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, RootReplacesWhateverAnotherUserHasPutThere) {
  if (!HasOtherUsers()) {
    // In a sandbox of one user everything is root's own, and stays.
    const Descriptor own = ListenAtSocket();
    EXPECT_EQ(RunDaemon().exitCode, 1);
    EXPECT_TRUE(ConnectToDaemon().IsOpen());
    return;
  }
  const std::vector<std::function<Descriptor()>> puts = {
      [] { return ListenAtSocket(); },
      [] {
        WriteFile(PluginDaemonSocketPath, "x");
        return Descriptor();
      },
      [] {
        EXPECT_EQ(symlink("/tmp/elsewhere", PluginDaemonSocketPath), 0);
        return Descriptor();
      },
      [] {
        WriteFile(std::string(PluginDaemonSocketPath) + "/sub/file", "x");
        return Descriptor();
      }};
  for (size_t i = 0; i < puts.size(); ++i) {
    const Descriptor open = puts[i]();
    ASSERT_EQ(lchown(PluginDaemonSocketPath, 1, 1), 0);
    IndexDaemon daemon;
    EXPECT_EQ(GetIndexVersion("/a"), 0) << i;
    EXPECT_THAT(daemon.End(SIGTERM).err,
                HasSubstr("level=warning event=socket replaced=/tmp/velaindexplugind_sock "
                          "owner=daemon"));
  }
}

TEST_F(ServiceTest, SocketThatAnotherListensAtIsLeftAlone) {
  const Descriptor other = ListenAtSocket();
  const ProgramResult result = RunDaemon();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("another instance listens at /tmp/velaindexplugind_sock"));
  EXPECT_TRUE(ConnectToDaemon().IsOpen());
}

TEST_F(ServiceTest, RefusesToStartWhileAnotherPreparesItsSocket) {
  const char* const file = "/run/velaindexplugind.lock";
  const Descriptor lock(open(file, O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  ASSERT_EQ(flock(lock.Get(), LOCK_EX | LOCK_NB), 0);
  const ProgramResult result = RunDaemon();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("another instance listens at /tmp/velaindexplugind_sock"));
  EXPECT_FALSE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, OneOfTwoThatStartTogetherGetsTheSocket) {
  for (int round = 0; round < 5; ++round) {
    {
      IndexDaemon daemon;
      daemon.End(SIGKILL);
    }
    Program first = StartProgram(IndexDaemonPath(), {"--database", "/tmp/first/index.db"});
    Program second = StartProgram(IndexDaemonPath(), {"--database", "/tmp/second/index.db"});
    const auto isDecided = [](const Program& program) {
      const std::string log = program.Error();
      return log.find("event=settings") != std::string::npos ||
             log.find("level=error") != std::string::npos;
    };
    for (int i = 0; i < 6000 && !(isDecided(first) && isDecided(second)); ++i) usleep(10000);
    const bool isFirst = first.Error().find("event=settings") != std::string::npos;
    Program& winner = isFirst ? first : second;
    Program& loser = isFirst ? second : first;
    EXPECT_EQ(GetIndexVersion("/a"), 0);
    EXPECT_EQ(loser.Wait()->exitCode, 1);
    winner.Kill(SIGTERM);
    EXPECT_EQ(winner.Wait()->exitCode, 0);
  }
}

TEST_F(ServiceTest, OrdinaryUserMayRunItForHimself) {
  ProgramOptions options;
  if (!HasOtherUsers()) {
    // The only user of the sandbox, with no more rights than any other.
    options.beforeExec = {DropCapabilities()};
    MakeDirectories("/tmp/own");
    const IndexDaemon daemon({"--database", "/tmp/own/index.db"}, options);
    EXPECT_TRUE(SetVersion("/a", 3));
    EXPECT_EQ(GetIndexVersion("/a"), 3);
    return;
  }
  options.beforeExec = {[] { return BecomeOther(1, 1) ? 0 : EPERM; }};
  const std::vector<std::string> arguments = {"--database", "/tmp/own/index.db"};
  MakeDirectories("/tmp/own");
  const IndexDaemon daemon(arguments, options);
  EXPECT_EQ(RunAs(1, 1, [] { return GetIndexVersion("/a"); }), 0);
  EXPECT_EQ(RunAs(1, 1, [] { return SetVersion("/a", 3) ? 0 : 1; }), 0);
  EXPECT_EQ(GetIndexVersion("/a"), 3);
  MakeDirectories("/tmp/more");
  const ProgramResult second =
      RunProgram(IndexDaemonPath(), {"--database", "/tmp/more/index.db"}, options);
  EXPECT_EQ(second.exitCode, 1);
  EXPECT_THAT(second.err, HasSubstr("another instance listens"));
}

TEST_F(ServiceTest, OnlyTheDaemonsUserSetsIndexVersions) {
  if (!HasOtherUsers()) {
    const IndexDaemon daemon;
    EXPECT_TRUE(SetVersion("/photos", 5));
    EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 5);
    return;
  }
  IndexDaemon daemon({"--group", "daemon"});
  const auto set = [] {
    Json::Value request = PathRequest("SET_INDEX_VERSION", "/photos");
    request["version"] = 4;
    const Json::Value reply = Ask(request);
    const bool isRight =
        reply["error"] == "only root and the daemon's own user may set index versions";
    return reply["success"] == Json::Value(false) && isRight ? 0 : 1;
  };
  EXPECT_EQ(RunAs(65534, 1, set), 0);
  EXPECT_EQ(GetIndexVersion("/photos/a.jpg"), 0);
  EXPECT_EQ(RunAs(65534, 1,
                  [] {
                    const Json::Value reply = Ask(PathRequest("POST_PHOTO_CONVERT", "/a.jpg"));
                    return reply["success"] == Json::Value(true) ? 0 : 1;
                  }),
            0);
  EXPECT_TRUE(SetVersion("/photos", 5));
  EXPECT_THAT(daemon.End(SIGTERM).err, HasSubstr("command=SET_INDEX_VERSION path=/photos "
                                                 "outcome=refused"));
}

TEST_F(ServiceTest, SocketOfAnotherIsNotRemovedAtTheEnd) {
  IndexDaemon daemon;
  RemoveTree(PluginDaemonSocketPath);
  const Descriptor other = ListenAtSocket();
  EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  EXPECT_TRUE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, SocketIsForRootAndItsGroupOnly) {
  ProgramOptions options;
  options.umask = 0;
  const IndexDaemon daemon({}, options);
  struct stat status;
  ASSERT_EQ(lstat(PluginDaemonSocketPath, &status), 0);
  EXPECT_TRUE(S_ISSOCK(status.st_mode));
  EXPECT_EQ(status.st_mode & 07777, 0660U);
  EXPECT_EQ(status.st_uid, 0U);
  EXPECT_EQ(status.st_gid, 0U);
  if (HasOtherUsers()) {
    EXPECT_EQ(ConnectAs(65534, 65534), EACCES);
    EXPECT_EQ(ConnectAs(65534, 0), 0);
  }
}

TEST_F(ServiceTest, GroupIsTheOneThatIsNamed) {
  if (HasOtherUsers()) {
    const IndexDaemon daemon({"--group", "daemon"});
    struct stat status;
    ASSERT_EQ(lstat(PluginDaemonSocketPath, &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0660U);
    EXPECT_EQ(status.st_gid, 1U);
    for (const char* made : {"/var/lib/velaindex", kIndexDatabase}) {
      ASSERT_EQ(stat(made, &status), 0);
      EXPECT_EQ(status.st_gid, 1U) << made;
    }
    EXPECT_EQ(ConnectAs(65534, 1), 0);
    EXPECT_EQ(ConnectAs(65534, 65534), EACCES);
  } else {
    const ProgramResult result = RunDaemon({"--group", "daemon"});
    EXPECT_EQ(result.exitCode, 1) << "a group that does not exist here cannot be given";
  }
}

TEST_F(ServiceTest, GroupThatNobodyKnowsIsAnError) {
  const ProgramResult result = RunDaemon({"--group", "no-such-group"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("there is no group no-such-group"));
  EXPECT_FALSE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, TakesTheSocketThatItIsGiven) {
  const Descriptor given = ListenAtSocket();
  // Who comes before it has started is answered, too.
  const Descriptor early = ConnectToDaemon();
  SendBytes(early, "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"}\n");
  Program program = StartGiven(given);
  EXPECT_EQ(ParseReply(ReceiveAll(early))["version"], 0);
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  program.Kill(SIGTERM);
  EXPECT_EQ(program.Wait()->exitCode, 0);
  EXPECT_TRUE(Exists(PluginDaemonSocketPath)) << "it is not its own to remove";
  EXPECT_TRUE(ConnectToDaemon().IsOpen()) << "the next one finds who waits here";
}

TEST_F(ServiceTest, HasADefiniteLogFormat) {
  IndexDaemon daemon({"--log-requests"});
  AskForVersion("/a \"b\"\n\xff=");
  const std::string log = daemon.End(SIGTERM).err;
  EXPECT_THAT(log, HasSubstr("time=2"));
  EXPECT_THAT(log, HasSubstr(" level=info event=request command=GET_INDEX_VERSION "
                             "path=\"/a \\\"b\\\"\\n\\xff=\" outcome=done pid="));
}

TEST_F(ServiceTest, MarksLinesForTheJournal) {
  const std::string script = "JOURNAL_STREAM=$(stat -L -c %d:%i /proc/self/fd/2) exec \"$0\"";
  Program daemon = StartProgram("/bin/bash", {"-c", script, IndexDaemonPath()});
  ASSERT_TRUE(WaitUntilExists(PluginDaemonSocketPath));
  while (!ConnectToDaemon().IsOpen()) usleep(1000);
  AskWithBytes("x");
  daemon.Kill(SIGTERM);
  const std::string log = daemon.Wait()->err;
  EXPECT_THAT(log, HasSubstr("<6>level=info event=start"));
  EXPECT_THAT(log, HasSubstr("<4>level=warning event=request"));
  EXPECT_THAT(log, Not(HasSubstr("time=")));
}

TEST_F(ServiceTest, MarksNoLinesWhenItsErrorStreamIsNotTheJournals) {
  ProgramOptions options;
  options.addedEnvironment = {"JOURNAL_STREAM=1:2"};
  IndexDaemon daemon({}, options);
  const std::string log = daemon.End(SIGTERM).err;
  EXPECT_THAT(log, HasSubstr("time=2"));
  EXPECT_THAT(log, Not(HasSubstr("<6>")));
}

TEST_F(ServiceTest, TellsTheSocketThatItWasGiven) {
  const Descriptor given = ListenAt("/tmp/another_sock");
  Program program = StartGiven(given);
  const Descriptor early = ConnectTo("/tmp/another_sock");
  SendBytes(early, "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"}\n");
  EXPECT_EQ(ParseReply(ReceiveAll(early))["version"], 0);
  program.Kill(SIGTERM);
  EXPECT_THAT(program.Wait()->err, HasSubstr(" socket=/tmp/another_sock "));
}

TEST_F(ServiceTest, SaysNothingOfOrdinaryRequestsUnlessAsked) {
  IndexDaemon daemon;
  AskForVersion("/a");
  EXPECT_THAT(daemon.End(SIGTERM).err, Not(HasSubstr("event=request")));
}

TEST_F(ServiceTest, TellsTheServiceManagerWhenItIsReady) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, "/tmp/notify", sizeof address.sun_path - 1);
  const Descriptor manager(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  ASSERT_EQ(bind(manager.Get(), generic, sizeof address), 0);
  ProgramOptions options;
  options.addedEnvironment = {"NOTIFY_SOCKET=/tmp/notify"};
  IndexDaemon daemon({}, options);
  const auto next = [&] {
    char text[256];
    const ssize_t got = recv(manager.Get(), text, sizeof text, 0);
    return std::string(text, static_cast<size_t>(got < 0 ? 0 : got));
  };
  EXPECT_EQ(next(), "READY=1");
  daemon.Process().Kill(SIGHUP);
  EXPECT_THAT(next(), HasSubstr("RELOADING=1\nMONOTONIC_USEC="));
  EXPECT_EQ(next(), "READY=1");
  daemon.Process().Kill(SIGTERM);
  EXPECT_EQ(next(), "STOPPING=1");
  EXPECT_EQ(daemon.Process().Wait()->exitCode, 0);
}

TEST_F(ServiceTest, BrokenErrorStreamDoesNotEndIt) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const std::string number = std::to_string(ends[1]);
  ProgramOptions options;
  options.keptDescriptors = {ends[1]};
  Program program = StartProgram(
      "/bin/bash", {"-c", "exec \"$0\" 2>&" + number + " " + number + ">&-", IndexDaemonPath()},
      options);
  close(ends[1]);
  close(ends[0]);
  ASSERT_TRUE(WaitUntilExists(PluginDaemonSocketPath));
  while (!ConnectToDaemon().IsOpen()) usleep(1000);
  AskWithBytes("x");
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  program.Kill(SIGTERM);
  EXPECT_EQ(program.Wait()->exitCode, 0);
}

TEST_F(ServiceTest, TellsItsVersionAndOptions) {
  EXPECT_THAT(RunDaemon({"--version"}).out, HasSubstr("velaindexplugind "));
  const ProgramResult help = RunDaemon({"--help"});
  EXPECT_EQ(help.exitCode, 0);
  EXPECT_THAT(help.out, HasSubstr("--set-index-version"));
}

}  // namespace
}  // namespace vela_test
