#include <cerrno>
#include <climits>
#include <cstring>
#include <string_view>

#include "platform/standalone/bounded_copy.h"
#include "platform/standalone/last_error.h"
#include "platform/standalone/line_index_cache.h"
#include "platform/vlibc.h"
#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/files.h"

namespace {

using vela::Fail;

constexpr size_t kChunkSize = 65536;

/// Compares the lines of a file, which is read in pieces, with one text.
class LineMatcher {
 public:
  explicit LineMatcher(std::string_view wanted) : wanted_(wanted) {}

  /// Takes the next piece. Returns true when a line that equals the text has ended.
  bool Feed(std::string_view piece);

  /// Returns whether the last line, which has no newline, equals the text.
  bool IsLastLineEqual() const { return isLineOpen_ && IsEqual(); }

 private:
  bool IsEqual() const { return !isDifferent_ && matched_ == wanted_.size(); }
  void Extend(std::string_view part);

  std::string_view wanted_;
  size_t matched_ = 0;
  bool isDifferent_ = false;
  bool isLineOpen_ = false;
};

bool LineMatcher::Feed(std::string_view piece) {
  while (!piece.empty()) {
    const size_t newline = piece.find('\n');
    Extend(piece.substr(0, newline));
    if (newline == std::string_view::npos) {
      return false;
    }
    if (IsEqual()) {
      return true;
    }
    matched_ = 0;
    isDifferent_ = false;
    isLineOpen_ = false;
    piece.remove_prefix(newline + 1);
  }
  return false;
}

void LineMatcher::Extend(std::string_view part) {
  isLineOpen_ = true;
  if (isDifferent_) {
    return;
  }
  if (wanted_.substr(matched_, part.size()) != part) {
    isDifferent_ = true;
    return;
  }
  matched_ += part.size();
}

/// Sets `isFound`. Returns 0 or an errno value.
int FindLine(int fd, std::string_view wanted, bool& isFound) {
  char chunk[kChunkSize];
  LineMatcher matcher(wanted);
  for (;;) {
    size_t got = 0;
    const int error = vela::ReadChunk(fd, chunk, sizeof(chunk), got);
    if (error != 0) {
      return error;
    }
    if (got == 0) {
      break;
    }
    isFound = matcher.Feed({chunk, got});
    if (isFound) {
      return 0;
    }
  }
  isFound = matcher.IsLastLineEqual();
  return 0;
}

/// Searches the open file `fd`, whose path is `path`. Sets `isFound`. Returns 0 or an errno value.
int SearchOpenFile(const char* path, int fd, std::string_view wanted, bool& isFound) {
  vela::IndexLines(path, fd);
  if (const auto known = vela::FindLineInIndex(path, wanted)) {
    isFound = *known;
    return 0;
  }
  const int error = vela::Rewind(fd);
  if (error != 0 && error != ESPIPE) {
    return error;
  }
  return FindLine(fd, wanted, isFound);
}

int SearchFile(const char* path, std::string_view wanted, bool& isFound) {
  if (const auto known = vela::FindLineInIndex(path, wanted)) {
    isFound = *known;
    return 0;
  }
  const vela::FileDescriptor fd = vela::OpenForReading(path);
  if (!fd.IsOpen()) {
    return errno;
  }
  return SearchOpenFile(path, fd.Get(), wanted, isFound);
}

}  // namespace

int VLIBCFileGetLine(const char* file, const char* text, char* out, size_t outSize, int /*flags*/) {
  vela::CopyTruncated("", out, outSize);
  if (file == nullptr || text == nullptr) {
    return Fail(EINVAL);
  }
  const std::string_view wanted(text);
  if (wanted.size() > INT_MAX) {
    return Fail(EOVERFLOW);
  }

  bool isFound = false;
  const int error = SearchFile(file, wanted, isFound);
  if (error != 0) {
    return Fail(error);
  }
  if (!isFound) {
    return 0;
  }
  vela::CopyTruncated(wanted, out, outSize);
  return static_cast<int>(wanted.size());
}
