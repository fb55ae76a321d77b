#include "process/failure_report.h"

#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <exception>
#include <string_view>

#include "platform/system_rules.h"
#include "posix/escaped_text.h"
#include "posix/log.h"

namespace vela {

namespace {

constexpr std::string_view kPrefix = "convert-thumb: ";

/// Enough for the longest path.
constexpr size_t kMaxLine = 8192;

std::atomic_flag g_isReported = ATOMIC_FLAG_INIT;
char g_line[kMaxLine] = "";
std::atomic<bool> g_isLineComplete{false};

/// Where failures are logged, and as whose. Never destroyed: a library may abort at any time.
struct FailureLog {
  LogConnection connection;
  std::string beginning;  ///< of each line
  std::string source;     ///< as failures name it
};
std::atomic<const FailureLog*> g_log{nullptr};
static_assert(std::atomic<const FailureLog*>::is_always_lock_free);

bool IsControl(char character) {
  return static_cast<unsigned char>(character) < ' ';
}

/// Messages of libraries may have several lines, and file names may contain any character.
void MakeOneLine(char* text) {
  char* end = text + std::strlen(text);
  while (end != text && IsControl(end[-1])) {
    --end;
  }
  *end = '\0';
  std::replace_if(text, end, IsControl, ' ');
}

/// Returns the name by which users know the photo: for a file in the folder of a photo, the path of
/// that photo, followed by the name of the file.
std::string PhotoName(const std::string& source) {
  const size_t file = source.rfind('/');
  const size_t folder = file == 0 || file == std::string::npos ? file : source.rfind('/', file - 1);
  if (folder == std::string::npos) {
    return source;
  }
  const std::string directory = source.substr(0, folder);
  const size_t root = directory.rfind('/') + 1;
  if (directory.substr(root) != kMetadataDirName) {
    return source;
  }
  return directory.substr(0, root) + source.substr(folder + 1, file - folder - 1) + " (" +
         source.substr(file + 1) + ")";
}

/// A relative path says nothing to readers of the log.
std::string AbsolutePath(const std::string& path) {
  char directory[kMaxLine] = "";
  const bool isRelative = !path.empty() && path.front() != '/';
  return isRelative && getcwd(directory, sizeof directory) != nullptr
             ? std::string(directory) + "/" + path
             : path;
}

void PrintLine() {
  std::fprintf(stderr, "convert-thumb: %s\n", g_line);
}

/// Appends as much of `text` as fits into a buffer of kMaxLine bytes that holds `length` of them.
void Append(char* buffer, size_t& length, std::string_view text) {
  const size_t count = std::min(text.size(), kMaxLine - length);
  std::memcpy(buffer + length, text.data(), count);
  length += count;
}

}  // namespace

void LogFailuresOf(const std::string& source) {
  std::string name = EscapeControls(PhotoName(AbsolutePath(source)), InvalidBytes::kEscape);
  name = std::string(kPrefix) + (name.empty() ? "" : name + ": ");
  std::string reportedSource = source + ": ";
  std::replace_if(reportedSource.begin(), reportedSource.end(), IsControl, ' ');
  g_log = new FailureLog{LogConnection(), name, reportedSource};
}

void ReportFailure(const char* format, ...) {
  if (g_isReported.test_and_set()) {
    return;
  }
  std::va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(g_line, sizeof g_line, format, arguments);
  va_end(arguments);
  MakeOneLine(g_line);
  g_isLineComplete = true;
}

void PrintFailure() {
  if (g_isLineComplete) {
    if (g_log != nullptr) {
      LogFailure();
    }
    PrintLine();
  }
}

void LogFailure() {
  const FailureLog* const log = g_log;
  if (!g_isLineComplete) {
    return;
  }
  if (log == nullptr) {
    PrintLine();
    return;
  }
  try {
    std::string_view line = g_line;
    const bool isNamed = line.substr(0, log->source.size()) == log->source;
    line.remove_prefix(isNamed ? log->source.size() : 0);
    log->connection.SendError(log->beginning + EscapeControls(line, InvalidBytes::kEscape));
  } catch (const std::exception&) {
    log->connection.SendError(log->beginning + "out of memory");
  }
}

void PrintFailureNow(const char* message) {
  char line[kMaxLine];
  size_t length = 0;
  if (const FailureLog* const log = g_log) {
    Append(line, length, log->beginning);
    Append(line, length, message);
    log->connection.SendError({line, length});
  }
  length = 0;
  Append(line, length, kPrefix);
  Append(line, length, message);
  Append(line, length, "\n");
  const ssize_t written = write(STDERR_FILENO, line, length);
  static_cast<void>(written);  // there is no other place to report it
}

}  // namespace vela
