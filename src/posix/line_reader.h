// Reading a text file line by line.
#pragma once

#include <cstddef>
#include <cstdio>
#include <memory>
#include <string>

namespace vela {

/// The lines of a file, one at a time, of any length.
class LineReader {
 public:
  /// Opens regular files only: any other kind could block the reader forever.
  explicit LineReader(const char* path);
  ~LineReader();
  LineReader(const LineReader&) = delete;
  LineReader& operator=(const LineReader&) = delete;

  /// Returns false, with errno set by the constructor, when the file could not be opened.
  bool IsOpen() const { return stream_ != nullptr; }

  /// Reads the next line, its newline included. Returns false at the end and on failure.
  bool Next();

  /// Returns true when reading has stopped because of an error.
  bool HasFailed() const { return std::ferror(stream_.get()) != 0; }

  /// Returns the length of the line in bytes, its newline included.
  size_t Length() const { return length_; }

  /// Returns the line without its newline.
  std::string WithoutNewline() const;

 private:
  struct Closer {
    void operator()(std::FILE* stream) const { std::fclose(stream); }
  };
  std::unique_ptr<std::FILE, Closer> stream_;
  char* line_ = nullptr;
  size_t capacity_ = 0;
  size_t length_ = 0;
};

}  // namespace vela
