// An open file as Exiv2 reads it.
#pragma once

#include <cstdio>
#include <exiv2/exiv2.hpp>
#include <string>

#include "posix/file_content.h"

namespace vela {

/// Gives Exiv2 a stream that somebody else owns. Cannot be written to.
class StreamIo : public Exiv2::BasicIo {
 public:
  explicit StreamIo(FILE* file);

  int open() override;
  int close() override;
  long write(const Exiv2::byte* data, long size) override;
  long write(Exiv2::BasicIo& source) override;
  int putb(Exiv2::byte data) override;
  Exiv2::DataBuf read(long size) override;
  long read(Exiv2::byte* buffer, long size) override;
  int getb() override;
  void transfer(Exiv2::BasicIo& source) override;
  int seek(long offset, Position position) override;
  Exiv2::byte* mmap(bool isWriteable) override;
  int munmap() override;
  long tell() const override;
  size_t size() const override;
  bool isopen() const override;
  int error() const override;
  bool eof() const override;
  std::string path() const override;

 private:
  FILE* file_;
  size_t size_ = 0;  // of the file, at first
  bool isOpen_ = false;
  FileMapping mapping_;
};

}  // namespace vela
