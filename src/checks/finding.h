// What is wrong in a configuration file.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace vela {

enum class Severity {
  kWarning,  ///< something is ignored, or a default is used
  kError,    ///< nothing can be made with it, or nothing right
};

/// Returns "warning" or "error".
const char* SeverityName(Severity severity);

/// One fault.
struct Finding {
  std::string file;
  int64_t line = 0;  ///< from 1; 0 for the file as a whole
  Severity severity = Severity::kWarning;
  std::string message;  ///< one line of valid UTF-8 without control characters
};

/// A file that could not be read, so that nothing in it was checked.
struct UncheckedFile {
  std::string file;
  int error = 0;  ///< errno value
};

/// The result of a check.
struct CheckResult {
  std::vector<Finding> findings;  ///< by line, those of whole files last
  std::vector<UncheckedFile> unchecked;

  /// Appends the result of another check.
  void Add(CheckResult other);
};

/// Collects the findings of one file. A file with nothing right in it does not fill the memory:
/// after many findings of one severity the others of it are dropped, and the last one says so.
class FindingList {
 public:
  explicit FindingList(std::string file) : file_(std::move(file)) {}

  void Add(int64_t line, Severity severity, std::string message);
  void Warn(int64_t line, std::string message) {
    Add(line, Severity::kWarning, std::move(message));
  }

  /// Returns the findings in the order of their lines; the list is then empty.
  std::vector<Finding> Take();

 private:
  std::string file_;
  std::vector<Finding> findings_;
  size_t warnings_ = 0;  // in the list
  size_t errors_ = 0;
  bool isFull_ = false;
};

/// Returns the bytes in quotation marks, as a part of a message: cut when they are long, with
/// everything escaped that is not printable.
std::string Quoted(std::string_view bytes);

}  // namespace vela
