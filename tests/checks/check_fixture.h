// Findings as lines of text.
#pragma once

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "checks/configuration_check.h"
#include "support/files.h"
#include "support/named_case.h"
#include "support/quiet_test.h"

namespace vela_test {

/// The findings without the name of the file, such as "3: warning: MESSAGE".
inline std::vector<std::string> LinesOf(const vela::CheckResult& result) {
  std::vector<std::string> lines;
  for (const vela::Finding& finding : result.findings) {
    lines.push_back(vela::FindingText(finding).substr(finding.file.size() + 1));
  }
  return lines;
}

/// A text, and the findings in it: each begins with the line and the severity.
struct FindingsCase : NamedCase {
  std::string text;
  std::vector<std::string> findings;
};

}  // namespace vela_test
