#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <initializer_list>
#include <optional>
#include <string_view>

#include "platform/standalone/last_error.h"
#include "platform/standalone/path_text.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "posix/files.h"
#include "posix/folder.h"

namespace {

using vela::Fail;

/// Writes the concatenated parts to `out`, terminated. Returns false, with `out` unchanged, when
/// they do not fit.
bool Join(std::initializer_list<std::string_view> parts, char* out, size_t outSize) {
  size_t length = 0;
  for (const std::string_view part : parts) {
    length += part.size();
  }
  if (length >= outSize) {
    return false;
  }
  for (const std::string_view part : parts) {
    if (!part.empty()) {
      memcpy(out, part.data(), part.size());
    }
    out += part.size();
  }
  *out = '\0';
  return true;
}

/// The path of one derived file, for system calls.
class DerivedPath {
 public:
  DerivedPath(const char* eaDir, const char* name)
      : isValid_(name != nullptr && *name != '\0' && *eaDir != '\0' &&
                 Join({eaDir, "/", name}, path_, sizeof(path_))) {}

  /// Returns false for a name that no file can have.
  bool IsValid() const { return isValid_; }
  const char* Get() const { return path_; }

 private:
  char path_[PATH_MAX];
  bool isValid_;
};

/// Fills `out` when a regular file is at `path`.
bool ExamineRegularFile(const DerivedPath& path, EAFileStatus& out) {
  if (!path.IsValid()) {
    return false;
  }
  const std::optional<vela::FileStatus> status = vela::ExamineFile(path.Get());
  if (!status || !status->isRegular) {
    return false;
  }
  out = {status->size, status->modified};
  return true;
}

/// Returns 0 when no file has the name any more, otherwise an errno value.
int Remove(const DerivedPath& path) {
  if (!path.IsValid()) {
    return 0;
  }
  const vela::FolderEntry entry(path.Get());
  const int error = entry.Remove();
  struct stat status;
  // A read-only volume, for example, also reports an error for a file that does not exist.
  return error == 0 || error == ENOENT || entry.ExamineLink(status) != 0 ? 0 : error;
}

}  // namespace

int IndexIsPathSupportEAWrite(const char* dir) {
  if (dir == nullptr || vela::HasComponent(dir, vela::kMetadataDirName)) {
    return 0;
  }
  if (IsDirExist(dir) == 0) {
    return 0;
  }
  return faccessat(AT_FDCWD, dir, W_OK | X_OK, AT_EACCESS) == 0 ? 1 : 0;
}

int VELAEADirPath(int /*flags*/, const char* path, char* out, size_t outSize) {
  if (path == nullptr || out == nullptr) {
    return Fail(EINVAL);
  }
  const std::string_view whole(path);
  const std::string_view file = vela::LastComponentOf(whole);
  if (file.empty()) {
    return Fail(EINVAL);
  }
  if (vela::HasComponent(whole, vela::kMetadataDirName)) {
    return Fail(EINVAL);
  }
  const std::string_view directory = whole.substr(0, whole.size() - file.size());
  if (!Join({directory, vela::kMetadataDirName, "/", file}, out, outSize)) {
    return Fail(ENAMETOOLONG);
  }
  return 0;
}

const char* FindEAFile(const char* eaDir, const char* name, const char* oldName,
                       EAFileStatus* status) {
  if (eaDir == nullptr) {
    return nullptr;
  }
  if (ExamineRegularFile(DerivedPath(eaDir, name), *status)) {
    return name;
  }
  if (ExamineRegularFile(DerivedPath(eaDir, oldName), *status)) {
    return oldName;
  }
  return nullptr;
}

const char* IsEAFileExist(const char* eaDir, int64_t* sizeOut, const char* name,
                          const char* oldName) {
  EAFileStatus status;
  const char* found = FindEAFile(eaDir, name, oldName, &status);
  if (found != nullptr && sizeOut != nullptr) {
    *sizeOut = status.size;
  }
  return found;
}

int IsEAFileExist2(const char* path, const char* name, const char* oldName) {
  char eaDir[PATH_MAX];
  if (VELAEADirPath(0, path, eaDir, sizeof(eaDir)) != 0) {
    return 0;
  }
  return IsEAFileExist(eaDir, nullptr, name, oldName) != nullptr ? 1 : 0;
}

int GetEAFilePath(const char* path, const char* name, const char* oldName, char* out,
                  size_t outSize) {
  char eaDir[PATH_MAX];
  if (VELAEADirPath(0, path, eaDir, sizeof(eaDir)) != 0) {
    return -1;
  }
  const char* found = IsEAFileExist(eaDir, nullptr, name, oldName);
  if (found == nullptr) {
    return Fail(ENOENT);
  }
  if (out == nullptr) {
    return Fail(EINVAL);
  }
  return Join({eaDir, "/", found}, out, outSize) ? 0 : Fail(ENAMETOOLONG);
}

int RemoveEAFile(const char* eaDir, const char* name, const char* oldName) {
  if (eaDir == nullptr) {
    return Fail(EINVAL);
  }
  const int error = Remove(DerivedPath(eaDir, name));
  const int oldError = Remove(DerivedPath(eaDir, oldName));
  if (error != 0) {
    return Fail(error);
  }
  return oldError == 0 ? 0 : Fail(oldError);
}

int RemoveEAFile2(const char* path, const char* name, const char* oldName) {
  char eaDir[PATH_MAX];
  if (VELAEADirPath(0, path, eaDir, sizeof(eaDir)) != 0) {
    return -1;
  }
  return RemoveEAFile(eaDir, name, oldName);
}
