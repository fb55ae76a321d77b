#include "support/program.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "support/descriptor.h"
#include "support/environment_failure.h"

namespace vela_test {

namespace {

using Clock = std::chrono::steady_clock;

// Descriptors used for starting have high numbers, so that they do not collide with the program's.
constexpr int kFirstOwnDescriptor = 200;

Descriptor MovedAside(int number) {
  const Descriptor original(number);
  Descriptor moved(fcntl(number, F_DUPFD_CLOEXEC, kFirstOwnDescriptor));
  if (!moved.IsOpen()) {
    EnvironmentFailureWithErrno("cannot prepare the descriptors of a program");
  }
  return moved;
}

Descriptor MemoryFile(const char* name, const std::string& content = std::string()) {
  Descriptor file = MovedAside(memfd_create(name, MFD_CLOEXEC));
  const ssize_t size = static_cast<ssize_t>(content.size());
  if (pwrite(file.Get(), content.data(), content.size(), 0) != size) {
    EnvironmentFailureWithErrno("cannot write the input of a program");
  }
  return file;
}

std::string WholeContent(const Descriptor& file) {
  struct stat status {};
  if (fstat(file.Get(), &status) != 0) {
    EnvironmentFailureWithErrno("cannot examine the output of a program");
  }
  std::string content(static_cast<size_t>(status.st_size), '\0');
  const ssize_t count = pread(file.Get(), content.data(), content.size(), 0);
  content.resize(count < 0 ? 0 : static_cast<size_t>(count));
  return content;
}

std::string NameOf(const std::string& variable) {
  return variable.substr(0, variable.find('='));
}

std::vector<std::string> EnvironmentFor(const ProgramOptions& options) {
  std::vector<std::string> variables;
  if (options.environment) {
    variables = *options.environment;
  } else {
    for (char** variable = environ; *variable != nullptr; ++variable) {
      variables.emplace_back(*variable);
    }
  }
  for (const std::string& added : options.addedEnvironment) {
    std::string* place = nullptr;
    for (std::string& variable : variables) {
      place = NameOf(variable) == NameOf(added) ? &variable : place;
    }
    if (place != nullptr) {
      *place = added;
    } else {
      variables.push_back(added);
    }
  }
  return variables;
}

std::vector<char*> Pointers(std::vector<std::string>* texts) {
  std::vector<char*> pointers;
  for (std::string& text : *texts) {
    pointers.push_back(text.data());
  }
  pointers.push_back(nullptr);
  return pointers;
}

/// All data that the child needs, prepared before the fork: after it only async-signal-safe calls
/// are allowed, since this process has more than one thread.
struct Launch {
  const char* path;
  char** arguments;
  char** environment;
  const ProgramOptions* options;
  int input;
  int output;
  int error;
  int failureReport;
};

int SetStandardDescriptor(int from, int to, bool closed) {
  if (closed) {
    close(to);
    return 0;
  }
  return dup2(from, to) < 0 ? errno : 0;
}

int SetDescriptors(const Launch& launch) {
  const ProgramOptions& options = *launch.options;
  if (close_range(3, ~0U, CLOSE_RANGE_CLOEXEC) != 0) {
    return errno;
  }
  for (const int kept : options.keptDescriptors) {
    if (fcntl(kept, F_SETFD, 0) != 0) {
      return errno;
    }
  }
  int failure = SetStandardDescriptor(launch.input, 0, options.closeInput);
  failure = failure != 0 ? failure : SetStandardDescriptor(launch.output, 1, options.closeOutput);
  return failure != 0 ? failure : SetStandardDescriptor(launch.error, 2, options.closeError);
}

int SetSurroundings(const Launch& launch) {
  const ProgramOptions& options = *launch.options;
  if (options.umask) {
    umask(*options.umask);
  }
  if (!options.workingDirectory.empty() && chdir(options.workingDirectory.c_str()) != 0) {
    return errno;
  }
  for (const BeforeExec& step : options.beforeExec) {
    const int failure = step();
    if (failure != 0) {
      return failure;
    }
  }
  return 0;
}

[[noreturn]] void BecomeProgram(const Launch& launch) {
  int failure = SetDescriptors(launch);
  failure = failure != 0 ? failure : SetSurroundings(launch);
  if (failure == 0) {
    execve(launch.path, launch.arguments, launch.environment);
    failure = errno;
  }
  const ssize_t written = write(launch.failureReport, &failure, sizeof failure);
  _exit(written == sizeof failure ? 127 : 126);
}

/// The errno that kept the program from starting, 0 when it runs.
int AwaitStart(const Descriptor& failureReport) {
  int failure = 0;
  ssize_t count = 0;
  while ((count = read(failureReport.Get(), &failure, sizeof failure)) < 0 && errno == EINTR) {
  }
  return count == sizeof failure ? failure : 0;
}

}  // namespace

struct Program::State {
  pid_t pid = -1;
  Descriptor handle;  // pidfd
  Descriptor output;
  Descriptor error;
  int startError = 0;
  Clock::time_point start;
  std::optional<ProgramResult> result;

