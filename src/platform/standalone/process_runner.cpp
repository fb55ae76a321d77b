#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <future>
#include <initializer_list>
#include <system_error>
#include <thread>
#include <utility>

#include "platform/standalone/last_error.h"
#include "platform/standalone/settings.h"
#include "platform/standalone/tool_confinement.h"
#include "platform/velautils.h"
#include "posix/child_process.h"
#include "posix/signal_block.h"

namespace VELAUtils {

namespace {

constexpr int kNotStarted = 127;     // as a shell reports it
constexpr int kEndedBySignal = 128;  // plus the signal's number
constexpr int kStatusUnknown = 126;

using Arguments = std::vector<std::string>;

void Append(Arguments& arguments, std::initializer_list<const char*> more) {
  for (const char* argument : more) {
    if (argument == nullptr) {
      return;
    }
    arguments.emplace_back(argument);
  }
}

/// Returns pointers into `program` and `arguments` for exec; the program is argument zero when
/// there are no arguments.
std::vector<char*> MakeVector(std::string& program, Arguments& arguments) {
  std::vector<char*> pointers;
  pointers.reserve(arguments.size() + 2);
  if (arguments.empty()) {
    pointers.push_back(program.data());
  }
  for (std::string& argument : arguments) {
    pointers.push_back(argument.data());
  }
  pointers.push_back(nullptr);
  return pointers;
}

vela::ChildStreams StreamsFor(bool keepOutput) {
  if (!keepOutput) {
    return {};
  }
  return {STDOUT_FILENO, STDERR_FILENO};
}

int ResultOf(int status) {
  if (status == -1) {
    return kStatusUnknown;
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : kEndedBySignal + WTERMSIG(status);
}

/// Starts the tool, confined. Returns 0 or an errno value.
int StartTool(std::string& program, Arguments& arguments, bool keepOutput, pid_t& pid) {
  const std::vector<char*> pointers = MakeVector(program, arguments);
  const vela::Confinement confinement = vela::ConfinementOfTool(
      program.c_str(), pointers.data(), vela::CurrentSettings().toolTimeout);
  return vela::StartChild(program.c_str(), pointers.data(), StreamsFor(keepOutput), confinement,
                          pid);
}

/// Waits for the child's end, at most for the time limit of tools, and returns the result of the
/// run.
int Finish(pid_t pid, const std::string& program) {
  const std::chrono::seconds limit = vela::CurrentSettings().toolTimeout;
  if (limit.count() != 0 && !vela::AwaitChildFor(pid, limit)) {
    vela::KillOverdueChild(pid, program.c_str(), limit);
  }
  vela::AwaitChild(pid);
  vela::KillGroup(pid);
  return ResultOf(vela::ReapChild(pid));
}

/// Runs the program in a thread of its own, which enforces the time limit and reaps the child. The
/// thread also starts the child, because the child gets a signal when the thread that started it
/// ends.
void RunInThread(std::string program, Arguments arguments, bool keepOutput,
                 std::promise<int> started) {
  pid_t pid = -1;
  const int error = StartTool(program, arguments, keepOutput, pid);
  started.set_value(error);
  if (error == 0) {
    Finish(pid, program);
  }
}

/// Returns 0 or an errno value.
int StartInBackground(const std::string& program, const Arguments& arguments, bool keepOutput) {
  const vela::SignalBlock noSignals;
  try {
    std::promise<int> started;
    std::future<int> result = started.get_future();
    std::thread(RunInThread, program, arguments, keepOutput, std::move(started)).detach();
    return result.get();
  } catch (const std::system_error&) {
    return EAGAIN;
  }
}

}  // namespace

ProcessRunner::ProcessRunner(const char* program, const char* arg0, const char* a1, const char* a2,
                             const char* a3, const char* a4, const char* a5, const char* a6,
                             const char* a7, const char* a8)
    : program_(program == nullptr ? "" : program) {
  Append(arguments_, {arg0, a1, a2, a3, a4, a5, a6, a7, a8});
}

void ProcessRunner::addArguments(const char* a1, const char* a2, const char* a3, const char* a4,
                                 const char* a5, const char* a6, const char* a7, const char* a8,
                                 const char* a9) {
  Append(arguments_, {a1, a2, a3, a4, a5, a6, a7, a8, a9});
}

int ProcessRunner::run(bool wait, bool keepOutput) {
  pid_t pid = -1;
  const int error = wait ? StartTool(program_, arguments_, keepOutput, pid)
                         : StartInBackground(program_, arguments_, keepOutput);
  if (error != 0) {
    vela::SetLastError(error);
    return kNotStarted;
  }
  return wait ? Finish(pid, program_) : 0;
}

}  // namespace VELAUtils
