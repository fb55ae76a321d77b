// video_probe FILE...: the results of the queries about videos, one line for each file, in a
// process that has not loaded the video library yet.
#include <iostream>

#include "platform/velaindex.h"
#include "platform/vlibc.h"

namespace {

void Print(int result) {
  std::cout << result << ':' << (result < 0 ? VLIBCErrGet() : 0) << ' ';
}

}  // namespace

int main(int argc, char** argv) {
  for (int i = 1; i < argc; ++i) {
    VELA_RESOLUTION resolution = {};
    _VIDEO_METADATA_ metadata = {};
    Print(VELAIDX_GetMediaResolution(argv[i], &resolution));
    Print(VELAIDX_GetVideoMetadata(argv[i], &metadata));
    Print(VELAIDX_IsVideoNeedConvert(argv[i]));
    std::cout << '\n';
  }
}
