#include "thumbnails/thumbnail_stream.h"

#include <algorithm>
#include <utility>

#include "picture/column_scaler.h"
#include "picture/row_scaler.h"
#include "picture/unsharp.h"

namespace vela {

namespace {

constexpr int kUpright = 1;

/// Returns true when the step can process rows one by one, given an upright photo in grey or RGB.
bool WorksOnRows(const Step& step) {
  switch (step.kind) {
    case Step::Kind::kFlatten:
    case Step::Kind::kAutoOrient:
    case Step::Kind::kSharpen:
    case Step::Kind::kConvertToSrgb:
      return true;
    case Step::Kind::kTurn:
      return step.quarterTurns == 0;
  }
  return false;
}

bool KeepsProfile(const OutputPlan& output, const PhotoTraits& traits) {
  return IsProfileValidInRgb(traits.space) ||
         std::none_of(output.steps.begin(), output.steps.end(),
                      [](const Step& step) { return step.kind == Step::Kind::kConvertToSrgb; });
}

}  // namespace

ResizePlan LaterResizePlan(PictureSize first, const ThumbnailBox& box, bool exact) {
  ResizePlan plan;
  plan.size = ThumbnailSize(first, box);
  plan.filter = FilterKind::kMitchell;
  plan.columnsFirst = exact && IsScaledVerticallyFirst(first, plan.size);
  plan.presample = IsPresampled(first, plan.size);
  return plan;
}

bool ThumbnailStream::Supports(const ConversionPlan& plan, const PhotoTraits& traits) {
  return traits.orientation == kUpright && IsStorable(traits.space) &&
         std::all_of(plan.outputs.begin(), plan.outputs.end(), [](const OutputPlan& output) {
           return std::all_of(output.steps.begin(), output.steps.end(), WorksOnRows);
         });
}

/// Passes the rows of the first thumbnail to its encoder and to the scalers of the other
/// thumbnails.
class ThumbnailStream::Splitter final : public RowSink {
 public:
  Splitter(PictureSize size, int channels)
      : block_(static_cast<size_t>(size.width) * static_cast<size_t>(channels), size.height) {}

  /// Adds a step that takes the rows unchanged.
  void Add(RowSink& sink) { sinks_.push_back(&sink); }

  void Add(PictureSize size, int channels, const ResizePlan& resize, RowSink& next) {
    if (resize.columnsFirst) {
      columnScalers_.push_back(std::make_unique<ColumnScaler>(size, channels, resize, next));
      Add(*columnScalers_.back());
    } else {
      scalers_.push_back(std::make_unique<BlockScaler>(size, channels, resize, next));
    }
  }

  bool Put(const float* row) override {
    const bool taken =
        std::all_of(sinks_.begin(), sinks_.end(), [row](RowSink* sink) { return sink->Put(row); });
    return taken && (scalers_.empty() || PutBlock(block_.Put(row)));
  }

 private:
  bool PutBlock(int rows) {
    return rows == 0 || std::all_of(scalers_.begin(), scalers_.end(), [&](const auto& scaler) {
             return scaler->Put(block_.Lanes(), rows);
           });
  }

  RowBlock block_;
  std::vector<RowSink*> sinks_;
  std::vector<std::unique_ptr<BlockScaler>> scalers_;
  std::vector<std::unique_ptr<ColumnScaler>> columnScalers_;
};

ThumbnailStream::ThumbnailStream(PictureSize first, int channels, const ConversionPlan& plan,
                                 const PhotoTraits& traits, bool exact)
    : channels_(channels), traits_(traits) {
  const OutputPlan& firstOutput = plan.outputs.front();
  const bool withProfile = KeepsProfile(firstOutput, traits);
  auto splitter = std::make_unique<Splitter>(first, channels);
  splitter->Add(*AddEncoder(first, firstOutput.quality, withProfile));
  for (size_t i = 1; i < plan.outputs.size(); ++i) {
    const OutputPlan& output = plan.outputs[i];
    const ResizePlan resize = LaterResizePlan(first, output.box, exact);
    RowSink* const encoder =
        AddEncoder(resize.size, output.quality, withProfile && KeepsProfile(output, traits));
    RowSink* const next = AddSharpening(resize.size, output, encoder);
    if (resize.size.width == first.width && resize.size.height == first.height) {
      splitter->Add(*next);
    } else {
      splitter->Add(first, channels, resize, *next);
    }
  }
  const size_t rowSize = static_cast<size_t>(first.width) * static_cast<size_t>(channels);
  queue_ = std::make_unique<RowQueue>(rowSize, *splitter);
  steps_.push_back(std::move(splitter));
  input_ = AddSharpening(first, firstOutput, queue_.get());
}

bool ThumbnailStream::Put(const float* row) {
  failed_ = !input_->Put(row);
  return !failed_;
}

bool ThumbnailStream::Complete() {
  return queue_->Finish();
}

std::string ThumbnailStream::Error() const {
  for (const std::unique_ptr<JpegEncoder>& encoder : encoders_) {
    if (const std::string error = encoder->Error(); !error.empty()) {
      return error;
    }
  }
  // The other steps can only fail for lack of memory.
  return "out of memory";
}

EncodedJpeg ThumbnailStream::Finish(size_t output) {
  return encoders_[output]->Finish();
}

RowSink* ThumbnailStream::AddEncoder(PictureSize size, int quality, bool withProfile) {
  encoders_.push_back(
      std::make_unique<JpegEncoder>(size, channels_, traits_, quality, withProfile));
  return encoders_.back().get();
}

RowSink* ThumbnailStream::AddSharpening(PictureSize size, const OutputPlan& output, RowSink* next) {
  for (auto step = output.steps.rbegin(); step != output.steps.rend(); ++step) {
    if (step->kind == Step::Kind::kSharpen) {
      steps_.push_back(std::make_unique<RowSharpener>(size, channels_, step->unsharp, *next));
      next = steps_.back().get();
    }
  }
  return next;
}

}  // namespace vela
