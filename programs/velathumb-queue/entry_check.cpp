#include "entry_check.h"

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/file_lock.h"
#include "posix/files.h"
#include "storage/creation_queue.h"
#include "storage/directory_tree.h"

namespace vela {

namespace {

std::string FindTreeFault(const std::string& path) {
  if (path.find(':') != std::string::npos) {
    return "the path of a tree cannot contain a colon; add its directories one by one";
  }
  const std::string name = path.substr(path.rfind('/') + 1);
  return EntryNameShouldIndex(name.c_str()) == 1 ? "" : "velathumb skips a tree of this name";
}

bool IsReadOnly(const std::string& directory) {
  return CheckAccess(directory, FileAccess::kWrite) == EROFS;
}

/// Adds the entry for a directory that is mounted read-only, and for what is below it. Directories
/// come before those below them; the path of a tree cannot contain a colon.
void AddReadOnly(const std::string& directory, std::vector<std::string>& entries) {
  const EntryTarget target{directory, false};
  if (!entries.empty() && DoOverlap(TargetOf(entries.back()), target)) {
    return;
  }
  const bool canBeTree = directory.find(':') == std::string::npos;
  entries.push_back(canBeTree ? kTreePrefix + directory : directory);
}

bool IsDirectoryLocked(const std::string& directory) {
  return IsLocked(directory + "/" + kMetadataDirName);
}

void ForEachDirectory(const EntryTarget& target, const std::function<void(const char*)>& visit,
                      const std::function<bool()>& shouldStop = nullptr) {
  if (!target.isTree) {
    visit(target.directory.c_str());
    return;
  }
  const auto visitReadable = [&](const char* path, bool isReadable) {
    if (isReadable) {
      visit(path);
    }
  };
  ForEachIndexedDirectory(target.directory.c_str(), visitReadable, shouldStop);
}

}  // namespace

std::string CheckAddition(std::string& entry) {
  const bool isTree = IsTreeEntry(entry);
  const std::string given = isTree ? entry.substr(std::strlen(kTreePrefix)) : entry;
  if (given.find('\n') != std::string::npos) {
    return "an entry cannot contain a newline";
  }
  if (given.empty() || IsDirExist(given.c_str()) == 0) {
    return "there is no such directory";
  }
  std::error_code error;
  std::string path =
      given.front() == '/' ? given : std::filesystem::canonical(given, error).string();
  if (error) {
    return error.message();
  }
  while (path.size() > 1 && path.back() == '/') {
    path.pop_back();
  }
  entry = isTree ? kTreePrefix + path : path;
  return isTree ? FindTreeFault(path) : std::string();
}

std::string FindObstacle(const std::string& entry) {
  const std::string directory = TargetOf(entry).directory;
  if (IsDirExist(directory.c_str()) == 0) {
    return "there is no such directory";
  }
  if (IsReadOnly(directory)) {
    return "its volume is mounted read-only";
  }
  return VLIBGetFsAvailSize(directory.c_str()) < kLeastFreeSpace ? "its volume is nearly full" : "";
}

std::vector<std::string> ListDirectories(const EntryTarget& target) {
  std::vector<std::string> directories;
  ForEachDirectory(target, [&](const char* path) { directories.emplace_back(path); });
  return directories;
}

SkippedDirectories FindSkippedDirectories(const EntryTarget& target,
                                          const std::function<bool()>& shouldStop) {
  SkippedDirectories skipped;
  const auto examine = [&](const char* path) {
    if (IsReadOnly(path)) {
      AddReadOnly(path, skipped.readOnly);
    } else if (IsDirectoryLocked(path)) {
      skipped.locked.emplace_back(path);
    }
  };
  ForEachDirectory(target, examine, shouldStop);
  return skipped;
}

}  // namespace vela
