// Reading and writing the content of files.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace vela {

/// Reads up to `size` bytes from the present position; `got` is 0 at the end of the file. Returns 0
/// or an errno value.
int ReadChunk(int fd, char* chunk, size_t size, size_t& got);

/// Returns `size` bytes from `offset`, or as many as can be read. Does not change the position.
std::string ReadAt(int fd, int64_t offset, size_t size);

/// Moves the position to the beginning. Returns 0 or an errno value, ESPIPE for a pipe.
int Rewind(int fd);

/// Sets the size of the open file `fd` to `size` bytes. Returns 0 or an errno value.
int SetFileSize(int fd, int64_t size);

/// Appends everything from the present position of `fd` to its end to `content`. Returns 0 or an
/// errno value.
int ReadToEnd(int fd, std::string& content);

/// Reads the file `path` into `content`; never waits for a pipe's writer. Returns 0 or an errno
/// value.
int ReadFile(const char* path, std::string& content);

/// Returns the content of the regular file `path`; empty for a symbolic link, any other file that
/// is not regular, a file of more than `limit` bytes, and on errors. Never waits for a pipe's
/// writer.
std::string ReadSmallFile(const std::string& path, size_t limit);

/// Returns the content of the regular file `path` if only root can change it: root owns it and it
/// is not writable for its group or others. Empty otherwise, for a file of more than `limit` bytes,
/// and on errors. Never waits for a pipe's writer.
std::string ReadSystemFile(const std::string& path, size_t limit);

/// Returns whether the file `path` begins with these bytes; false when it cannot be read.
bool BeginsWith(const std::string& path, std::string_view bytes);

/// The content of a file as memory that cannot be written to. Where the file has become shorter
/// since, reading it ends the process.
class FileMapping {
 public:
  FileMapping() = default;
  FileMapping(const FileMapping&) = delete;
  FileMapping& operator=(const FileMapping&) = delete;
  ~FileMapping() { Unmap(); }

  /// Maps the first `size` bytes of the file instead of what is mapped. Returns null, with errno
  /// set, on failure, also for size 0.
  unsigned char* Map(int fd, size_t size);
  void Unmap();

 private:
  void* memory_ = nullptr;
  size_t size_ = 0;
};

/// Writes all of `content` to `fd`. Returns 0 or an errno value.
int WriteAll(int fd, std::string_view content);

/// Appends `text` to `fd`, which was opened with O_APPEND and for reading, in one write unless that
/// is cut short: completely or not at all, unless the remains of a failed write cannot be removed.
/// Returns 0 or an errno value.
int AppendWhole(int fd, std::string_view text);

/// Returns true when the file is not empty and its last line has no newline at its end, or when
/// that is unknown.
bool LacksFinalNewline(int fd);

/// Returns an error that was only noticed after the writing, as some file systems do when a file is
/// closed: 0 or an errno value.
int FlushFile(int fd);

/// Waits until the content of the open file or directory is on the disk. Returns 0, also when its
/// file system cannot do that for this kind of file, or an errno value.
int SyncOpenFile(int fd);

/// Does the same with what is needed to read the content again, but not the times of the file.
int SyncData(int fd);

}  // namespace vela
