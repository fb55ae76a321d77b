// Takes a picture row by row.
#pragma once

namespace vela {

class RowSink {
 public:
  virtual ~RowSink() = default;

  /// Takes the next row from the top, as float samples from 0 to kBrightest, the samples of a pixel
  /// side by side. False when it cannot be used; no more rows may follow then.
  virtual bool Put(const float* row) = 0;

 protected:
  RowSink() = default;
  RowSink(const RowSink&) = default;
  RowSink& operator=(const RowSink&) = default;
};

}  // namespace vela
