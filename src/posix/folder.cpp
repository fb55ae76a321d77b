#include "posix/folder.h"

#include <fcntl.h>
#include <limits.h>
#include <linux/openat2.h>
#include <poll.h>
#include <sys/random.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>
#include <utility>
#include <vector>

#include "posix/file_version.h"
#include "posix/identity.h"

namespace vela {

namespace {

constexpr int kPathOnly = O_PATH | O_CLOEXEC;
/// An open must not wait for a pipe's other end or for the holder of a lease, and must not take
/// over a terminal.
constexpr int kNeverWait = O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
/// As many links as the kernel follows.
constexpr int kMaxLinks = 40;

/// A file system may give files another owner than the user that created them, such as network and
/// memory card file systems.
struct Creator {
  uid_t user = static_cast<uid_t>(-1);   ///< created a file
  uid_t owner = static_cast<uid_t>(-1);  ///< of that file
  dev_t device = 0;
  int64_t seconds = 0;  ///< when it was created
};
thread_local Creator t_creator;

FileDescriptor Failed(int error) {
  errno = error;
  return {};
}

int Examine(int fd, struct stat& status) {
  return fstat(fd, &status) == 0 ? 0 : errno;
}

/// Reads the target of the open link `fd`. Returns 0 or an errno value.
int ReadLink(int fd, std::string& target) {
  char text[PATH_MAX];
  const ssize_t length = readlinkat(fd, "", text, sizeof text);
  if (length < 0) {
    return errno;
  }
  target.assign(text, static_cast<size_t>(length));
  return length == sizeof text ? ENAMETOOLONG : 0;
}

/// Opens the file that `found` has located.
FileDescriptor OpenFound(const FileDescriptor& found, int flags) {
  const std::string name = "/proc/self/fd/" + std::to_string(found.Get());
  return FileDescriptor(open(name.c_str(), flags | kNeverWait));
}

/// Opens paths component by component, for those with links in them.
class LinkFollower {
 public:
  /// Opens `path` from the directory `at` (AT_FDCWD: the working directory).
  FileDescriptor Open(int at, const std::string& path, int flags);

 private:
  FileDescriptor OpenComponent(int at, const std::string& name, int flags);
  FileDescriptor Follow(int at, const FileDescriptor& link, const struct stat& status, int flags);

