// Provides fuzz input as a file.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "posix/file_descriptor.h"

/// A file in memory that contains the input; it exists as long as the object.
class InputFile {
 public:
  InputFile(const uint8_t* data, size_t size);
  InputFile(const InputFile&) = delete;
  InputFile& operator=(const InputFile&) = delete;

  /// Returns a path that opens the file.
  std::string Path() const { return "/proc/self/fd/" + std::to_string(descriptor_.Get()); }

  const vela::FileDescriptor& Descriptor() const { return descriptor_; }

 private:
  vela::FileDescriptor descriptor_;
};
