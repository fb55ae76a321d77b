#include "checks/finding.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "posix/escaped_text.h"

namespace vela {

namespace {

constexpr size_t kMostFindings = 1000;  // of each severity
constexpr size_t kLongestQuotation = 80;

/// The order of lines, the file as a whole last.
bool IsBefore(const Finding& a, const Finding& b) {
  return a.line != 0 && (b.line == 0 || a.line < b.line);
}

bool IsContinuation(char byte) {
  return (static_cast<unsigned char>(byte) & 0xc0) == 0x80;
}

/// Returns the beginning of the bytes that is quoted; a UTF-8 character is not cut in the middle.
std::string_view CutBetweenCharacters(std::string_view bytes) {
  constexpr size_t kLongestCharacter = 4;
  if (bytes.size() <= kLongestQuotation) {
    return bytes;
  }
  size_t end = kLongestQuotation;
  while (end > kLongestQuotation - kLongestCharacter && IsContinuation(bytes[end])) {
    --end;
  }
  return bytes.substr(0, end);
}

}  // namespace

const char* SeverityName(Severity severity) {
  return severity == Severity::kError ? "error" : "warning";
}

void CheckResult::Add(CheckResult other) {
  std::move(other.findings.begin(), other.findings.end(), std::back_inserter(findings));
  std::move(other.unchecked.begin(), other.unchecked.end(), std::back_inserter(unchecked));
}

void FindingList::Add(int64_t line, Severity severity, std::string message) {
  size_t& count = severity == Severity::kError ? errors_ : warnings_;
  if (count < kMostFindings) {
    ++count;
    findings_.push_back({file_, line, severity, std::move(message)});
  } else {
    isFull_ = true;
  }
}

std::vector<Finding> FindingList::Take() {
  std::stable_sort(findings_.begin(), findings_.end(), IsBefore);
  if (isFull_) {
    findings_.push_back({file_, 0, Severity::kWarning, "further findings are not listed"});
    isFull_ = false;
  }
  warnings_ = 0;
  errors_ = 0;
  return std::exchange(findings_, {});
}

std::string Quoted(std::string_view bytes) {
  const std::string_view shown = CutBetweenCharacters(bytes);
  const std::string text = EscapeControls(shown, InvalidBytes::kEscape);
  return '"' + text + (shown.size() < bytes.size() ? "...\"" : "\"");
}

}  // namespace vela
