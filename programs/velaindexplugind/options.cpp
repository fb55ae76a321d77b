#include "options.h"

#include <CLI/CLI.hpp>

#include <iostream>
#include <limits>
#include <optional>
#include <string_view>

#include "whole_number.h"

namespace vela {

namespace {

constexpr int kMaxWorkers = 64;
constexpr int kMaxTimeout = 3600;
constexpr int kMaxClients = 100000;

constexpr char kDescription[] =
    "Answers questions about photos and videos on the local socket of the index service, and "
    "keeps\n"
    "what it knows in the embedded index database. Runs in the foreground.";

constexpr char kFooter[] =
    "Exit status: 0 ended by a signal or request carried out, 1 could not start or request not\n"
    "carried out, 2 wrong use.";

/// The options as they are written.
struct Words {
  std::string setVersion;
  std::string unsetVersion;
};

void AddOptions(CLI::App& app, Options& options, Words& words) {
  app.add_option("--database", options.database, "the index database")
      ->type_name("FILE")
      ->capture_default_str();
  app.add_option("--group", options.group, "group that may use the socket (default: root's)")
      ->type_name("NAME");
  app.add_option("--workers", options.workers, "media files read at once")
      ->type_name("N")
      ->check(CLI::Range(1, kMaxWorkers))
      ->capture_default_str();
  app.add_option("--client-timeout", options.clientTimeout,
                 "seconds after which a client that keeps still is let go")
      ->type_name("SECONDS")
      ->check(CLI::Range(1, kMaxTimeout))
      ->capture_default_str();
  app.add_option("--max-clients", options.maxClients, "connections at once; more have to wait")
      ->type_name("N")
      ->check(CLI::Range(1, kMaxClients))
      ->capture_default_str();
  app.add_flag("--log-requests", options.logRequests, "log every request");
  auto* setVersion =
      app.add_option(
             "--set-index-version", words.setVersion,
             "tell the running daemon the index version of a directory and what is below it")
          ->type_name("DIR=N");
  app.add_option("--unset-index-version", words.unsetVersion,
                 "tell the running daemon to forget the version set for a directory")
      ->type_name("DIR")
      ->excludes(setVersion);
  app.set_version_flag("--version", "velaindexplugind " VELA_VERSION);
}

/// Returns what is wrong with DIR=N, empty when nothing is. The directory's name may have a `=`.
std::string TakeVersion(const std::string& word, Options& options) {
  const size_t equals = word.rfind('=');
  if (equals == std::string::npos) return "--set-index-version wants DIR=N";
  const auto number = ParseWholeNumber(std::string_view(word).substr(equals + 1));
  if (!number) return "the index version is a number from 0 to 2147483647";
  options.versionDirectory = word.substr(0, equals);
  options.version = *number;
  return {};
}

/// Returns what is wrong with the words, empty when nothing is.
std::string TakeWords(const CLI::App& app, const Words& words, Options& options) {
  const bool isSet = app.count("--set-index-version") > 0;
  const bool isUnset = app.count("--unset-index-version") > 0;
  if (isSet) {
    const std::string error = TakeVersion(words.setVersion, options);
    if (!error.empty()) return error;
  }
  if (isUnset) {
    options.versionDirectory = words.unsetVersion;
    options.isVersionRemoved = true;
  }
  const bool isAbsolute = !options.versionDirectory.empty() && options.versionDirectory[0] == '/';
  if ((isSet || isUnset) && !isAbsolute) return "the directory must begin with a slash";
  if (options.database.empty()) return "--database wants a file";
  return {};
}

}  // namespace

ParseOutcome ParseOptions(int argc, char** argv, Options& options) {
  try {
    CLI::App app(kDescription, "velaindexplugind");
    app.footer(kFooter);
    Words words;
    AddOptions(app, options, words);
    try {
      app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
      return app.exit(error) == 0 ? ParseOutcome::kDone : ParseOutcome::kWrong;
    }
    const std::string mistake = TakeWords(app, words, options);
    if (mistake.empty()) return ParseOutcome::kRun;
    std::cerr << "velaindexplugind: " << mistake << "; --help tells more\n";
  } catch (const std::exception& error) {
    std::cerr << "velaindexplugind: " << error.what() << '\n';
  }
  return ParseOutcome::kWrong;
}

}  // namespace vela
