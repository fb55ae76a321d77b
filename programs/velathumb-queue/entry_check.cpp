#include "entry_check.h"

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "entry_plan.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

std::string FindTreeFault(const std::string& path) {
  if (path.find(':') != std::string::npos) {
    return "a tree's path cannot hold a colon; add its directories one by one";
  }
  const std::string name = path.substr(path.rfind('/') + 1);
  return EntryNameShouldIndex(name.c_str()) == 1 ? "" : "velathumb leaves out a tree of this name";
}

}  // namespace

std::string CheckAddition(std::string& entry) {
  const bool isTree = IsTreeEntry(entry);
  const std::string given = isTree ? entry.substr(std::strlen(kTreePrefix)) : entry;
  if (given.find('\n') != std::string::npos) {
    return "an entry cannot hold a newline";
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

std::string FindHindrance(const std::string& entry) {
  const std::string directory = TargetOf(entry).directory;
  if (IsDirExist(directory.c_str()) == 0) {
    return "there is no such directory";
  }
  return VLIBGetFsAvailSize(directory.c_str()) < kLeastFreeSpace ? "its volume is nearly full" : "";
}

}  // namespace vela
