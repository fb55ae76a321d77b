#include "thumbnails.h"

#include <atomic>
#include <cstdio>
#include <exception>
#include <optional>
#include <string>
#include <system_error>
#include <thread>
#include <utility>

#include "jpeg_writer.h"
#include "output_file.h"
#include "resize.h"
#include "rows_ahead.h"
#include "turn.h"
#include "unsharp.h"

namespace {

/// A picture on its way to an output.
struct Thumbnail {
  Picture picture;
  int orientation = 1;  ///< EXIF orientation that it still has to be turned by
  bool withProfile = true;
};

void Apply(const Step& step, Thumbnail& thumbnail) {
  switch (step.kind) {
    case Step::Kind::kFlatten:
      // A JPEG covers the background as it is.
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
      // Colour is not converted, but a grey picture becomes one of another kind, and the profile of
      // its old kind is of no use to it.
      thumbnail.withProfile = thumbnail.withProfile && thumbnail.picture.channels == 3;
      break;
  }
}

void ApplySteps(const OutputPlan& output, Thumbnail& thumbnail) {
  for (const Step& step : output.steps) {
    Apply(step, thumbnail);
  }
}

bool Write(const Thumbnail& thumbnail, const JpegTraits& traits, const OutputPlan& output) {
  const std::optional<EncodedJpeg> jpeg =
      EncodeJpeg(thumbnail.picture, traits, output.quality, thumbnail.withProfile);
  if (!jpeg || !WriteOutputFile(output.path, jpeg->bytes.get(), jpeg->size)) {
    std::fprintf(stderr, "convert-thumb: cannot write %s\n", output.path.c_str());
    return false;
  }
  return true;
}

void TellUndecodable(const JpegReader& reader) {
  std::fprintf(stderr, "convert-thumb: cannot decode the photo: %s\n", reader.Error());
}

/// Whether the first thumbnail, and beside it a turned copy and what the encoder holds of it, fit.
bool FitsInMemory(const RowSource& rows, const ResizePlan& resize, size_t memoryLimit) {
  constexpr size_t kBytesBesides = 4;
  const size_t samples = static_cast<size_t>(resize.size.width) *
                         static_cast<size_t>(resize.size.height) *
                         static_cast<size_t>(rows.Channels());
  return ResizeMemory(rows, resize) + samples * kBytesBesides <= memoryLimit;
}

/// Scales a photo whose decoding has been started; empty, with one line on standard error, when
/// that fails.
std::optional<Picture> ScalePhoto(JpegReader& reader, const ResizePlan& resize, size_t memoryLimit,
                                  const std::string& path) {
  RowsAhead rows(reader);
  if (!FitsInMemory(rows, resize, memoryLimit)) {
    std::fprintf(stderr, "convert-thumb: %s would take too much memory\n", path.c_str());
    return std::nullopt;
  }
  std::optional<Picture> picture = Resize(rows, resize);
  if (!picture) {
    TellUndecodable(reader);
  }
  return picture;
}

/// The first thumbnail, from the photo; empty, with one line on standard error, when there is none.
std::optional<Thumbnail> MakeFirst(JpegReader& reader, const OutputPlan& output,
                                   size_t memoryLimit) {
  const PictureSize fullSize = reader.FullSize();
  ResizePlan resize;
  resize.size = ThumbnailSize(fullSize, output.box);
  if (!reader.Start(resize.size)) {
    TellUndecodable(reader);
    return std::nullopt;
  }
  resize.filter = reader.Channels() == 1 ? FilterKind::kMitchell : FilterKind::kLanczos;
  // A reduced photo has been thinned out by its decoder, which does it better.
  resize.coarse = !reader.IsReduced() && IsThinnedOut(fullSize, resize.size);
  std::optional<Picture> picture = ScalePhoto(reader, resize, memoryLimit, output.path);
  if (!picture) {
    return std::nullopt;
  }
  Thumbnail thumbnail{std::move(*picture), reader.Traits().orientation, true};
  ApplySteps(output, thumbnail);
  return thumbnail;
}

/// A later thumbnail, from the first.
Thumbnail MakeLater(const Thumbnail& first, const OutputPlan& output) {
  const PictureSize from = {first.picture.width, first.picture.height};
  ResizePlan resize;
  resize.size = ThumbnailSize(from, output.box);
  resize.filter = FilterKind::kMitchell;
  resize.coarse = IsThinnedOut(from, resize.size);
  PictureRows rows(first.picture);
  // Rows in memory can always be read.
  Thumbnail thumbnail{*Resize(rows, resize), first.orientation, first.withProfile};
  ApplySteps(output, thumbnail);
  return thumbnail;
}

/// Finishes the outputs, by two threads: each takes the next output that nobody has taken.
class OutputWork {
 public:
  OutputWork(const ConversionPlan& plan, const Thumbnail& first, const JpegTraits& traits)
      : plan_(plan), first_(first), traits_(traits) {}

  bool Run() {
    std::thread second;
    if (plan_.outputs.size() > 1 && std::thread::hardware_concurrency() > 1) {
      second = StartSecondThread();
    }
    TakeOutputs();
    if (second.joinable()) {
      second.join();
    }
    return !failed_;
  }

 private:
  std::thread StartSecondThread() {
    try {
      return std::thread([this] { TakeOutputs(); });
    } catch (const std::system_error&) {
      // One thread does all the work as well.
      return std::thread();
    }
  }

  void TakeOutputs() noexcept {
    for (size_t i = next_++; i < plan_.outputs.size() && !failed_; i = next_++) {
      if (!Finish(i)) {
        failed_ = true;
      }
    }
  }

  bool Finish(size_t place) {
    try {
      const OutputPlan& output = plan_.outputs[place];
      return place == 0 ? Write(first_, traits_, output)
                        : Write(MakeLater(first_, output), traits_, output);
    } catch (const std::exception& error) {
      std::fprintf(stderr, "convert-thumb: %s\n", error.what());
      return false;
    }
  }

  const ConversionPlan& plan_;
  const Thumbnail& first_;
  const JpegTraits& traits_;
  std::atomic<size_t> next_{0};
  std::atomic<bool> failed_{false};
};

}  // namespace

bool MakeThumbnails(JpegReader& reader, const ConversionPlan& plan, size_t memoryLimit) {
  const std::optional<Thumbnail> first = MakeFirst(reader, plan.outputs.front(), memoryLimit);
  return first && OutputWork(plan, *first, reader.Traits()).Run();
}
