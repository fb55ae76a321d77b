#include "platform/standalone/tool_confinement.h"

#include <algorithm>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "platform/installed_names.h"
#include "platform/system_rules.h"
#include "posix/file_content.h"

namespace vela {

namespace {

using Arguments = std::vector<std::string>;

constexpr char kScratchDefine[] = "registry:temporary-path=";
constexpr char kScratchVariable[] = "MAGICK_TEMPORARY_PATH=";
constexpr char kFirstPage[] = "[0]";

/// The configuration of ImageMagick, with the policy that limits it to photos.
constexpr const char* kImageMagickData[] = {kImageMagickConfiguration, kImageMagickShared,
                                            "/usr/share/color", "/usr/vela/share/imagemagick"};

/// Makes ImageMagick read that policy, before and after the system's.
constexpr const char* kImageMagickPolicy[] = {"MAGICK_CONFIGURE_PATH=/usr/vela/share/imagemagick",
                                              "XDG_CONFIG_HOME=/usr/vela/share/imagemagick/last"};

/// ImageMagick, which the converter runs when it does not support a photo, and what a converter
/// that is a script runs.
constexpr const char* kConverterPrograms[] = {"/usr/vela/lib/convert-thumb", kImageMagickProgram,
                                              "/bin/sh", "/usr/bin/od", "/usr/bin/tr"};

constexpr const char* kPerlPrograms[] = {"/usr/bin/perl"};
constexpr const char* kPerlData[] = {"/usr/share/perl", "/usr/share/perl5", "/etc/perl",
                                     "/usr/local/share/perl"};

template <size_t count>
void Append(Arguments& list, const char* const (&more)[count]) {
  list.insert(list.end(), more, more + count);
}

bool StartsWith(std::string_view text, std::string_view beginning) {
  return text.substr(0, beginning.size()) == beginning;
}

std::string DirectoryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) {
    return ".";
  }
  return slash == 0 ? "/" : path.substr(0, slash);
}

/// Percent signs are doubled in the names of outputs.
std::string WithoutDoubledPercents(const std::string& argument) {
  std::string path;
  for (size_t i = 0; i < argument.size(); ++i) {
    path += argument[i];
    if (argument[i] == '%' && i + 1 < argument.size() && argument[i + 1] == '%') {
      ++i;
    }
  }
  return path;
}

/// Returns the file that the converter's argument names: the argument without a page selection.
std::string InputFile(const std::string& argument) {
  constexpr size_t kSuffix = sizeof kFirstPage - 1;
  const bool isPage = argument.size() > kSuffix &&
                      argument.compare(argument.size() - kSuffix, kSuffix, kFirstPage) == 0;
  return isPage ? argument.substr(0, argument.size() - kSuffix) : argument;
}

void AddUnique(Arguments& list, const std::string& text) {
  if (std::find(list.begin(), list.end(), text) == list.end()) {
    list.push_back(text);
  }
}

/// Allows the directory of one output. That of a picture that is turned in place is named like the
/// input. In any other "jpg:/tmp/a.jpg" the beginning is part of a relative path, which a photo may
/// have, and does not open /tmp.
void AllowOutput(const std::string& argument, const std::string& input, AllowedFiles& files) {
  if (argument == kDiscardedOutput) {
    return;
  }
  const std::string path = argument == input ? input : WithoutDoubledPercents(argument);
  AddUnique(files.outputs, DirectoryOf(path));
}

/// Options with their values come first, then the input; an output follows each "-write", and the
/// last argument is one.
void AllowConverter(const Arguments& arguments, Confinement& confinement) {
  AllowedFiles& files = *confinement.files;
  Append(files.programs, kConverterPrograms);
  Append(files.data, kImageMagickData);
  files.data.emplace_back(kSettingsFile);
  size_t input = 1;
  bool hasScratchDirectory = false;
  while (input + 1 < arguments.size() &&
         (arguments[input] == "-define" || arguments[input] == "-rotate")) {
    const std::string& value = arguments[input + 1];
    if (StartsWith(value, kScratchDefine)) {
      AddUnique(files.outputs, value.substr(sizeof kScratchDefine - 1));
      hasScratchDirectory = true;
    }
    input += 2;
  }
  if (input >= arguments.size()) {
    return;
  }
  files.inputs.push_back(InputFile(arguments[input]));
  for (size_t i = input + 1; i < arguments.size(); ++i) {
    if (arguments[i - 1] == "-write" || i + 1 == arguments.size()) {
      AllowOutput(arguments[i], arguments[input], files);
    }
  }
  if (!hasScratchDirectory && !files.outputs.empty()) {
    confinement.environment.push_back(kScratchVariable + files.outputs.back());
  }
}

