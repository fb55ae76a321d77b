#include "stream_io.h"

#include <algorithm>

namespace vela {

namespace {

int Origin(Exiv2::BasicIo::Position position) {
  switch (position) {
    case Exiv2::BasicIo::cur:
      return SEEK_CUR;
    case Exiv2::BasicIo::end:
      return SEEK_END;
    default:
      return SEEK_SET;
  }
}

}  // namespace

StreamIo::StreamIo(FILE* file) : file_(file) {
  std::fseek(file, 0, SEEK_END);
  size_ = static_cast<size_t>(std::max(std::ftell(file), 0L));
}

int StreamIo::open() {
  close();
  std::rewind(file_);
  isOpen_ = true;
  return 0;
}

int StreamIo::close() {
  munmap();
  isOpen_ = false;
  return 0;
}

Exiv2Size StreamIo::write(const Exiv2::byte* /*data*/, Exiv2Size /*size*/) {
  return 0;
}

Exiv2Size StreamIo::write(Exiv2::BasicIo& /*source*/) {
  return 0;
}

int StreamIo::putb(Exiv2::byte /*data*/) {
  return EOF;
}

Exiv2::DataBuf StreamIo::read(Exiv2Size size) {
  if (static_cast<size_t>(size) > size_) {  // as any negative size is
    throw Exiv2::Error(Exiv2::ErrorCode::kerInvalidMalloc);
  }
  Exiv2::DataBuf data(size);
  Shorten(data, read(BytesOf(data), size));
  return data;
}

Exiv2Size StreamIo::read(Exiv2::byte* buffer, Exiv2Size size) {
  if (static_cast<Exiv2Offset>(size) < 0) {
    return 0;
  }
  return static_cast<Exiv2Size>(std::fread(buffer, 1, static_cast<size_t>(size), file_));
}

int StreamIo::getb() {
  return std::getc(file_);
}

void StreamIo::transfer(Exiv2::BasicIo& /*source*/) {
  throw Exiv2::Error(Exiv2::ErrorCode::kerErrorMessage, "not writable");
}

int StreamIo::seek(Exiv2Offset offset, Position position) {
  return std::fseek(file_, offset, Origin(position));
}

Exiv2::byte* StreamIo::mmap(bool isWriteable) {
  Exiv2::byte* const memory = isWriteable ? nullptr : mapping_.Map(fileno(file_), size_);
  if (memory == nullptr) {
    throw Exiv2::Error(Exiv2::ErrorCode::kerErrorMessage, "not mappable");
  }
  return memory;
}

int StreamIo::munmap() {
  mapping_.Unmap();
  return 0;
}

Exiv2Size StreamIo::tell() const {
  return static_cast<Exiv2Size>(std::ftell(file_));
}

size_t StreamIo::size() const {
  return size_;
}

bool StreamIo::isopen() const {
  return isOpen_;
}

int StreamIo::error() const {
  return std::ferror(file_);
}

bool StreamIo::eof() const {
  return std::feof(file_) != 0;
}

Exiv2Path StreamIo::path() const noexcept {
  return path_;
}

void StreamIo::populateFakeData() {}  // for files in a network only

}  // namespace vela
