// Makes a picture of the rows it gets.
#pragma once

#include <utility>

#include "picture/picture.h"
#include "picture/row_sink.h"
#include "picture/sample_loops.h"
#include "picture/thumbnail_size.h"

namespace vela {

class PictureMaker final : public RowSink {
 public:
  PictureMaker(PictureSize size, int channels) : picture_(size.width, size.height, channels) {}

  bool Put(const float* row) override {
    RoundToPicture(row, picture_.Row(next_++), picture_.RowSize());
    return true;
  }

  /// The picture, after its last row.
  Picture Take() { return std::move(picture_); }

 private:
  Picture picture_;
  int next_ = 0;
};

}  // namespace vela
