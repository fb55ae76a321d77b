#include "checks/configuration_check.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "platform/velaindex.h"

namespace vela {

namespace {

constexpr char kAdministratorsProfile[] = "/etc/velathumb/thumb-profiles.conf";
constexpr char kInstalledProfile[] = "share/velathumb/thumb-profiles.conf";

bool IsError(const Finding& finding) {
  return finding.severity == Severity::kError;
}

}  // namespace

std::string FirstErrorOfProfile(const std::string& path) {
  for (const Finding& finding : CheckProfile(path).findings) {
    if (IsError(finding) && finding.line != 0) {
      return "line " + std::to_string(finding.line) + ": " + finding.message;
    }
  }
  return {};
}

std::string ChooseProfileFile(const std::string& local, const std::string& installed) {
  return IsFileExist(local.c_str()) != 0 ? local : installed;
}

std::string DefaultProfileFile() {
  std::error_code error;
  const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
  return ChooseProfileFile(kAdministratorsProfile,
                           (program.parent_path().parent_path() / kInstalledProfile).string());
}

std::string FindingText(const Finding& finding) {
  const std::string place =
      finding.line == 0 ? finding.file : finding.file + ':' + std::to_string(finding.line);
  return place + ": " + SeverityName(finding.severity) + ": " + finding.message;
}

LogLevel LevelOf(Severity severity) {
  return severity == Severity::kError ? LogLevel::kError : LogLevel::kWarning;
}

std::vector<Finding> FindingsForLog(const CheckResult& result) {
  constexpr size_t kMostFindings = 20;
  std::vector<Finding> findings;
  for (const UncheckedFile& unchecked : result.unchecked) {
    findings.push_back({unchecked.file, 0, Severity::kWarning,
                        std::string("cannot be checked: ") + std::strerror(unchecked.error)});
  }
  findings.insert(findings.end(), result.findings.begin(), result.findings.end());
  std::stable_partition(findings.begin(), findings.end(), IsError);
  if (findings.size() > kMostFindings) {
    const size_t others = findings.size() - kMostFindings;
    findings.resize(kMostFindings);
    findings.push_back(
        {findings.back().file, 0, Severity::kWarning,
         std::to_string(others) + " more findings; velathumb-status --check-config lists all"});
  }
  return findings;
}

bool LogFindings(const std::string& path) {
  CheckResult result = CheckSettings();
  result.Add(CheckProfile(path));
  for (const Finding& finding : FindingsForLog(result)) {
    WriteLog(LevelOf(finding.severity), FindingText(finding));
  }
  return std::none_of(result.findings.begin(), result.findings.end(), IsError);
}

}  // namespace vela
