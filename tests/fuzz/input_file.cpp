#include "input_file.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstdlib>

InputFile::InputFile(const uint8_t* data, size_t size)
    : descriptor_(memfd_create("input", MFD_CLOEXEC)) {
  if (!descriptor_.IsOpen() || write(descriptor_.Get(), data, size) != static_cast<ssize_t>(size)) {
    std::abort();
  }
}
