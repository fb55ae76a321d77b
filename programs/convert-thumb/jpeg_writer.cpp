#include "jpeg_writer.h"

#include <algorithm>
#include <vector>

#include "jpeg_errors.h"
#include "sample_loops.h"

namespace {

/// Above this the slower transform is worth its time.
constexpr int kFastTransformQuality = 90;
/// From here on colour is stored as finely as brightness, unless the photo says otherwise.
constexpr int kFineColourQuality = 90;

/// Compares whole rows without leaving early, which the compiler makes vector instructions of.
bool IsGreyRow(const uint16_t* row, int width) {
  unsigned difference = 0;
  for (int x = 0; x < width; ++x) {
    difference |= static_cast<unsigned>((row[0] ^ row[1]) | (row[1] ^ row[2]));
    row += 3;
  }
  return difference == 0;
}

bool IsGrey(const Picture& picture) {
  if (picture.channels == 1) {
    return true;
  }
  for (int y = 0; y < picture.height; ++y) {
    if (!IsGreyRow(picture.Row(y), picture.width)) {
      return false;
    }
  }
  return true;
}

Picture GreyCopy(const Picture& picture) {
  Picture grey(picture.width, picture.height, 1);
  for (size_t i = 0; i < grey.samples.size(); ++i) {
    grey.samples[i] = picture.samples[i * 3];
  }
  return grey;
}

/// The library's compressor with the memory that it writes to.
class Compressor {
 public:
  Compressor() {
    info_.err = PrepareJpegErrors(errors_);
    created_ = CallJpegLibrary(errors_, [this] { jpeg_create_compress(&info_); });
  }
  ~Compressor() {
    if (created_ && info_.dest != nullptr && bytes_ != nullptr) {
      // While it compresses, only the library knows where the bytes have been moved to.
      info_.dest->term_destination(&info_);
    }
    std::free(bytes_);
    if (created_) {
      jpeg_destroy_compress(&info_);
    }
  }
  Compressor(const Compressor&) = delete;
  Compressor& operator=(const Compressor&) = delete;

  bool Start(const Picture& picture, const JpegTraits& traits, int quality) {
    return created_ && CallJpegLibrary(errors_, [&] { Configure(picture, traits, quality); });
  }

  bool WriteProfile(const std::vector<uint8_t>& profile) {
    return CallJpegLibrary(errors_, [&] {
      jpeg_write_icc_profile(&info_, profile.data(), static_cast<unsigned>(profile.size()));
    });
  }

  bool WriteRows(const Picture& picture) {
    std::vector<uint8_t> samples(picture.RowSize());
    return CallJpegLibrary(errors_, [&] {
      JSAMPROW row = samples.data();
      while (info_.next_scanline < info_.image_height) {
        RoundRow(picture.Row(static_cast<int>(info_.next_scanline)), row, picture.RowSize());
        jpeg_write_scanlines(&info_, &row, 1);
      }
      jpeg_finish_compress(&info_);
    });
  }

  EncodedJpeg TakeResult() {
    EncodedJpeg result;
    result.bytes.reset(bytes_);
    result.size = size_;
    bytes_ = nullptr;
    return result;
  }

 private:
  void Configure(const Picture& picture, const JpegTraits& traits, int quality) {
    jpeg_mem_dest(&info_, &bytes_, &size_);
    info_.image_width = static_cast<JDIMENSION>(picture.width);
    info_.image_height = static_cast<JDIMENSION>(picture.height);
    info_.input_components = picture.channels;
    info_.in_color_space = picture.channels == 1 ? JCS_GRAYSCALE : JCS_RGB;
    jpeg_set_defaults(&info_);
    jpeg_set_quality(&info_, quality, TRUE);
    info_.optimize_coding = TRUE;
    info_.dct_method = quality <= kFastTransformQuality ? JDCT_IFAST : JDCT_ISLOW;
    info_.density_unit = static_cast<UINT8>(traits.density.unit);
    info_.X_density = static_cast<UINT16>(traits.density.x);
    info_.Y_density = static_cast<UINT16>(traits.density.y);
    SetSampling(traits, quality);
    jpeg_start_compress(&info_, TRUE);
  }

  void SetSampling(const JpegTraits& traits, int quality) {
    if (info_.num_components == 3 && traits.colour) {
      for (int i = 0; i < 3; ++i) {
        const JpegSampling& sampling = traits.sampling[static_cast<size_t>(i)];
        info_.comp_info[i].h_samp_factor = sampling.horizontal;
        info_.comp_info[i].v_samp_factor = sampling.vertical;
      }
    } else if (quality >= kFineColourQuality) {
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

std::optional<EncodedJpeg> Encode(const Picture& picture, const JpegTraits& traits, int quality,
                                  bool withProfile) {
  Compressor compressor;
  if (!compressor.Start(picture, traits, quality)) {
    return std::nullopt;
  }
  if (withProfile && !traits.colourProfile.empty() &&
      !compressor.WriteProfile(traits.colourProfile)) {
    return std::nullopt;
  }
  if (!compressor.WriteRows(picture)) {
    return std::nullopt;
  }
  return compressor.TakeResult();
}

}  // namespace

std::optional<EncodedJpeg> EncodeJpeg(const Picture& picture, const JpegTraits& traits, int quality,
                                      bool withProfile) {
  if (picture.channels == 3 && IsGrey(picture)) {
    return Encode(GreyCopy(picture), traits, quality, withProfile);
  }
  return Encode(picture, traits, quality, withProfile);
}
