#include "posix/tree_walk.h"

#include <dirent.h>
#include <fcntl.h>
#include <limits.h>
#include <sys/resource.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "posix/file_descriptor.h"
#include "posix/files.h"
#include "posix/folder.h"

namespace vela {

namespace {

/// Directories that are kept open at most, besides those with a followed link.
constexpr size_t kMaxOpen = 50;
/// Followed links above a directory. The kernel refuses a path with more of them.
constexpr int kMaxLinks = 40;
constexpr size_t kListSize = 64 * 1024;

/// O_DIRECTORY: nothing else is opened, above all no pipe, whose other end would be waited for.
constexpr int kOpenFlags = O_RDONLY | O_DIRECTORY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;

/// Repeats a system call that a signal has interrupted.
template <typename Call>
auto Repeat(Call call) {
  auto result = call();
  while (result < 0 && errno == EINTR) {
    result = call();
  }
  return result;
}

/// Returns how many directories to keep open: a quarter of the descriptors that this process may
/// have, because the steps need some too.
size_t OpenLimit() {
  struct rlimit limit = {};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) {
    return kMaxOpen;
  }
  return std::clamp<size_t>(limit.rlim_cur / 4, 2, kMaxOpen);
}

FileDescriptor OpenAt(int folder, const char* name, int flags) {
  return FileDescriptor(Repeat([&] { return openat(folder, name, flags); }));
}

/// What a name belongs to.
struct Entry {
  unsigned mode = 0;
  FileIdentity identity;
};

/// Examines a name with the call that all kernels have. Returns 0 or an errno value.
int ExamineSimply(int folder, const char* name, int flags, Entry& entry) {
  struct stat status = {};
  if (Repeat([&] { return fstatat(folder, name, &status, flags | AT_NO_AUTOMOUNT); }) != 0) {
    return errno;
  }
  entry.mode = status.st_mode;
  entry.identity = {status.st_dev, status.st_ino};
  return 0;
}

/// Examines a name without asking the file system again for what is known about it: one that is
/// mounted there and does not answer must not stop a walk that does not enter it. Returns 0 or an
/// errno value.
int Examine(int folder, const char* name, int flags, Entry& entry) {
  struct statx status = {};
  const int allFlags = flags | AT_NO_AUTOMOUNT | AT_STATX_DONT_SYNC;
  const unsigned mask = STATX_TYPE | STATX_INO;
  if (Repeat([&] { return statx(folder, name, allFlags, mask, &status); }) != 0) {
    // Older kernels and some containers do not have the call.
    const bool isRefused = errno == ENOSYS || errno == EPERM || errno == EINVAL;
    return isRefused ? ExamineSimply(folder, name, flags, entry) : errno;
  }
  entry.mode = status.stx_mode;
  entry.identity = {makedev(status.stx_dev_major, status.stx_dev_minor), status.stx_ino};
  return 0;
}

FileIdentity IdentityOf(const struct stat& status) {
  return {status.st_dev, status.st_ino};
}

bool IsDirectory(const FileDescriptor& directory, const FileIdentity& identity) {
  struct stat status = {};
  return directory.IsOpen() && fstat(directory.Get(), &status) == 0 &&
         IdentityOf(status) == identity;
}

/// Returns true for errors that only say that a link has no target.
bool LeadsNowhere(int error) {
  switch (error) {
    case EACCES:
    case ELOOP:
    case ENAMETOOLONG:
    case ENOENT:
    case ENOTDIR:
      return true;
    default:
      return false;
  }
}

/// A directory that the walk has entered.
struct Level {
  FileDescriptor directory;  ///< closed in a deep tree while the walk is further down
  FileIdentity identity;
  size_t pathSize = 0;
  bool isLinked = false;  ///< entered by a symbolic link
  std::string entries;    ///< of each entry to visit its type, its name and a null
  size_t next = 0;        ///< place of the next one
};

class TreeWalk {
 public:
  explicit TreeWalk(const TreeStep& step) : step_(step) {}

  int Run(const char* root);

 private:
  int VisitRoot();
  int VisitNext();
  int VisitEntry(unsigned char type, const char* name);
  int VisitLink(const char* name);
  int VisitDirectory(const char* name, const FileIdentity& found, bool isLinked);
  int Enter(FileDescriptor directory, const struct stat& status, bool isLinked);
  int Report(int typeFlag, const struct stat* status = nullptr);
  int ReportFailure(int typeFlag, int error);
  int ReportUnopened(int error, const FileIdentity& found);

  FileDescriptor Open(int folder, const char* name, bool isLinked);
  void ReadEntries(Level& level);
  void AddEntries(Level& level, size_t size) const;
  bool CloseOne();
  void Leave();
  void ReopenByName();
  void DropFrom(size_t index);
  std::string NameOf(size_t index) const;

