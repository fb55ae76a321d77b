// Fuzz input as a file.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

/// A file in memory that holds the input as long as the object exists.
class InputFile {
 public:
  InputFile(const uint8_t* data, size_t size);
  ~InputFile();
  InputFile(const InputFile&) = delete;
  InputFile& operator=(const InputFile&) = delete;

  /// The path under which it can be opened.
  std::string Path() const { return "/proc/self/fd/" + std::to_string(descriptor_); }

 private:
  int descriptor_;
};
