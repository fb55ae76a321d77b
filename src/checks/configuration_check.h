// Finds what is wrong in the configuration files. velathumb itself ignores most of it.
#pragma once

#include <string>
#include <vector>

#include "checks/finding.h"
#include "posix/service_log.h"

namespace vela {

/// Checks the settings of the machine, /etc/velainfo.conf. A missing file is no fault.
CheckResult CheckSettings();

/// Checks the profile file `path`, with the sizes that the settings ask for.
CheckResult CheckProfile(const std::string& path);

/// Returns where the profile file has its first error, and which: "line LINE: MESSAGE"; empty when
/// it has none, or none in a line.
std::string FirstErrorOfProfile(const std::string& path);

/// Returns the profile file that is used unless another one is given: `local` if anything is there,
/// even when it cannot be read, otherwise `installed`.
std::string ChooseProfileFile(const std::string& local, const std::string& installed);

/// Returns the profile file that the services use when none is given: that of the administrator
/// in /etc, otherwise the one that was installed beside this program.
std::string DefaultProfileFile();

/// Returns the finding as a line of text without its newline: "FILE:LINE: SEVERITY: MESSAGE".
std::string FindingText(const Finding& finding);

/// Returns the level at which a service logs a finding.
LogLevel LevelOf(Severity severity);

/// Returns the findings as a service logs them when it starts: errors first, files that could not
/// be checked among the warnings, and instead of very many only their number.
std::vector<Finding> FindingsForLog(const CheckResult& result);

/// Checks the settings and the profile file `path`, and writes the findings to the log of a
/// service. Returns false when one of them is an error: velathumb would make nothing, or nothing
/// right.
bool LogFindings(const std::string& path);

}  // namespace vela
