// The messages between a program and the header reader that it starts. Both are parts of the same
// build.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vela {

/// The descriptor of the header reader's socket, on which it gets questions.
inline constexpr int kQuestionSocket = 1;

/// What is asked about a file.
enum class HeaderTopic : uint32_t {
  kImageSize = 1,
  kExifOrientation = 2,
};

/// A question; its message also carries the file's descriptor, open for reading.
struct HeaderQuestion {
  HeaderTopic topic = HeaderTopic::kImageSize;
};

/// Size of the buffer for the text of an orientation, terminator included.
inline constexpr size_t kOrientationTextSize = 128;

/// The answer to one question.
struct HeaderAnswer {
  uint32_t isRead = 0;  ///< 1 when the file has what was asked for
  uint32_t width = 0;   ///< pixels, as stored
  uint32_t height = 0;  ///< pixels, as stored
  char orientation[kOrientationTextSize] = "";
};

}  // namespace vela
