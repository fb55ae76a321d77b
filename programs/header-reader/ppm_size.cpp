#include "ppm_size.h"

#include <csetjmp>
#include <cstdio>

extern "C" {
#include <netpbm/ppm.h>
}

namespace vela {

namespace {

/// Netpbm also reads related formats, and leaks memory when some of them are damaged.
bool IsBinaryPixmap(FILE* file) {
  std::rewind(file);
  char magic[2] = "";
  const bool isPixmap =
      fread(magic, 1, sizeof(magic), file) == sizeof(magic) && magic[0] == 'P' && magic[1] == '6';
  rewind(file);
  return isPixmap;
}

void IgnoreMessage(const char* /*text*/) {}

/// Netpbm ends the process on any error unless it has a jmp_buf to jump to. No object with a
/// destructor may exist between here and there.
bool ReadHeader(FILE* file, int& width, int& height) {
  jmp_buf onError;
  if (setjmp(onError) != 0) {
    pm_setjmpbuf(nullptr);
    return false;
  }
  pm_setjmpbuf(&onError);
  pixval largest = 0;
  int format = 0;
  ppm_readppminit(file, &width, &height, &largest, &format);
  pm_setjmpbuf(nullptr);
  return true;
}

}  // namespace

PixelSize ReadPpmSize(FILE* file) {
  if (!IsBinaryPixmap(file)) {
    return {};
  }
  pm_init("velathumb", 0);
  pm_setusermessagefn(IgnoreMessage);
  pm_setusererrormsgfn(IgnoreMessage);
  int width = 0;
  int height = 0;
  if (!ReadHeader(file, width, height)) {
    return {};
  }
  return {width, height};
}

}  // namespace vela
