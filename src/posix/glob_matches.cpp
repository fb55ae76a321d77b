#include "posix/glob_matches.h"

#include <dirent.h>
#include <sys/stat.h>

#include <cerrno>
#include <string_view>

#include "posix/folder.h"

namespace vela {

namespace {

// The directory functions of a pattern's expansion, in the types of the C library.

void* OpenStream(const char* path) {
  return OpenDirectoryStream(path);
}

dirent* ReadStream(void* stream) {
  return readdir(static_cast<DIR*>(stream));
}

void CloseStream(void* stream) {
  closedir(static_cast<DIR*>(stream));
}

int ToResult(int error) {
  errno = error == 0 ? errno : error;
  return error == 0 ? 0 : -1;
}

int Stat(const char* path, struct stat* status) {
  return ToResult(FolderEntry(path).Examine(*status));
}

int StatLink(const char* path, struct stat* status) {
  return ToResult(FolderEntry(path).ExamineLink(*status));
}

}  // namespace

GlobMatches::GlobMatches(const std::string& pattern) {
  matches_.gl_opendir = OpenStream;
  matches_.gl_readdir = ReadStream;
  matches_.gl_closedir = CloseStream;
  matches_.gl_stat = Stat;
  matches_.gl_lstat = StatLink;
  found_ = glob(pattern.c_str(), GLOB_ALTDIRFUNC, nullptr, &matches_) == 0;
}

std::string EscapePattern(const std::string& path) {
  constexpr std::string_view kSpecial = "*?[\\";
  std::string escaped;
  escaped.reserve(path.size());
  for (const char c : path) {
    if (kSpecial.find(c) != std::string_view::npos) {
      escaped += '\\';
    }
    escaped += c;
  }
  return escaped;
}

}  // namespace vela
