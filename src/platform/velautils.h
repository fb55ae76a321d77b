// Utility library of the platform: sectioned configuration files, child processes, path parts.
#pragma once

#include <memory>
#include <string>
#include <vector>

namespace VELAUtils {

/// A configuration file of named sections with key/value pairs.
class ConfParser {
 public:
  ConfParser();
  ~ConfParser();
  ConfParser(const ConfParser&) = delete;
  ConfParser& operator=(const ConfParser&) = delete;

  /// Reads the file at `path`. Returns true on success; false when the file cannot be read or
  /// contains a line that is not a section, pair, comment or blank line.
  bool loadFromFile(const std::string& path);

  /// Returns the section names in file order, each once.
  std::vector<std::string> enumSections() const;

  /// Returns the leading base-10 integer of the key's value, limited to the range of int;
  /// `defaultValue` when the key is absent or its value does not begin with a number.
  int getInt(const std::string& section, const std::string& key, int defaultValue) const;

  /// Returns the key's value, or `defaultValue` when the key is absent.
  std::string getString(const std::string& section, const std::string& key,
                        const std::string& defaultValue) const;

 private:
  struct Content;
  std::unique_ptr<Content> content_;
};

/// A child process that is started without a shell.
class ProcessRunner {
 public:
  /// Prepares `program` with its argument zero and up to eight arguments; the first null ends them.
  ProcessRunner(const char* program, const char* arg0, const char* a1 = nullptr,
                const char* a2 = nullptr, const char* a3 = nullptr, const char* a4 = nullptr,
                const char* a5 = nullptr, const char* a6 = nullptr, const char* a7 = nullptr,
                const char* a8 = nullptr);

  /// Appends up to nine arguments in order; the first null ends them.
  void addArguments(const char* a1, const char* a2 = nullptr, const char* a3 = nullptr,
                    const char* a4 = nullptr, const char* a5 = nullptr, const char* a6 = nullptr,
                    const char* a7 = nullptr, const char* a8 = nullptr, const char* a9 = nullptr);

  /// Starts the program; with `wait` waits for its end, with `keepOutput` it writes to the
  /// caller's output instead of /dev/null. Returns 0 when the child exited with 0 (or, without
  /// `wait`, was started), else non-zero: exit status, ended by a signal, killed after the time
  /// limit, or not startable.
  int run(bool wait, bool keepOutput);

 private:
  std::string program_;
  std::vector<std::string> arguments_;
};

/// Returns the directory part of `path` without the trailing slash; "." when there is none.
std::string GetPathDirName(const std::string& path);

/// Returns the extension of the last component of `path`, without the dot; empty when there is
/// none.
std::string GetPathExt(const std::string& path);

}  // namespace VELAUtils
