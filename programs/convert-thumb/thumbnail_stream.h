// Makes all thumbnails of a photo while it is being decoded.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "command_line/conversion_plan.h"
#include "decoding/photo_traits.h"
#include "encoding/jpeg_writer.h"
#include "picture/resize.h"
#include "picture/row_queue.h"
#include "picture/row_sink.h"

namespace vela {

/// How a thumbnail is scaled from the first one, which has the size `first`. `exact`: with the
/// order of directions that ImageMagick has, not the faster one.
ResizePlan LaterResizePlan(PictureSize first, const ThumbnailBox& box, bool exact);

class ThumbnailStream final : public RowSink {
 public:
  /// Whether no step needs more than some rows of the photo: the photo stands upright, and is not
  /// turned nor converted from other colours.
  static bool Serves(const ConversionPlan& plan, const PhotoTraits& traits);

  /// For the rows of the first thumbnail, of `channels` samples a pixel, as they are scaled.
  /// `traits` have to outlive this. `exact`: as in LaterResizePlan.
  ThumbnailStream(PictureSize first, int channels, const ConversionPlan& plan,
                  const PhotoTraits& traits, bool exact);

  bool Put(const float* row) override;

  /// Whether Put has refused a row.
  bool HasFailed() const { return failed_; }

  /// To be called after the last row. False when a row could not be encoded.
  bool Complete();

  /// Why a row was refused or could not be encoded.
  std::string Error() const;

  /// The output at this place of the plan, after Complete. Any thread may call it, once for each
  /// output.
  EncodedJpeg Finish(size_t output);

 private:
  class Fork;

  /// Each adds a step and returns where its rows go in.
  RowSink* AddEncoder(PictureSize size, int quality, bool withProfile);
  RowSink* AddSharpening(PictureSize size, const OutputPlan& output, RowSink* next);

  int channels_;
  const PhotoTraits& traits_;
  std::vector<std::unique_ptr<JpegEncoder>> encoders_;
  std::vector<std::unique_ptr<RowSink>> steps_;
  /// Between the first thumbnail and all that is made of it. Its thread ends before they do.
  std::unique_ptr<RowQueue> queue_;
  RowSink* way_ = nullptr;  ///< of a row of the first thumbnail
  bool failed_ = false;
};

}  // namespace vela
