#include "posix/processes.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>

#include "posix/directory_entries.h"
#include "posix/file_content.h"

namespace vela {

namespace {

/// One line of the process table.
struct ProcessEntry {
  ProcessIdentity identity;
  pid_t parent = 0;
  bool isRunning = false;
  bool hasEnded = false;
  uint64_t cpuTime = 0;
};

std::string ReadProcessFile(pid_t pid, const char* name) {
  std::string text;
  const std::string path = "/proc/" + std::to_string(pid) + '/' + name;
  return ReadFile(path.c_str(), text) == 0 ? text : std::string();
}

std::optional<ProcessEntry> ExamineProcess(pid_t pid) {
  const std::string text = ReadProcessFile(pid, "stat");
  // The name of the command, in parentheses, can contain anything.
  const size_t end = text.rfind(')');
  if (end == std::string::npos) {
    return std::nullopt;
  }
  ProcessEntry entry;
  entry.identity.pid = pid;
  char state = 0;
  uint64_t times[4] = {};
  const int count = std::sscanf(text.c_str() + end + 1,
                                " %c %d %*d %*d %*d %*d %*u %*u %*u %*u %*u %" SCNu64 " %" SCNu64
                                " %" SCNu64 " %" SCNu64 " %*d %*d %*d %*d %" SCNu64,
                                &state, &entry.parent, &times[0], &times[1], &times[2], &times[3],
                                &entry.identity.startTime);
  constexpr int kFields = 7;
  if (count != kFields) {
    return std::nullopt;
  }
  entry.isRunning = state == 'R';
  entry.hasEnded = state == 'Z' || state == 'X';
  entry.cpuTime = times[0] + times[1] + times[2] + times[3];
  return entry;
}

uint64_t WrittenBytes(pid_t pid) {
  constexpr char kKey[] = "wchar: ";
  const std::string text = ReadProcessFile(pid, "io");
  const size_t place = text.find(kKey);
  return place == std::string::npos
             ? 0
             : std::strtoull(text.c_str() + place + sizeof kKey - 1, nullptr, 10);
}

/// Returns all processes by the id of their parent.
std::multimap<pid_t, ProcessEntry> ListProcesses() {
  std::multimap<pid_t, ProcessEntry> processes;
  DirectoryEntries entries("/proc");
  while (const char* name = entries.IsOpen() ? entries.NextName() : nullptr) {
    const auto pid = static_cast<pid_t>(std::strtol(name, nullptr, 10));
    if (pid <= 0) {
      continue;
    }
    if (const auto process = ExamineProcess(pid)) {
      processes.emplace(process->parent, *process);
    }
  }
  return processes;
}

void Add(const ProcessEntry& process, ProcessActivity& activity) {
  activity.isRunning = activity.isRunning || process.isRunning;
  activity.cpuTime += process.cpuTime;
  activity.written += WrittenBytes(process.identity.pid);
}

}  // namespace

std::optional<ProcessActivity> ActivityOf(pid_t pid) {
  const auto root = ExamineProcess(pid);
  if (!root) {
    return std::nullopt;
  }
  ProcessActivity activity;
  Add(*root, activity);
  const auto processes = ListProcesses();
  std::vector<pid_t> parents = {pid};
  while (!parents.empty()) {
    const auto [begin, end] = processes.equal_range(parents.back());
    parents.pop_back();
    for (auto child = begin; child != end; ++child) {
      Add(child->second, activity);
      parents.push_back(child->second.identity.pid);
      if (!child->second.hasEnded) {
        activity.descendants.push_back(child->second.identity);
      }
    }
  }
  return activity;
}

ProcessState StateOfProcess(long pid) {
  const auto id = static_cast<pid_t>(pid);
  if (id != pid) {
    return ProcessState::kGone;
  }
  if (kill(id, 0) == 0) {
    return ProcessState::kRunning;
  }
  return errno == EPERM ? ProcessState::kInaccessible : ProcessState::kGone;
}

void ReserveStandardDescriptors() {
  int descriptor = 0;
  do {
    descriptor = open("/dev/null", O_RDWR);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor > STDERR_FILENO) {
    close(descriptor);
  }
}

void CreateFilesWithExactModes() {
  umask(0);
}

uint64_t RaiseOpenFileLimit(uint64_t wanted) {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) {
    return wanted;
  }
  if (limit.rlim_cur >= wanted) {
    return limit.rlim_cur;
  }
  limit.rlim_cur = std::min<rlim_t>(wanted, limit.rlim_max);
  setrlimit(RLIMIT_NOFILE, &limit);
  getrlimit(RLIMIT_NOFILE, &limit);
  return limit.rlim_cur;
}

void BlockSignals(std::initializer_list<int> signals) {
  sigset_t blocked;
  sigemptyset(&blocked);
  for (const int number : signals) {
    sigaddset(&blocked, number);
  }
  pthread_sigmask(SIG_BLOCK, &blocked, nullptr);
}

void IgnoreBrokenPipes() {
  signal(SIGPIPE, SIG_IGN);
}

}  // namespace vela
