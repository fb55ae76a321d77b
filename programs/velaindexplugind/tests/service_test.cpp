// The daemon as a service: start, stop, sockets and their permissions.
#include <fcntl.h>
#include <grp.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <functional>

#include "index_daemon.h"
#include "support/privileges.h"
#include "support/users.h"

namespace vela_test {
namespace {

using namespace ::testing;

using ServiceTest = IndexDaemonTest;

Descriptor ListenAt(const char* path) {
  Descriptor made = SocketAt(path, SOCK_STREAM, bind);
  EXPECT_EQ(listen(made.Get(), 100), 0);
  return made;
}

struct stat StatusOf(const char* path) {
  struct stat status = {};
  EXPECT_EQ(lstat(path, &status), 0) << path;
  return status;
}

void ExpectCleanEnd(Program& program) {
  program.Kill(SIGTERM);
  EXPECT_EQ(program.Wait()->exitCode, 0);
}

/// Starts the daemon as a service manager with socket activation does.
Program StartGiven(const Descriptor& given, const std::string& arguments = "",
                   ProgramOptions options = ProgramOptions()) {
  const std::string number = std::to_string(given.Get());
  options.keptDescriptors = {given.Get()};
  const std::string script = "exec 3<&" + number + " " + (number == "3" ? "" : number + "<&-") +
                             "; LISTEN_FDS=1 LISTEN_PID=$$ exec \"$0\" " + arguments;
  return StartProgram("/bin/bash", {"-c", script, IndexDaemonPath()}, options);
}

bool SwitchUser(uid_t user, gid_t group) {
  return setgroups(0, nullptr) == 0 && setgid(group) == 0 && setuid(user) == 0;
}

/// The result of `action`, 0 to 254, run by another user.
int RunAs(uid_t user, gid_t group, const std::function<int()>& action) {
  const pid_t child = fork();
  if (child == 0) _exit(SwitchUser(user, group) ? action() : 255);
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

TEST_F(ServiceTest, AnswersRequestsInProgressBeforeItEnds) {
  IndexDaemon daemon;
  IndexHolder holder;
  const Descriptor posting = SendLine(kPostRequest);
  const Descriptor halfWay = ConnectToDaemon();
  SendBytes(halfWay, "{\"command\":");
  daemon.Process().Kill(SIGTERM);
  EXPECT_EQ(ReceiveAll(halfWay), "");
  EXPECT_FALSE(ConnectToDaemon().IsOpen());
  holder.Release();
  ExpectSuccess(posting);
  EXPECT_EQ(daemon.Process().Wait()->exitCode, 0);
}

TEST_F(ServiceTest, AnswersClientsThatConnectedBeforeTheSignal) {
  IndexDaemon daemon;
  daemon.Process().Kill(SIGSTOP);
  std::vector<Descriptor> early;
  for (int i = 0; i < 40; ++i) {
    early.push_back(SendLine(kVersionRequest));
  }
  daemon.Process().Kill(SIGTERM);
  daemon.Process().Kill(SIGCONT);
  for (const Descriptor& connection : early) {
    EXPECT_EQ(ReceiveReply(connection)["version"], 0);
  }
  EXPECT_EQ(daemon.Process().Wait()->exitCode, 0);
}

TEST_F(ServiceTest, SecondSignalEndsItAtOnce) {
  IndexDaemon daemon;
  IndexHolder holder;
  const Descriptor posting = SendLine(kPostRequest);
  daemon.Process().Kill(SIGTERM);
  ASSERT_TRUE(daemon.WaitForLog("event=stop"));
  const ProgramResult result = daemon.End(SIGTERM);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, HasSubstr("requests_left=1"));
}

TEST_F(ServiceTest, SecondInstanceRefusesToStart) {
  const IndexDaemon daemon;
  const std::pair<std::vector<std::string>, const char*> cases[] = {
      {{}, "another instance uses /var/lib/velaindex/index.db"},
      {{"--database", "/tmp/other/index.db"},
       "another instance listens at /tmp/velaindexplugind_sock"}};
  for (const auto& [arguments, message] : cases) {
    const std::string log = ExpectRefusal(arguments, message, NoStart::kPassing);
    EXPECT_EQ(std::count(log.begin(), log.end(), '\n'), 1);
    EXPECT_EQ(GetIndexVersion("/a"), 0);
  }
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

TEST_F(ServiceTest, AnythingButASocketIsKept) {
  WriteFile(PluginDaemonSocketPath, "precious");
  ExpectRefusal({}, "is not a socket", NoStart::kPermanent);
  EXPECT_EQ(ReadFile(PluginDaemonSocketPath), "precious");
  RemoveTree(PluginDaemonSocketPath);

  // A link is not followed either.
  ASSERT_EQ(symlink("/tmp/elsewhere", PluginDaemonSocketPath), 0);
  ExpectRefusal({}, "is not a socket", NoStart::kPermanent);
  EXPECT_TRUE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, RootReplacesAnythingOfAnotherUser) {
  if (!HasOtherUsers()) {
    // In a sandbox with one user everything belongs to root and is kept.
    const Descriptor own = ListenAt(PluginDaemonSocketPath);
    EXPECT_EQ(RunDaemon({}).exitCode, 1);
    EXPECT_TRUE(ConnectToDaemon().IsOpen());
    return;
  }
  const std::vector<std::function<Descriptor()>> puts = {
      [] { return ListenAt(PluginDaemonSocketPath); },
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

TEST_F(ServiceTest, SocketOfAnotherListenerIsKept) {
  const Descriptor other = ListenAt(PluginDaemonSocketPath);
  ExpectRefusal({}, "another instance listens at /tmp/velaindexplugind_sock", NoStart::kPassing);
  EXPECT_TRUE(ConnectToDaemon().IsOpen());
}

TEST_F(ServiceTest, RefusesToStartWhileAnotherPreparesItsSocket) {
  const Descriptor lock(open("/run/velaindexplugind.lock", O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  ASSERT_EQ(flock(lock.Get(), LOCK_EX | LOCK_NB), 0);
  ExpectRefusal({}, "another instance listens at /tmp/velaindexplugind_sock", NoStart::kPassing);
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
    ExpectCleanEnd(winner);
  }
}

TEST_F(ServiceTest, OrdinaryUserMayRunIt) {
  ProgramOptions options;
  if (!HasOtherUsers()) {
    // The only user of the sandbox, without any capability.
    options.beforeExec = {DropCapabilities()};
    MakeDirectories("/tmp/own");
    const IndexDaemon daemon({"--database", "/tmp/own/index.db"}, options);
    EXPECT_TRUE(SetVersion("/a", 3));
    EXPECT_EQ(GetIndexVersion("/a"), 3);
    return;
  }
  options.beforeExec = {[] { return SwitchUser(1, 1) ? 0 : EPERM; }};
  const std::vector<std::string> arguments = {"--database", "/tmp/own/index.db"};
  MakeDirectories("/tmp/own");
  const IndexDaemon daemon(arguments, options);
  EXPECT_EQ(RunAs(1, 1, [] { return GetIndexVersion("/a"); }), 0);
  EXPECT_EQ(RunAs(1, 1, [] { return SetVersion("/a", 3) ? 0 : 1; }), 0);
  EXPECT_EQ(RunAs(1, 1, [] { return GetIndexVersion("/a"); }), 3);
  // Root's programs believe only root's daemon.
  EXPECT_EQ(GetIndexVersion("/a"), -1);
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
  const Descriptor other = ListenAt(PluginDaemonSocketPath);
  EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  EXPECT_TRUE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, SocketIsForRootAndItsGroupOnly) {
  ProgramOptions options;
  options.umask = 0;
  const IndexDaemon daemon({}, options);
  const struct stat status = StatusOf(PluginDaemonSocketPath);
  EXPECT_TRUE(S_ISSOCK(status.st_mode));
  EXPECT_EQ(status.st_mode & 07777, 0660U);
  EXPECT_EQ(status.st_uid, 0U);
  EXPECT_EQ(status.st_gid, 0U);
  if (HasOtherUsers()) {
    EXPECT_EQ(ConnectAs(65534, 65534), EACCES);
    EXPECT_EQ(ConnectAs(65534, 0), 0);
  }
}

TEST_F(ServiceTest, GroupCanBeChosen) {
  if (HasOtherUsers()) {
    const IndexDaemon daemon({"--group", "daemon"});
    EXPECT_EQ(ModeOf(PluginDaemonSocketPath), 0660);
    for (const char* made : {PluginDaemonSocketPath, "/var/lib/velaindex", kIndexDatabase}) {
      EXPECT_EQ(StatusOf(made).st_gid, 1U) << made;
    }
    EXPECT_EQ(ConnectAs(65534, 1), 0);
    EXPECT_EQ(ConnectAs(65534, 65534), EACCES);
  } else {
    EXPECT_EQ(RunDaemon({"--group", "daemon"}).exitCode, 1)
        << "a group that does not exist here cannot be set";
  }
}

TEST_F(ServiceTest, UnknownGroupIsAnError) {
  ExpectRefusal({"--group", "no-such-group"}, "there is no group no-such-group",
                NoStart::kPermanent);
  EXPECT_FALSE(Exists(PluginDaemonSocketPath));
}

TEST_F(ServiceTest, AGroupThatAServiceCannotGiveAwayIsNamedWithItsRemedy) {
  if (!HasOtherUsers()) {
    ExpectRefusal({"--group", "daemon"}, "Invalid argument", NoStart::kPassing);
    return;
  }
  const Descriptor given = ListenAt(PluginDaemonSocketPath);
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  Program program = StartGiven(given, "--group daemon", options);
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  program.Kill(SIGTERM);
  const std::string log = program.Wait()->err;
  EXPECT_THAT(log, HasSubstr("level=warning event=socket path=/tmp/velaindexplugind_sock gid=1 "
                             "error=\"it keeps the group that the service manager has given it\" "
                             "advice=\"set SocketGroup= in its unit\"\n"));
  for (const char* path : {"/var/lib/velaindex", kIndexDatabase}) {
    EXPECT_THAT(log,
                HasSubstr("level=warning event=database path=" + std::string(path) +
                          " gid=1 error=\"Operation not permitted\" "
                          "advice=\"a service without CAP_CHOWN needs Group= in its unit\"\n"));
    EXPECT_EQ(StatusOf(path).st_gid, 0U);
  }
}

TEST_F(ServiceTest, AnInheritedSocketWithTheGroupIsNotMentioned) {
  const Descriptor given = ListenAt(PluginDaemonSocketPath);
  Program program = StartGiven(given, "--group root");
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  program.Kill(SIGTERM);
  EXPECT_THAT(program.Wait()->err, Not(HasSubstr("level=warning")));
}

TEST_F(ServiceTest, UsesAnInheritedSocket) {
  const Descriptor given = ListenAt(PluginDaemonSocketPath);
  // A client that connects before the start gets an answer, too.
  const Descriptor early = SendLine(kVersionRequest);
  Program program = StartGiven(given);
  EXPECT_EQ(ReceiveReply(early)["version"], 0);
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  ExpectCleanEnd(program);
  EXPECT_TRUE(Exists(PluginDaemonSocketPath)) << "it belongs to the service manager";
  EXPECT_TRUE(ConnectToDaemon().IsOpen()) << "the next instance finds waiting clients";
}

TEST_F(ServiceTest, HasAFixedLogFormat) {
  IndexDaemon daemon({"--log-requests"});
  QueryVersion("/a \"b\"\n\xff=");
  const std::string log = daemon.End(SIGTERM).err;
  EXPECT_THAT(log, HasSubstr("time=2"));
  EXPECT_THAT(log, HasSubstr(" level=info event=request command=GET_INDEX_VERSION "
                             "path=\"/a \\\"b\\\"\\n\\xff=\" outcome=done pid="));
}

TEST_F(ServiceTest, LinesForTheJournalHaveTheirLevel) {
  const std::string script = "JOURNAL_STREAM=$(stat -L -c %d:%i /proc/self/fd/2) exec \"$0\"";
  Program daemon = StartProgram("/bin/bash", {"-c", script, IndexDaemonPath()});
  WaitForDaemon();
  QueryWithBytes("x");
  daemon.Kill(SIGTERM);
  const std::string log = daemon.Wait()->err;
  EXPECT_THAT(log, HasSubstr("<6>level=info event=start"));
  EXPECT_THAT(log, HasSubstr("<4>level=warning event=request"));
  EXPECT_THAT(log, Not(HasSubstr("time=")));
}

TEST_F(ServiceTest, LinesHaveNoLevelWhenTheErrorStreamIsNotTheJournals) {
  ProgramOptions options;
  options.addedEnvironment = {"JOURNAL_STREAM=1:2"};
  IndexDaemon daemon({}, options);
  const std::string log = daemon.End(SIGTERM).err;
  EXPECT_THAT(log, HasSubstr("time=2"));
  EXPECT_THAT(log, Not(HasSubstr("<6>")));
}

TEST_F(ServiceTest, LogsTheInheritedSocket) {
  const Descriptor given = ListenAt("/tmp/another_sock");
  Program program = StartGiven(given);
  const Descriptor early = SocketAt("/tmp/another_sock", SOCK_STREAM, connect);
  SendBytes(early, std::string(kVersionRequest) + "\n");
  EXPECT_EQ(ReceiveReply(early)["version"], 0);
  program.Kill(SIGTERM);
  EXPECT_THAT(program.Wait()->err, HasSubstr(" socket=/tmp/another_sock "));
}

TEST_F(ServiceTest, LogsSuccessfulRequestsOnlyWithTheOption) {
  IndexDaemon daemon;
  QueryVersion("/a");
  EXPECT_THAT(daemon.End(SIGTERM).err, Not(HasSubstr("event=request")));
}

TEST_F(ServiceTest, NotifiesTheServiceManager) {
  const Descriptor manager = SocketAt("/tmp/notify", SOCK_DGRAM, bind);
  ASSERT_TRUE(manager.IsOpen());
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
  WaitForDaemon();
  QueryWithBytes("x");
  EXPECT_EQ(GetIndexVersion("/a"), 0);
  ExpectCleanEnd(program);
}

TEST_F(ServiceTest, PrintsItsVersionAndOptions) {
  EXPECT_THAT(RunDaemon({"--version"}).out, HasSubstr("velaindexplugind "));
  const ProgramResult help = RunDaemon({"--help"});
  EXPECT_EQ(help.exitCode, 0);
  EXPECT_THAT(help.out, HasSubstr("--set-index-version"));
}

}  // namespace
}  // namespace vela_test
