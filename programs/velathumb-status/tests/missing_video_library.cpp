#include "missing_video_library.h"

#include <glob.h>
#include <sys/mount.h>

#include <filesystem>
#include <set>

#include "support/environment_failure.h"
#include "support/files.h"

namespace vela_test {

namespace {

constexpr const char* kEmptyFile = "/tmp/empty.library";

/// Adds the files that the names lead to.
void AddMatches(const char* pattern, std::set<std::string>& files) {
  glob_t matches = {};
  if (glob(pattern, 0, nullptr, &matches) == 0) {
    for (size_t i = 0; i < matches.gl_pathc; ++i) {
      files.insert(std::filesystem::canonical(matches.gl_pathv[i]).string());
    }
  }
  globfree(&matches);
}

/// The library's files wherever the loader may look.
std::set<std::string> LibraryFiles() {
  std::set<std::string> files;
  for (const char* pattern :
       {"/usr/lib*/libavformat.so*", "/usr/lib/*/libavformat.so*", "/usr/local/lib/libavformat.so*",
        "/usr/local/lib/*/libavformat.so*"}) {
    AddMatches(pattern, files);
  }
  return files;
}

}  // namespace

MissingVideoLibrary::MissingVideoLibrary() {
  WriteFile(kEmptyFile, "");
  for (const std::string& file : LibraryFiles()) {
    if (mount(kEmptyFile, file.c_str(), nullptr, MS_BIND, nullptr) != 0) {
      EnvironmentFailureWithErrno("cannot hide " + file);
    }
    hidden_.push_back(file);
  }
  if (hidden_.empty()) {
    EnvironmentFailure("cannot find the video library");
  }
}

MissingVideoLibrary::~MissingVideoLibrary() {
  for (const std::string& file : hidden_) {
    umount2(file.c_str(), MNT_DETACH);
  }
}

}  // namespace vela_test
