#include "cli/command_line.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <utility>

#include "posix/service_log.h"

namespace vela {

std::vector<std::string> ArgumentsOf(int argc, char** argv) {
  return argc > 1 ? std::vector<std::string>(argv + 1, argv + argc) : std::vector<std::string>();
}

ParseOutcome ParseCommandLine(const ProgramText& text, std::vector<std::string> arguments,
                              const std::function<void(CLI::App&)>& addOptions,
                              const std::function<std::string(const CLI::App&)>& findConflict) {
  CLI::App app(text.description, text.name);
  app.footer(text.footer);
  addOptions(app);
  app.set_version_flag("--version", std::string(text.name) + " " VELA_VERSION);
  // The library expects them in reverse order.
  std::reverse(arguments.begin(), arguments.end());
  try {
    app.parse(std::move(arguments));
  } catch (const CLI::ParseError& error) {
    return app.exit(error) == 0 ? ParseOutcome::kDone : ParseOutcome::kUsageError;
  }
  const std::string conflict = findConflict ? findConflict(app) : std::string();
  if (conflict.empty()) {
    return ParseOutcome::kRun;
  }
  WriteLog(LogLevel::kError, conflict + "; see --help");
  return ParseOutcome::kUsageError;
}

void ReportException(const char* message) noexcept {
  try {
    WriteLog(LogLevel::kError, message);
  } catch (...) {
    // Not enough memory for the message: the exit status has to suffice.
  }
}

}  // namespace vela
