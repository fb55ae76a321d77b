#include "unsharp.h"

#include <algorithm>
#include <cmath>
#include <vector>

#include "sample_loops.h"

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

/// Sharpens one picture in place: a row is changed when the last row that its blur needs is known.
class Sharpener {
 public:
  Sharpener(Picture& picture, const UnsharpMask& mask)
      : picture_(picture),
        mask_(mask),
        kernel_(MakeKernel(mask)),
        reach_(static_cast<int>(kernel_.size()) - 1),
        rowSize_(picture.RowSize()),
        margin_(static_cast<size_t>(reach_ * picture.channels)),
        padded_(rowSize_ + 2 * margin_),
        blurred_(rowSize_ * static_cast<size_t>(2 * reach_ + 1)),
        sum_(rowSize_) {}

  void Run() {
    for (int y = 0; y < std::min(reach_, picture_.height); ++y) {
      BlurRow(y);
    }
    for (int y = 0; y < picture_.height; ++y) {
      if (y + reach_ < picture_.height) {
        BlurRow(y + reach_);
      }
      BlurColumns(y);
      SharpenRow(picture_.Row(y), sum_.data(), static_cast<float>(mask_.amount),
                 static_cast<float>(mask_.threshold) * kBrightest, rowSize_);
    }
  }

 private:
  float* Blurred(int y) {
    const int inside = std::min(std::max(y, 0), picture_.height - 1);
    return blurred_.data() + static_cast<size_t>(inside % (2 * reach_ + 1)) * rowSize_;
  }

  /// The row with its first and last pixel repeated to both sides.
  void PadRow(int y) {
    const uint16_t* const row = picture_.Row(y);
    const size_t channels = static_cast<size_t>(picture_.channels);
    for (size_t i = 0; i < rowSize_; ++i) {
      padded_[margin_ + i] = row[i];
    }
    for (size_t i = 0; i < margin_; ++i) {
      padded_[i] = row[i % channels];
      padded_[margin_ + rowSize_ + i] = row[rowSize_ - channels + i % channels];
    }
  }

  void BlurRow(int y) {
    PadRow(y);
    float* const out = Blurred(y);
    const float* const middle = padded_.data() + margin_;
    ScaleRow({middle, kernel_[0]}, out, rowSize_);
    for (int distance = 1; distance <= reach_; ++distance) {
      const float* const left = middle - distance * picture_.channels;
      const float* const right = middle + distance * picture_.channels;
      AddPair(left, right, kernel_[static_cast<size_t>(distance)], out, rowSize_);
    }
  }

  void BlurColumns(int y) {
    ScaleRow({Blurred(y), kernel_[0]}, sum_.data(), rowSize_);
    for (int distance = 1; distance <= reach_; ++distance) {
      AddPair(Blurred(y - distance), Blurred(y + distance), kernel_[static_cast<size_t>(distance)],
              sum_.data(), rowSize_);
    }
  }

  Picture& picture_;
  const UnsharpMask& mask_;
  std::vector<float> kernel_;
  int reach_;
  size_t rowSize_;
  size_t margin_;
  std::vector<float> padded_;
  std::vector<float> blurred_;
  std::vector<float> sum_;
};

}  // namespace

void Sharpen(Picture& picture, const UnsharpMask& mask) {
  Sharpener(picture, mask).Run();
}
