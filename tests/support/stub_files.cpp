#include "support/stub_files.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

#include "support/descriptor.h"

namespace vela_test {

namespace {

void MakeEmptyFile(const char* path) {
  const Descriptor file(open(path, O_CREAT | O_TRUNC | O_WRONLY | O_CLOEXEC, 0666));
  if (!file.IsOpen()) {
    std::perror(path);
    _exit(1);
  }
  fchmod(file.Get(), 0666);
}

}  // namespace

void MakeStubDirectory() {
  if (mkdir(kStubDirectory, 0777) != 0 && errno != EEXIST) {
    std::perror(kStubDirectory);
    _exit(1);
  }
  chmod(kStubDirectory, 0777);
  MakeEmptyFile(kStubRecordFile);
  MakeEmptyFile(kStubSequenceFile);
}

std::string StubToolDirectory(const std::string& tool) {
  return std::string(kStubDirectory) + "/" + tool;
}

uint64_t IncrementCounter(const std::string& file) {
  const Descriptor counter(open(file.c_str(), O_RDWR | O_CLOEXEC));
  if (!counter.IsOpen()) {
    return 0;
  }
  uint64_t number = 0;
  while (flock(counter.Get(), LOCK_EX) != 0 && errno == EINTR) {
  }
  const ssize_t had = pread(counter.Get(), &number, sizeof number, 0);
  number = had == static_cast<ssize_t>(sizeof number) ? number + 1 : 1;
  const bool written = pwrite(counter.Get(), &number, sizeof number, 0) == sizeof number;
  return written ? number : 0;
}

}  // namespace vela_test
