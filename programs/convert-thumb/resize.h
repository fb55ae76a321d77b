// Scales a picture while it is being read.
#pragma once

#include <cstddef>
#include <optional>

#include "picture.h"
#include "resize_filter.h"
#include "row_source.h"
#include "thumbnail_size.h"

/// How to scale.
struct ResizePlan {
  PictureSize size;  ///< of the result, both sides at least 1
  FilterKind filter = FilterKind::kLanczos;
  bool coarse = false;  ///< first take the nearest sample on a grid of `kGridFactor` times `size`
};

constexpr int kGridFactor = 5;

/// Whether a picture that shrinks from `from` to `to` is thinned out first: by much, and not to
/// something so small that it would show.
bool IsThinnedOut(PictureSize from, PictureSize to);

/// Bytes that scaling takes at its peak, the result included.
size_t ResizeMemory(const RowSource& source, const ResizePlan& plan);

/// The scaled picture; empty when a row cannot be read. Holds as many rows of the source as the
/// filter is high, and the result.
std::optional<Picture> Resize(RowSource& source, const ResizePlan& plan);
