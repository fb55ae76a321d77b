#include "support/files.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <time.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <optional>
#include <ostream>
#include <sstream>
#include <thread>

namespace vela_test {

namespace {

namespace fs = std::filesystem;

void Fail(const std::string& what, const std::string& path) {
  ADD_FAILURE() << "cannot " << what << " " << path << ": " << std::strerror(errno);
}

void MakeParents(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash != std::string::npos && slash > 0) {
    MakeDirectories(path.substr(0, slash));
  }
}

/// `mode` as for fopen; "e" hides the descriptor from programs that are started meanwhile.
void Write(const std::string& path, const std::string& content, const char* mode) {
  std::FILE* const file = std::fopen(path.c_str(), mode);
  const bool isWritten =
      file != nullptr && std::fwrite(content.data(), 1, content.size(), file) == content.size();
  if ((file != nullptr && std::fclose(file) != 0) || !isWritten) {
    Fail("write", path);
  }
}

/// The file's status, links followed; empty when there is no such file.
std::optional<struct stat> StatusOf(const std::string& path) {
  struct stat status {};
  return stat(path.c_str(), &status) == 0 ? std::optional(status) : std::nullopt;
}

/// The same for a file that must exist.
struct stat ExistingStatus(const std::string& path) {
  const struct stat none {};
  const auto status = StatusOf(path);
  if (!status) {
    Fail("examine", path);
  }
  return status.value_or(none);
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
  Write(path, content, "we");
}

void WriteFileOfSize(const std::string& path, size_t bytes) {
  WriteFile(path, std::string(bytes, 'x'));
}

void AppendToFile(const std::string& path, const std::string& content) {
  Write(path, content, "ae");
}

std::string ReadFile(const std::string& path) {
  const std::ifstream file(path, std::ios::binary);
  std::ostringstream content;
  content << file.rdbuf();
  if (!file || content.bad()) {
    Fail("open", path);
  }
  return content.str();
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
  std::error_code error;
  fs::remove_all(path, error);
  EXPECT_FALSE(error) << "cannot remove " << path << ": " << error.message();
}

void CopyFile(const std::string& from, const std::string& to) {
  WriteFile(to, ReadFile(from));
}

bool Exists(const std::string& path) {
  struct stat status {};
  return lstat(path.c_str(), &status) == 0;
}

bool IsRegularFile(const std::string& path) {
  const auto status = StatusOf(path);
  return status && S_ISREG(status->st_mode);
}

bool IsDirectory(const std::string& path) {
  const auto status = StatusOf(path);
  return status && S_ISDIR(status->st_mode);
}

int64_t FileSize(const std::string& path) {
  const auto status = StatusOf(path);
  return status ? status->st_size : -1;
}

int ModeOf(const std::string& path) {
  const auto status = StatusOf(path);
  return status ? static_cast<int>(status->st_mode & 07777) : -1;
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
  const struct stat status = ExistingStatus(path);
  return {status.st_mtim.tv_sec, status.st_mtim.tv_nsec};
}

FileTime AccessTime(const std::string& path) {
  const struct stat status = ExistingStatus(path);
  return {status.st_atim.tv_sec, status.st_atim.tv_nsec};
}

std::vector<std::string> ListDirectory(const std::string& path) {
  std::vector<std::string> names;
  std::error_code error;
  for (const auto& entry : fs::directory_iterator(path, error)) {
    names.push_back(entry.path().filename().string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

std::vector<std::string> ListTree(const std::string& path) {
  std::vector<std::string> found;
  std::error_code error;
  for (const auto& entry : fs::recursive_directory_iterator(path, error)) {
    const bool isDirectory = entry.symlink_status().type() == fs::file_type::directory;
    found.push_back(entry.path().lexically_relative(path).string() + (isDirectory ? "/" : ""));
  }
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
