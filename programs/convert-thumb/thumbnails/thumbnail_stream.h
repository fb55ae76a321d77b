// Makes all thumbnails of a photo while it is being decoded.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "command_line/conversion_plan.h"
#include "encoding/jpeg_writer.h"
#include "picture/photo_traits.h"
#include "picture/resize.h"
#include "picture/row_queue.h"
#include "picture/rows.h"

namespace vela {

/// Returns how to scale a thumbnail from the first one, which has the size `first`. `exact`: in the
/// same order of directions as ImageMagick instead of the faster one.
ResizePlan LaterResizePlan(PictureSize first, const ThumbnailBox& box, bool exact);

/// Passes the rows of the first thumbnail through the steps of all thumbnails.
class ThumbnailStream final : public RowSink {
 public:
  /// Returns true when every step needs only a few rows at a time: the photo is upright, in grey or
  /// RGB, and not rotated.
  static bool Supports(const ConversionPlan& plan, const PhotoTraits& traits);

  /// `first`, `channels`: size and samples per pixel of the first thumbnail, whose rows are put
  /// here. `traits` must outlive this object. `exact`: see LaterResizePlan.
  ThumbnailStream(PictureSize first, int channels, const ConversionPlan& plan,
                  const PhotoTraits& traits, bool exact);

  bool Put(const float* row) override;

  /// Returns true when Put has rejected a row.
  bool HasFailed() const { return failed_; }

  /// Called after the last row. Returns false when a row could not be encoded.
  bool Complete();

  /// Returns why a row was rejected or could not be encoded.
  std::string Error() const;

  /// Returns the output with this index in the plan. Called after Complete, once per output, by any
  /// thread.
  EncodedJpeg Finish(size_t output);

 private:
  class Splitter;

  /// Both add a step and return it; the step passes its rows to `next` or encodes them as an
  /// output.
  RowSink* AddEncoder(PictureSize size, int quality, bool withProfile);
  RowSink* AddSharpening(PictureSize size, const OutputPlan& output, RowSink* next);

  int channels_;
  const PhotoTraits& traits_;
  std::vector<std::unique_ptr<JpegEncoder>> encoders_;
  std::vector<std::unique_ptr<RowSink>> steps_;
  /// Separates the first thumbnail from those made from it. Declared after the steps, so that its
  /// thread ends before they are destroyed.
  std::unique_ptr<RowQueue> queue_;
  RowSink* input_ = nullptr;  ///< the first step
  bool failed_ = false;
};

}  // namespace vela
