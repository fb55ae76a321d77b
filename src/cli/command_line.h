// The command line of a companion program, and what its main function does.
#pragma once

#include <exception>
#include <functional>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace vela {

/// What --help says besides the options.
struct ProgramText {
  const char* name;
  const char* description;
  const char* footer;
};

/// How parsing a command line ended.
enum class ParseOutcome {
  kRun,    ///< the options are valid
  kDone,   ///< help or version was printed
  kWrong,  ///< wrong use, reported on standard error
};

/// Exit status after wrong use, the same for all programs.
inline constexpr int kWrongUse = 2;

/// Returns the arguments that follow the name of the program.
std::vector<std::string> ArgumentsOf(int argc, char** argv);

/// Parses `arguments`. `addOptions` adds the options of the program; --help and --version are added
/// here. `findMistake` is called with options that are valid one by one and returns what is wrong
/// with them together, empty when nothing is. Mistakes are reported on standard error. Throws what
/// the two functions throw.
ParseOutcome ParseCommandLine(
    const ProgramText& text, std::vector<std::string> arguments,
    const std::function<void(CLI::App&)>& addOptions,
    const std::function<std::string(const CLI::App&)>& findMistake = nullptr);

/// Reports the message of an exception that ends the program; throws nothing.
void ReportException(const char* message) noexcept;

/// The body of main: calls `parse` and, when that returns kRun, `run` with the options. Returns the
/// exit status: that of `run`, 0 after help or version, kWrongUse after wrong use, `failureStatus`
/// when `run` throws.
template <typename Options, typename Run>
int RunProgram(int argc, char** argv, ParseOutcome (*parse)(int, char**, Options&), const Run& run,
               int failureStatus) noexcept {
  int status = kWrongUse;
  try {
    Options options;
    const ParseOutcome outcome = parse(argc, argv, options);
    if (outcome != ParseOutcome::kRun) {
      return outcome == ParseOutcome::kDone ? 0 : kWrongUse;
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
