#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <string_view>

#include "platform/standalone/bounded_copy.h"
#include "platform/standalone/last_error.h"
#include "platform/standalone/line_index_cache.h"
#include "platform/vlibc.h"
#include "posix/file_descriptor.h"

namespace {

using vela::Fail;

constexpr size_t kChunkSize = 65536;

/// Compares the lines of a file, which comes in pieces, with one text.
class LineMatcher {
 public:
  explicit LineMatcher(std::string_view wanted) : wanted_(wanted) {}

  /// Takes the next piece; returns true once a line has ended that equals the text.
  bool Feed(std::string_view piece);

  /// Returns whether the last line, which no newline ends, equals the text.
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
    if (newline == std::string_view::npos) return false;
    if (IsEqual()) return true;
    matched_ = 0;
    isDifferent_ = false;
    isLineOpen_ = false;
    piece.remove_prefix(newline + 1);
  }
  return false;
}

void LineMatcher::Extend(std::string_view part) {
  isLineOpen_ = true;
  if (isDifferent_) return;
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
    const ssize_t got = read(fd, chunk, sizeof(chunk));
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) return errno;
    if (got == 0) break;
    isFound = matcher.Feed({chunk, static_cast<size_t>(got)});
    if (isFound) return 0;
  }
  isFound = matcher.IsLastLineEqual();
  return 0;
}

/// Searches the open file `fd`, found at `path`. Sets `isFound`. Returns 0 or an errno value.
int FindLineInFile(const char* path, int fd, std::string_view wanted, bool& isFound) {
  vela::IndexLines(path, fd);
  if (const auto known = vela::FindLineInIndex(path, wanted)) {
    isFound = *known;
    return 0;
  }
  if (lseek(fd, 0, SEEK_SET) < 0 && errno != ESPIPE) return errno;
  return FindLine(fd, wanted, isFound);
}

int SearchFile(const char* path, std::string_view wanted, bool& isFound) {
  if (const auto known = vela::FindLineInIndex(path, wanted)) {
    isFound = *known;
    return 0;
  }
  const vela::FileDescriptor fd(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  if (!fd.IsOpen()) return errno;
  return FindLineInFile(path, fd.Get(), wanted, isFound);
}

}  // namespace

int VLIBCFileGetLine(const char* file, const char* text, char* out, size_t outSize, int /*flags*/) {
  vela::CopyCut("", out, outSize);
  if (file == nullptr || text == nullptr) return Fail(EINVAL);
  const std::string_view wanted(text);
  if (wanted.size() > INT_MAX) return Fail(EOVERFLOW);

  bool isFound = false;
  const int error = SearchFile(file, wanted, isFound);
  if (error != 0) return Fail(error);
  if (!isFound) return 0;
  vela::CopyCut(wanted, out, outSize);
  return static_cast<int>(wanted.size());
}
