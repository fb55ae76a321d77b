// The lines of a text, with their numbers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace vela {

/// Reads a text line by line. The text must outlive this object and the lines.
class TextLines {
 public:
  explicit TextLines(std::string_view text) : rest_(text) {}

  /// Moves to the next line. Returns false at the end; a newline at the end of the text begins no
  /// other line.
  bool Next() {
    if (rest_.empty()) {
      return false;
    }
    const size_t newline = rest_.find('\n');
    line_ = rest_.substr(0, newline);
    rest_.remove_prefix(newline == std::string_view::npos ? rest_.size() : newline + 1);
    ++number_;
    return true;
  }

  /// Returns the line, without its newline.
  std::string_view Line() const { return line_; }

  /// Returns the number of the line, 1 for the first one.
  int64_t Number() const { return number_; }

 private:
  std::string_view rest_;
  std::string_view line_;
  int64_t number_ = 0;
};

}  // namespace vela
