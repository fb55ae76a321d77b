#include "encoding/jpeg_writer.h"

#include <algorithm>
#include <array>
#include <cmath>

#include "picture/jpeg_errors.h"
#include "picture/sample_loops.h"

namespace vela {

namespace {

/// Above this quality, the slower transform is worth its time.
constexpr int kMaxFastTransformQuality = 90;
/// Smallest difference between the samples of a pixel with colour, in samples of a picture.
constexpr float kMinColourDifference = 0.5;
/// From this quality on, chroma is not subsampled unless that of the photo is.
constexpr int kMinFullChromaQuality = 90;

using Sampling = std::array<JpegSampling, 3>;

/// Returns true when a JPEG with interleaved components can have these factors. JPEGs with separate
/// components are less limited.
bool IsStorable(const Sampling& sampling) {
  int blocks = 0;
  for (const JpegSampling& component : sampling) {
    blocks += component.horizontal * component.vertical;
  }
  return blocks <= C_MAX_BLOCKS_IN_MCU;
}

/// Has no early exit, so that the compiler can vectorise the loop.
bool IsGreyRow(const float* row, int width) {
  float difference = 0;
  for (int x = 0; x < width; ++x) {
    difference = std::max({difference, std::fabs(row[0] - row[1]), std::fabs(row[1] - row[2])});
    row += 3;
  }
  return difference < kMinColourDifference;
}

}  // namespace

/// The library's compressor with its output buffer.
class JpegEncoder::Compressor {
 public:
  Compressor() {
    info_.err = PrepareJpegErrors(errors_);
    created_ = CallJpegLibrary(errors_, [this] { jpeg_create_compress(&info_); });
  }
  ~Compressor() {
    if (created_ && info_.dest != nullptr && bytes_ != nullptr) {
      // During compression, only the library knows the current address of the buffer.
      info_.dest->term_destination(&info_);
    }
    std::free(bytes_);
    if (created_) {
      jpeg_destroy_compress(&info_);
    }
  }
  Compressor(const Compressor&) = delete;
  Compressor& operator=(const Compressor&) = delete;

  bool Start(PictureSize size, int channels, const PhotoTraits& traits, int quality) {
    return created_ &&
           CallJpegLibrary(errors_, [&] { Configure(size, channels, traits, quality); });
  }

  bool WriteProfile(const std::vector<uint8_t>& profile) {
    return CallJpegLibrary(errors_, [&] {
      jpeg_write_icc_profile(&info_, profile.data(), static_cast<unsigned>(profile.size()));
    });
  }

  bool WriteRow(uint8_t* row) {
    return CallJpegLibrary(errors_, [&] { jpeg_write_scanlines(&info_, &row, 1); });
  }

  bool End() {
    return CallJpegLibrary(errors_, [&] { jpeg_finish_compress(&info_); });
  }

  /// Returns why the last call failed.
  const char* Error() const { return errors_.message; }

  EncodedJpeg TakeResult() {
    EncodedJpeg result;
    result.bytes.reset(bytes_);
    result.size = size_;
    bytes_ = nullptr;
    return result;
  }

 private:
  void Configure(PictureSize size, int channels, const PhotoTraits& traits, int quality) {
    jpeg_mem_dest(&info_, &bytes_, &size_);
    info_.image_width = static_cast<JDIMENSION>(size.width);
    info_.image_height = static_cast<JDIMENSION>(size.height);
    info_.input_components = channels;
    info_.in_color_space = channels == 1 ? JCS_GRAYSCALE : JCS_RGB;
    jpeg_set_defaults(&info_);
    jpeg_set_quality(&info_, quality, TRUE);
    info_.optimize_coding = TRUE;
    info_.dct_method = quality <= kMaxFastTransformQuality ? JDCT_IFAST : JDCT_ISLOW;
    info_.density_unit = static_cast<UINT8>(traits.density.unit);
    info_.X_density = static_cast<UINT16>(traits.density.x);
    info_.Y_density = static_cast<UINT16>(traits.density.y);
    SetSampling(traits, quality);
    jpeg_start_compress(&info_, TRUE);
  }

