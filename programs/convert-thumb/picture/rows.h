// Pictures that are produced and consumed row by row.
#pragma once

#include <utility>

#include "picture/picture.h"
#include "picture/sample_loops.h"

namespace vela {

/// A picture that is read row by row.
class RowSource {
 public:
  virtual ~RowSource() = default;
  virtual int Width() const = 0;     ///< pixels
  virtual int Height() const = 0;    ///< pixels
  virtual int Channels() const = 0;  ///< 1, 3 or 4

  /// Writes the next row from the top to `row`, which has room for Width() * Channels() samples
  /// from 0 to kBrightest. Returns false when it cannot be read. Called at most Height() times.
  virtual bool ReadRow(float* row) = 0;

 protected:
  RowSource() = default;
  RowSource(const RowSource&) = default;
  RowSource& operator=(const RowSource&) = default;
};

/// A step that takes a picture row by row.
class RowSink {
 public:
  virtual ~RowSink() = default;

  /// Takes the next row from the top as float samples from 0 to kBrightest, the samples of a pixel
  /// next to each other. Returns false when the row cannot be processed; no row may follow then.
  virtual bool Put(const float* row) = 0;

 protected:
  RowSink() = default;
  RowSink(const RowSink&) = default;
  RowSink& operator=(const RowSink&) = default;
};

/// Reads the rows of a picture in memory, which must outlive this object.
class PictureRows final : public RowSource {
 public:
  explicit PictureRows(const Picture& picture) : picture_(picture) {}

  int Width() const override { return picture_.width; }
  int Height() const override { return picture_.height; }
  int Channels() const override { return picture_.channels; }
  bool ReadRow(float* row) override {
    WidenRow(picture_.Row(next_++), row, picture_.RowSize());
    return true;
  }

 private:
  const Picture& picture_;
  int next_ = 0;
};

/// Writes rows into a picture, which must outlive this object.
class PictureWriter final : public RowSink {
 public:
  explicit PictureWriter(Picture& picture) : picture_(picture) {}

  bool Put(const float* row) override {
    RoundToPicture(row, picture_.Row(next_++), picture_.RowSize());
    return true;
  }

 private:
  Picture& picture_;
  int next_ = 0;
};

}  // namespace vela
