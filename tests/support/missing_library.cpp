#include "support/missing_library.h"

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
void AddMatches(const std::string& pattern, std::set<std::string>& files) {
  glob_t matches = {};
  if (glob(pattern.c_str(), 0, nullptr, &matches) == 0) {
    for (size_t i = 0; i < matches.gl_pathc; ++i) {
      files.insert(std::filesystem::canonical(matches.gl_pathv[i]).string());
    }
  }
  globfree(&matches);
}

/// The library's files wherever the loader may look.
std::set<std::string> LibraryFiles(const std::string& name) {
  std::set<std::string> files;
  for (const char* directory :
       {"/usr/lib*/", "/usr/lib/*/", "/usr/local/lib/", "/usr/local/lib/*/"}) {
    AddMatches(directory + name + ".so*", files);
  }
  return files;
}

}  // namespace

MissingLibrary::MissingLibrary(const std::string& name) {
  WriteFile(kEmptyFile, "");
  for (const std::string& file : LibraryFiles(name)) {
    if (mount(kEmptyFile, file.c_str(), nullptr, MS_BIND, nullptr) != 0) {
      EnvironmentFailureWithErrno("cannot hide " + file);
    }
    hidden_.push_back(file);
  }
  if (hidden_.empty()) {
    EnvironmentFailure("cannot find " + name);
  }
}

MissingLibrary::~MissingLibrary() {
  for (const std::string& file : hidden_) {
    umount2(file.c_str(), MNT_DETACH);
  }
}

}  // namespace vela_test
