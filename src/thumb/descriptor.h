// Owner of a file descriptor.
#pragma once

#include <unistd.h>

#include <utility>

/// A file descriptor, closed with its object; -1 for none.
class Descriptor {
 public:
  Descriptor() = default;
  explicit Descriptor(int number) : number_(number) {}
  ~Descriptor() { Close(); }
  Descriptor(Descriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    if (this != &other) {
      Close();
      number_ = std::exchange(other.number_, -1);
    }
    return *this;
  }

  int Get() const { return number_; }
  bool IsOpen() const { return number_ >= 0; }

  /// Returns false when what was written may not have arrived.
  bool Close() {
    const bool isClosed = number_ < 0 || close(number_) == 0;
    number_ = -1;
    return isClosed;
  }

 private:
  int number_ = -1;
};
