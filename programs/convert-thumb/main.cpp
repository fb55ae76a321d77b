// convert-thumb: makes all thumbnails of a photo in one run.

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <memory>
#include <new>
#include <optional>
#include <string>
#include <vector>

#include "command_line/plan_parser.h"
#include "confinement/confinement.h"
#include "confinement/memory_limit.h"
#include "confinement/resource_limits.h"
#include "confinement/writable_places.h"
#include "decoding/photo_opener.h"
#include "encoding/unfinished_outputs.h"
#include "failure_line.h"
#include "imagemagick/image_magick.h"
#include "posix/file_descriptor.h"
#include "thumbnails.h"
#include "turning/jpeg_turn.h"
#include "write_signals.h"

namespace vela {

namespace {

constexpr int kDone = 0;
constexpr int kFailed = 1;

/// Returns only when ImageMagick could not be started.
int LeaveToImageMagick(const std::vector<std::string>& arguments, size_t memoryLimit) {
  HandOver(arguments, memoryLimit);
  return kFailed;
}

bool IsRegularFile(int descriptor) {
  struct stat status;
  return fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

int Convert(const ConversionPlan& plan, const std::vector<std::string>& arguments,
            size_t memoryLimit) {
  // Opening must not wait when the source is a pipe.
  const FileDescriptor file(
      open(plan.source.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK));
  if (!file.IsOpen()) {
    TellFailure("cannot open %s: %s", plan.source.c_str(), std::strerror(errno));
    return kFailed;
  }
  if (!IsRegularFile(file.Get())) {
    return LeaveToImageMagick(arguments, memoryLimit);
  }
  const std::unique_ptr<PhotoReader> reader = OpenPhoto(file.Get(), plan, memoryLimit);
  if (reader == nullptr) {
    return LeaveToImageMagick(arguments, memoryLimit);
  }
  ConfineToThisProgram();
  return MakeThumbnails(*reader, plan, memoryLimit) ? kDone : kFailed;
}

int TurnFile(const TurnPlan& plan, const std::vector<std::string>& arguments, size_t memoryLimit) {
  const FileTurn turn = TurnJpegFile(plan.path, plan.quarterTurns, memoryLimit);
  if (turn == FileTurn::kImpossible) {
    return LeaveToImageMagick(arguments, memoryLimit);
  }
  return turn == FileTurn::kDone ? kDone : kFailed;
}

int Run(const std::vector<std::string>& arguments, size_t memoryLimit) {
  if (const std::optional<TurnPlan> turn = ParseTurn(arguments)) {
    return TurnFile(*turn, arguments, memoryLimit);
  }
  const std::optional<ConversionPlan> plan = ParseConversion(arguments);
  return plan ? Convert(*plan, arguments, memoryLimit) : LeaveToImageMagick(arguments, memoryLimit);
}

int RunMain(int argc, char** argv) {
  int status = kFailed;
  try {
    const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
    IgnoreWriteSignals();
    EndCleanlyOnFatalSignals();
    const size_t memoryLimit = ConversionMemoryLimit();
    LimitResources(memoryLimit);
    Confine(FindWritablePlaces(arguments));
    status = Run(arguments, memoryLimit);
  } catch (const std::bad_alloc&) {
    TellFailure("out of memory");
  } catch (const std::exception& error) {
    TellFailure("%s", error.what());
  }
  if (status != kDone) {
    RemoveNotedOutputs();
    WriteFailureLine();
  }
  return status;
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunMain(argc, argv);
}
