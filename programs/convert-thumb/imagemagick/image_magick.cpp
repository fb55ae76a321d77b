#include "imagemagick/image_magick.h"

#include <cerrno>
#include <cstring>
#include <string>
#include <variant>
#include <vector>

#include "imagemagick/handed_line.h"
#include "imagemagick/handed_outputs.h"
#include "imagemagick/handed_source.h"
#include "imagemagick/image_magick_limits.h"
#include "imagemagick/image_magick_message.h"
#include "imagemagick/image_magick_policy.h"
#include "platform/installed_names.h"
#include "posix/landlock.h"
#include "process/child_program.h"
#include "process/failure_report.h"
#include "process/source_file.h"
#include "process/trusted_path.h"
#include "process/unfinished_outputs.h"
#include "process/write_signals.h"

namespace vela {

namespace {

/// A link to kImageMagickProgram. Processes are found by the name of their program, so it must be
/// the converter's name.
constexpr char kLink[] = "/usr/vela/lib/convert-thumb";
constexpr char kArgumentZero[] = "convert-thumb";

bool PassDescriptors(const HandedLine& handed) {
  bool passed = true;
  for (const FileDescriptor& input : handed.inputs) {
    passed = PassToPrograms(input) && passed;
  }
  for (const OpenOutput& output : handed.outputs) {
    passed = PassToPrograms(output.file) && passed;
  }
  if (!passed) {
    ReportFailure("cannot pass descriptors: %s", std::strerror(errno));
  }
  return passed;
}

bool Hand(const CommandLine& line, HandedLine& handed) {
  handed.arguments = line.arguments;
  return HandSource(line, handed) && HandOutputs(line, handed) && PassDescriptors(handed);
}

/// ImageMagick creates its temporary files and opens them again later, by their names: others must
/// not be able to replace them by links, or the links must not lead anywhere else.
bool CanUseFilesIn(const std::string& directory) {
  return LandlockVersion() > 0 || ProtectsOwnFiles(directory);
}

std::vector<char*> ArgumentVector(std::string& argumentZero, std::vector<std::string>& arguments) {
  std::vector<char*> vector = {argumentZero.data()};
  for (std::string& argument : arguments) {
    vector.push_back(argument.data());
  }
  vector.push_back(nullptr);
  return vector;
}

/// Logs why ImageMagick has failed; it has printed that itself.
void LogFailureOf(const ChildEnd& end) {
  const std::string message = MainMessage(end.errors);
  if (end.signal != 0) {
    ReportFailure("ImageMagick was ended by signal %d: %s", end.signal, strsignal(end.signal));
  } else {
    ReportFailure("ImageMagick: %s", message.empty() ? "no message" : message.c_str());
  }
  LogFailure();
}

/// Makes the outputs of ImageMagick complete, or removes them. Returns false on failure.
bool Finish(const HandedLine& handed, const ChildEnd& end) {
  if (end.succeeded && AreOutputsWritten(handed) && SyncOutputs()) {
    return true;
  }
  RemoveHandedOutputs(handed);
  if (end.wasIdle) {
    ReportFailure("ImageMagick did nothing for %d seconds", kMostIdleSeconds);
    return false;
  }
  // A stopped run says nothing about the photo.
  if (!end.succeeded && !end.wasStopped) {
    LogFailureOf(end);
  }
  return false;
}

}  // namespace

void HandOver(const CommandLine& line, size_t memoryLimit) {
  HandedLine handed;
  if (!UsePolicy() || !Hand(line, handed)) {
    return;
  }
  LimitImageMagick(memoryLimit);
  if (!CanUseFilesIn(line.scratchDirectory)) {
    KeepImageMagickFromUsingFiles();
  }
  std::string argumentZero = kArgumentZero;
  std::vector<char*> vector = ArgumentVector(argumentZero, handed.arguments);
  RestoreWriteSignals();
  if (handed.outputs.empty() && handed.namedOutputs.empty()) {
    ReplaceProcess(kLink, vector.data());
  }
  RunInChildAndExit({kLink, kImageMagickProgram}, vector.data(),
                    [&handed](const ChildEnd& end) { return Finish(handed, end); });
  IgnoreWriteSignals();
  ReportFailure("%s: %s", kImageMagickProgram, std::strerror(errno));
}

}  // namespace vela
