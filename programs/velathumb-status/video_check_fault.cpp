#include "video_check_fault.h"

#include <cerrno>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"

namespace vela {

namespace {

/// Checks a file that exists and is not a video: only the error matters.
bool AreVideosReadable() {
  return VELAIDX_IsVideoNeedConvert("/proc/self/exe") >= 0 || VLIBCErrGet() != ELIBACC;
}

}  // namespace

std::string FindVideoCheckFault() {
  if (!AreVideosReadable()) {
    return "the library that reads videos is not installed; no video was checked";
  }
  if (GetIndexVersion("/") < 0) {
    return "the index service does not answer; no video was checked";
  }
  return {};
}

}  // namespace vela
