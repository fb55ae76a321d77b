#include "posix/landlock.h"

#include <fcntl.h>
#include <linux/landlock.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <iterator>
#include <utility>

#include "posix/folder.h"

namespace vela {

namespace {

// May be newer than the kernel headers of the build.
constexpr uint64_t kTruncate = 1U << 14;
constexpr uint64_t kDeviceControl = 1U << 15;
constexpr uint64_t kTcp = (1U << 0) | (1U << 1);
constexpr uint64_t kAbstractSocketsAndSignals = (1U << 0) | (1U << 1);

constexpr int kVersionOfTruncate = 3;
constexpr int kVersionOfTcp = 4;
constexpr int kVersionOfDeviceControl = 5;
constexpr int kVersionOfScopes = 6;

constexpr uint64_t kMakeOtherThanFiles =
    LANDLOCK_ACCESS_FS_MAKE_CHAR | LANDLOCK_ACCESS_FS_MAKE_DIR | LANDLOCK_ACCESS_FS_MAKE_SOCK |
    LANDLOCK_ACCESS_FS_MAKE_FIFO | LANDLOCK_ACCESS_FS_MAKE_BLOCK | LANDLOCK_ACCESS_FS_MAKE_SYM |
    LANDLOCK_ACCESS_FS_REMOVE_DIR;
constexpr uint64_t kChangeDirectory = LANDLOCK_ACCESS_FS_MAKE_REG | LANDLOCK_ACCESS_FS_REMOVE_FILE;
constexpr uint64_t kRead = LANDLOCK_ACCESS_FS_READ_FILE | LANDLOCK_ACCESS_FS_READ_DIR;
/// The rights that a rule for a file other than a directory can contain.
constexpr uint64_t kOfFiles = LANDLOCK_ACCESS_FS_EXECUTE | LANDLOCK_ACCESS_FS_WRITE_FILE |
                              LANDLOCK_ACCESS_FS_READ_FILE | kTruncate | kDeviceControl;

/// Directories of shared libraries. The dynamic loader among them is run.
constexpr const char* kLibraries[] = {"/lib",       "/lib32",     "/lib64",        "/usr/lib",
                                      "/usr/lib32", "/usr/lib64", "/usr/local/lib"};
constexpr const char* kLibraryData[] = {
    "/etc/ld.so.cache",  "/etc/ld.so.preload",  "/etc/localtime",
    "/usr/share/locale", "/usr/share/zoneinfo", "/dev/random",
    "/dev/urandom",      "/dev/zero",           "/sys/devices/system/cpu"};
constexpr char kNullDevice[] = "/dev/null";

/// The kernel's structure in its latest known form; older kernels accept it as long as the fields
/// that they do not know are zero.
struct RulesetAttributes {
  uint64_t files = 0;
  uint64_t network = 0;
  uint64_t scopes = 0;
};

uint64_t ChangeFile(int version) {
  return LANDLOCK_ACCESS_FS_WRITE_FILE | (version >= kVersionOfTruncate ? kTruncate : 0);
}

RulesetAttributes WritingRestrictions(int version) {
  RulesetAttributes all;
  all.files = ChangeFile(version) | kChangeDirectory | kMakeOtherThanFiles |
              (version >= kVersionOfDeviceControl ? kDeviceControl : 0);
  all.network = version >= kVersionOfTcp ? kTcp : 0;
  all.scopes = version >= kVersionOfScopes ? kAbstractSocketsAndSignals : 0;
  return all;
}

FileDescriptor CreateRuleset(const RulesetAttributes& restrictions) {
  return FileDescriptor(static_cast<int>(
      syscall(SYS_landlock_create_ruleset, &restrictions, sizeof restrictions, 0)));
}

/// Returns 0 or an errno value.
int Allow(const FileDescriptor& ruleset, const FileDescriptor& file, uint64_t access) {
  landlock_path_beneath_attr rule = {};
  rule.allowed_access = access;
  rule.parent_fd = file.Get();
  const long result =
      syscall(SYS_landlock_add_rule, ruleset.Get(), LANDLOCK_RULE_PATH_BENEATH, &rule, 0);
  return result == 0 ? 0 : errno;
}

/// Adds rules to a ruleset and remembers the first failure.
class RulesetBuilder {
 public:
  RulesetBuilder(const FileDescriptor& ruleset, uint64_t handled)
      : ruleset_(ruleset), handled_(handled) {}