void AllowDcraw(const Arguments& arguments, Confinement& confinement) {
  confinement.files->inputs.push_back(arguments.back());
}

void AllowExiftool(const Arguments& arguments, Confinement& confinement) {
  Append(confinement.files->programs, kPerlPrograms);
  Append(confinement.files->data, kPerlData);
  confinement.files->inputs.push_back(arguments.back());
}

/// The two images are followed by the name of the output, which is no file.
void AllowCompare(const Arguments& arguments, Confinement& confinement) {
  Append(confinement.files->data, kImageMagickData);
  Append(confinement.environment, kImageMagickPolicy);
  constexpr size_t kLast = 3;
  if (arguments.size() > kLast) {
    const auto output = arguments.end() - 1;
    confinement.files->inputs.insert(confinement.files->inputs.end(), output - 2, output);
  }
}

/// A tool whose needs are known.
struct Tool {
  std::string_view name;
  void (*allow)(const Arguments& arguments, Confinement& confinement);
  uint64_t memory;  ///< bytes; none for one that sets a limit of its own before it reads its input
  bool hasThreads;
  /// Connects to the system log, and gives up making sockets itself before it reads its input.
  bool logsFailures;
};

constexpr Tool kTools[] = {{"convert-thumb", AllowConverter, ResourceLimits::kNone, true, true},
                           {"dcraw", AllowDcraw, kRawDecoderMemory, false, false},
                           {"exiftool", AllowExiftool, kToolMemory, false, false},
                           {"compare", AllowCompare, kToolMemory, true, false}};

std::string_view NameOf(std::string_view path) {
  return path.substr(path.rfind('/') + 1);
}

struct FreeMemory {
  void operator()(char* memory) const { std::free(memory); }
};

/// Returns whether the file at this path is a program and has the same name there. Another program
/// may have been linked to the path, and a script does not confine what it runs.
bool IsProgramItself(const char* path) {
  const std::unique_ptr<char, FreeMemory> file(realpath(path, nullptr));
  return file && NameOf(file.get()) == NameOf(path) && !BeginsWith(path, "#!");
}

const Tool* FindTool(std::string_view program) {
  const std::string_view name = NameOf(program);
  const auto* const found = std::find_if(std::begin(kTools), std::end(kTools),
                                         [&](const Tool& tool) { return tool.name == name; });
  return found == std::end(kTools) ? nullptr : found;
}

/// The time limit of the run ends a tool that works all the time before this limit is reached; it
/// is for processes that the tool leaves behind.
uint64_t ProcessorSeconds(const Tool* tool, std::chrono::seconds timeLimit) {
  if (timeLimit.count() == 0) {
    return ResourceLimits::kNone;
  }
  const bool hasThreads = tool == nullptr || tool->hasThreads;
  const uint64_t processors = hasThreads ? std::max(1U, std::thread::hardware_concurrency()) : 1U;
  return (static_cast<uint64_t>(timeLimit.count()) + 1) * processors;
}

bool IsUnconfined(std::string_view program) {
  const std::string list = ReadSystemFile(kUnconfinedToolsFile, kUnconfinedToolsSize);
  std::string_view rest = list;
  while (!rest.empty()) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    if (line == program && StartsWith(line, "/")) {
      return true;
    }
    rest.remove_prefix(std::min(rest.size(), line.size() + 1));
  }
  return false;
}

}  // namespace

Confinement ConfinementOfTool(const char* program, char* const arguments[],
                              std::chrono::seconds timeLimit) {
  const Tool* const tool = FindTool(program);
  Confinement confinement;
  confinement.limits.fileSize = kToolFileSize;
  confinement.limits.processorSeconds = ProcessorSeconds(tool, timeLimit);
  confinement.limits.memory = tool == nullptr ? kToolMemory : tool->memory;
  if (IsUnconfined(program)) {
    confinement.blocksSystemCalls = false;
    return confinement;
  }
  if (tool == nullptr) {
    return confinement;
  }
  Arguments list;
  for (char* const* argument = arguments; *argument != nullptr; ++argument) {
    list.emplace_back(*argument);
  }
  if (tool->logsFailures && IsProgramItself(program)) {
    confinement.sockets = SocketUse::kLocalDatagrams;
  }
  confinement.files = FilesOfEveryProgram();
  confinement.files->programs.emplace_back(program);
  if (!list.empty()) {
    tool->allow(list, confinement);
  }
  return confinement;
}

}  // namespace vela