  int links_ = 0;
};

/// Opens what the link, which lies in the directory `at`, leads to.
FileDescriptor LinkFollower::Follow(int at, const FileDescriptor& link, const struct stat& status,
                                    int flags) {
  if (++links_ > kMaxLinks) {
    return Failed(ELOOP);
  }
  std::string target;
  if (const int error = ReadLink(link.Get(), target); error != 0) {
    return Failed(error);
  }
  // Opening some files has effects of its own, so the target is found first.
  FileDescriptor file = Open(at, target, kPathOnly | (flags & O_DIRECTORY));
  struct stat found = {};
  if (!file.IsOpen()) {
    return file;
  }
  if (const int error = Examine(file.Get(), found); error != 0) {
    return Failed(error);
  }
  const bool isTrusted =
      status.st_uid == 0 || status.st_uid == FileUser() || status.st_uid == found.st_uid;
  if (!isTrusted) {
    return Failed(ELOOP);
  }
  return (flags & O_PATH) != 0 ? std::move(file) : OpenFound(file, flags);
}

FileDescriptor LinkFollower::OpenComponent(int at, const std::string& name, int flags) {
  FileDescriptor entry(openat(at, name.c_str(), kPathOnly | O_NOFOLLOW));
  struct stat status = {};
  if (!entry.IsOpen()) {
    return entry;
  }
  if (const int error = Examine(entry.Get(), status); error != 0) {
    return Failed(error);
  }
  if (S_ISLNK(status.st_mode)) {
    return (flags & O_NOFOLLOW) != 0 ? Failed(ELOOP) : Follow(at, entry, status, flags);
  }
  if ((flags & (O_PATH | O_DIRECTORY)) == O_PATH) {
    return entry;
  }
  return FileDescriptor(openat(at, name.c_str(), flags | O_NOFOLLOW | kNeverWait));
}

FileDescriptor LinkFollower::Open(int at, const std::string& path, int flags) {
  if (path.empty()) {
    return Failed(ENOENT);
  }
  size_t begin = path.find_first_not_of('/');
  if (begin == std::string::npos) {
    return FileDescriptor(open("/", flags | kNeverWait));
  }
  FileDescriptor folder;
  if (path.front() == '/') {
    folder.Reset(open("/", kPathOnly | O_DIRECTORY));
    if (!folder.IsOpen()) {
      return folder;
    }
    at = folder.Get();
  }
  for (;;) {
    const size_t end = path.find('/', begin);
    const size_t next = end == std::string::npos ? end : path.find_first_not_of('/', end);
    const std::string name = path.substr(begin, end - begin);
    if (next == std::string::npos) {
      return OpenComponent(at, name, end == std::string::npos ? flags : flags | O_DIRECTORY);
    }
    FileDescriptor below = OpenComponent(at, name, kPathOnly | O_DIRECTORY);
    if (!below.IsOpen()) {
      return below;
    }
    folder = std::move(below);
    at = folder.Get();
    begin = next;
  }
}

/// Opens a path that contains no link. Returns -1 with errno set on failure, ELOOP when there is
/// one.
int OpenWithoutLinks(int at, const char* path, int flags) {
  open_how how = {};
  how.flags = static_cast<unsigned>(flags | ((flags & O_PATH) != 0 ? O_CLOEXEC : kNeverWait));
  how.resolve = RESOLVE_NO_SYMLINKS;
  return static_cast<int>(syscall(SYS_openat2, at, path, &how, sizeof how));
}

}  // namespace

bool CanRefuseLinks() {
  return FileDescriptor(OpenWithoutLinks(AT_FDCWD, "/", O_PATH)).IsOpen();
}

FileDescriptor OpenTrusted(int at, const char* path, int flags) {
  const int fd = OpenWithoutLinks(at, path, flags);
  // Older kernels and some containers do not have the call.
  if (fd >= 0 || (errno != ELOOP && errno != ENOSYS && errno != EPERM)) {
    return FileDescriptor(fd);
  }
  return LinkFollower().Open(at, path, flags);
}

namespace {

struct Held {
  std::string path;
  FileDescriptor folder;
};

/// The folders that are held, the latest last: at most a directory, its metadata directory and the
/// folder of one photo.
std::vector<Held>& HeldFolders() {
  thread_local std::vector<Held> folders;
  return folders;
}

/// Returns the descriptor of a held folder, -1 when the path is not held.
int FindHeld(std::string_view path) {
  const std::vector<Held>& folders = HeldFolders();
  for (auto held = folders.rbegin(); held != folders.rend(); ++held) {
    if (held->path == path) {
      return held->folder.Get();
    }
  }
  return -1;
}

/// A path as the directory and the name in it.
struct SplitPath {
  std::string_view folder;
  std::string_view name;
};

SplitPath Split(std::string_view path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string_view::npos) {
    return {".", path};
  }
  if (slash + 1 == path.size()) {
    return {path, "."};
  }
  return {path.substr(0, slash == 0 ? 1 : slash), path.substr(slash + 1)};
}

/// Replaces the last characters of `name` by random ones. Returns false when there are none to be
/// had.
bool Randomize(std::string& name, size_t count) {
  constexpr char kCharacters[] = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789";
  constexpr size_t kChoices = sizeof kCharacters - 1;
  unsigned char random[16];
  if (count > sizeof random || getrandom(random, count, 0) != static_cast<ssize_t>(count)) {
    return false;
  }
  for (size_t i = 0; i < count; ++i) {
    name[name.size() - count + i] = kCharacters[random[i] % kChoices];
  }
  return true;
}

/// Opens for reading the regular file that `located` refers to. Returns 0 or an errno value.
int Reopen(const FileDescriptor& located, FileDescriptor& out) {
  constexpr int kTries = 200;
  constexpr int kPauseMilliseconds = 5;
  const std::string path = "/proc/self/fd/" + std::to_string(located.Get());
  for (int i = 0; i < kTries; ++i) {
    out = OpenForReading(path);
    // The first attempt asks the holder of a lease, such as a file server, to give it up.
    if (out.IsOpen() || errno != EAGAIN) {
      break;
    }
    poll(nullptr, 0, kPauseMilliseconds);
  }
  return out.IsOpen() ? 0 : errno;
}

/// Creates the file exclusively and remembers who owns it.
FileDescriptor CreateIn(int folder, const char* name, unsigned mode) {
  const int flags = O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | kNeverWait;
  FileDescriptor file(openat(folder, name, flags, mode));
  struct stat status = {};
  if (file.IsOpen() && Examine(file.Get(), status) == 0) {
    t_creator = {FileUser(), status.st_uid, status.st_dev, status.st_ctim.tv_sec};
  }
  return file;
}

}  // namespace

