#include "options.h"

#include <CLI/CLI.hpp>

#include <optional>
#include <string_view>

#include "configuration/whole_number.h"

namespace vela {

namespace {

constexpr int kMaxWorkers = 64;
constexpr int kMaxTimeout = 3600;
constexpr int kMaxClients = 100000;

constexpr ProgramText kProgramText = {
    "velaindexplugind",
    "Answers requests about photos and videos on the local socket of the index service and stores\n"
    "their data in the embedded index database. Runs in the foreground.",
    "Exit status: 0 ended by a signal or request carried out, 1 could not start or request not\n"
    "carried out, 2 invalid command line, 78 could not start with these options or this index."};

/// Options that are parsed further.
struct OptionText {
  std::string setVersion;
  std::string unsetVersion;
};

void AddOptions(CLI::App& app, Options& options, OptionText& text) {
  app.add_option("--database", options.database, "the index database")
      ->type_name("FILE")
      ->capture_default_str();
  app.add_option("--group", options.group, "group that may use the socket (default: root's)")
      ->type_name("NAME");
  app.add_option("--workers", options.workers, "media files read at a time")
      ->type_name("N")
      ->check(CLI::Range(1, kMaxWorkers))
      ->capture_default_str();
  app.add_option("--client-timeout", options.clientTimeout,
                 "disconnect a client that is idle for SECONDS")
      ->type_name("SECONDS")
      ->check(CLI::Range(1, kMaxTimeout))
      ->capture_default_str();
  app.add_option("--max-clients", options.maxClients, "connections at a time; others have to wait")
      ->type_name("N")
      ->check(CLI::Range(1, kMaxClients))
      ->capture_default_str();
  app.add_flag("--log-requests", options.logRequests, "log every request");
  auto* setVersion =
      app.add_option(
             "--set-index-version", text.setVersion,
             "have the running daemon set the index version of a directory and everything below it")
          ->type_name("DIR=N");
  app.add_option("--unset-index-version", text.unsetVersion,
                 "have the running daemon remove the version set for a directory")
      ->type_name("DIR")
      ->excludes(setVersion);
}

/// Parses DIR=N, where the name of the directory may contain a `=`. Returns an error message,
/// empty on success.
std::string ParseVersion(const std::string& argument, Options& options) {
  const size_t equals = argument.rfind('=');
  if (equals == std::string::npos) {
    return "--set-index-version needs DIR=N";
  }
  const auto number = ParseWholeNumber(std::string_view(argument).substr(equals + 1));
  if (!number) {
    return "the index version is a number from 0 to 2147483647";
  }
  options.versionDirectory = argument.substr(0, equals);
  options.version = *number;
  return {};
}

/// Parses the options further. Returns an error message, empty on success.
std::string ParseText(const CLI::App& app, const OptionText& text, Options& options) {
  const bool isSet = app.count("--set-index-version") > 0;
  const bool isUnset = app.count("--unset-index-version") > 0;
  if (isSet) {
    const std::string error = ParseVersion(text.setVersion, options);
    if (!error.empty()) {
      return error;
    }
  }
  if (isUnset) {
    options.versionDirectory = text.unsetVersion;
    options.isVersionRemoved = true;
  }
  const bool isAbsolute = !options.versionDirectory.empty() && options.versionDirectory[0] == '/';
  if ((isSet || isUnset) && !isAbsolute) {
    return "the directory must begin with a slash";
  }
  if (options.database.empty()) {
    return "--database needs a file";
  }
  return {};
}

}  // namespace

ParseOutcome ParseOptions(int argc, char** argv, Options& options) {
  OptionText text;
  return ParseCommandLine(
      kProgramText, ArgumentsOf(argc, argv), [&](CLI::App& app) { AddOptions(app, options, text); },
      [&](const CLI::App& app) { return ParseText(app, text, options); });
}

}  // namespace vela
