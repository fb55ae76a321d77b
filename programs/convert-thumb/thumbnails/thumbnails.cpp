#include "thumbnails/thumbnails.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>

#include "decoding/rows_ahead.h"
#include "encoding/jpeg_writer.h"
#include "picture/colour_conversion.h"
#include "picture/resize.h"
#include "picture/rows.h"
#include "picture/turn.h"
#include "picture/unsharp.h"
#include "process/failure_report.h"
#include "process/output_file.h"
#include "process/worker_threads.h"
#include "thumbnails/thumbnail_stream.h"

namespace vela {

namespace {

/// A picture that is being processed.
struct Thumbnail {
  Picture picture;
  ColourSpace space = ColourSpace::kRgb;
  int orientation = 1;  ///< EXIF orientation that has not been applied yet
  bool withProfile = true;
};

void ConvertToSrgb(Thumbnail& thumbnail) {
  thumbnail.withProfile = thumbnail.withProfile && IsProfileValidInRgb(thumbnail.space);
  ConvertToRgb(thumbnail.picture, thumbnail.space);
  thumbnail.space = ColourSpace::kRgb;
}

void Apply(const Step& step, Thumbnail& thumbnail) {
  switch (step.kind) {
    case Step::Kind::kFlatten:
      // Already done while reading.
      break;
    case Step::Kind::kAutoOrient:
      ApplyOrientation(thumbnail.picture, thumbnail.orientation);
      thumbnail.orientation = 1;
      break;
    case Step::Kind::kTurn:
      Turn(thumbnail.picture, step.quarterTurns);
      break;
    case Step::Kind::kSharpen:
      Sharpen(thumbnail.picture, step.unsharp);
      break;
    case Step::Kind::kConvertToSrgb:
      ConvertToSrgb(thumbnail);
      break;
  }
}

void ApplySteps(const OutputPlan& output, Thumbnail& thumbnail) {
  for (const Step& step : output.steps) {
    Apply(step, thumbnail);
  }
}

bool Write(const EncodedJpeg& jpeg, const OutputPlan& output) {
  if (!jpeg.IsComplete()) {
    ReportFailure("cannot encode %s: %s", output.path.c_str(), jpeg.error.c_str());
    return false;
  }
  if (!WriteOutputFile(output.path, jpeg.bytes.get(), jpeg.size)) {
    ReportFailure("cannot write %s", output.path.c_str());
    return false;
  }
  return true;
}

void ReportDecodingFailure(const PhotoReader& reader) {
  // Without an error of the decoder, the cause is lack of memory.
  const char* const error = *reader.Error() == '\0' ? "out of memory" : reader.Error();
  ReportFailure("cannot decode the photo: %s", error);
}

/// Memory of a rotated copy of a thumbnail and of the encoder, in bytes per sample.
constexpr size_t kExtraBytesPerSample = 4;

/// Returns the memory in bytes for making a thumbnail no larger than the first, without that of the
/// decoder and of sharpening.
size_t MemoryOfScaling(const PhotoReader& reader, const ResizePlan& resize) {
  const size_t samples = static_cast<size_t>(resize.size.width) *
                         static_cast<size_t>(resize.size.height) *
                         static_cast<size_t>(reader.Channels());
  return ResizeMemory({reader.Width(), reader.Height()}, reader.Channels(), resize) +
         samples * kExtraBytesPerSample;
}

/// Returns the memory in bytes for sharpening an output as large as the first thumbnail.
size_t MemoryOfSharpening(const PhotoReader& reader, const ResizePlan& resize,
                          const OutputPlan& output) {
  size_t bytes = 0;
  for (const Step& step : output.steps) {
    if (step.kind == Step::Kind::kSharpen) {
      bytes += RowSharpener::Memory(resize.size, reader.Channels(), step.unsharp);
    }
  }
  return bytes;
}

/// Returns the memory in bytes for processing whole pictures. Apart from sharpening, no output
/// needs more than the first one while it is being scaled.
size_t MemoryOfWholePictures(const PhotoReader& reader, const ResizePlan& resize,
                             const ConversionPlan& plan) {
  size_t sharpening = 0;
  for (const OutputPlan& output : plan.outputs) {
    sharpening = std::max(sharpening, MemoryOfSharpening(reader, resize, output));
  }
  return RowsAhead::Memory(reader) + MemoryOfScaling(reader, resize) + sharpening;
}

/// Returns the memory in bytes for making all thumbnails at the same time.
size_t MemoryOfAll(const PhotoReader& reader, const ResizePlan& resize,
                   const ConversionPlan& plan) {
  size_t bytes = RowsAhead::Memory(reader);
  for (const OutputPlan& output : plan.outputs) {
    bytes += MemoryOfScaling(reader, resize) + MemoryOfSharpening(reader, resize, output);
  }
  return bytes;
}

/// Scales a photo whose decoding has been started. Returns false when a row cannot be decoded or
/// `out` rejects one.
bool ScalePhoto(PhotoReader& reader, const ResizePlan& resize, RowSink& out) {
  RowsAhead rows(reader);
  return Resize(rows, resize, out);
}

/// Starts decoding the photo for the first thumbnail and returns how to scale it; empty, after a
/// call of ReportFailure, when it cannot be decoded.
std::optional<ResizePlan> StartFirst(PhotoReader& reader, const OutputPlan& output) {
  const PictureSize fullSize = reader.FullSize();
  ResizePlan resize;
  resize.size = ThumbnailSize(fullSize, output.box);
  if (!reader.Start(resize.size)) {
    ReportDecodingFailure(reader);
    return std::nullopt;
  }
  const PhotoTraits& traits = reader.Traits();
  resize.filter =
      traits.palette || traits.transparent ? FilterKind::kMitchell : FilterKind::kLanczos;
  // The samples of a reduced photo are averages already.
  resize.presample = !reader.IsReduced() && IsPresampled(fullSize, resize.size);
  resize.columnsFirst = !reader.IsReduced() && IsScaledVerticallyFirst(fullSize, resize.size);
  return resize;
}

/// Makes a later thumbnail from the first.
Thumbnail MakeLater(const Thumbnail& first, const OutputPlan& output, bool exact) {
  PictureRows rows(first.picture);
  const ResizePlan resize =
      LaterResizePlan({first.picture.width, first.picture.height}, output.box, exact);
  // Reading rows from memory cannot fail.
  Thumbnail thumbnail{*Resize(rows, resize), first.space, first.orientation, first.withProfile};
  ApplySteps(output, thumbnail);
  return thumbnail;
}

bool WriteThumbnail(const Thumbnail& thumbnail, const PhotoTraits& traits,
                    const OutputPlan& output) {
  return Write(EncodeJpeg(thumbnail.picture, traits, output.quality, thumbnail.withProfile),
               output);
}

/// Applies every step to whole pictures.
bool MakeWholePictures(PhotoReader& reader, const ResizePlan& resize, const ConversionPlan& plan) {
  const PhotoTraits& traits = reader.Traits();
  Thumbnail first;
  first.picture = Picture(resize.size.width, resize.size.height, reader.Channels());
  first.space = traits.space;
  first.orientation = traits.orientation;
  PictureWriter writer(first.picture);
  if (!ScalePhoto(reader, resize, writer)) {
    ReportDecodingFailure(reader);
    return false;
  }
  ApplySteps(plan.outputs.front(), first);
  return DoInTwoThreads(plan.outputs.size(), [&](size_t i) {
    const OutputPlan& output = plan.outputs[i];
    return i == 0 ? WriteThumbnail(first, traits, output)
                  : WriteThumbnail(MakeLater(first, output, !reader.IsReduced()), traits, output);
  });
}

/// Applies every step to rows as they are decoded.
bool MakeWhileDecoding(PhotoReader& reader, const ResizePlan& resize, const ConversionPlan& plan) {
  ThumbnailStream stream(resize.size, reader.Channels(), plan, reader.Traits(),
                         !reader.IsReduced());
  const bool decoded = ScalePhoto(reader, resize, stream);
  if (!decoded && !stream.HasFailed()) {
    ReportDecodingFailure(reader);
    return false;
  }
  if (!decoded || !stream.Complete()) {
    ReportFailure("cannot encode the thumbnails: %s", stream.Error().c_str());
    return false;
  }
  return DoInTwoThreads(plan.outputs.size(),
                        [&](size_t i) { return Write(stream.Finish(i), plan.outputs[i]); });
}

}  // namespace

bool CanMakeThumbnails(const PhotoTraits& traits, const ConversionPlan& plan) {
  const std::vector<Step>& steps = plan.outputs.front().steps;
  const bool flattened = !steps.empty() && steps.front().kind == Step::Kind::kFlatten;
  const bool converted = std::any_of(steps.begin(), steps.end(), [](const Step& step) {
    return step.kind == Step::Kind::kConvertToSrgb;
  });
  return (flattened || !traits.transparent) && (converted || IsStorable(traits.space));
}

bool MakeThumbnails(PhotoReader& reader, const ConversionPlan& plan, size_t memoryLimit) {
  const std::optional<ResizePlan> resize = StartFirst(reader, plan.outputs.front());
  if (!resize) {
    return false;
  }
  if (MemoryOfWholePictures(reader, *resize, plan) > memoryLimit) {
    ReportFailure("%s would take too much memory", plan.outputs.front().path.c_str());
    return false;
  }
  const bool streamed = ThumbnailStream::Supports(plan, reader.Traits()) &&
                        MemoryOfAll(reader, *resize, plan) <= memoryLimit;
  return streamed ? MakeWhileDecoding(reader, *resize, plan)
                  : MakeWholePictures(reader, *resize, plan);
}

}  // namespace vela
