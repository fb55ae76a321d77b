#include "support/farm.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <utility>
#include <vector>

#include "support/descriptor.h"
#include "support/environment_failure.h"
#include "support/removal.h"
#include "support/sandbox.h"

namespace vela_test {

namespace {

// A time that no directory has by chance: as long as a directory has it, nothing was added, removed
// or renamed in it.
constexpr timespec kUntouched = {1, 0};

struct Entry {
  std::string name;
  unsigned char type;
};

/// None without a directory.
std::vector<Entry> Entries(DIR* directory) {
  std::vector<Entry> entries;
  if (directory == nullptr) {
    return entries;
  }
  while (const dirent* entry = readdir(directory)) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") {
      entries.push_back({name, entry->d_type});
    }
  }
  return entries;
}

std::string ReadLink(int directory, const std::string& name) {
  char target[PATH_MAX];
  const ssize_t length = readlinkat(directory, name.c_str(), target, sizeof target);
  return length < 0 ? std::string() : std::string(target, static_cast<size_t>(length));
}

}  // namespace

Farm::Farm(std::string path, std::set<std::string> own, const std::string& hidden)
    : path_(std::move(path)), own_(std::move(own)) {
  if (mkdir(path_.c_str(), 0755) != 0 && errno != EEXIST) {
    EnvironmentFailureWithErrno("cannot make " + path_);
  }
  const DirectoryStream host(opendir(HostPath(path_).c_str()));
  if (host == nullptr && errno != ENOENT) {
    EnvironmentFailureWithErrno("cannot read the machine's " + path_);
  }
  for (const Entry& entry : Entries(host.get())) {
    const bool isHidden = !hidden.empty() && entry.name.compare(0, hidden.size(), hidden) == 0;
    if (own_.count(entry.name) == 0 && !isHidden) {
      links_[entry.name] = LinkTarget(dirfd(host.get()), entry.name, entry.type);
    }
  }
  LinkMissing();
  MarkUntouched();
}

void Farm::Restore() const {
  if (path_ != "/") {
    UnmountAll(path_);
  }
  chmod(path_.c_str(), 0755);
  if (IsUntouched()) {
    return;
  }
  RemoveOthers();
  LinkMissing();
  MarkUntouched();
}

/// Links are copied unchanged, so that they are resolved inside the sandbox.
std::string Farm::LinkTarget(int directory, const std::string& name, unsigned char type) const {
  if (type == DT_LNK || type == DT_UNKNOWN) {
    std::string target = ReadLink(directory, name);
    if (!target.empty()) {
      return target;
    }
  }
  return HostPath((path_ == "/" ? "" : path_) + "/" + name);
}

void Farm::RemoveOthers() const {
  const DirectoryStream directory(opendir(path_.c_str()));
  if (directory == nullptr) {
    EnvironmentFailureWithErrno("cannot read " + path_);
  }
  for (const Entry& entry : Entries(directory.get())) {
    const auto link = links_.find(entry.name);
    const bool isOurs =
        link != links_.end() && ReadLink(dirfd(directory.get()), entry.name) == link->second;
    if (!isOurs && own_.count(entry.name) == 0) {
      RemoveWithMounts(path_ + "/" + entry.name);
    }
  }
}

void Farm::LinkMissing() const {
  const Descriptor directory(open(path_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!directory.IsOpen()) {
    EnvironmentFailureWithErrno("cannot open " + path_);
  }
  for (const auto& link : links_) {
    if (symlinkat(link.second.c_str(), directory.Get(), link.first.c_str()) != 0 &&
        errno != EEXIST) {
      EnvironmentFailureWithErrno("cannot link " + link.first + " in " + path_);
    }
  }
}

void Farm::MarkUntouched() const {
  const timespec times[2] = {kUntouched, kUntouched};
  if (utimensat(AT_FDCWD, path_.c_str(), times, 0) != 0) {
    EnvironmentFailureWithErrno("cannot set the time of " + path_);
  }
}

bool Farm::IsUntouched() const {
  struct stat status {};
  return stat(path_.c_str(), &status) == 0 && status.st_mtim.tv_sec == kUntouched.tv_sec;
}

}  // namespace vela_test
