#include "options.h"

#include <CLI/CLI.hpp>

#include <cstring>

namespace vela {

namespace {

constexpr ProgramText kProgramText = {
    "velathumb-status",
    "Reports the outstanding work of velathumb: which photos lack thumbnails, which videos need\n"
    "work, what the queues contain and how far the conversion has progressed.",
    "Exit status: 0 nothing to do, 1 work outstanding, 2 error.\n"
    "Nothing is changed unless --check-videos is given."};

/// Returns an error message, empty when the name of a file is valid.
std::string FindNameFault(const std::string& name) {
  return name.empty() ? "the name of the file is empty; see --help" : std::string();
}

void AddOptions(CLI::App& app, Options& options) {
  auto* directories =
      app.add_option("DIR", options.directories, "directories to check, one line for each");
  app.add_flag("-p,--photos", options.photos,
               "list incomplete photos with their missing, outdated and failed sizes")
      ->needs(directories);
  app.add_flag("-r,--recursive", options.recursive, "include everything below the directories");
  auto* failed = app.add_flag(
      "--failed", options.failed,
      "list the failed photos of the directories, or of the current one, with their sizes, the "
      "time and the reason, for which the converter is run again");
  auto* json = app.add_flag("-j,--json", options.json, "write JSON");
  auto* null = app.add_flag("-0,--null", options.nulTerminated,
                            "with --failed, write only the paths, each followed by a null byte")
                   ->needs(failed)
                   ->excludes(json);
  app.add_flag("--check-videos", options.checkVideos,
               "check videos too, with the index service; this REMOVES thumbnails of videos that "
               "are outdated or have the wrong orientation, and the Flash or MPEG-4 conversion of "
               "a rotated video when its orientation is wrong");
  app.add_option("--html", options.htmlFile, "write a page with all photos to FILE")
      ->check(FindNameFault, "")
      ->type_name("FILE")
      ->needs(directories);
  auto* queue = app.add_flag("-q,--queue", options.queue, "show the entries of the queues");
  auto* progress =
      app.add_flag("--progress", options.progress, "show the counters of conversion progress");
  auto* resumeTime =
      app.add_flag("--resume-time", options.resumeTime, "show until when conversion is paused");
  auto* security = app.add_flag("--security", options.security, "show how the tools are confined");
  auto* checkConfig = app.add_option("--check-config", options.profileFile,
                                     "check the settings and the profile file, by default that of "
                                     "the services")
                          ->type_name("PROFILE")
                          ->expected(0, 1)
                          ->excludes(directories);
  // Their texts are no paths.
  for (CLI::Option* const report : {queue, progress, resumeTime, security, checkConfig}) {
    null->excludes(report);
  }
  app.add_flag("-w,--watch", options.watch,
               "follow the progress until nothing is running or queued")
      ->excludes(directories)
      ->excludes(queue)
      ->excludes(resumeTime)
      ->excludes(security)
      ->excludes(checkConfig)
      ->excludes(failed);
}

/// Returns an error message when options that are valid one by one contradict each other, otherwise
/// an empty text.
std::string FindContradiction(const Options& options) {
  const bool hasQuery = !options.directories.empty() || options.queue || options.progress ||
                        options.watch || options.resumeTime || options.security ||
                        options.checkConfig || options.failed;
  if (options.recursive && options.directories.empty() && !options.failed) {
    return "--recursive requires DIR or --failed";
  }
  if (!hasQuery) {
    return "give a directory, --failed, --queue, --progress, --watch, --resume-time, --security or "
           "--check-config";
  }
  if (options.checkVideos && options.directories.empty() && !options.queue) {
    return "--check-videos needs a directory or --queue";
  }
  return {};
}

/// Returns the arguments such that the library takes each literally: it would parse a value that
/// begins with a bracket as a list.
std::vector<std::string> LiteralArguments(std::vector<std::string> arguments) {
  for (std::string& argument : arguments) {
    const bool isListLike = !argument.empty() && std::strchr("[{%", argument.front()) != nullptr;
    if (isListLike) {
      argument.insert(0, "./");
    }
  }
  return arguments;
}

}  // namespace

ParseOutcome ParseOptions(int argc, char** argv, Options& options) {
  return ParseCommandLine(
      kProgramText, LiteralArguments(ArgumentsOf(argc, argv)),
      [&](CLI::App& app) { AddOptions(app, options); },
      [&](const CLI::App& app) {
        options.checkConfig = app.count("--check-config") > 0;
        return FindContradiction(options);
      });
}

}  // namespace vela
