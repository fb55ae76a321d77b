#include "status_text.h"

#include <gtest/gtest.h>

#include <ostream>
#include <sstream>

namespace vela_test {

namespace {

constexpr char kPhotoIndent[] = "    ";
constexpr size_t kPhotoIndentLength = 4;

bool IsPhotoLine(const std::string& line) {
  return line.compare(0, kPhotoIndentLength, kPhotoIndent) == 0 &&
         line.size() > kPhotoIndentLength && line[kPhotoIndentLength] != ' ';
}

StatusLine ReadStatusLine(const std::string& text) {
  StatusLine line;
  std::istringstream in(text);
  StatusNumbers& numbers = line.numbers;
  in >> numbers.photos >> numbers.toDo >> numbers.present >> numbers.missing >> numbers.failed >>
      line.videos >> line.queued;
  EXPECT_TRUE(in.good()) << text;
  std::string gap(2, '?');
  in.read(gap.data(), 2);
  EXPECT_EQ(gap, "  ") << text;
  std::getline(in, line.name);
  return line;
}

}  // namespace

bool operator==(const StatusNumbers& a, const StatusNumbers& b) {
  return a.photos == b.photos && a.toDo == b.toDo && a.present == b.present &&
         a.missing == b.missing && a.failed == b.failed;
}

void PrintTo(const StatusNumbers& numbers, std::ostream* out) {
  *out << numbers.photos << " photos, " << numbers.toDo << " to do, " << numbers.present
       << " present, " << numbers.missing << " missing, " << numbers.failed << " failed";
}

std::vector<std::string> StatusText::Names() const {
  std::vector<std::string> names;
  for (const StatusLine& directory : directories) {
    names.push_back(directory.name);
  }
  return names;
}

StatusText ReadStatusText(const std::string& text) {
  StatusText answer;
  std::istringstream in(text);
  std::string line;
  std::getline(in, line);
  while (std::getline(in, line)) {
    if (!IsPhotoLine(line)) {
      answer.directories.push_back(ReadStatusLine(line));
    } else if (answer.directories.empty()) {
      ADD_FAILURE() << "a photo without a directory: " << line;
    } else {
      answer.directories.back().photos.push_back(line.substr(kPhotoIndentLength));
    }
  }
  if (answer.directories.empty()) {
    ADD_FAILURE() << "no totals in: " << text;
    return answer;
  }
  answer.totals = answer.directories.back();
  answer.directories.pop_back();
  return answer;
}

}  // namespace vela_test
