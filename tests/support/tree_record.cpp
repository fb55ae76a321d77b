#include "support/tree_record.h"

#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <functional>

#include "support/environment_failure.h"
#include "support/files.h"

namespace vela_test {

namespace {

std::string Octal(unsigned number) {
  char digits[16];
  std::snprintf(digits, sizeof digits, "%o", number);
  return digits;
}

std::string LinkTarget(const std::string& path) {
  char target[PATH_MAX];
  const ssize_t length = readlink(path.c_str(), target, sizeof target);
  return std::string(target, length > 0 ? static_cast<size_t>(length) : 0);
}

std::string ContentOf(const std::string& path, const struct stat& status) {
  if (S_ISLNK(status.st_mode)) {
    return " -> " + LinkTarget(path);
  }
  if (!S_ISREG(status.st_mode)) {
    return "";
  }
  const std::string content = ReadFile(path);
  return " " + std::to_string(content.size()) + " bytes #" +
         std::to_string(std::hash<std::string>()(content));
}

std::string Describe(const std::string& path, RecordDetail detail) {
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) {
    EnvironmentFailureWithErrno("cannot examine " + path);
  }
  std::string text = Octal(status.st_mode) + ContentOf(path, status);
  if (detail == RecordDetail::kAll) {
    text += " of " + std::to_string(status.st_uid) + ":" + std::to_string(status.st_gid) + " at " +
            std::to_string(status.st_mtim.tv_sec) + "." + std::to_string(status.st_mtim.tv_nsec);
  }
  return text;
}

}  // namespace

TreeRecord RecordTree(const std::string& directory, RecordDetail detail) {
  TreeRecord record;
  record[""] = Describe(directory, detail);
  for (std::string path : ListTree(directory)) {
    if (path.back() == '/') {
      path.pop_back();
    }
    record[path] = Describe(directory + "/" + path, detail);
  }
  return record;
}

std::vector<std::string> Differences(const TreeRecord& before, const TreeRecord& after) {
  std::vector<std::string> lines;
  for (const auto& [path, description] : before) {
    const auto now = after.find(path);
    if (now == after.end()) {
      lines.push_back("'" + path + "' is gone");
    } else if (now->second != description) {
      lines.push_back("'" + path + "' was " + description + ", is " + now->second);
    }
  }
  for (const auto& [path, description] : after) {
    if (before.count(path) == 0) {
      lines.push_back("'" + path + "' is new: " + description);
    }
  }
  return lines;
}

}  // namespace vela_test
