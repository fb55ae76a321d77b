// The text report about directories, parsed column by column.
#pragma once

#include <cstdint>
#include <iosfwd>
#include <string>
#include <vector>

namespace vela_test {

/// The numbers of a line, in the order of its columns.
struct StatusNumbers {
  int64_t photos = -1;
  int64_t toDo = -1;
  int64_t present = -1;
  int64_t missing = -1;
  int64_t failed = -1;
};
bool operator==(const StatusNumbers& a, const StatusNumbers& b);
void PrintTo(const StatusNumbers& numbers, std::ostream* out);

/// One line with the photos named below it.
struct StatusLine {
  StatusNumbers numbers;
  std::string videos;
  std::string queued;
  std::string name;
  std::vector<std::string> photos;
};

/// A whole report.
struct StatusText {
  std::vector<StatusLine> directories;
  StatusLine totals;

  /// The names of the directories, in order.
  std::vector<std::string> Names() const;
};

/// Parses the report; fails the test when the text is anything else.
StatusText ReadStatusText(const std::string& text);

}  // namespace vela_test
