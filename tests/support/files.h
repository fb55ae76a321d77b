// Files for tests: write, read, date, list. A failure of one of these fails the current test.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <iosfwd>
#include <string>
#include <vector>

namespace vela_test {

/// Writes `content` as the whole file; missing directories are created (mode 0777).
void WriteFile(const std::string& path, const std::string& content);

/// Writes a file of `bytes` bytes of 'x', creating directories like WriteFile.
void WriteFileOfSize(const std::string& path, size_t bytes);

/// Appends to the file, which is made when missing.
void AppendToFile(const std::string& path, const std::string& content);

/// The whole content; fails the test and returns "" when the file cannot be read.
std::string ReadFile(const std::string& path);

/// The lines of a text file without their newlines.
std::vector<std::string> ReadLines(const std::string& path);

/// Makes the directory and those above it, mode 0777 regardless of the umask.
void MakeDirectories(const std::string& path);

/// Removes a file or a whole tree; missing ones are ignored.
void RemoveTree(const std::string& path);

/// Copies the content of one file to another (new or overwritten).
void CopyFile(const std::string& from, const std::string& to);

/// Whether a file of any kind, even a dangling link, has this name.
bool Exists(const std::string& path);

/// Whether it is a regular file, links followed.
bool IsRegularFile(const std::string& path);

/// Whether it is a directory, links followed.
bool IsDirectory(const std::string& path);

/// Size in bytes, -1 when there is no such file.
int64_t FileSize(const std::string& path);

/// Permission bits (07777), -1 when there is no such file.
int ModeOf(const std::string& path);

/// A time of a file.
struct FileTime {
  int64_t seconds = 0;  ///< since the epoch
  int64_t nanoseconds = 0;
};
inline bool operator==(const FileTime& a, const FileTime& b) {
  return a.seconds == b.seconds && a.nanoseconds == b.nanoseconds;
}
inline bool operator!=(const FileTime& a, const FileTime& b) {
  return !(a == b);
}
/// For messages of failed comparisons.
void PrintTo(const FileTime& time, std::ostream* out);

/// Sets both access and modification time, links followed.
void SetFileTime(const std::string& path, int64_t seconds, int64_t nanoseconds = 0);

/// Sets access and modification time to now plus `seconds`.
void SetFileTimeFromNow(const std::string& path, int64_t secondsFromNow);

FileTime ModificationTime(const std::string& path);
FileTime AccessTime(const std::string& path);

/// The entry names of a directory except "." and "..", sorted by bytes; empty when it cannot be
/// read.
std::vector<std::string> ListDirectory(const std::string& path);

/// Everything below a directory as paths relative to it, sorted by bytes, directories with a
/// trailing "/"; links are not followed.
std::vector<std::string> ListTree(const std::string& path);

/// Waits until the path exists, at most `milliseconds`; returns whether it does.
bool WaitUntilExists(const std::string& path, int milliseconds = 10000);

/// Waits until the path no longer exists, at most `milliseconds`; returns whether that is so.
bool WaitUntilGone(const std::string& path, int milliseconds = 10000);

}  // namespace vela_test