  void SetSampling(const PhotoTraits& traits, int quality) {
    if (info_.num_components == 3 && traits.colour && IsStorable(traits.sampling)) {
      for (int i = 0; i < 3; ++i) {
        const JpegSampling& sampling = traits.sampling[static_cast<size_t>(i)];
        info_.comp_info[i].h_samp_factor = sampling.horizontal;
        info_.comp_info[i].v_samp_factor = sampling.vertical;
      }
    } else if (quality >= kMinFullChromaQuality) {
      for (int i = 0; i < info_.num_components; ++i) {
        info_.comp_info[i].h_samp_factor = 1;
        info_.comp_info[i].v_samp_factor = 1;
      }
    }
  }

  jpeg_compress_struct info_ = {};
  JpegErrors errors_;
  bool created_ = false;
  unsigned char* bytes_ = nullptr;
  unsigned long size_ = 0;
};

JpegEncoder::JpegEncoder(PictureSize size, int channels, const PhotoTraits& traits, int quality,
                         bool withProfile)
    : size_(size),
      channels_(channels),
      traits_(traits),
      quality_(quality),
      withProfile_(withProfile),
      row_(static_cast<size_t>(size.width) * static_cast<size_t>(channels)) {}

JpegEncoder::~JpegEncoder() = default;

bool JpegEncoder::Put(const float* row) {
  if (compressor_ == nullptr) {
    if (channels_ == 3 && IsGreyRow(row, size_.width)) {
      KeepGreyRow(row);
      return true;
    }
    if (!Start(channels_) || !WriteGreyRows()) {
      return false;
    }
  }
  RoundRow(row, row_.data(), row_.size());
  return WriteRow();
}

std::string JpegEncoder::Error() const {
  return compressor_ == nullptr ? "" : compressor_->Error();
}

EncodedJpeg JpegEncoder::Finish() {
  const bool written = compressor_ != nullptr || (Start(1) && WriteGreyRows());
  return written && compressor_->End() ? compressor_->TakeResult() : Failure();
}

EncodedJpeg JpegEncoder::Failure() const {
  EncodedJpeg failure;
  failure.error = Error();
  return failure;
}

void JpegEncoder::KeepGreyRow(const float* row) {
  RoundRow(row, row_.data(), row_.size());
  for (size_t i = 0; i < row_.size(); i += 3) {
    grey_.push_back(row_[i]);
  }
}

bool JpegEncoder::Start(int channels) {
  channels_ = channels;
  row_.resize(static_cast<size_t>(size_.width) * static_cast<size_t>(channels));
  compressor_ = std::make_unique<Compressor>();
  return compressor_->Start(size_, channels, traits_, quality_) &&
         (!withProfile_ || traits_.colourProfile.empty() ||
          compressor_->WriteProfile(traits_.colourProfile));
}

bool JpegEncoder::WriteGreyRows() {
  const size_t width = static_cast<size_t>(size_.width);
  for (size_t row = 0; row < grey_.size(); row += width) {
    for (size_t i = 0; i < row_.size(); ++i) {
      row_[i] = grey_[row + i / static_cast<size_t>(channels_)];
    }
    if (!WriteRow()) {
      return false;
    }
  }
  return true;
}

bool JpegEncoder::WriteRow() {
  return compressor_->WriteRow(row_.data());
}

EncodedJpeg EncodeJpeg(const Picture& picture, const PhotoTraits& traits, int quality,
                       bool withProfile) {
  JpegEncoder encoder({picture.width, picture.height}, picture.channels, traits, quality,
                      withProfile);
  std::vector<float> row(picture.RowSize());
  for (int y = 0; y < picture.height; ++y) {
    WidenRow(picture.Row(y), row.data(), row.size());
    if (!encoder.Put(row.data())) {
      return encoder.Failure();
    }
  }
  return encoder.Finish();
}

}  // namespace vela
