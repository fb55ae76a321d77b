// Owners of file descriptors and directory streams.
#pragma once

#include <dirent.h>
#include <unistd.h>

#include <memory>

namespace vela_test {

/// A file descriptor, closed with its object; -1 for none.
class Descriptor {
 public:
  Descriptor() = default;
  explicit Descriptor(int number) : number_(number) {}
  ~Descriptor() { Close(); }
  Descriptor(Descriptor&& other) noexcept : number_(other.number_) { other.number_ = -1; }
  Descriptor& operator=(Descriptor&& other) noexcept {
    const int number = other.number_;
    other.number_ = -1;
    Close();
    number_ = number;
    return *this;
  }

  int Get() const { return number_; }
  bool IsOpen() const { return number_ >= 0; }

  void Close() {
    if (number_ >= 0) {
      close(number_);
      number_ = -1;
    }
  }

 private:
  int number_ = -1;
};

struct DirectoryCloser {
  void operator()(DIR* directory) const { closedir(directory); }
};
/// A directory stream, closed with its object.
using DirectoryStream = std::unique_ptr<DIR, DirectoryCloser>;

}  // namespace vela_test
