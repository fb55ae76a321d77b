#include "support/stub/call_record.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <climits>

#include "support/descriptor.h"
#include "support/field_codec.h"
#include "support/stub_files.h"

namespace vela_test {

namespace {

using Fields = std::vector<std::string>;

std::string Now() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return std::to_string(now.tv_sec * 1000000000LL + now.tv_nsec);
}

/// Without listing a directory, which a confined program may not do.
std::string OpenDescriptors() {
  constexpr int kMost = 1024;
  Fields fields;
  for (int number = 0; number < kMost; ++number) {
    char target[PATH_MAX];
    const std::string link = "/proc/self/fd/" + std::to_string(number);
    const ssize_t length = readlink(link.c_str(), target, sizeof target);
    if (length >= 0) {
      fields.push_back(std::to_string(number));
      fields.emplace_back(target, static_cast<size_t>(length));
    }
  }
  return EncodeFields(fields);
}

std::string BlockedSignals() {
  sigset_t blocked;
  sigprocmask(SIG_BLOCK, nullptr, &blocked);
  Fields fields;
  for (int signal = 1; signal < NSIG; ++signal) {
    if (sigismember(&blocked, signal) == 1) {
      fields.push_back(std::to_string(signal));
    }
  }
  return EncodeFields(fields);
}

std::string IgnoredSignals() {
  Fields fields;
  for (int signal = 1; signal < NSIG; ++signal) {
    struct sigaction action {};
    if (sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN) {
      fields.push_back(std::to_string(signal));
    }
  }
  return EncodeFields(fields);
}

std::string WorkingDirectory() {
  char directory[PATH_MAX];
  return getcwd(directory, sizeof directory) == nullptr ? "" : directory;
}

std::string Mask() {
  const mode_t mask = umask(0);
  umask(mask);
  return std::to_string(mask);
}

/// One record in one write, so that those of several processes never mix.
bool Append(const Fields& fields) {
  const std::string record = EncodeFields({EncodeFields(fields)});
  const Descriptor file(open(kStubRecordFile, O_WRONLY | O_APPEND | O_CLOEXEC));
  return write(file.Get(), record.data(), record.size()) == static_cast<ssize_t>(record.size());
}

}  // namespace

std::vector<std::string> Surroundings() {
  // Descriptors first: before the stub opens any of its own.
  const std::string descriptors = OpenDescriptors();
  return {"descriptors", descriptors,
          "directory",   WorkingDirectory(),
          "blocked",     BlockedSignals(),
          "ignored",     IgnoredSignals(),
          "umask",       Mask(),
          "user",        std::to_string(getuid()),
          "group",       std::to_string(getgid()),
          "pid",         std::to_string(getpid()),
          "parent",      std::to_string(getppid()),
          "time",        Now()};
}

uint64_t RecordStart(const StubCommandLine& line, uint64_t number,
                     const std::vector<std::string>& surroundings) {
  const uint64_t sequence = IncrementCounter(kStubSequenceFile);
  Fields fields = {"event",     "start",
                   "tool",      line.tool,
                   "path",      line.path,
                   "number",    std::to_string(number),
                   "arguments", EncodeFields(line.arguments),
                   "sequence",  std::to_string(sequence)};
  fields.insert(fields.end(), surroundings.begin(), surroundings.end());
  return Append(fields) ? sequence : 0;
}

void RecordEnd(uint64_t startSequence) {
  Append({"event", "end", "start", std::to_string(startSequence), "sequence",
          std::to_string(IncrementCounter(kStubSequenceFile)), "time", Now()});
}

void RecordProblem(const std::string& tool, const std::string& problem) {
  Append({"event", "problem", "tool", tool, "problem", problem});
}

}  // namespace vela_test
