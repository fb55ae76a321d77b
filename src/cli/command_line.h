// The command line of a companion program, and the body of its main function.
#pragma once

#include <exception>
#include <functional>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace vela {

/// The text of --help besides the options.
struct ProgramText {
  const char* name;
  const char* description;
  const char* footer;
};

/// How parsing a command line ended.
enum class ParseOutcome {
  kRun,         ///< the options are valid
  kDone,        ///< help or version was printed
  kUsageError,  ///< usage error, reported on standard error
};

/// Exit status after a usage error, of all programs that have no reason for another one.
inline constexpr int kUsageError = 2;

/// Returns the arguments that follow the name of the program.
std::vector<std::string> ArgumentsOf(int argc, char** argv);

/// Parses `arguments`. `addOptions` adds the options of the program; --help and --version are added
/// here. `findConflict` is called when every option is valid by itself; it returns why the
/// combination is invalid, empty when it is valid. Errors are reported on standard error.
/// Exceptions of the two functions are passed on.
ParseOutcome ParseCommandLine(
    const ProgramText& text, std::vector<std::string> arguments,
    const std::function<void(CLI::App&)>& addOptions,
    const std::function<std::string(const CLI::App&)>& findConflict = nullptr);

/// Reports the message of an exception that ends the program; throws nothing.
void ReportException(const char* message) noexcept;

/// The body of main: calls `parse` and, when that returns kRun, `run` with the options. Returns the
/// exit status: that of `run`, 0 after help or version, `usageStatus` after a usage error,
/// `failureStatus` when `run` throws.
template <typename Options, typename Run>
int RunProgram(int argc, char** argv, ParseOutcome (*parse)(int, char**, Options&), const Run& run,
               int failureStatus, int usageStatus = kUsageError) noexcept {
  int status = usageStatus;
  try {
    Options options;
    const ParseOutcome outcome = parse(argc, argv, options);
    if (outcome != ParseOutcome::kRun) {
      return outcome == ParseOutcome::kDone ? 0 : usageStatus;
    }
    status = failureStatus;
    return run(options);
  } catch (const std::exception& error) {
    ReportException(error.what());
  } catch (...) {
    ReportException("unknown error");
  }
  return status;
}

}  // namespace vela
