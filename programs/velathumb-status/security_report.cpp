#include "security_report.h"

#include <ostream>
#include <sstream>

#include "platform/system_rules.h"
#include "posix/file_content.h"
#include "posix/landlock.h"
#include "text_encoding.h"

namespace vela {

namespace {

constexpr uint64_t kGibibyte = uint64_t{1} << 30;

const char* ActiveText(bool isActive) {
  return isActive ? "active" : "not supported by this kernel";
}

std::string LandlockText(int version) {
  if (version < 1) {
    return ActiveText(false);
  }
  std::string text = "active, Landlock version " + std::to_string(version);
  const char* separator = ": ";
  for (const std::string& right : LandlockCoverage(version)) {
    text += separator + right;
    separator = ", ";
  }
  return text;
}

/// The lines of the file, as far as they name programs.
std::vector<std::string> UnconfinedTools() {
  std::istringstream lines(ReadSystemFile(kUnconfinedToolsFile, kUnconfinedToolsSize));
  std::vector<std::string> tools;
  for (std::string line; std::getline(lines, line);) {
    if (line.front() == '/') {
      tools.push_back(line);
    }
  }
  return tools;
}

}  // namespace

SecurityState ReadSecurityState() {
  return {FindConfinementSupport(), UnconfinedTools()};
}

void WriteSecurityText(std::ostream& out, const SecurityState& state) {
  const ConfinementSupport& support = state.support;
  out << "confinement of the tools:\n"
      << "    no new privileges: " << ActiveText(support.noNewPrivileges) << '\n'
      << "    system call filter: " << ActiveText(support.seccomp) << '\n'
      << "    file access: " << LandlockText(support.landlockVersion) << '\n'
      << "    link checks in one system call: " << ActiveText(support.openat2) << '\n'
      << "    limits: active, " << kToolMemory / kGibibyte << " GiB of memory, "
      << kToolFileSize / kGibibyte << " GiB for each file, processor time, no core dumps\n"
      << "    unconfined tools:" << (state.unconfinedTools.empty() ? " none\n" : "\n");
  for (const std::string& tool : state.unconfinedTools) {
    out << "        " << ToPlainLine(tool) << '\n';
  }
}

Json::Value DescribeSecurity(const SecurityState& state) {
  const ConfinementSupport& support = state.support;
  Json::Value object;
  object["no_new_privileges"] = support.noNewPrivileges;
  object["system_call_filter"] = support.seccomp;
  object["landlock_version"] = support.landlockVersion;
  object["landlock_covers"] = Json::Value(Json::arrayValue);
  for (const std::string& right : LandlockCoverage(support.landlockVersion)) {
    object["landlock_covers"].append(right);
  }
  object["openat2"] = support.openat2;
  object["memory_limit"] = Json::Value(Json::UInt64{kToolMemory});
  object["file_size_limit"] = Json::Value(Json::UInt64{kToolFileSize});
  object["unconfined_tools"] = Json::Value(Json::arrayValue);
  for (const std::string& tool : state.unconfinedTools) {
    object["unconfined_tools"].append(ToUtf8(tool));
  }
  return object;
}

}  // namespace vela