  void AddSystemPaths(const std::vector<std::string>& paths, uint64_t access) {
    for (const std::string& path : paths) {
      Add(FileDescriptor(open(path.c_str(), O_PATH | O_CLOEXEC)), access);
    }
  }

  /// Other files than regular ones are left out: a tool would wait for the writer of a pipe.
  void AddInputs(const std::vector<std::string>& paths, uint64_t access) {
    for (const std::string& path : paths) {
      const FileDescriptor file = FolderEntry(path).Open(O_PATH);
      struct stat status = {};
      if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || S_ISREG(status.st_mode)) {
        Add(file, access);
      }
    }
  }

  void AddOutputs(const std::vector<std::string>& paths, uint64_t access) {
    for (const std::string& path : paths) {
      Add(FolderEntry(path).Open(O_PATH | O_DIRECTORY), access);
    }
  }

  int Error() const { return error_; }

 private:
  void Add(const FileDescriptor& file, uint64_t access) {
    if (!file.IsOpen()) {
      // A file that is missing or out of reach needs no rule.
      if (errno == EMFILE || errno == ENFILE || errno == ENOMEM) {
        error_ = errno;
      }
      return;
    }
    struct stat status;
    if (fstat(file.Get(), &status) != 0) {
      error_ = errno;
      return;
    }
    const uint64_t possible = S_ISDIR(status.st_mode) ? access : access & kOfFiles;
    const int error = Allow(ruleset_, file, possible & handled_);
    error_ = error_ == 0 ? error : error_;
  }

  const FileDescriptor& ruleset_;
  uint64_t handled_;
  int error_ = 0;
};

}  // namespace

AllowedFiles FilesOfEveryProgram() {
  AllowedFiles files;
  files.programs.assign(std::begin(kLibraries), std::end(kLibraries));
  files.data.assign(std::begin(kLibraryData), std::end(kLibraryData));
  files.devices = {kNullDevice};
  return files;
}

int LandlockVersion() {
  const long version =
      syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION);
  return version < 0 ? 0 : static_cast<int>(version);
}

std::vector<std::string> LandlockCoverage(int version) {
  constexpr struct {
    int version;
    const char* name;
  } kCoverage[] = {{1, "reading"},
                   {1, "writing"},
                   {1, "running programs"},
                   {kVersionOfTruncate, "truncating"},
                   {kVersionOfTcp, "TCP"},
                   {kVersionOfDeviceControl, "device control"},
                   {kVersionOfScopes, "signals"},
                   {kVersionOfScopes, "abstract sockets"}};
  std::vector<std::string> names;
  for (const auto& part : kCoverage) {
    if (version >= part.version) {
      names.emplace_back(part.name);
    }
  }
  return names;
}

int MakeLandlockRuleset(const AllowedFiles& files, FileDescriptor& ruleset) {
  ruleset.Reset();
  const int version = LandlockVersion();
  if (version < 1) {
    return 0;
  }
  RulesetAttributes restrictions = WritingRestrictions(version);
  restrictions.files |= kRead | LANDLOCK_ACCESS_FS_EXECUTE;
  FileDescriptor made = CreateRuleset(restrictions);
  if (!made.IsOpen()) {
    return errno;
  }
  RulesetBuilder builder(made, restrictions.files);
  builder.AddSystemPaths(files.programs, kRead | LANDLOCK_ACCESS_FS_EXECUTE);
  builder.AddSystemPaths(files.data, kRead);
#if defined(VELA_SANITIZED)
  // The checks of a sanitizer read their own process's memory map and threads.
  builder.AddSystemPaths({"/proc"}, kRead);
#endif
  builder.AddSystemPaths(files.devices, kRead | ChangeFile(version) | kDeviceControl);
  builder.AddInputs(files.inputs, kRead);
  builder.AddOutputs(files.outputs, kRead | ChangeFile(version) | kChangeDirectory);
  ruleset = std::move(made);
  return builder.Error();
}

int EnterLandlockRuleset(int ruleset) {
  return syscall(SYS_landlock_restrict_self, ruleset, 0) == 0 ? 0 : errno;
}

}  // namespace vela
