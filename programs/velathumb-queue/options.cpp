#include "options.h"

#include <CLI/CLI.hpp>

#include <filesystem>
#include <string>
#include <system_error>

#include "checks/configuration_check.h"

namespace vela {

namespace {

constexpr ProgramText kProgramText = {
    "velathumb-queue",
    "Processes the queue of directories that need thumbnails: runs velathumb for each entry.",
    "Exit status: 0 the queue is empty, or the entries were queued for a service, 1 entries are "
    "left for a later run: stopped by a signal,\n"
    "entries that cannot be processed now, or another velathumb-queue is running; 2 error;\n"
    "64 invalid command line;\n"
    "78 velathumb cannot be started, or would make nothing, or nothing right, with this profile or "
    "these settings."};

void AddOptions(CLI::App& app, RunSettings& settings) {
  app.add_flag("-f,--follow", settings.follow, "keep running and wait for new entries");
  app.add_option("-j,--jobs", settings.jobs,
                 "process up to N entries at a time, never overlapping ones")
      ->type_name("N")
      ->check(CLI::Range(1, 256));
  app.add_option("-a,--add", settings.additions,
                 "append ENTRY to the queue: a directory, or R: and a directory; may be repeated; "
                 "the work is left to the service, if there is one")
      ->type_name("ENTRY")
      ->allow_extra_args(false);
  app.add_flag("--now", settings.now, "with --add: process the queue here, also with a service");
  app.add_flag("--queue-only", settings.queueOnly, "with --add: do not process the queue");
  app.add_option("-p,--profile", settings.velathumb.profileFile, "profile file for velathumb")
      ->type_name("FILE")
      ->capture_default_str();
  app.add_option("--velathumb", settings.velathumb.path, "the velathumb to run")
      ->type_name("FILE")
      ->capture_default_str();
  app.add_flag("--wait", settings.wait,
               "when another velathumb-queue is running, wait for it to end");
  app.add_flag("--check-videos", settings.checkVideos,
               "count the videos in the video queue for the progress totals; this REMOVES bad "
               "thumbnails and converted videos of these videos");
}

/// Returns why the options contradict each other, empty when they do not.
std::string FindConflict(const RunSettings& settings) {
  if (settings.queueOnly && settings.additions.empty()) {
    return "--queue-only needs --add";
  }
  if (settings.queueOnly && (settings.now || settings.wait || settings.follow)) {
    return "--queue-only excludes --now, --wait and --follow";
  }
  return {};
}

/// Returns the velathumb that was installed together with this program, and the profile file for
/// it.
VelathumbCommand InstalledVelathumb() {
  std::error_code error;
  const auto program = std::filesystem::read_symlink("/proc/self/exe", error);
  return {(program.parent_path() / "velathumb").string(), DefaultProfileFile()};
}

}  // namespace

ParseOutcome ParseOptions(int argc, char** argv, RunSettings& settings) {
  settings.velathumb = InstalledVelathumb();
  const auto findConflict = [&](const CLI::App&) { return FindConflict(settings); };
  return ParseCommandLine(
      kProgramText, ArgumentsOf(argc, argv), [&](CLI::App& app) { AddOptions(app, settings); },
      findConflict);
}

}  // namespace vela
