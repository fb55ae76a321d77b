#include "picture/unsharp.h"

#include <algorithm>
#include <cmath>

#include "picture/sample_loops.h"

namespace vela {

namespace {

constexpr double kSmallestWeight = 1.0 / 65535;
/// The bell is averaged over this many points a sample.
constexpr int kPointsPerSample = 3;

double Bell(double x, double sigma) {
  return std::exp(-x * x / (2 * sigma * sigma));
}

/// How far to both sides the bell is worth computing.
int AutomaticReach(double sigma) {
  for (int reach = 2;; ++reach) {
    double sum = 1;
    for (int i = 1; i <= reach; ++i) {
      sum += 2 * Bell(i, sigma);
    }
    if (Bell(reach, sigma) / sum < kSmallestWeight) {
      return reach - 1;
    }
  }
}

int Reach(const UnsharpMask& mask) {
  if (mask.radius >= 1) {
    return static_cast<int>(mask.radius);
  }
  return mask.radius > 0 ? 1 : AutomaticReach(mask.sigma);
}

/// One side of the bell from its middle; over both sides the weights sum up to 1.
std::vector<float> MakeKernel(const UnsharpMask& mask) {
  const int reach = Reach(mask);
  std::vector<double> half(static_cast<size_t>(reach) + 1);
  for (int i = 0; i <= reach; ++i) {
    for (int point = -(kPointsPerSample / 2); point <= kPointsPerSample / 2; ++point) {
      half[static_cast<size_t>(i)] +=
          Bell(i * kPointsPerSample + point, kPointsPerSample * mask.sigma);
    }
  }
  double sum = half[0];
  for (int i = 1; i <= reach; ++i) {
    sum += 2 * half[static_cast<size_t>(i)];
  }
  std::vector<float> kernel;
  kernel.reserve(half.size());
  for (const double weight : half) {
    kernel.push_back(static_cast<float>(weight / sum));
  }
  return kernel;
}

/// Writes rows over those of a picture.
class PictureRewriter final : public RowSink {
 public:
  explicit PictureRewriter(Picture& picture) : picture_(picture) {}

  bool Put(const float* row) override {
    RoundToPicture(row, picture_.Row(next_++), picture_.RowSize());
    return true;
  }

 private:
  Picture& picture_;
  int next_ = 0;
};

}  // namespace

RowSharpener::RowSharpener(PictureSize size, int channels, const UnsharpMask& mask, RowSink& next)
    : height_(size.height),
      channels_(static_cast<size_t>(channels)),
      amount_(static_cast<float>(mask.amount)),
      threshold_(static_cast<float>(mask.threshold) * kBrightest),
      kernel_(MakeKernel(mask)),
      reach_(static_cast<int>(kernel_.size()) - 1),
      rowSize_(static_cast<size_t>(size.width) * channels_),
      stride_(PaddedSize(rowSize_)),
      margin_(static_cast<size_t>(reach_) * channels_),
      rowsHeld_(2 * reach_ + 1),
      rows_(static_cast<size_t>(rowsHeld_) * RoomOfRow()),
      blurred_(static_cast<size_t>(rowsHeld_) * stride_),
      sum_(stride_),
      sharpened_(stride_),
      pairs_(static_cast<size_t>(reach_)),
      next_(next) {}

bool RowSharpener::Put(const float* row) {
  TakeRow(row);
  BlurRow(read_);
  ++read_;
  // The row that comes last ends the wait of those before it.
  const int end = read_ == height_ ? height_ : read_ - reach_;
  for (; made_ < end; ++made_) {
    if (!FinishRow(made_)) {
      return false;
    }
  }
  return true;
}

size_t RowSharpener::Memory(PictureSize size, int channels, const UnsharpMask& mask) {
  const auto reach = static_cast<size_t>(Reach(mask));
  const size_t stride = PaddedSize(static_cast<size_t>(size.width) * static_cast<size_t>(channels));
  const size_t margins = 2 * reach * static_cast<size_t>(channels);
  // Rows as they came and blurred rows; a blurred and a sharpened one more.
  const size_t held = 2 * reach + 1;
  return (held * (margins + stride + stride) + 2 * stride) * sizeof(float);
}

size_t RowSharpener::RoomOfRow() const {
  return margin_ + stride_ + margin_;
}

float* RowSharpener::Row(int y) {
  return rows_.data() + static_cast<size_t>(y % rowsHeld_) * RoomOfRow() + margin_;
}

float* RowSharpener::Blurred(int y) {
  const int inside = std::min(std::max(y, 0), height_ - 1);
  return blurred_.data() + static_cast<size_t>(inside % rowsHeld_) * stride_;
}

void RowSharpener::TakeRow(const float* row) {
  float* const own = Row(read_);
  std::copy_n(row, rowSize_, own);
  // The first and the last pixel are repeated to both sides.
  float* const left = own - margin_;
  for (size_t i = 0; i < margin_; ++i) {
    left[i] = row[i % channels_];
    own[rowSize_ + i] = row[rowSize_ - channels_ + i % channels_];
  }
}

void RowSharpener::BlurRow(int y) {
  const float* const middle = Row(y);
  for (size_t i = 0; i < pairs_.size(); ++i) {
    const size_t distance = (i + 1) * channels_;
    pairs_[i] = {middle - distance, middle + distance, kernel_[i + 1]};
  }
  SumPairs({middle, kernel_[0]}, pairs_.data(), pairs_.size(), Blurred(y), stride_);
}

bool RowSharpener::FinishRow(int y) {
  for (int distance = 1; distance <= reach_; ++distance) {
    pairs_[static_cast<size_t>(distance) - 1] = {Blurred(y - distance), Blurred(y + distance),
                                                 kernel_[static_cast<size_t>(distance)]};
  }
  SumPairs({Blurred(y), kernel_[0]}, pairs_.data(), pairs_.size(), sum_.data(), stride_);
  SharpenRow(Row(y), sum_.data(), amount_, threshold_, sharpened_.data(), rowSize_);
  return next_.Put(sharpened_.data());
}

void Sharpen(Picture& picture, const UnsharpMask& mask) {
  PictureRewriter rewriter(picture);
  RowSharpener sharpener({picture.width, picture.height}, picture.channels, mask, rewriter);
  std::vector<float> row(picture.RowSize());
  for (int y = 0; y < picture.height; ++y) {
    WidenRow(picture.Row(y), row.data(), row.size());
    sharpener.Put(row.data());
  }
}

}  // namespace vela