HeldFolder::HeldFolder(const std::string& path) {
  if (IsFolderHeld(path)) {
    return;
  }
  FileDescriptor folder = FolderEntry(path).Open(kPathOnly | O_DIRECTORY);
  if (!folder.IsOpen()) {
    error_ = errno;
    return;
  }
  HeldFolders().push_back({path, std::move(folder)});
  isOwner_ = true;
}

HeldFolder::~HeldFolder() {
  if (isOwner_) {
    HeldFolders().pop_back();
  }
}

bool IsFolderHeld(const std::string& path) {
  return FindHeld(path) >= 0;
}

bool IsInHeldFolder(const std::string& path) {
  return FindHeld(Split(path).folder) >= 0 || IsFolderHeld(path);
}

bool IsInPlace(const std::string& path) {
  const int held = FindHeld(path);
  struct stat open = {};
  struct stat named = {};
  return held < 0 ||
         (Examine(held, open) == 0 && stat(path.c_str(), &named) == 0 && IsSameFile(open, named));
}

bool IsOwnFileIn(int folder, const struct stat& status) {
  if (IsOwnFile(status) || !S_ISREG(status.st_mode) || status.st_nlink != 1) {
    return IsOwnFile(status);
  }
  std::string name = "VELAPHOTO.tmp.XXXXXX";
  const FileDescriptor probe =
      Randomize(name, 6) ? CreateIn(folder, name.c_str(), 0600) : FileDescriptor();
  if (probe.IsOpen()) {
    unlinkat(folder, name.c_str(), 0);
  }
  return IsOwnFile(status);
}

bool IsOwnFile(const struct stat& status) {
  const uid_t user = FileUser();
  const bool isCreator = user == t_creator.user && status.st_uid == t_creator.owner;
  const bool isOwner = status.st_uid == user || isCreator;
  return S_ISREG(status.st_mode) && status.st_nlink == 1 && isOwner;
}

FolderEntry::FolderEntry(const std::string& path) {
  if (path.size() >= PATH_MAX) {
    // A path that works here has to work in a tool, too.
    error_ = ENAMETOOLONG;
    return;
  }
  folder_ = FindHeld(path);
  if (folder_ >= 0) {
    name_ = ".";
    return;
  }
  const SplitPath split = Split(path);
  name_ = split.name;
  folder_ = FindHeld(split.folder);
  if (folder_ >= 0) {
    return;
  }
  const std::string folder(split.folder);
  opened_ = OpenTrusted(AT_FDCWD, folder.c_str(), kPathOnly | O_DIRECTORY);
  folder_ = opened_.Get();
  error_ = opened_.IsOpen() ? 0 : errno;
}

int FolderEntry::ExamineLink(struct stat& status) const {
  if (error_ != 0) {
    return error_;
  }
  return fstatat(folder_, Name(), &status, AT_SYMLINK_NOFOLLOW) == 0 ? 0 : errno;
}

int FolderEntry::Examine(struct stat& status) const {
  if (const int error = ExamineLink(status); error != 0 || !S_ISLNK(status.st_mode)) {
    return error;
  }
  const FileDescriptor target = Open(kPathOnly);
  return target.IsOpen() ? vela::Examine(target.Get(), status) : errno;
}

FileDescriptor FolderEntry::Open(int flags) const {
  return error_ != 0 ? Failed(error_) : OpenTrusted(folder_, Name(), flags);
}

namespace {

/// Returns false for a file that is older than the last one that was created in its file system:
/// another user may have moved an existing file of this user here.
bool IsNew(int fd, const struct stat& status) {
  struct statx birth = {};
  if (status.st_dev != t_creator.device || statx(fd, "", AT_EMPTY_PATH, STATX_BTIME, &birth) != 0 ||
      (birth.stx_mask & STATX_BTIME) == 0) {
    return true;
  }
  // Some file systems store times in steps of two seconds.
  constexpr int64_t kSlack = 2;
  return birth.stx_btime.tv_sec + kSlack >= t_creator.seconds;
}

}  // namespace

