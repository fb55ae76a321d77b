#include "options.h"

#include <CLI/CLI.hpp>

#include <cstring>
#include <iostream>

namespace vela {

namespace {

constexpr char kDescription[] =
    "Tells what velathumb still has to do: which photos lack thumbnails, which videos need work,\n"
    "what waits in the queues and how far the conversion has come.";

constexpr char kFooter[] =
    "Exit status: 0 nothing to do, 1 work outstanding, 2 error.\n"
    "Nothing is changed, unless --check-videos asks for it.";

/// Returns what is wrong with the name of a file, empty when nothing is.
std::string FindNameFault(const std::string& name) {
  return name.empty() ? "the name of the file is empty; --help tells more" : std::string();
}

void AddOptions(CLI::App& app, Options& options) {
  auto* directories =
      app.add_option("DIR", options.directories, "directories to look at, a line for each");
  app.add_flag("-p,--photos", options.photos, "name the photos and what each lacks or failed at")
      ->needs(directories);
  app.add_flag("-r,--recursive", options.recursive, "look below the directories too")
      ->needs(directories);
  app.add_flag("--check-videos", options.checkVideos,
               "look at videos too, with the index service; this REMOVES thumbnails of videos that "
               "are outdated or of the wrong orientation, and the Flash film or MPEG-4 conversion "
               "of a rotated video that stands wrong");
  app.add_option("--html", options.htmlFile, "write a page with all photos to FILE")
      ->check(FindNameFault, "")
      ->type_name("FILE")
      ->needs(directories);
  auto* queue = app.add_flag("-q,--queue", options.queue, "tell what the queues hold");
  app.add_flag("--progress", options.progress, "tell the counters of conversion progress");
  auto* resumeTime =
      app.add_flag("--resume-time", options.resumeTime, "tell until when conversion is held back");
  app.add_flag("-w,--watch", options.watch,
               "follow the progress until no velathumb is running any more")
      ->excludes(directories)
      ->excludes(queue)
      ->excludes(resumeTime);
  app.add_flag("-j,--json", options.json, "answer in JSON");
  app.set_version_flag("--version", "velathumb-status " VELA_VERSION);
}

/// Returns what is wrong with options that are right each by itself, empty when nothing is.
std::string FindContradiction(const Options& options) {
  const bool hasQuestion = !options.directories.empty() || options.queue || options.progress ||
                           options.watch || options.resumeTime;
  if (!hasQuestion) {
    return "give a directory, --queue, --progress, --watch or --resume-time";
  }
  if (options.checkVideos && options.directories.empty() && !options.queue) {
    return "--check-videos needs a directory or --queue";
  }
  return {};
}

/// Returns the arguments such that the library takes each literally: a value that begins with a
/// bracket would be a list to it.
std::vector<std::string> LiteralArguments(int argc, char** argv) {
  std::vector<std::string> arguments;
  // From the last to the first, as the library wants them.
  for (int i = argc - 1; i > 0; --i) {
    const std::string argument = argv[i];
    const bool isListLike = !argument.empty() && std::strchr("[{%", argument.front()) != nullptr;
    arguments.push_back(isListLike ? "./" + argument : argument);
  }
  return arguments;
}

}  // namespace

ParseOutcome ParseOptions(int argc, char** argv, Options& options) {
  try {
    CLI::App app(kDescription, "velathumb-status");
    app.footer(kFooter);
    AddOptions(app, options);
    try {
      app.parse(LiteralArguments(argc, argv));
    } catch (const CLI::ParseError& error) {
      return app.exit(error) == 0 ? ParseOutcome::kDone : ParseOutcome::kWrong;
    }
    const std::string contradiction = FindContradiction(options);
    if (contradiction.empty()) {
      return ParseOutcome::kRun;
    }
    std::cerr << "velathumb-status: " << contradiction << "; --help tells more\n";
  } catch (const std::exception& error) {
    std::cerr << "velathumb-status: " << error.what() << '\n';
  }
  return ParseOutcome::kWrong;
}

}  // namespace vela
