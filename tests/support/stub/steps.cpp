#include "support/stub/steps.h"

#include <fcntl.h>
#include <ftw.h>
#include <signal.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "support/descriptor.h"

namespace vela_test {

namespace {

/// 0 for a call that succeeded, else its errno.
int ErrorOf(int result) {
  return result == 0 ? 0 : errno;
}

int OpenAndWrite(const std::string& path, const std::string& content, int flags) {
  const Descriptor file(open(path.c_str(), O_WRONLY | O_CLOEXEC | flags, 0666));
  return file.IsOpen() ? WriteWhole(file.Get(), content) : errno;
}

int RemoveEntry(const char* path, const struct stat*, int, FTW*) {
  return std::remove(path);
}

}  // namespace

int WriteWhole(int descriptor, const std::string& content) {
  size_t done = 0;
  while (done < content.size()) {
    const ssize_t written = write(descriptor, content.data() + done, content.size() - done);
    if (written < 0 && errno != EINTR) {
      return errno;
    }
    done += written < 0 ? 0 : static_cast<size_t>(written);
  }
  return 0;
}

int WriteContent(const std::string& path, const std::string& content) {
  return OpenAndWrite(path, content, O_CREAT | O_TRUNC);
}

int AppendBytes(const std::string& path, size_t bytes) {
  return OpenAndWrite(path, std::string(bytes, 'x'), O_APPEND);
}

int GrowSize(const std::string& path, size_t bytes) {
  struct stat status {};
  if (stat(path.c_str(), &status) != 0) {
    return errno;
  }
  return ErrorOf(truncate(path.c_str(), status.st_size + static_cast<off_t>(bytes)));
}

int GrowBlocks(const std::string& path, size_t bytes) {
  const Descriptor file(open(path.c_str(), O_RDWR | O_CLOEXEC));
  struct stat status {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return errno;
  }
  const off_t page = static_cast<off_t>(sysconf(_SC_PAGESIZE));
  const off_t end = (status.st_size + page - 1) / page * page;
  return ErrorOf(fallocate(file.Get(), FALLOC_FL_KEEP_SIZE, end, static_cast<off_t>(bytes)));
}

int RemoveWhole(const std::string& path) {
  constexpr int kDescriptors = 16;
  return ErrorOf(nftw(path.c_str(), RemoveEntry, kDescriptors, FTW_DEPTH | FTW_PHYS));
}

int ReplaceWithDirectory(const std::string& path) {
  const int error = RemoveWhole(path);
  return error != 0 ? error : ErrorOf(mkdir(path.c_str(), 0777));
}

int SetBothTimes(const std::string& path, long long seconds) {
  const timespec time = {seconds, 0};
  const timespec times[2] = {time, time};
  return ErrorOf(utimensat(AT_FDCWD, path.c_str(), times, 0));
}

int FillUp(const std::string& path) {
  struct statvfs volume {};
  if (statvfs(path.c_str(), &volume) != 0) {
    return errno;
  }
  const unsigned long used = (volume.f_blocks - volume.f_bfree) * volume.f_frsize;
  if (used == 0) {
    return EINVAL;  // for the kernel, a size of 0 means no limit
  }
  const std::string options = "size=" + std::to_string(used);
  return ErrorOf(mount("tmpfs", path.c_str(), "tmpfs", MS_REMOUNT | MS_NOSUID, options.c_str()));
}

int RunAndWait(const std::string& program, const std::vector<std::string>& arguments) {
  std::vector<char*> pointers = {const_cast<char*>(program.c_str())};
  for (const std::string& argument : arguments) {
    pointers.push_back(const_cast<char*>(argument.c_str()));
  }
  pointers.push_back(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    execv(program.c_str(), pointers.data());
    _exit(127);
  }
  int status = 0;
  while (waitpid(child, &status, 0) < 0 && errno == EINTR) {
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

void SleepFor(int milliseconds) {
  timespec left = {milliseconds / 1000, (milliseconds % 1000) * 1000000L};
  while (nanosleep(&left, &left) != 0 && errno == EINTR) {
  }
}

bool AwaitFile(const std::string& path) {
  constexpr int kMilliseconds = 60000;
  for (int i = 0; i < kMilliseconds; ++i) {
    if (access(path.c_str(), F_OK) == 0) {
      return true;
    }
    SleepFor(1);
  }
  return false;
}

void Die(int signal) {
  const rlimit noCore = {0, 0};
  setrlimit(RLIMIT_CORE, &noCore);
  ::signal(signal, SIG_DFL);
  sigset_t only;
  sigemptyset(&only);
  sigaddset(&only, signal);
  sigprocmask(SIG_UNBLOCK, &only, nullptr);
  raise(signal);
  for (;;) {
    pause();
  }
}

}  // namespace vela_test
