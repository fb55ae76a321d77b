// convert-thumb: makes all thumbnails of a photo in one run.

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <exception>
#include <memory>
#include <new>
#include <string>
#include <variant>
#include <vector>

#include "command_line/allowed_files.h"
#include "command_line/command_line.h"
#include "decoding/photo_opener.h"
#include "imagemagick/image_magick.h"
#include "posix/file_descriptor.h"
#include "process/confinement.h"
#include "process/failure_report.h"
#include "process/resource_limits.h"
#include "process/source_file.h"
#include "process/trusted_path.h"
#include "process/unfinished_outputs.h"
#include "process/write_signals.h"
#include "thumbnails/thumbnails.h"
#include "turning/jpeg_turn.h"

namespace vela {

namespace {

constexpr int kDone = 0;
constexpr int kFailed = 1;

/// Returns only if ImageMagick could not be started.
int LeaveToImageMagick(const CommandLine& line, size_t memoryLimit) {
  HandOver(line, memoryLimit);
  return kFailed;
}

int Convert(const ConversionPlan& plan, const CommandLine& line, size_t memoryLimit) {
  const FileDescriptor file = OpenSource(plan.source);
  if (!file.IsOpen()) {
    ReportFailure("cannot open %s: %s", plan.source.c_str(), std::strerror(errno));
    return kFailed;
  }
  if (TypeOf(file.Get()) != FileType::kRegular) {
    return LeaveToImageMagick(line, memoryLimit);
  }
  const std::unique_ptr<PhotoReader> reader = OpenPhoto(file.Get(), plan, memoryLimit);
  if (reader == nullptr || !CanMakeThumbnails(reader->Traits(), plan)) {
    return LeaveToImageMagick(line, memoryLimit);
  }
  ConfineToThisProgram();
  return MakeThumbnails(*reader, plan, memoryLimit) && SyncOutputs() ? kDone : kFailed;
}

int Turn(const TurnPlan& plan, const CommandLine& line, size_t memoryLimit) {
  switch (TurnJpegFile(plan.path, plan.quarterTurns, memoryLimit)) {
    case FileTurn::kDone:
      return kDone;
    case FileTurn::kImpossible:
      return LeaveToImageMagick(line, memoryLimit);
    case FileTurn::kFailed:
      break;
  }
  return kFailed;
}

int Run(const CommandLine& line, size_t memoryLimit) {
  if (const auto* const turn = std::get_if<TurnPlan>(&line.task)) {
    return Turn(*turn, line, memoryLimit);
  }
  if (const auto* const conversion = std::get_if<ConversionPlan>(&line.task)) {
    return Convert(*conversion, line, memoryLimit);
  }
  return LeaveToImageMagick(line, memoryLimit);
}

int RunConfined(const CommandLine& line, size_t memoryLimit) {
  if (const int error = Confine(FindAllowedFiles(line)); error != 0) {
    ReportFailure("cannot give up privileges: %s", std::strerror(error));
    return kFailed;
  }
  return Run(line, memoryLimit);
}

int RunMain(int argc, char** argv) {
  int status = kFailed;
  try {
    const CommandLine line =
        ParseCommandLine(std::vector<std::string>(argv + (argc > 0 ? 1 : 0), argv + argc));
    if (!IsDiscarded(line)) {
      LogFailuresOf(line.sourceFile);
    }
    IgnoreWriteSignals();
    CleanUpOnFatalSignals();
    const size_t memoryLimit = ConversionMemoryLimit();
    LimitResources(memoryLimit);
    status = RunConfined(line, memoryLimit);
  } catch (const std::bad_alloc&) {
    ReportFailure("out of memory");
  } catch (const std::exception& error) {
    ReportFailure("%s", error.what());
  }
  if (status != kDone) {
    RemoveOutputs();
    PrintFailure();
  }
  return status;
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunMain(argc, argv);
}
