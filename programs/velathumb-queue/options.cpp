#include "options.h"

#include <unistd.h>

#include <CLI/CLI.hpp>

#include <cerrno>
#include <filesystem>
#include <string>
#include <system_error>

#include "run_log.h"

namespace vela {

namespace {

constexpr char kDescription[] =
    "Works the queue of directories off that wait for thumbnails: runs velathumb for each.";

constexpr char kFooter[] =
    "Exit status: 0 nothing waits any more, 1 something was left for a later run: ended by a\n"
    "signal, could not be worked on, or another velathumb-queue is running; 2 error.";

void AddOptions(CLI::App& app, RunSettings& settings) {
  app.add_flag("-f,--follow", settings.follow, "stay and wait for new entries");
  app.add_option("-j,--jobs", settings.jobs,
                 "work on up to N directories at a time, never two of a tree")
      ->type_name("N")
      ->check(CLI::Range(1, 256));
  app.add_option("-a,--add", settings.additions,
                 "append ENTRY to the queue first: a directory, or R: and a directory; can be "
                 "given again")
      ->type_name("ENTRY")
      ->allow_extra_args(false);
  app.add_option("-p,--profile", settings.program.profileFile, "profile file for velathumb")
      ->type_name("FILE")
      ->capture_default_str();
  app.add_option("--velathumb", settings.program.path, "the velathumb to run")
      ->type_name("FILE")
      ->capture_default_str();
  app.add_flag("--wait", settings.wait,
               "when another velathumb-queue is running, wait for its end");
  app.add_flag("--check-videos", settings.checkVideos,
               "count the videos that wait in their queue for the progress totals; this REMOVES "
               "bad thumbnails and films of these videos");
  app.set_version_flag("--version", "velathumb-queue " VELA_VERSION);
}

bool IsUsable(const std::string& file, int mode) {
  if (access(file.c_str(), mode) == 0) {
    return true;
  }
  WriteLog(LogLevel::kError, file + ": " + ErrnoText(errno));
  return false;
}

/// Returns the directory that this program was installed into.
std::filesystem::path OwnDirectory() {
  std::error_code error;
  return std::filesystem::read_symlink("/proc/self/exe", error).parent_path();
}

/// What is installed together with this program.
ChildProgram InstalledProgram() {
  const std::filesystem::path programs = OwnDirectory();
  const auto profiles = programs.parent_path() / "share/velathumb/thumb-profiles.conf";
  return {(programs / "velathumb").string(), profiles.string()};
}

}  // namespace

ParseOutcome ParseOptions(int argc, char** argv, RunSettings& settings) {
  try {
    settings.program = InstalledProgram();
    CLI::App app(kDescription, "velathumb-queue");
    app.footer(kFooter);
    AddOptions(app, settings);
    try {
      app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
      return app.exit(error) == 0 ? ParseOutcome::kDone : ParseOutcome::kWrong;
    }
  } catch (const std::exception& error) {
    WriteLog(LogLevel::kError, error.what());
    return ParseOutcome::kWrong;
  }
  // velathumb says nothing about a profile that is not there, and every entry would count as done.
  return IsUsable(settings.program.path, X_OK) && IsUsable(settings.program.profileFile, R_OK)
             ? ParseOutcome::kRun
             : ParseOutcome::kWrong;
}

}  // namespace vela
