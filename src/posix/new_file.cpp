#include "posix/new_file.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <tuple>
#include <utility>

#include "posix/file_content.h"

namespace vela {

namespace {

constexpr mode_t kNewFileMode = 0666;
constexpr size_t kBufferSize = 64 * 1024;

constexpr int kLinksMax = 40;

/// Short and independent of the final name, which may be as long as names can be.
std::string NextName() {
  static std::atomic<unsigned> count{0};
  return std::string(".") + program_invocation_short_name + '.' + std::to_string(getpid()) + '.' +
         std::to_string(count++);
}

/// Returns true for the errors of a link that is not followed or whose target does not exist.
bool LeadsNowhere(int error) {
  return error == EACCES || error == ENOENT || error == ENOTDIR || error == ELOOP ||
         error == ENAMETOOLONG;
}

/// Returns the part of the path before its last component, and that component.
std::pair<std::string, std::string> SplitPath(const std::string& path) {
  const size_t begin = path.rfind('/') + 1;  // 0 without a slash
  return {path.substr(0, begin), path.substr(begin)};
}

/// Follows a path component by component, through descriptors that nobody can redirect.
class PathWalk {
 public:
  /// `at` is the directory where relative paths begin, none for the working directory. `links`
  /// counts the links followed.
  PathWalk(FileDescriptor& at, int& links) : at_(at), links_(links) {}

  /// Moves `at` to what `path` names. Returns 0 or an errno value; `at` is then somewhere on the
  /// way.
  int Follow(const std::string& path);

 private:
  int Step(const std::string& component);
  int StepThroughLink(const FileDescriptor& link, const struct stat& status);

