#include "picture/resize.h"

#include <vector>

#include "picture/column_scaler.h"
#include "picture/row_scaler.h"

namespace vela {

namespace {

/// Rows of the result that the larger filter covers.
constexpr size_t kFilterHeight = 6;

bool PassRows(RowSource& source, RowSink& out) {
  std::vector<float> row(static_cast<size_t>(source.Width()) *
                         static_cast<size_t>(source.Channels()));
  for (int y = 0; y < source.Height(); ++y) {
    if (!source.ReadRow(row.data()) || !out.Put(row.data())) {
      return false;
    }
  }
  return true;
}

}  // namespace

size_t ResizeMemory(PictureSize from, int channels, const ResizePlan& plan) {
  const size_t rowSize = static_cast<size_t>(from.width) * static_cast<size_t>(channels);
  const size_t shrunkRows = static_cast<size_t>(from.height / plan.size.height) + 1;
  const size_t scaledRow = static_cast<size_t>(plan.size.width) * static_cast<size_t>(channels);
  const size_t result = scaledRow * static_cast<size_t>(plan.size.height);
  // Two copies of a block of rows before it is scaled horizontally, and two after.
  const size_t blocks = 2 * kBlockRows * (rowSize + scaledRow);
  const size_t windowRow = plan.columnsFirst ? rowSize : scaledRow;
  return (kFilterHeight * shrunkRows * windowRow + blocks) * sizeof(float) +
         result * sizeof(uint16_t);
}

bool Resize(RowSource& source, const ResizePlan& plan, RowSink& out) {
  if (source.Width() == plan.size.width && source.Height() == plan.size.height) {
    return PassRows(source, out);
  }
  if (plan.columnsFirst) {
    ColumnScaler scaler({source.Width(), source.Height()}, source.Channels(), plan, out);
    return PassRows(source, scaler);
  }
  RowScaler scaler({source.Width(), source.Height()}, source.Channels(), plan, out);
  for (int y = 0; y < source.Height(); ++y) {
    if (!source.ReadRow(scaler.NextRow()) || !scaler.TakeRow()) {
      return false;
    }
  }
  return true;
}

std::optional<Picture> Resize(RowSource& source, const ResizePlan& plan) {
  Picture picture(plan.size.width, plan.size.height, source.Channels());
  PictureWriter writer(picture);
  return Resize(source, plan, writer) ? std::optional<Picture>(std::move(picture)) : std::nullopt;
}

}  // namespace vela
