#include "picture/unsharp.h"

#include <algorithm>
#include <cmath>

#include "picture/sample_loops.h"

namespace vela {

namespace {

constexpr double kMinWeight = 1.0 / 65535;
/// The Gaussian is averaged over this many points per sample.
constexpr int kPointsPerSample = 3;

double Gaussian(double x, double sigma) {
  return std::exp(-x * x / (2 * sigma * sigma));
}

/// Returns the distance at which the weights of the Gaussian become negligible.
int AutomaticReach(double sigma) {
  for (int reach = 2;; ++reach) {
    double sum = 1;
    for (int i = 1; i <= reach; ++i) {
      sum += 2 * Gaussian(i, sigma);
    }
    if (Gaussian(reach, sigma) / sum < kMinWeight) {
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

/// Returns one half of the Gaussian, starting at its centre; the weights of both halves add up
/// to 1.
std::vector<float> MakeKernel(const UnsharpMask& mask) {
  const int reach = Reach(mask);
  std::vector<double> half(static_cast<size_t>(reach) + 1);
  for (int i = 0; i <= reach; ++i) {
    for (int point = -(kPointsPerSample / 2); point <= kPointsPerSample / 2; ++point) {
      half[static_cast<size_t>(i)] +=
          Gaussian(i * kPointsPerSample + point, kPointsPerSample * mask.sigma);
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
      rows_(static_cast<size_t>(rowsHeld_) * PaddedRowSize()),
      blurred_(static_cast<size_t>(rowsHeld_) * stride_),
      sum_(stride_),
      sharpened_(stride_),
      pairs_(static_cast<size_t>(reach_)),
      next_(next) {}

bool RowSharpener::Put(const float* row) {
  StoreRow(row);
  BlurRow(read_);
  ++read_;
  // The last row completes all rows that are still pending.
  const int end = read_ == height_ ? height_ : read_ - reach_;
  for (; done_ < end; ++done_) {
    if (!FinishRow(done_)) {
      return false;
    }
  }
  return true;
}

size_t RowSharpener::Memory(PictureSize size, int channels, const UnsharpMask& mask) {
  const auto reach = static_cast<size_t>(Reach(mask));
  const size_t stride = PaddedSize(static_cast<size_t>(size.width) * static_cast<size_t>(channels));
  const size_t margins = 2 * reach * static_cast<size_t>(channels);
  // Source rows and blurred rows, plus one blurred and one sharpened row.
  const size_t held = 2 * reach + 1;
  return (held * (margins + stride + stride) + 2 * stride) * sizeof(float);
}

size_t RowSharpener::PaddedRowSize() const {
  return margin_ + stride_ + margin_;
}

float* RowSharpener::Row(int y) {
  return rows_.data() + static_cast<size_t>(y % rowsHeld_) * PaddedRowSize() + margin_;
}

float* RowSharpener::Blurred(int y) {
  const int inside = std::min(std::max(y, 0), height_ - 1);
  return blurred_.data() + static_cast<size_t>(inside % rowsHeld_) * stride_;
}

void RowSharpener::StoreRow(const float* row) {
  float* const own = Row(read_);
  std::copy_n(row, rowSize_, own);
  // The first and the last pixel are repeated into the margins.
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
  PictureWriter writer(picture);
  RowSharpener sharpener(picture.Size(), picture.channels, mask, writer);
  std::vector<float> row(picture.RowSize());
  for (int y = 0; y < picture.height; ++y) {
    WidenRow(picture.Row(y), row.data(), row.size());
    sharpener.Put(row.data());
  }
}

}  // namespace vela