  FileDescriptor& at_;
  int& links_;
};

/// Reads the link that is open without being followed. Returns 0 or an errno value.
int ReadLink(int link, std::string& target) {
  target.resize(PATH_MAX);
  const ssize_t length = readlinkat(link, "", target.data(), target.size());
  if (length < 0) {
    return errno;
  }
  target.resize(static_cast<size_t>(length));
  return target.size() < PATH_MAX ? 0 : ENAMETOOLONG;
}

/// Opens a directory entry without using it, a link itself. Returns 0 or an errno value.
int OpenEntry(int directory, const std::string& name, FileDescriptor& entry, struct stat& status) {
  entry.Reset(openat(directory, name.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
  return entry.IsOpen() && fstat(entry.Get(), &status) == 0 ? 0 : errno;
}

int PathWalk::Follow(const std::string& path) {
  const bool isAbsolute = !path.empty() && path.front() == '/';
  if (isAbsolute || !at_.IsOpen()) {
    at_.Reset(open(isAbsolute ? "/" : ".", O_PATH | O_DIRECTORY | O_CLOEXEC));
  }
  if (!at_.IsOpen()) {
    return errno;
  }
  for (size_t begin = 0; begin < path.size();) {
    const size_t end = std::min(path.find('/', begin), path.size());
    const int error = end > begin ? Step(path.substr(begin, end - begin)) : 0;
    if (error != 0) {
      return error;
    }
    begin = end + 1;
  }
  return 0;
}

int PathWalk::Step(const std::string& component) {
  FileDescriptor entry;
  struct stat status = {};
  const int error = OpenEntry(at_.Get(), component, entry, status);
  if (error != 0) {
    return error;
  }
  if (S_ISLNK(status.st_mode)) {
    return StepThroughLink(entry, status);
  }
  at_ = std::move(entry);
  return 0;
}

int PathWalk::StepThroughLink(const FileDescriptor& link, const struct stat& status) {
  std::string path;
  int error = ++links_ > kLinksMax ? ELOOP : ReadLink(link.Get(), path);
  if (error == 0) {
    error = Follow(path);
  }
  struct stat target = {};
  if (error == 0 && fstat(at_.Get(), &target) != 0) {
    error = errno;
  }
  if (error != 0) {
    return error;
  }
  const uid_t owner = status.st_uid;
  return owner == 0 || owner == geteuid() || owner == target.st_uid ? 0 : EACCES;
}

FileDescriptor CopyOf(const FileDescriptor& descriptor) {
  return FileDescriptor(fcntl(descriptor.Get(), F_DUPFD_CLOEXEC, 0));
}

}  // namespace

FilePlace::FilePlace(const std::string& path) : error_(Find(path)) {}

int FilePlace::Find(const std::string& path) {
  if (path.empty()) {
    return ENOENT;
  }
  std::string parent;
  std::tie(parent, name_) = SplitPath(path);
  int error = PathWalk(directory_, links_).Follow(parent);
  if (error != 0 || name_.empty()) {
    return error != 0 ? error : EISDIR;
  }
  error = FollowLinksAtEnd();
  return error != 0 ? error : ErrorOfFile();
}

/// Moves to the directory and the name in `link`, which was found at this place. Returns 0 or an
/// errno value.
int FilePlace::MoveAlong(const FileDescriptor& link) {
  std::string path;
  int error = ReadLink(link.Get(), path);
  if (error != 0) {
    return error;
  }
  std::string parent;
  std::tie(parent, name_) = SplitPath(path);
  error = PathWalk(directory_, links_).Follow(parent);
  return error == 0 && name_.empty() ? EISDIR : error;
}

int FilePlace::FollowLinksAtEnd() {
  for (;;) {
    FileDescriptor entry;
    struct stat status = {};
    int error = OpenEntry(directory_.Get(), name_, entry, status);
    if (error == ENOENT) {
      return 0;
    }
    if (error != 0 || !S_ISLNK(status.st_mode)) {
      return error;
    }
    FileDescriptor target = CopyOf(directory_);
    error = PathWalk(target, links_).Follow(name_);
    if (LeadsNowhere(error)) {
      return 0;
    }
    if (error == 0) {
      error = MoveAlong(entry);
    }
    if (error != 0) {
      return error;
    }
  }
}

int FilePlace::ErrorOfFile() const {
  struct stat named = {};
  if (fstatat(directory_.Get(), name_.c_str(), &named, AT_SYMLINK_NOFOLLOW) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  if (S_ISDIR(named.st_mode)) {
    return EISDIR;
  }
  // A link of the kernel leads somewhere although its text names no file, such as that of a pipe.
  const bool isFreeLink =
      S_ISLNK(named.st_mode) && fstatat(directory_.Get(), name_.c_str(), &named, 0) != 0;
  return isFreeLink || S_ISREG(named.st_mode) ? 0 : EEXIST;
}

NewFile::NewFile(const FilePlace& place, Kind kind) : place_(place) {
  buffer_.reserve(kBufferSize);
  Open(kind);
}

NewFile::~NewFile() {
  if (!name_.empty()) {
    unlinkat(place_.directory_.Get(), name_.c_str(), 0);
  }
}

void NewFile::Open(Kind kind) {
  if (kind == Kind::kResult) {
    OpenNamed();
    return;
  }
  const int directory = place_.directory_.Get();
  file_.Reset(openat(directory, ".", O_TMPFILE | O_RDWR | O_CLOEXEC, 0600));
  // Not every file system supports files without a name.
  if (!file_.IsOpen() && OpenNamed() && unlinkat(directory, name_.c_str(), 0) == 0) {
    name_.clear();
  }
}

/// A name may exist already, left behind by a killed process with the same id.
bool NewFile::OpenNamed() {
  constexpr int kTries = 100;
  constexpr int kFlags = O_CREAT | O_EXCL | O_NOFOLLOW | O_RDWR | O_CLOEXEC;
  for (int i = 0; i < kTries && !file_.IsOpen() && (i == 0 || errno == EEXIST); ++i) {
    name_ = NextName();
    file_.Reset(openat(place_.directory_.Get(), name_.c_str(), kFlags, kNewFileMode));
  }
  Remember(file_.IsOpen());
  if (!file_.IsOpen()) {
    name_.clear();
  }
  return file_.IsOpen();
}

void NewFile::Remember(bool isSuccess) {
  if (!isSuccess && error_ == 0) {
    error_ = errno;
  }
}

void NewFile::Append(std::string_view text) {
  if (buffer_.size() + text.size() > kBufferSize) {
    Flush();
  }
  if (text.size() > kBufferSize) {
    Write(text);
    return;
  }
  buffer_ += text;
}

void NewFile::Flush() {
  Write(buffer_);
  buffer_.clear();
}

void NewFile::Write(std::string_view text) {
  if (error_ == 0) {
    error_ = WriteAll(file_.Get(), text);
  }
}

void NewFile::AppendAllOf(NewFile& source) {
  source.Flush();
  if (source.error_ != 0) {
    error_ = error_ == 0 ? source.error_ : error_;
    return;
  }
  std::string piece(kBufferSize, '\0');
  off_t position = 0;
  ssize_t count = 1;
  while (count != 0 && error_ == 0) {
    count = pread(source.file_.Get(), piece.data(), piece.size(), position);
    if (count > 0) {
      Append(std::string_view(piece.data(), static_cast<size_t>(count)));
      position += count;
    }
    Remember(count >= 0 || errno == EINTR);
  }
}

void NewFile::Clear() {
  buffer_.clear();
  if (error_ == 0) {
    Remember(ftruncate(file_.Get(), 0) == 0 && lseek(file_.Get(), 0, SEEK_SET) == 0);
  }
}

/// A user may be allowed to create files in the directory, but not to read it; and a file system
/// may have nothing to wait for.
bool NewFile::SyncDirectory() const {
  const FileDescriptor directory(
      openat(place_.directory_.Get(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return directory.IsOpen() ? fsync(directory.Get()) == 0 || errno == EINVAL : errno == EACCES;
}

int NewFile::MoveToPlace() {
  Flush();
  if (error_ != 0) {
    return error_;
  }
  const int directory = place_.directory_.Get();
  Remember(fsync(file_.Get()) == 0 &&
           renameat(directory, name_.c_str(), directory, place_.name_.c_str()) == 0);
  if (error_ == 0) {
    name_.clear();
    Remember(SyncDirectory());
  }
  return error_;
}

}  // namespace vela
