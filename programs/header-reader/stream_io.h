// An open file as Exiv2 reads it.
#pragma once

#include <cstdio>
#include <string>

#include "exiv2_library.h"
#include "posix/file_content.h"

namespace vela {

/// Gives Exiv2 a stream that somebody else owns. Cannot be written to.
class StreamIo : public Exiv2::BasicIo {
 public:
  explicit StreamIo(FILE* file);

  int open() override;
  int close() override;
  Exiv2Size write(const Exiv2::byte* data, Exiv2Size size) override;
  Exiv2Size write(Exiv2::BasicIo& source) override;
  int putb(Exiv2::byte data) override;
  Exiv2::DataBuf read(Exiv2Size size) override;
  Exiv2Size read(Exiv2::byte* buffer, Exiv2Size size) override;
  int getb() override;
  void transfer(Exiv2::BasicIo& source) override;
  int seek(Exiv2Offset offset, Position position) override;
  Exiv2::byte* mmap(bool isWriteable) override;
  int munmap() override;
  Exiv2Size tell() const override;
  size_t size() const override;
  bool isopen() const override;
  int error() const override;
  bool eof() const override;
  Exiv2Path path() const noexcept override;
  void populateFakeData() override;

 private:
  FILE* file_;
  const std::string path_;
  size_t size_ = 0;  // of the file, at first
  bool isOpen_ = false;
  FileMapping mapping_;
};

}  // namespace vela
