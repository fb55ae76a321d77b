#include "decoding/file_input.h"

#include <unistd.h>

#include <cerrno>

int FileInput::Read(unsigned char* bytes, int size) {
  int done = 0;
  while (done < size) {
    const ssize_t count =
        pread(descriptor_, bytes + done, static_cast<size_t>(size - done), place_);
    if (count < 0 && errno == EINTR) {
      continue;
    }
    if (count <= 0) {
      break;
    }
    done += static_cast<int>(count);
    place_ += count;
  }
  return done;
}
