#include "checks/finding.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "posix/escaped_text.h"

namespace vela {

namespace {

constexpr size_t kMostFindings = 1000;
constexpr size_t kLongestQuotation = 80;

/// The order of lines, the file as a whole last.
bool IsBefore(const Finding& a, const Finding& b) {
  return a.line != 0 && (b.line == 0 || a.line < b.line);
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
  if (findings_.size() < kMostFindings) {
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
  return std::exchange(findings_, {});
}

std::string Quoted(std::string_view bytes) {
  const bool isCut = bytes.size() > kLongestQuotation;
  const std::string text =
      EscapeControls(bytes.substr(0, kLongestQuotation), InvalidBytes::kEscape);
  return '"' + text + (isCut ? "...\"" : "\"");
}

}  // namespace vela
