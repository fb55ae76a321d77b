#include "storage/fail_marker.h"

#include "platform/velaindex.h"
#include "posix/files.h"
#include "posix/truncated_text.h"

namespace vela {

std::string FailMarkerPath(const std::string& thumbPath) {
  const std::size_t dot = thumbPath.rfind('.');
  return dot == std::string::npos ? std::string() : thumbPath.substr(0, dot) + ".fail";
}

std::optional<time_t> FindFailMarker(const char* path, const EAThumbInfo& row) {
  const std::string name = FailMarkerPath(row.name);
  const std::string oldName = FailMarkerPath(row.oldName);
  char marker[kPathBufferSize] = "";
  if (GetEAFilePath(path, name.c_str(), oldName.c_str(), marker, sizeof marker) != 0) {
    return std::nullopt;
  }
  const std::optional<FileStatus> status = ExamineFile(marker);
  return status ? std::optional<time_t>(status->modified) : std::nullopt;
}

}  // namespace vela
