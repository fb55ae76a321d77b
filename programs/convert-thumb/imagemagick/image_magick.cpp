#include "imagemagick/image_magick.h"

#include <cerrno>
#include <cstring>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "command_line/file_name.h"
#include "imagemagick/image_magick_limits.h"
#include "posix/file_descriptor.h"
#include "process/child_program.h"
#include "process/failure_report.h"
#include "process/source_file.h"
#include "process/write_signals.h"

namespace vela {

namespace {

/// A link to kProgram. Processes are found by the name of their program, so it must be the
/// converter's name.
constexpr char kLink[] = "/usr/vela/lib/convert-thumb";
constexpr char kProgram[] = "/usr/bin/convert-im6.q16";
constexpr char kArgumentZero[] = "convert-thumb";

/// Size of ImageMagick's buffers for file names, including the terminating null.
constexpr size_t kMaxName = 4096;

/// Returns true for bytes without a special meaning to ImageMagick anywhere in a name.
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

/// Returns the prefix that replaces the extension of the output's name in choosing the format.
std::string FormatPrefix(const std::string& path) {
  const std::string extension(ExtensionOf(path));
  return IsPlainName(extension) ? extension + ":" : "";
}

/// Returns true when an argument that names no file, according to the `error` of opening it, can be
/// passed on unchanged: an option, or a picture that ImageMagick generates. With a directory in its
/// name it is a photo that has been removed.
bool NeedNotBeFile(const std::string& argument, int error) {
  return error == ENOENT && argument.find('/') == std::string::npos;
}

/// ImageMagick could wait for such a file forever.
bool IsSpecialFile(FileType type) {
  return type == FileType::kPipe || type == FileType::kOther;
}

bool ReportSpecialFile(const std::string& file) {
  ReportFailure("%s: not a regular file", file.c_str());
  return false;
}

/// Returns a name without special meaning that is valid as long as the descriptor is open.
std::string PlainName(FileDescriptor& descriptor, std::vector<FileDescriptor>& inherited) {
  const std::string name = "/proc/self/fd/" + std::to_string(descriptor.Get());
  inherited.push_back(std::move(descriptor));
  return name;
}

/// Replaces a source name that has a special meaning. Returns false when the source cannot be
/// passed on. Descriptors that have to stay open are added to `inherited`.
bool MakeSourceSafe(const CommandLine& line, std::vector<std::string>& arguments,
                    std::vector<FileDescriptor>& inherited) {
  const size_t index = line.sourceIndex;
  if (index == arguments.size()) {
    return true;
  }
  const std::string& file = line.sourceFile;
  if (IsSpecialFile(TypeOf(file))) {
    return ReportSpecialFile(file);
  }
  if (IsPlainName(file)) {
    return true;
  }
  FileDescriptor source = OpenForProgram(file);
  if (!source.IsOpen()) {
    const int error = errno;
    if (!NeedNotBeFile(file, error)) {
      ReportFailure("%s: %s", file.c_str(), std::strerror(error));
      return false;
    }
    return true;
  }
  // A pipe may have been put in the file's place since it was examined.
  if (IsSpecialFile(TypeOf(source.Get()))) {
    return ReportSpecialFile(file);
  }
  const std::string plain = PlainName(source, inherited);
  const std::string pageSelection = arguments[index].substr(file.size());
  arguments[index] = plain + pageSelection;
  if (index + 1 < arguments.size() && arguments.back() == file) {
    // A photo that is turned in place: ImageMagick opens and truncates it under that name.
    arguments.back() = FormatPrefix(file) + plain;
  }
  return true;
}

/// Writing to a pipe could wait for a reader forever.
bool CheckForPipes(const std::vector<OutputPlan>& outputs) {
  for (const OutputPlan& output : outputs) {
    if (TypeOf(output.path) == FileType::kPipe) {
      return ReportSpecialFile(output.path);
    }
  }
  return true;
}

/// ImageMagick expands such a name when no file with exactly this name exists.
bool IsPattern(const std::string& path) {
  return path.find_first_of("*?{}[]") != std::string::npos;
}

/// Returns false when ImageMagick would truncate the name.
bool MakeOutputSafe(std::string& path) {
  if (!path.empty() && path.front() != '/') {
    // Keeps the name from being read as an option, a format prefix or a list of file names.
    path.insert(0, "./");
  }
  if (path.size() >= kMaxName) {
    ReportFailure("name of an output too long for ImageMagick");
    return false;
  }
  return true;
}

/// Rewrites outputs so that ImageMagick can only interpret them as file names. Applies to
/// conversions only: in other command lines, special meanings may be intended. Returns false when
/// that is impossible.
bool MakeOutputsSafe(const CommandLine& line, std::vector<std::string>& arguments) {
  for (const size_t index : line.outputIndices) {
    const bool followsSource = index == line.sourceIndex + 1;  // which is called "-write" then
    if (!followsSource && !MakeOutputSafe(arguments[index])) {
      return false;
    }
  }
  if (IsPattern(arguments.back())) {
    // An argument of an option is never expanded.
    arguments.insert(arguments.end() - 1, "-write");
    arguments.push_back("null:");
  }
  return true;
}

bool MakeSafe(const CommandLine& line, std::vector<std::string>& arguments,
              std::vector<FileDescriptor>& inherited) {
  const auto* const conversion = std::get_if<ConversionPlan>(&line.task);
  return MakeSourceSafe(line, arguments, inherited) &&
         (conversion == nullptr ||
          (CheckForPipes(conversion->outputs) && MakeOutputsSafe(line, arguments)));
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

void HandOver(const CommandLine& line, size_t memoryLimit) {
  std::vector<std::string> arguments = line.arguments;
  std::vector<FileDescriptor> inherited;
  if (!MakeSafe(line, arguments, inherited)) {
    return;
  }
  LimitImageMagick(memoryLimit);
  std::string argumentZero = kArgumentZero;
  std::vector<char*> vector = ArgumentVector(argumentZero, arguments);
  RestoreWriteSignals();
  ReplaceProcess(kLink, vector.data());
  RunInChildAndExit(kProgram, vector.data());
  IgnoreWriteSignals();
  ReportFailure("%s: %s", kProgram, std::strerror(errno));
}

}  // namespace vela
