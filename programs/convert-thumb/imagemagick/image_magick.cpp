#include "imagemagick/image_magick.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <utility>

#include "command_line/plan_parser.h"
#include "failure_line.h"
#include "imagemagick/child_program.h"
#include "imagemagick/image_magick_limits.h"
#include "posix/file_descriptor.h"
#include "write_signals.h"

namespace vela {

namespace {

/// The first is a link to the second. A process is found by the name of the program it was started
/// from, which has to be the converter's.
constexpr char kLink[] = "/usr/vela/lib/convert-thumb";
constexpr char kProgram[] = "/usr/bin/convert-im6.q16";
constexpr char kArgumentZero[] = "convert-thumb";

/// What ImageMagick keeps of a file name, with the null behind it.
constexpr size_t kLongestName = 4096;

/// Bytes that mean nothing but themselves to ImageMagick, wherever they stand in a name.
bool IsPlainByte(unsigned char byte) {
  return byte >= 0x80 || (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') ||
         (byte >= 'a' && byte <= 'z') || std::strchr("/._-+,= ", byte) != nullptr;
}

bool IsPlainName(const std::string& name) {
  if (name.empty() || name.front() == '-') {
    return false;
  }
  for (const char character : name) {
    if (character == '\0' || !IsPlainByte(static_cast<unsigned char>(character))) {
      return false;
    }
  }
  return true;
}

/// Without its name, an output does not tell its format.
std::string FormatPrefix(const std::string& path) {
  const size_t dot = path.find_last_of("./");
  if (dot == std::string::npos || path[dot] != '.' || !IsPlainName(path.substr(dot + 1))) {
    return "";
  }
  return path.substr(dot + 1) + ":";
}

/// Whether an argument that names no file, as `error` of opening it says, can be left as it is: an
/// option, or a picture that ImageMagick draws. In a directory it is a photo that has gone.
bool CanBeNoFile(const std::string& argument, int error) {
  return error == ENOENT && argument.find('/') == std::string::npos;
}

/// A pipe or the like, on which ImageMagick could wait without end.
bool IsSpecial(const struct stat& status) {
  return !S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode);
}

bool IsSpecialFile(const std::string& file) {
  struct stat status;
  return stat(file.c_str(), &status) == 0 && IsSpecial(status);
}

struct OpenedSource {
  FileDescriptor descriptor;
  int error = 0;  ///< errno when it could not be opened
  bool isSpecial = false;
};

/// Does not wait when a pipe has taken the file's place. The descriptor, which programs inherit,
/// waits for its data again.
OpenedSource OpenSource(const std::string& file) {
  OpenedSource source;
  source.descriptor = FileDescriptor(
      open(file.c_str(), O_RDONLY | O_NOCTTY | O_NONBLOCK));  // NOLINT: for ImageMagick
  struct stat status;
  if (!source.descriptor.IsOpen() || fstat(source.descriptor.Get(), &status) != 0 ||
      fcntl(source.descriptor.Get(), F_SETFL, 0) != 0) {
    source.error = errno;
  } else {
    source.isSpecial = IsSpecial(status);
  }
  return source;
}

bool TellSpecial(const std::string& file) {
  TellFailure("%s: not a regular file", file.c_str());
  return false;
}

/// A name that means nothing but itself, for as long as the process or program lasts.
std::string PlainName(FileDescriptor& descriptor, std::vector<FileDescriptor>& inherited) {
  const std::string name = "/proc/self/fd/" + std::to_string(descriptor.Get());
  inherited.push_back(std::move(descriptor));
  return name;
}

/// False when the source cannot be handed over. What has to stay open goes to `inherited`.
bool MakeSourceSafe(std::vector<std::string>& arguments, std::vector<FileDescriptor>& inherited) {
  const size_t place = FindSourceArgument(arguments);
  if (place == arguments.size()) {
    return true;
  }
  const std::string source = arguments[place];
  const std::string file = SourceFile(source);
  if (IsSpecialFile(file)) {
    return TellSpecial(file);
  }
  if (IsPlainName(file)) {
    return true;
  }
  OpenedSource opened = OpenSource(file);
  if (opened.isSpecial) {
    return TellSpecial(file);
  }
  if (opened.error != 0 && CanBeNoFile(file, opened.error)) {
    return true;
  }
  if (opened.error != 0) {
    TellFailure("%s: %s", file.c_str(), std::strerror(opened.error));
    return false;
  }
  const std::string plain = PlainName(opened.descriptor, inherited);
  arguments[place] = plain + source.substr(file.size());
  if (place + 1 < arguments.size() && arguments.back() == file) {
    // A photo that is turned in place: opened by that name again, and cut, when it is written.
    arguments.back() = FormatPrefix(file) + plain;
  }
  return true;
}

/// Nobody may ever read from it.
bool IsPipe(const std::string& path) {
  struct stat status;
  return stat(path.c_str(), &status) == 0 && S_ISFIFO(status.st_mode);
}

bool AreNoPipes(const std::vector<OutputPlan>& outputs) {
  for (const OutputPlan& output : outputs) {
    if (IsPipe(output.path)) {
      return TellSpecial(output.path);
    }
  }
  return true;
}

/// Names of files are looked for where none is known by the name itself.
bool IsPattern(const std::string& path) {
  return path.find_first_of("*?{}[]") != std::string::npos;
}

/// False when an output's name is longer than ImageMagick can tell apart.
bool MakeOutputSafe(std::string& path) {
  if (!path.empty() && path.front() != '/') {
    // A format, an option or a list of file names could stand at the beginning.
    path.insert(0, "./");
  }
  if (path.size() >= kLongestName) {
    TellFailure("name of an output too long for ImageMagick");
    return false;
  }
  return true;
}

/// Lets outputs be nothing but files of that name, which is what they are here; in a command line
/// that only ImageMagick understands, names may well mean more. False when there is no way.
bool MakeOutputsSafe(std::vector<std::string>& arguments) {
  for (size_t i = 1; i + 1 < arguments.size(); ++i) {
    if (arguments[i - 1] == "-write" && !MakeOutputSafe(arguments[i])) {
      return false;
    }
  }
  if (!MakeOutputSafe(arguments.back())) {
    return false;
  }
  if (IsPattern(arguments.back())) {
    // Only what stands behind an option is never a pattern.
    arguments.insert(arguments.end() - 1, "-write");
    arguments.push_back("null:");
  }
  return true;
}

bool MakeSafe(std::vector<std::string>& arguments, std::vector<FileDescriptor>& inherited) {
  const std::optional<ConversionPlan> plan = ParseConversion(arguments);
  return MakeSourceSafe(arguments, inherited) &&
         (!plan || (AreNoPipes(plan->outputs) && MakeOutputsSafe(arguments)));
}

std::vector<char*> ArgumentVector(std::string& argumentZero, std::vector<std::string>& arguments) {
  std::vector<char*> vector = {argumentZero.data()};
  for (std::string& argument : arguments) {
    vector.push_back(argument.data());
  }
  vector.push_back(nullptr);
  return vector;
}

}  // namespace

void HandOver(const std::vector<std::string>& arguments, size_t memoryLimit) {
  std::vector<std::string> handed = arguments;
  std::vector<FileDescriptor> inherited;
  if (!MakeSafe(handed, inherited)) {
    return;
  }
  LimitImageMagick(memoryLimit);
  std::string argumentZero = kArgumentZero;
  std::vector<char*> vector = ArgumentVector(argumentZero, handed);
  RestoreWriteSignals();
  execv(kLink, vector.data());
  StandForProgram(kProgram, vector.data());
  IgnoreWriteSignals();
  TellFailure("%s: %s", kProgram, std::strerror(errno));
}

}  // namespace vela