  const TreeStep& step_;
  std::string path_;
  size_t base_ = 0;  ///< place of the last component in the path
  dev_t device_ = 0;
  std::set<FileIdentity> seen_;
  std::vector<Level> levels_;
  /// Levels from here to the deepest are open; further up only the first and those with a followed
  /// link.
  size_t firstOpen_ = 0;
  int links_ = 0;  ///< followed to the deepest level
  int error_ = 0;  ///< the first failure
  const size_t maxOpen_ = OpenLimit();
  std::vector<char> list_ = std::vector<char>(kListSize);
};

int TreeWalk::Report(int typeFlag, const struct stat* status) {
  const struct stat none = {};
  struct FTW place = {};
  place.base = static_cast<int>(base_);
  place.level = static_cast<int>(levels_.size());
  return step_(path_.c_str(), status == nullptr ? &none : status, typeFlag, &place);
}

int TreeWalk::ReportFailure(int typeFlag, int error) {
  error_ = error_ == 0 ? error : error_;
  return Report(typeFlag);
}

/// Reports a directory that could not be opened.
int TreeWalk::ReportUnopened(int error, const FileIdentity& found) {
  switch (error) {
    case ELOOP:
      return Report(FTW_SL);
    case ENOENT:
    case ENOTDIR:
      return Report(FTW_NS);
    case EACCES:
      seen_.insert(found);
      return Report(FTW_DNR);
    default:
      seen_.insert(found);
      return ReportFailure(FTW_DNR, error);
  }
}

/// Opens a directory, for which others are closed when there are too many.
FileDescriptor TreeWalk::Open(int folder, const char* name, bool isLinked) {
  for (;;) {
    FileDescriptor directory = isLinked ? OpenTrusted(folder, name, kOpenFlags)
                                        : OpenAt(folder, name, kOpenFlags | O_NOFOLLOW);
    const bool isShort = !directory.IsOpen() && (errno == EMFILE || errno == ENFILE);
    if (!isShort || !CloseOne()) {
      return directory;
    }
  }
}

/// Closes the uppermost directory that can be opened again. Returns false when there is none.
bool TreeWalk::CloseOne() {
  while (firstOpen_ + 1 < levels_.size()) {
    Level& level = levels_[firstOpen_];
    const bool isKept = firstOpen_ == 0 || levels_[firstOpen_ + 1].isLinked;
    ++firstOpen_;
    if (!isKept) {
      level.directory.Reset();
      return true;
    }
  }
  return false;
}

void TreeWalk::AddEntries(Level& level, size_t size) const {
  for (size_t offset = 0; offset < size;) {
    const auto* entry = reinterpret_cast<const dirent64*>(list_.data() + offset);
    const std::string_view name = entry->d_name;
    const unsigned char type = entry->d_type;
    const bool isOther = type != DT_DIR && type != DT_LNK && type != DT_UNKNOWN;
    if (!isOther && name != "." && name != "..") {
      level.entries += static_cast<char>(type);
      level.entries.append(name);
      level.entries += '\0';
    }
    offset += entry->d_reclen;
  }
}

void TreeWalk::ReadEntries(Level& level) {
  for (;;) {
    const ssize_t size =
        Repeat([&] { return getdents64(level.directory.Get(), list_.data(), list_.size()); });
    if (size <= 0) {
      const bool isFailure = size < 0 && errno != ENOENT;
      error_ = isFailure && error_ == 0 ? errno : error_;
      return;
    }
    AddEntries(level, static_cast<size_t>(size));
  }
}

int TreeWalk::Enter(FileDescriptor directory, const struct stat& status, bool isLinked) {
  const int action = Report(FTW_D, &status);
  if (action != FTW_CONTINUE) {
    return action;
  }
  Level level;
  level.directory = std::move(directory);
  level.identity = IdentityOf(status);
  level.pathSize = path_.size();
  level.isLinked = isLinked;
  ReadEntries(level);
  links_ += isLinked ? 1 : 0;
  levels_.push_back(std::move(level));
  if (levels_.size() - firstOpen_ > maxOpen_) {
    CloseOne();
  }
  return action;
}

int TreeWalk::VisitDirectory(const char* name, const FileIdentity& found, bool isLinked) {
  if (found.device != device_ || seen_.count(found) != 0) {
    return FTW_CONTINUE;
  }
  if (isLinked && links_ == kMaxLinks) {
    return Report(FTW_SL);
  }
  FileDescriptor directory = Open(levels_.back().directory.Get(), name, isLinked);
  struct stat status = {};
  if (!directory.IsOpen() || fstat(directory.Get(), &status) != 0) {
    return ReportUnopened(errno, found);
  }
  // Not necessarily the directory that was found: the name may have changed hands.
  if (status.st_dev != device_ || !seen_.insert(IdentityOf(status)).second) {
    return FTW_CONTINUE;
  }
  return Enter(std::move(directory), status, isLinked);
}

int TreeWalk::VisitLink(const char* name) {
  Entry target;
  const int error = Examine(levels_.back().directory.Get(), name, 0, target);
  if (error != 0) {
    return LeadsNowhere(error) ? Report(FTW_SLN) : ReportFailure(FTW_NS, error);
  }
  return S_ISDIR(target.mode) ? VisitDirectory(name, target.identity, true) : FTW_CONTINUE;
}

int TreeWalk::VisitEntry(unsigned char type, const char* name) {
  if (type == DT_LNK) {
    return VisitLink(name);
  }
  Entry entry;
  const int error = Examine(levels_.back().directory.Get(), name, AT_SYMLINK_NOFOLLOW, entry);
  if (error == EACCES || error == ENOENT) {
    return Report(FTW_NS);
  }
  if (error != 0) {
    return ReportFailure(FTW_NS, error);
  }
  if (S_ISLNK(entry.mode)) {
    return VisitLink(name);
  }
  return S_ISDIR(entry.mode) ? VisitDirectory(name, entry.identity, false) : FTW_CONTINUE;
}

int TreeWalk::VisitNext() {
  Level& level = levels_.back();
  const auto type = static_cast<unsigned char>(level.entries[level.next]);
  // A copy, because the level may move while its entry is visited.
  const std::string name = level.entries.c_str() + level.next + 1;
  level.next += 1 + name.size() + 1;
  path_.resize(level.pathSize);
  if (path_.back() != '/') {
    path_ += '/';
  }
  base_ = path_.size();
  path_ += name;
  return VisitEntry(type, name.c_str());
}

std::string TreeWalk::NameOf(size_t index) const {
  const size_t above = levels_[index - 1].pathSize;
  const size_t begin = path_[above] == '/' ? above + 1 : above;
  return path_.substr(begin, levels_[index].pathSize - begin);
}

void TreeWalk::DropFrom(size_t index) {
  for (size_t i = index; i < levels_.size(); ++i) {
    links_ -= levels_[i].isLinked ? 1 : 0;
  }
  levels_.resize(index);
}

/// Opens the deepest level again by the names on the way to it. What has been moved away cannot be
/// found any more: the walk continues above it.
void TreeWalk::ReopenByName() {
  size_t open = levels_.size() - 1;
  while (!levels_[open].directory.IsOpen()) {
    --open;
  }
  for (size_t i = open + 1; i < levels_.size(); ++i) {
    const int above = levels_[i - 1].directory.Get();
    levels_[i].directory = Open(above, NameOf(i).c_str(), levels_[i].isLinked);
    if (!IsDirectory(levels_[i].directory, levels_[i].identity)) {
      error_ = error_ == 0 ? ESTALE : error_;
      DropFrom(i);
      break;
    }
    if (i - open > maxOpen_) {
      levels_[i - maxOpen_].directory.Reset();
    }
  }
  firstOpen_ = levels_.size() - std::min(levels_.size() - open, maxOpen_);
}

/// Leaves the deepest level and opens the one above it again if it has been closed.
void TreeWalk::Leave() {
  const Level left = std::move(levels_.back());
  levels_.pop_back();
  links_ -= left.isLinked ? 1 : 0;
  if (levels_.empty()) {
    return;
  }
  firstOpen_ = std::min(firstOpen_, levels_.size() - 1);
  Level& above = levels_.back();
  if (above.directory.IsOpen()) {
    return;
  }
  FileDescriptor directory = OpenAt(left.directory.Get(), "..", kOpenFlags);
  if (IsDirectory(directory, above.identity)) {
    above.directory = std::move(directory);
  } else {
    ReopenByName();
  }
}

int TreeWalk::VisitRoot() {
  struct stat status = {};
  if (stat(path_.c_str(), &status) != 0) {
    error_ = errno;
    return FTW_CONTINUE;
  }
  if (!S_ISDIR(status.st_mode)) {
    return Report(FTW_F, &status);
  }
  FileDescriptor directory = OpenAt(AT_FDCWD, path_.c_str(), kOpenFlags);
  if (!directory.IsOpen() || fstat(directory.Get(), &status) != 0) {
    return ReportUnopened(errno, IdentityOf(status));
  }
  device_ = status.st_dev;
  seen_.insert(IdentityOf(status));
  return Enter(std::move(directory), status, false);
}

int TreeWalk::Run(const char* root) {
  path_ = root;
  while (path_.size() > 1 && path_.back() == '/') {
    path_.pop_back();
  }
  base_ = path_.rfind('/') + 1;
  int action = VisitRoot();
  while (!levels_.empty()) {
    if (levels_.back().next == levels_.back().entries.size()) {
      Leave();
      continue;
    }
    action = VisitNext();
    if (action == FTW_SKIP_SIBLINGS) {
      levels_.back().next = levels_.back().entries.size();
    } else if (action != FTW_CONTINUE && action != FTW_SKIP_SUBTREE) {
      break;
    }
  }
  if (action != FTW_CONTINUE && action != FTW_SKIP_SUBTREE && action != FTW_SKIP_SIBLINGS) {
    return action;
  }
  errno = error_;
  return error_ == 0 ? 0 : -1;
}

}  // namespace

int WalkTree(const char* root, const TreeStep& step) {
  return TreeWalk(step).Run(root);
}

}  // namespace vela
