#include "index_directory.h"

#include <sys/stat.h>

#include <filesystem>
#include <system_error>

namespace {

constexpr mode_t kDirectoryMode = 0755;

}  // namespace

void MakeDirectoryOf(const std::string& file) {
  const std::filesystem::path directory = std::filesystem::path(file).parent_path();
  if (directory.empty()) return;
  std::error_code ignored;
  std::filesystem::create_directories(directory.parent_path(), ignored);
  // Other programs use the index too, whatever the mask that this one was started with.
  if (mkdir(directory.c_str(), kDirectoryMode) == 0) chmod(directory.c_str(), kDirectoryMode);
}