  ~State() {
    if (!result) {
      kill(pid, SIGKILL);
      waitpid(pid, nullptr, 0);
    }
  }

  void Reap() {
    int status = 0;
    const pid_t reaped = waitpid(pid, &status, 0);
    ProgramResult ended;
    ended.wallTime = Clock::now() - start;
    ended.startError = startError;
    if (reaped != pid) {
      ended.signal = SIGKILL;  // ResetSandbox has ended and reaped it
    } else if (WIFSIGNALED(status)) {
      ended.signal = WTERMSIG(status);
    } else if (startError == 0) {
      ended.exitCode = WEXITSTATUS(status);
    }
    ended.out = WholeContent(output);
    ended.err = WholeContent(error);
    result = ended;
  }
};

Program::Program(std::unique_ptr<State> state) : state_(std::move(state)) {}
Program::Program(Program&&) noexcept = default;
Program& Program::operator=(Program&&) noexcept = default;
Program::~Program() = default;

pid_t Program::Pid() const {
  return state_->pid;
}

void Program::Kill(int signal) const {
  if (!state_->result) {
    kill(state_->pid, signal);
  }
}

std::optional<ProgramResult> Program::Wait(std::chrono::milliseconds limit) {
  const Clock::time_point end = Clock::now() + limit;
  while (!state_->result) {
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now()).count();
    pollfd ended = {state_->handle.Get(), POLLIN, 0};
    const int ready = poll(&ended, 1, left > 0 ? static_cast<int>(left) : 0);
    if (ready > 0) {
      state_->Reap();
    } else if (ready == 0 && left <= 0) {
      break;
    }
  }
  return state_->result;
}

std::string Program::Output() const {
  return WholeContent(state_->output);
}

std::string Program::Error() const {
  return WholeContent(state_->error);
}

Program StartProgram(const std::string& path, const std::vector<std::string>& arguments,
                     const ProgramOptions& options) {
  std::vector<std::string> allArguments = {options.argumentZero.value_or(path)};
  allArguments.insert(allArguments.end(), arguments.begin(), arguments.end());
  std::vector<std::string> variables = EnvironmentFor(options);
  const std::vector<char*> argumentPointers = Pointers(&allArguments);
  const std::vector<char*> variablePointers = Pointers(&variables);
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    EnvironmentFailureWithErrno("cannot make a pipe");
  }
  const Descriptor report(ends[0]);
  Descriptor failureReport = MovedAside(ends[1]);
  const Descriptor input = options.input.empty()
                               ? MovedAside(open("/dev/null", O_RDONLY | O_CLOEXEC))
                               : MemoryFile("input", options.input);
  auto state = std::make_unique<Program::State>();
  state->output = MemoryFile("output");
  state->error = MemoryFile("error");
  const Launch launch = {path.c_str(),
                         const_cast<char**>(argumentPointers.data()),
                         const_cast<char**>(variablePointers.data()),
                         &options,
                         input.Get(),
                         state->output.Get(),
                         state->error.Get(),
                         failureReport.Get()};
  state->start = Clock::now();
  state->pid = fork();
  if (state->pid == 0) {
    BecomeProgram(launch);
  }
  if (state->pid < 0) {
    EnvironmentFailureWithErrno("cannot start a process");
  }
  failureReport.Close();
  state->handle = Descriptor(static_cast<int>(syscall(SYS_pidfd_open, state->pid, 0)));
  if (!state->handle.IsOpen()) {
    EnvironmentFailureWithErrno("cannot watch a process");
  }
  state->startError = AwaitStart(report);
  if (state->startError != 0) {
    state->Reap();
  }
  return Program(std::move(state));
}

ProgramResult RunProgram(const std::string& path, const std::vector<std::string>& arguments,
                         const ProgramOptions& options) {
  Program program = StartProgram(path, arguments, options);
  std::optional<ProgramResult> result = program.Wait(options.timeLimit);
  if (!result) {
    program.Kill(SIGKILL);
    result = program.Wait(std::chrono::hours(1));
    result->timedOut = true;
  }
  return *result;
}

}  // namespace vela_test
