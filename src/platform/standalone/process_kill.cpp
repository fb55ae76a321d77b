// Called from signal handlers: system calls only.
#include <fcntl.h>
#include <signal.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "platform/standalone/last_error.h"
#include "platform/vlibc.h"
#include "posix/file_descriptor.h"

namespace {

using vela::FileDescriptor;

constexpr size_t kCommandNameMax = 15;  // the kernel truncates command names to this length

/// A directory entry as returned by the system call.
struct KernelEntry {
  uint64_t inode;
  int64_t next;
  uint16_t length;
  uint8_t type;
  char name[1];
};

/// Returns the process id that `name` is in decimal, 0 for any other name.
pid_t ParsePid(const char* name) {
  constexpr pid_t kPidMax = 1 << 22;
  pid_t pid = 0;
  for (; *name >= '0' && *name <= '9'; ++name) {
    if (pid > kPidMax) {
      return 0;
    }
    pid = pid * 10 + (*name - '0');
  }
  return *name == '\0' ? pid : 0;
}

/// Reads the beginning of a file in the process's directory below /proc. Returns the number of
/// bytes, 0 when it cannot be read.
size_t ReadProcessFile(int processTable, const char* pidName, const char* file, char* out,
                       size_t outSize) {
  char path[32];
  const size_t pidLength = strlen(pidName);
  const size_t fileSize = strlen(file) + 1;
  if (pidLength + fileSize > sizeof(path)) {
    return 0;
  }
  memcpy(path, pidName, pidLength);
  memcpy(path + pidLength, file, fileSize);
  const FileDescriptor descriptor(openat(processTable, path, O_RDONLY | O_CLOEXEC));
  if (!descriptor.IsOpen()) {
    return 0;
  }
  const ssize_t got = read(descriptor.Get(), out, outSize);
  return got > 0 ? static_cast<size_t>(got) : 0;
}

bool HasCommandName(int processTable, const char* pidName, const char* name, size_t nameLength) {
  char command[kCommandNameMax + 2];
  const size_t got = ReadProcessFile(processTable, pidName, "/comm", command, sizeof(command));
  if (got == 0 || command[got - 1] != '\n') {
    return false;
  }
  return got - 1 == nameLength && memcmp(command, name, nameLength) == 0;
}

/// Returns whether the process has ended and only waits to be reaped.
bool IsZombie(int processTable, const char* pidName) {
  // "pid (command name) state ...", where the name may contain parentheses itself.
  char line[64];
  const size_t got = ReadProcessFile(processTable, pidName, "/stat", line, sizeof(line));
  const auto* parenthesis = static_cast<const char*>(memrchr(line, ')', got));
  return parenthesis != nullptr && parenthesis + 2 < line + got && parenthesis[2] == 'Z';
}

/// Which signal to send, and to which processes.
struct SignalRequest {
  const char* name;
  size_t nameLength;
  int signal;
  pid_t self;
};

int SignalMatching(int processTable, const KernelEntry& entry, const SignalRequest& request) {
  const pid_t pid = ParsePid(entry.name);
  if (pid == 0 || pid == request.self) {
    return 0;
  }
  if (!HasCommandName(processTable, entry.name, request.name, request.nameLength)) {
    return 0;
  }
  if (IsZombie(processTable, entry.name)) {
    return 0;
  }
  return kill(pid, request.signal) == 0 ? 1 : 0;
}

/// Returns the number of processes signalled, or -1 with errno set.
int SignalAll(const SignalRequest& request) {
  const FileDescriptor processTable(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!processTable.IsOpen()) {
    return -1;
  }
  int count = 0;
  alignas(KernelEntry) char buffer[4096];
  for (;;) {
    const long got = syscall(SYS_getdents64, processTable.Get(), buffer, sizeof(buffer));
    if (got < 0) {
      return -1;
    }
    if (got == 0) {
      return count;
    }
    for (long at = 0; at < got;) {
      const auto* entry = reinterpret_cast<const KernelEntry*>(buffer + at);
      count += SignalMatching(processTable.Get(), *entry, request);
      at += entry->length;
    }
  }
}

}  // namespace

int VLIBCKill(const char* name, int signal) {
  const int savedErrno = errno;
  if (name == nullptr || *name == '\0') {
    return vela::Fail(EINVAL);
  }
  const size_t length = strlen(name);
  const SignalRequest request{name, length < kCommandNameMax ? length : kCommandNameMax,
                              signal == 0 ? SIGTERM : signal, getpid()};
  int result = SignalAll(request);
  if (result < 0) {
    result = vela::Fail(errno);
  }
  errno = savedErrno;
  return result;
}
