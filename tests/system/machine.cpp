#include "machine.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <thread>

#include "ipc/velamk_ipc.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/profile_file.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace vela_test {

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

std::vector<std::string> RunnerArguments(const std::vector<std::string>& more) {
  std::vector<std::string> arguments = {"--velathumb", VelathumbPath(), "--profile", kProfileFile};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return arguments;
}

/// The program that the process runs, empty when it has ended.
std::string ProgramOf(pid_t process) {
  char target[4096];
  const std::string link = "/proc/" + std::to_string(process) + "/exe";
  const ssize_t length = readlink(link.c_str(), target, sizeof target);
  return length > 0 ? std::string(target, static_cast<size_t>(length)) : "";
}

void ExpectKilled(std::optional<Program>* program, const char* name) {
  ASSERT_TRUE(program->has_value());
  (*program)->Kill(SIGKILL);
  const auto result = (*program)->Wait(seconds(10));
  ASSERT_TRUE(result) << name;
  // A program that had already ended by itself has printed the reason.
  EXPECT_EQ(result->signal, SIGKILL) << name << ": " << result->exitCode << '\n' << result->err;
  program->reset();
}

bool IsAnswering() {
  return access(PluginDaemonSocketPath, F_OK) == 0 && GetIndexVersion("/tmp") >= 0;
}

}  // namespace

Machine::Machine() {
  InstallRealTools();
  WriteProfileFile(kProfileFile, {{"thumb_xl", 1280, 80, std::nullopt, "VELAPHOTO_THUMB_XL.jpg", 0},
                                  {"thumb_l", 800, 80, std::nullopt, "VELAPHOTO_THUMB_L.jpg", 1},
                                  {"thumb_m", 320, 80, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 1},
                                  {"thumb_sm", 240, 80, std::nullopt, "VELAPHOTO_THUMB_SM.jpg", 1},
                                  {"thumb_b", 640, 80, std::nullopt, "VELAPHOTO_THUMB_B.jpg", 2},
                                  {"thumb_s", 120, 80, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2}});
}

void Machine::StartDaemon() {
  daemon_ = StartProgram(BuiltPath(VELAINDEXPLUGIND_FILE), {});
  const auto end = std::chrono::steady_clock::now() + seconds(10);
  while (!IsAnswering()) {
    ASSERT_LT(std::chrono::steady_clock::now(), end) << daemon_->Error();
    std::this_thread::sleep_for(milliseconds(5));
  }
}

void Machine::KillAndRestartDaemon() {
  ExpectKilled(&daemon_, "the daemon");
  daemon_ = StartProgram(BuiltPath(VELAINDEXPLUGIND_FILE), {});
}

void Machine::ReloadDaemon() {
  daemon_->Kill(SIGHUP);
}

std::optional<ProgramResult> Machine::StopDaemon() {
  daemon_->Kill(SIGTERM);
  return daemon_->Wait(seconds(10));
}

void Machine::StartFollowingRunner() {
  runner_ = StartRunner({"--follow", "--jobs", "2"});
}

void Machine::KillRunner() {
  ExpectKilled(&runner_, "the runner");
}

std::vector<pid_t> Machine::Velathumbs() {
  std::vector<pid_t> found;
  for (const std::string& name : ListDirectory("/proc")) {
    const auto process = static_cast<pid_t>(std::strtol(name.c_str(), nullptr, 10));
    const std::string program = process > 0 ? ProgramOf(process) : "";
    constexpr char kName[] = "/velathumb";
    constexpr size_t kLength = sizeof kName - 1;
    if (program.size() > kLength && program.substr(program.size() - kLength) == kName) {
      found.push_back(process);
    }
  }
  return found;
}

bool Machine::KillVelathumb() {
  const std::vector<pid_t> processes = Velathumbs();
  return !processes.empty() && kill(processes.front(), SIGKILL) == 0;
}

Program Machine::StartRunner(const std::vector<std::string>& more) {
  return StartProgram(BuiltPath(VELATHUMB_QUEUE_FILE), RunnerArguments(more));
}

ProgramResult Machine::RunRunner(const std::vector<std::string>& more) {
  return RunProgram(BuiltPath(VELATHUMB_QUEUE_FILE), RunnerArguments(more));
}

bool Machine::HasQueue() {
  return Exists("/var/spool/thumb_create.queue") || Exists("/var/spool/thumb_create.queue.tmp") ||
         Exists("/var/spool/thumb_create.queue.done") ||
         Exists("/var/spool/thumb_create.queue.later");
}

}  // namespace vela_test
