#include "resize.h"

#include <algorithm>

#include "sample_loops.h"

namespace {

constexpr double kThinningArea = 0.1;
constexpr int kSmallestGrid = 128;
/// Rows of the result that the larger filter reaches over.
constexpr size_t kFilterHeight = 6;

/// What the filter of a row may read past its end.
constexpr size_t kRowMargin = 1;

/// The rows that the filter still needs, as floating point numbers.
class RowWindow {
 public:
  RowWindow(size_t rowSize, size_t rows)
      : rowSize_(rowSize), rows_(rows), values_(rowSize * rows) {}

  const float* Row(int y) const { return values_.data() + Offset(y); }

  float* Row(int y) { return values_.data() + Offset(y); }

 private:
  size_t Offset(int y) const { return static_cast<size_t>(y) % rows_ * rowSize_; }

  size_t rowSize_;
  size_t rows_;
  std::vector<float> values_;
};

size_t LongestContribution(const std::vector<Contribution>& contributions) {
  size_t longest = 0;
  for (const Contribution& contribution : contributions) {
    longest = std::max(longest, contribution.weights.size());
  }
  return longest;
}

void FilterColumns(const RowWindow& window, const Contribution& contribution,
                   std::vector<WeightedRow>& rows, float* sum, size_t size) {
  rows.clear();
  for (size_t i = 0; i < contribution.weights.size(); ++i) {
    // A thinned-out picture leaves most rows out.
    if (contribution.weights[i] != 0) {
      rows.push_back(
          {window.Row(contribution.first + static_cast<int>(i)), contribution.weights[i]});
    }
  }
  ScaleRow(rows.front(), sum, size);
  size_t done = 1;
  for (; done + 4 <= rows.size(); done += 4) {
    AddFourRows(&rows[done], sum, size);
  }
  for (; done < rows.size(); ++done) {
    AddRow(rows[done], sum, size);
  }
  // Overshoot is cut between the two directions, as it is after them.
  Clamp(sum, size);
}

/// Makes the rows of the result one after another.
class Resizer {
 public:
  Resizer(RowSource& source, const ResizePlan& plan)
      : source_(source),
        rowSize_(static_cast<size_t>(source.Width()) * static_cast<size_t>(source.Channels())),
        columns_(MakeContributions(source.Width(), plan.size.width,
                                   plan.coarse ? kGridFactor * plan.size.width : 0, plan.filter)),
        rows_(MakeContributions(source.Height(), plan.size.height,
                                plan.coarse ? kGridFactor * plan.size.height : 0, plan.filter)),
        window_(rowSize_, LongestContribution(rows_)),
        sum_(rowSize_ + kRowMargin),
        result_(plan.size.width, plan.size.height, source.Channels()) {}

  std::optional<Picture> Run() {
    for (int y = 0; y < result_.height; ++y) {
      const Contribution& contribution = rows_[static_cast<size_t>(y)];
      if (!ReadUpTo(contribution.End())) {
        return std::nullopt;
      }
      FilterColumns(window_, contribution, weighted_, sum_.data(), rowSize_);
      FilterRow(y);
    }
    return ReadUpTo(source_.Height()) ? std::optional<Picture>(std::move(result_)) : std::nullopt;
  }

 private:
  bool ReadUpTo(int end) {
    for (; read_ < end; ++read_) {
      if (!source_.ReadRow(window_.Row(read_))) {
        return false;
      }
    }
    return true;
  }

  void FilterRow(int y) {
    if (result_.channels == 1) {
      FilterGreyRow(columns_, sum_.data(), result_.Row(y));
    } else {
      FilterColourRow(columns_, sum_.data(), result_.Row(y));
    }
  }

  RowSource& source_;
  size_t rowSize_;
  std::vector<Contribution> columns_;
  std::vector<Contribution> rows_;
  RowWindow window_;
  std::vector<float> sum_;
  std::vector<WeightedRow> weighted_;
  Picture result_;
  int read_ = 0;
};

std::optional<Picture> CopyRows(RowSource& source) {
  Picture copy(source.Width(), source.Height(), source.Channels());
  std::vector<float> row(copy.RowSize());
  for (int y = 0; y < copy.height; ++y) {
    if (!source.ReadRow(row.data())) {
      return std::nullopt;
    }
    std::transform(row.begin(), row.end(), copy.Row(y), ToSample);
  }
  return copy;
}

}  // namespace

bool IsThinnedOut(PictureSize from, PictureSize to) {
  const double horizontal = static_cast<double>(to.width) / from.width;
  const double vertical = static_cast<double>(to.height) / from.height;
  return horizontal * vertical <= kThinningArea && kGridFactor * to.width >= kSmallestGrid &&
         kGridFactor * to.height >= kSmallestGrid;
}

size_t ResizeMemory(const RowSource& source, const ResizePlan& plan) {
  const size_t channels = static_cast<size_t>(source.Channels());
  const size_t rowSize = static_cast<size_t>(source.Width()) * channels;
  const size_t shrunkRows = static_cast<size_t>(source.Height() / plan.size.height) + 1;
  const size_t result =
      static_cast<size_t>(plan.size.width) * static_cast<size_t>(plan.size.height) * channels;
  return kFilterHeight * shrunkRows * rowSize * sizeof(float) + result * sizeof(uint16_t);
}

std::optional<Picture> Resize(RowSource& source, const ResizePlan& plan) {
  if (source.Width() == plan.size.width && source.Height() == plan.size.height) {
    return CopyRows(source);
  }
  return Resizer(source, plan).Run();
}
