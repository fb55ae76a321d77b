// Scales a picture while it is being read.
#pragma once

#include <cstddef>
#include <optional>
#include <vector>

#include "picture/picture.h"
#include "picture/resize_filter.h"
#include "picture/row_sink.h"
#include "picture/row_source.h"
#include "picture/thumbnail_size.h"

namespace vela {

/// How to scale.
struct ResizePlan {
  PictureSize size;  ///< of the result, both sides at least 1
  FilterKind filter = FilterKind::kLanczos;
  bool columnsFirst = false;  ///< from top to bottom before from left to right, see ColumnScaler
  bool coarse = false;  ///< first take the nearest sample on a grid of `kGridFactor` times `size`
};

constexpr int kGridFactor = 5;

/// Whether a picture that shrinks from `from` to `to` is thinned out first: by much, and not to
/// something so small that it would show.
bool IsThinnedOut(PictureSize from, PictureSize to);

/// Whether ImageMagick scales such a picture from top to bottom before it scales it from left to
/// right.
bool IsScaledDownFirst(PictureSize from, PictureSize to);

/// What the samples of a row or column of `length` samples, scaled to `newLength`, are made of.
std::vector<Contribution> ContributionsOf(int length, int newLength, const ResizePlan& plan);

/// Bytes that scaling a picture of size `from` with `channels` samples a pixel takes at its peak,
/// a picture made of the result included.
size_t ResizeMemory(PictureSize from, int channels, const ResizePlan& plan);

/// Passes the rows of the scaled picture on. False when a row cannot be read or `out` refuses one.
/// Holds as many rows of the source as the filter is high.
bool Resize(RowSource& source, const ResizePlan& plan, RowSink& out);

/// The scaled picture; empty when a row cannot be read.
std::optional<Picture> Resize(RowSource& source, const ResizePlan& plan);

}  // namespace vela