FileDescriptor FolderEntry::OpenOwn() const {
  FileDescriptor file = Open(O_RDONLY | O_NOFOLLOW);
  struct stat status = {};
  if (!file.IsOpen()) {
    return file;
  }
  if (const int error = vela::Examine(file.Get(), status); error != 0) {
    return Failed(error);
  }
  return IsOwnFile(status) && IsNew(file.Get(), status) ? std::move(file) : Failed(EPERM);
}

FileDescriptor FolderEntry::Create(unsigned mode) const {
  if (error_ != 0) {
    return Failed(error_);
  }
  return CreateIn(folder_, Name(), mode);
}

FileDescriptor FolderEntry::CreateAnew(unsigned mode) const {
  const int error = Remove();
  return error == 0 || error == ENOENT ? Create(mode) : Failed(error);
}

int FolderEntry::CreateDirectory(unsigned mode) const {
  if (error_ != 0) {
    return error_;
  }
  return mkdirat(folder_, Name(), mode) == 0 ? 0 : errno;
}

int FolderEntry::Remove() const {
  if (error_ != 0) {
    return error_;
  }
  return unlinkat(folder_, Name(), 0) == 0 ? 0 : errno;
}

int FolderEntry::RenameTo(const FolderEntry& to) const {
  if (error_ != 0 || to.error_ != 0) {
    return error_ != 0 ? error_ : to.error_;
  }
  return renameat(folder_, Name(), to.folder_, to.Name()) == 0 ? 0 : errno;
}

bool FolderEntry::IsFile(int fd) const {
  struct stat open = {};
  struct stat named = {};
  return vela::Examine(fd, open) == 0 && ExamineLink(named) == 0 && IsSameFile(open, named);
}

int ReadStatus(const std::string& path, struct stat& status) {
  if (IsInHeldFolder(path)) {
    return FolderEntry(path).Examine(status);
  }
  return stat(path.c_str(), &status) == 0 ? 0 : errno;
}

FileDescriptor OpenEntry(const std::string& path) {
  return FolderEntry(path).Open(O_RDONLY);
}

int OpenRegularFile(const std::string& path, OpenedFile& out) {
  // Unlike an ordinary open, this has no effect on a device or pipe.
  const FileDescriptor located = FolderEntry(path).Open(kPathOnly);
  struct stat status = {};
  if (!located.IsOpen() || fstat(located.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
  }
  out.owner = status.st_uid;
  return Reopen(located, out.file);
}

DIR* OpenDirectoryStream(const std::string& path) {
  FileDescriptor directory = FolderEntry(path).Open(O_RDONLY | O_DIRECTORY);
  DIR* const stream = directory.IsOpen() ? fdopendir(directory.Get()) : nullptr;
  if (stream != nullptr) {
    directory.Release();
  }
  return stream;
}

int RemoveEntry(const std::string& path) {
  return FolderEntry(path).Remove();
}

std::string FindUnusedPath(const std::string& nameTemplate) {
  constexpr int kTries = 100;
  const size_t count = nameTemplate.size() - (nameTemplate.find_last_not_of('X') + 1);
  std::string path = nameTemplate;
  errno = EEXIST;
  for (int i = 0; i < kTries && errno == EEXIST && Randomize(path, count); ++i) {
    const FolderEntry entry(path);
    const FileDescriptor file = entry.Create(0600);
    if (!file.IsOpen()) {
      continue;
    }
    entry.Remove();
    return path;
  }
  return {};
}

ScratchDirectory::ScratchDirectory() {
  if (mkdtemp(path_.data()) == nullptr) {
    path_.clear();
  }
}

ScratchDirectory::~ScratchDirectory() {
  DIR* const stream = path_.empty() ? nullptr : opendir(path_.c_str());
  if (stream == nullptr) {
    return;
  }
  while (const dirent* const entry = readdir(stream)) {
    unlinkat(dirfd(stream), entry->d_name, 0);
  }
  closedir(stream);
  rmdir(path_.c_str());
}

}  // namespace vela
