#include "platform/standalone/line_index.h"

#include <algorithm>
#include <cerrno>
#include <new>
#include <string>

#include "posix/file_content.h"

namespace vela {

namespace {

constexpr size_t kChunkSize = 65536;
/// Limits the memory of an index to 128 MiB.
constexpr size_t kLinesMax = size_t{8} << 20;

/// The 64-bit FNV-1a hash of a line that is read in pieces.
class LineHash {
 public:
  void Extend(std::string_view piece) {
    for (const char c : piece) {
      value_ = (value_ ^ static_cast<unsigned char>(c)) * 0x100000001b3;
    }
  }
  uint64_t Value() const { return value_; }

 private:
  uint64_t value_ = 0xcbf29ce484222325;
};

uint64_t HashOf(std::string_view text) {
  LineHash hash;
  hash.Extend(text);
  return hash.Value();
}

/// Returns whether the line that begins at `begin` equals the text.
bool IsLineAt(int fd, int64_t begin, std::string_view text) {
  const std::string bytes = ReadAt(fd, begin, text.size() + 1);
  if (bytes.compare(0, text.size(), text) != 0) {
    return false;
  }
  return bytes.size() == text.size() || bytes.back() == '\n';
}

}  // namespace

int LineIndex::Read(int fd) {
  char chunk[kChunkSize];
  LineHash hash;
  int64_t begin = 0;
  int64_t end = 0;
  try {
    for (;;) {
      size_t got = 0;
      const int error = ReadChunk(fd, chunk, sizeof(chunk), got);
      if (error != 0) {
        return error;
      }
      if (got == 0) {
        break;
      }
      std::string_view piece(chunk, got);
      while (!piece.empty()) {
        const size_t newline = piece.find('\n');
        const std::string_view part = piece.substr(0, newline);
        hash.Extend(part);
        end += static_cast<int64_t>(part.size());
        if (newline == std::string_view::npos) {
          break;
        }
        if (lines_.size() == kLinesMax) {
          return ENOMEM;
        }
        lines_.push_back({hash.Value(), begin});
        hash = LineHash();
        begin = ++end;
        piece.remove_prefix(newline + 1);
      }
    }
    if (end > begin) {
      lines_.push_back({hash.Value(), begin});
    }
    lines_.shrink_to_fit();
  } catch (const std::bad_alloc&) {
    return ENOMEM;
  }
  std::sort(lines_.begin(), lines_.end(),
            [](const Line& a, const Line& b) { return a.hash < b.hash; });
  return 0;
}

std::vector<LineIndex::Line>::const_iterator LineIndex::First(uint64_t hash) const {
  return std::lower_bound(lines_.begin(), lines_.end(), hash,
                          [](const Line& line, uint64_t wanted) { return line.hash < wanted; });
}

bool LineIndex::MayContain(std::string_view text) const {
  const uint64_t hash = HashOf(text);
  const auto line = First(hash);
  return line != lines_.end() && line->hash == hash;
}

bool LineIndex::Contains(int fd, std::string_view text) const {
  const uint64_t hash = HashOf(text);
  for (auto line = First(hash); line != lines_.end() && line->hash == hash; ++line) {
    if (IsLineAt(fd, line->begin, text)) {
      return true;
    }
  }
  return false;
}

}  // namespace vela
