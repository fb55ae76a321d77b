#include "thumbnails.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>

#include "decoding/rows_ahead.h"
#include "encoding/jpeg_writer.h"
#include "encoding/output_file.h"
#include "failure_line.h"
#include "picture/colour_conversion.h"
#include "picture/picture_maker.h"
#include "picture/resize.h"
#include "picture/turn.h"
#include "picture/unsharp.h"
#include "thumbnail_stream.h"
#include "worker_threads.h"

namespace vela {

namespace {

/// A picture on its way to an output.
struct Thumbnail {
  Picture picture;
  ColourSpace space = ColourSpace::kRgb;
  int orientation = 1;  ///< EXIF orientation that it still has to be turned by
  bool withProfile = true;
};

void ConvertToSrgb(Thumbnail& thumbnail) {
  thumbnail.withProfile = thumbnail.withProfile && ProfileOutlivesConversion(thumbnail.space);
  ConvertToRgb(thumbnail.picture, thumbnail.space);
  thumbnail.space = ColourSpace::kRgb;
}

void Apply(const Step& step, Thumbnail& thumbnail) {
  switch (step.kind) {
    case Step::Kind::kFlatten:
      // What is transparent has been laid on its background while it was read.
      break;
    case Step::Kind::kAutoOrient:
      Straighten(thumbnail.picture, thumbnail.orientation);
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
    TellFailure("cannot encode %s: %s", output.path.c_str(), jpeg.error.c_str());
    return false;
  }
  if (!WriteOutputFile(output.path, jpeg.bytes.get(), jpeg.size)) {
    TellFailure("cannot write %s", output.path.c_str());
    return false;
  }
  return true;
}

void TellUndecodable(const PhotoReader& reader) {
  // What fails without the decoder's knowledge has run out of memory.
  const char* const error = *reader.Error() == '\0' ? "out of memory" : reader.Error();
  TellFailure("cannot decode the photo: %s", error);
}

/// What a turned copy of a thumbnail and what the encoder holds of it take, bytes a sample.
constexpr size_t kBytesBesides = 4;

/// Bytes besides the decoder's that making a thumbnail, which is not larger than the first, takes
/// without sharpening it.
size_t MemoryOfScaling(const PhotoReader& reader, const ResizePlan& resize) {
  const size_t samples = static_cast<size_t>(resize.size.width) *
                         static_cast<size_t>(resize.size.height) *
                         static_cast<size_t>(reader.Channels());
  return ResizeMemory({reader.Width(), reader.Height()}, reader.Channels(), resize) +
         samples * kBytesBesides;
}

/// Bytes that the output's sharpening takes when it is as large as the first.
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

/// Bytes that the thumbnails take when each step is done to a whole picture: no output takes more
/// than the first does while it is scaled, but for its sharpening.
size_t MemoryOfWholePictures(const PhotoReader& reader, const ResizePlan& resize,
                             const ConversionPlan& plan) {
  size_t sharpening = 0;
  for (const OutputPlan& output : plan.outputs) {
    sharpening = std::max(sharpening, MemoryOfSharpening(reader, resize, output));
  }
  return RowsAhead::Memory(reader) + MemoryOfScaling(reader, resize) + sharpening;
}

/// Bytes that they take when all are made at the same time.
size_t MemoryOfAll(const PhotoReader& reader, const ResizePlan& resize,
                   const ConversionPlan& plan) {
  size_t bytes = RowsAhead::Memory(reader);
  for (const OutputPlan& output : plan.outputs) {
    bytes += MemoryOfScaling(reader, resize) + MemoryOfSharpening(reader, resize, output);
  }
  return bytes;
}

/// Scales a photo whose decoding has been started; false when a row cannot be decoded or `out`
/// refuses one.
bool ScalePhoto(PhotoReader& reader, const ResizePlan& resize, RowSink& out) {
  RowsAhead rows(reader);
  return Resize(rows, resize, out);
}

/// Starts decoding the photo for the first thumbnail and says how to scale it; empty, with one line
/// on standard error, when it cannot be decoded.
std::optional<ResizePlan> StartFirst(PhotoReader& reader, const OutputPlan& output) {
  const PictureSize fullSize = reader.FullSize();
  ResizePlan resize;
  resize.size = ThumbnailSize(fullSize, output.box);
  if (!reader.Start(resize.size)) {
    TellUndecodable(reader);
    return std::nullopt;
  }
  const PhotoTraits& traits = reader.Traits();
  resize.filter =
      traits.palette || traits.transparent ? FilterKind::kMitchell : FilterKind::kLanczos;
  // The averages of a reduced photo are not thinned out again.
  resize.coarse = !reader.IsReduced() && IsThinnedOut(fullSize, resize.size);
  resize.columnsFirst = !reader.IsReduced() && IsScaledDownFirst(fullSize, resize.size);
  return resize;
}

/// A later thumbnail, from the first.
Thumbnail MakeLater(const Thumbnail& first, const OutputPlan& output, bool exact) {
  PictureRows rows(first.picture);
  const ResizePlan resize =
      LaterResizePlan({first.picture.width, first.picture.height}, output.box, exact);
  // Rows in memory can always be read.
  Thumbnail thumbnail{*Resize(rows, resize), first.space, first.orientation, first.withProfile};
  ApplySteps(output, thumbnail);
  return thumbnail;
}

bool WriteThumbnail(const Thumbnail& thumbnail, const PhotoTraits& traits,
                    const OutputPlan& output) {
  return Write(EncodeJpeg(thumbnail.picture, traits, output.quality, thumbnail.withProfile),
               output);
}

/// Every step works on a whole picture.
bool MakeWholePictures(PhotoReader& reader, const ResizePlan& resize, const ConversionPlan& plan) {
  const PhotoTraits& traits = reader.Traits();
  PictureMaker maker(resize.size, reader.Channels());
  if (!ScalePhoto(reader, resize, maker)) {
    TellUndecodable(reader);
    return false;
  }
  Thumbnail first{maker.Take(), traits.space, traits.orientation, true};
  ApplySteps(plan.outputs.front(), first);
  return DoInTwoThreads(plan.outputs.size(), [&](size_t i) {
    const OutputPlan& output = plan.outputs[i];
    return i == 0 ? WriteThumbnail(first, traits, output)
                  : WriteThumbnail(MakeLater(first, output, !reader.IsReduced()), traits, output);
  });
}

/// Every step works on the rows that the photo has been decoded to.
bool MakeWhileDecoding(PhotoReader& reader, const ResizePlan& resize, const ConversionPlan& plan) {
  ThumbnailStream stream(resize.size, reader.Channels(), plan, reader.Traits(),
                         !reader.IsReduced());
  const bool decoded = ScalePhoto(reader, resize, stream);
  if (!decoded && !stream.HasFailed()) {
    TellUndecodable(reader);
    return false;
  }
  if (!decoded || !stream.Complete()) {
    TellFailure("cannot encode the thumbnails: %s", stream.Error().c_str());
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
    TellFailure("%s would take too much memory", plan.outputs.front().path.c_str());
    return false;
  }
  const bool streamed = ThumbnailStream::Serves(plan, reader.Traits()) &&
                        MemoryOfAll(reader, *resize, plan) <= memoryLimit;
  return streamed ? MakeWhileDecoding(reader, *resize, plan)
                  : MakeWholePictures(reader, *resize, plan);
}

}  // namespace vela
