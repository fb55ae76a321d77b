// What a broken test environment ends in.
#pragma once

#include <string>

namespace vela_test {

/// Ends the process with one line on standard error: a place of the sandbox, a tool or a mount that
/// the tests rely on could not be made, so no result of this run would mean anything.
[[noreturn]] void EnvironmentFailure(const std::string& what);

/// The same with the text of the current errno behind `what`.
[[noreturn]] void EnvironmentFailureWithErrno(const std::string& what);

}  // namespace vela_test
