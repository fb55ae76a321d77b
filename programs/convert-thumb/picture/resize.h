// Scales a picture while it is being read.
#pragma once

#include <cstddef>
#include <optional>

#include "picture/picture.h"
#include "picture/resize_plan.h"
#include "picture/rows.h"

namespace vela {

/// Returns the peak memory in bytes of scaling a picture of size `from` with `channels` samples a
/// pixel, including a picture made of the result.
size_t ResizeMemory(PictureSize from, int channels, const ResizePlan& plan);

/// Passes the rows of the scaled picture to `out`. Returns false when a row cannot be read or `out`
/// rejects one. Keeps only as many source rows in memory as the filter is high.
bool Resize(RowSource& source, const ResizePlan& plan, RowSink& out);

/// Returns the scaled picture; empty when a row cannot be read.
std::optional<Picture> Resize(RowSource& source, const ResizePlan& plan);

}  // namespace vela
