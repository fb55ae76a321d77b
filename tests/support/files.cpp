#include "support/files.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <functional>
#include <ostream>
#include <thread>

#include "support/descriptor.h"

namespace vela_test {

namespace {

void Fail(const std::string& what, const std::string& path) {
  ADD_FAILURE() << "cannot " << what << " " << path << ": " << std::strerror(errno);
}

void MakeParents(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash != std::string::npos && slash > 0) {
    MakeDirectories(path.substr(0, slash));
  }
}

bool WriteAll(int file, const std::string& content) {
  size_t done = 0;
  while (done < content.size()) {
    const ssize_t written = write(file, content.data() + done, content.size() - done);
    if (written < 0) {
      return false;
    }
    done += static_cast<size_t>(written);
  }
  return true;
}

void Write(const std::string& path, const std::string& content, int flags) {
  const Descriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | flags, 0666));
  if (!file.IsOpen() || !WriteAll(file.Get(), content)) {
    Fail("write", path);
  }
}

/// Status of a file, links followed; whether there is one.
bool Status(const std::string& path, struct stat* status) {
  return stat(path.c_str(), status) == 0;
}

void AddTree(const std::string& top, const std::string& below, std::vector<std::string>* found) {
  for (const std::string& name : ListDirectory(top + "/" + below)) {
    const std::string path = below + name;
    struct stat status {};
    const bool isDirectory =
        lstat((top + "/" + path).c_str(), &status) == 0 && S_ISDIR(status.st_mode);
    found->push_back(isDirectory ? path + "/" : path);
    if (isDirectory) {
      AddTree(top, path + "/", found);
    }
  }
}

bool WaitFor(const std::function<bool()>& condition, int milliseconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
  while (!condition()) {
    if (std::chrono::steady_clock::now() > end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  return true;
}

}  // namespace

void WriteFile(const std::string& path, const std::string& content) {
  MakeParents(path);
  Write(path, content, O_TRUNC);
}

void WriteFileOfSize(const std::string& path, size_t bytes) {
  WriteFile(path, std::string(bytes, 'x'));
}

void AppendToFile(const std::string& path, const std::string& content) {
  Write(path, content, O_APPEND);
}

std::string ReadFile(const std::string& path) {
  const Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file.IsOpen()) {
    Fail("open", path);
    return "";
  }
  std::string content;
  char buffer[65536];
  ssize_t count = 0;
  while ((count = read(file.Get(), buffer, sizeof buffer)) > 0) {
    content.append(buffer, static_cast<size_t>(count));
  }
  if (count < 0) {
    Fail("read", path);
  }
  return content;
}

std::vector<std::string> ReadLines(const std::string& path) {
  const std::string content = ReadFile(path);
  std::vector<std::string> lines;
  size_t begin = 0;
  while (begin < content.size()) {
    const size_t end = std::min(content.find('\n', begin), content.size());
    lines.push_back(content.substr(begin, end - begin));
    begin = end + 1;
  }
  return lines;
}

void MakeDirectories(const std::string& path) {
  if (IsDirectory(path)) {
    return;
  }
  MakeParents(path);
  if (mkdir(path.c_str(), 0777) != 0 || chmod(path.c_str(), 0777) != 0) {
    Fail("make directory", path);
  }
}

void RemoveTree(const std::string& path) {
  if (unlink(path.c_str()) == 0 || errno == ENOENT) {
    return;
  }
  for (const std::string& name : ListDirectory(path)) {
    RemoveTree(path + "/" + name);
  }
  if (rmdir(path.c_str()) != 0) {
    Fail("remove", path);
  }
}

void CopyFile(const std::string& from, const std::string& to) {
  WriteFile(to, ReadFile(from));
}

bool Exists(const std::string& path) {
  struct stat status {};
  return lstat(path.c_str(), &status) == 0;
}

bool IsRegularFile(const std::string& path) {
  struct stat status {};
  return Status(path, &status) && S_ISREG(status.st_mode);
}

bool IsDirectory(const std::string& path) {
  struct stat status {};
  return Status(path, &status) && S_ISDIR(status.st_mode);
}

int64_t FileSize(const std::string& path) {
  struct stat status {};
  return Status(path, &status) ? status.st_size : -1;
}

int ModeOf(const std::string& path) {
  struct stat status {};
  return Status(path, &status) ? static_cast<int>(status.st_mode & 07777) : -1;
}

void PrintTo(const FileTime& time, std::ostream* out) {
  *out << time.seconds << " s " << time.nanoseconds << " ns";
}

void SetFileTime(const std::string& path, int64_t seconds, int64_t nanoseconds) {
  const timespec time = {seconds, nanoseconds};
  const timespec times[2] = {time, time};
  if (utimensat(AT_FDCWD, path.c_str(), times, 0) != 0) {
    Fail("set the time of", path);
  }
}

void SetFileTimeFromNow(const std::string& path, int64_t secondsFromNow) {
  SetFileTime(path, time(nullptr) + secondsFromNow);
}

FileTime ModificationTime(const std::string& path) {
  struct stat status {};
  if (!Status(path, &status)) {
    Fail("examine", path);
  }
  return {status.st_mtim.tv_sec, status.st_mtim.tv_nsec};
}

FileTime AccessTime(const std::string& path) {
  struct stat status {};
  if (!Status(path, &status)) {
    Fail("examine", path);
  }
  return {status.st_atim.tv_sec, status.st_atim.tv_nsec};
}

std::vector<std::string> ListDirectory(const std::string& path) {
  std::vector<std::string> names;
  const DirectoryStream directory(opendir(path.c_str()));
  if (directory == nullptr) {
    return names;
  }
  while (const dirent* entry = readdir(directory.get())) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") {
      names.push_back(name);
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

std::vector<std::string> ListTree(const std::string& path) {
  std::vector<std::string> found;
  AddTree(path, "", &found);
  std::sort(found.begin(), found.end());
  return found;
}

bool WaitUntilExists(const std::string& path, int milliseconds) {
  return WaitFor([&] { return Exists(path); }, milliseconds);
}

bool WaitUntilGone(const std::string& path, int milliseconds) {
  return WaitFor([&] { return !Exists(path); }, milliseconds);
}

}  // namespace vela_test
