// Ending the program when the test environment is broken.
#pragma once

#include <string>

namespace vela_test {

/// Ends the process with one line on standard error: a directory, a tool or a mount that the tests
/// rely on could not be created, so no result of this run would be meaningful.
[[noreturn]] void EnvironmentFailure(const std::string& what);

/// The same with the text of the current errno after `what`.
[[noreturn]] void EnvironmentFailureWithErrno(const std::string& what);

}  // namespace vela_test
