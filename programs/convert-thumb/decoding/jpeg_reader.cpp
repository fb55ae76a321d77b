#include "decoding/jpeg_reader.h"

#include <array>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <vector>

#include "decoding/exif_traits.h"
#include "decoding/jpeg_source.h"
#include "picture/jpeg_errors.h"
#include "picture/resize.h"

#include <jerror.h>

namespace vela {

namespace {

constexpr int kExifMarker = JPEG_APP0 + 1;
constexpr int kProfileMarker = JPEG_APP0 + 2;
constexpr unsigned kLongestMarker = 65533;
constexpr char kExifName[] = "Exif";
constexpr char kFaxName[] = "G3FAX";

/// Scales, in eighths, at which decoding takes less time than at full size.
constexpr std::array<unsigned, 5> kReductions = {1, 2, 3, 4, 5};
constexpr unsigned kFullScale = 8;
/// Scaling a reduced picture that is hardly larger than the thumbnail makes its blocks visible.
constexpr double kMinExcess = 1.5;
/// Decoding this many pixels takes so little time that quality is not reduced for it.
constexpr uint64_t kFewPixels = 2000000;
/// Where ImageMagick skips samples, a reduced picture, which holds averages of all samples, differs
/// more from its result. Up to this many pixels, and wherever ImageMagick skips many, similarity
/// takes priority over time.
constexpr uint64_t kManyPixels = 16000000;
constexpr double kFineGrid = 0.75;

/// A picture with more scans was crafted to waste time.
constexpr int kMaxScans = 500;

void LimitScans(j_common_ptr info) {
  if (reinterpret_cast<j_decompress_ptr>(info)->input_scan_number > kMaxScans) {
    ERREXIT1(info, JERR_BAD_PROG_SCRIPT, kMaxScans);
  }
}

struct FreeMemory {
  void operator()(JOCTET* memory) const { std::free(memory); }
};

bool BeginsWith(const jpeg_marker_struct& marker, const char* name) {
  const size_t length = std::strlen(name);
  return marker.data_length >= length && std::memcmp(marker.data, name, length) == 0;
}

unsigned ScaledSide(unsigned side, unsigned eighths) {
  return (side * eighths + kFullScale - 1) / kFullScale;
}

}  // namespace

struct JpegReader::State {
  jpeg_decompress_struct info = {};
  JpegErrors errors;
  JpegSource source;
  jpeg_progress_mgr progress = {};
  PhotoTraits traits;
  bool created = false;

  ~State() {
    if (created) {
      jpeg_destroy_decompress(&info);
    }
  }

  uint64_t Pixels() const { return static_cast<uint64_t>(info.image_width) * info.image_height; }

  bool IsSupported() const {
    return HasSupportedComponents() && info.data_precision == 8 && Pixels() <= kMaxPixels &&
           !IsFax();
  }

  bool HasSupportedComponents() const {
    return info.num_components == 1 || info.num_components == 3 ||
           (info.num_components == 4 && info.out_color_space == JCS_CMYK);
  }

  bool IsFax() const {
    for (const jpeg_marker_struct* marker = info.marker_list; marker != nullptr;
         marker = marker->next) {
      if (marker->marker == kExifMarker && BeginsWith(*marker, kFaxName)) {
        return true;
      }
    }
    return false;
  }

  void ReadFrameTraits() {
    traits.colour = info.num_components == 3;
    traits.palette = info.num_components == 1;
    traits.space = SpaceOf(info.num_components);
    for (int i = 0; traits.colour && i < 3; ++i) {
      traits.sampling[static_cast<size_t>(i)] = {info.comp_info[i].h_samp_factor,
                                                 info.comp_info[i].v_samp_factor};
    }
    // A density of 1 by 1 is a placeholder.
    if (info.saw_JFIF_marker != 0 && info.X_density != 1 && info.Y_density != 1) {
      traits.density = {info.density_unit, info.X_density, info.Y_density};
    }
  }

  void ReadExif() {
    for (const jpeg_marker_struct* marker = info.marker_list; marker != nullptr;
         marker = marker->next) {
      if (marker->marker == kExifMarker && BeginsWith(*marker, kExifName)) {
        ReadExifTraits(marker->data, marker->data_length, traits);
        return;
      }
    }
  }

  static ColourSpace SpaceOf(int components) {
    if (components == 4) {
      return ColourSpace::kCmyk;
    }
    return components == 1 ? ColourSpace::kGrey : ColourSpace::kRgb;
  }

  bool ReadColourProfile() {
    JOCTET* data = nullptr;
    unsigned size = 0;
    if (!CallJpegLibrary(errors, [&] { jpeg_read_icc_profile(&info, &data, &size); })) {
      return false;
    }
    const std::unique_ptr<JOCTET, FreeMemory> owned(data);
    if (data != nullptr) {
      traits.colourProfile.assign(data, data + size);
    }
    return true;
  }

  bool IsLargeEnough(unsigned eighths, PictureSize needed) const {
    return ScaledSide(info.image_width, eighths) >= kMinExcess * needed.width &&
           ScaledSide(info.image_height, eighths) >= kMinExcess * needed.height;
  }

  /// Returns true when the samples that ImageMagick picks are needed.
  bool MustBePresampled(PictureSize needed) const {
    const PictureSize full = {static_cast<int>(info.image_width),
                              static_cast<int>(info.image_height)};
    return IsPresampled(full, needed) &&
           (Pixels() <= kManyPixels || kGridFactor * needed.width < kFineGrid * full.width);
  }

  unsigned ChooseScale(PictureSize needed) const {
    if (Pixels() <= kFewPixels || MustBePresampled(needed)) {
      return kFullScale;
    }
    for (const unsigned eighths : kReductions) {
      if (IsLargeEnough(eighths, needed)) {
        return eighths;
      }
    }
    return kFullScale;
  }
};

JpegReader::JpegReader(int descriptor, size_t memoryLimit) : state_(std::make_unique<State>()) {
  State& state = *state_;
  state.info.err = PrepareJpegErrors(state.errors);
  state.created = CallJpegLibrary(state.errors, [&] { jpeg_create_decompress(&state.info); });
  if (!state.created) {
    return;
  }
  const auto max = static_cast<size_t>(std::numeric_limits<long>::max());
  state.info.mem->max_memory_to_use = static_cast<long>(memoryLimit < max ? memoryLimit : max);
  state.progress.progress_monitor = LimitScans;
  state.info.progress = &state.progress;
  ReadJpegFrom(state.source, descriptor, state.info);
}

JpegReader::~JpegReader() = default;

bool JpegReader::ReadHeader() {
  State& state = *state_;
  const bool read = state.created && CallJpegLibrary(state.errors, [&] {
                      jpeg_save_markers(&state.info, kExifMarker, kLongestMarker);
                      jpeg_save_markers(&state.info, kProfileMarker, kLongestMarker);
                      jpeg_read_header(&state.info, TRUE);
                    });
  if (!read || !state.IsSupported()) {
    return false;
  }
  state.ReadFrameTraits();
  state.ReadExif();
  return state.ReadColourProfile();
}

PictureSize JpegReader::FullSize() const {
  return {static_cast<int>(state_->info.image_width), static_cast<int>(state_->info.image_height)};
}

const PhotoTraits& JpegReader::Traits() const {
  return state_->traits;
}

bool JpegReader::Start(PictureSize needed) {
  State& state = *state_;
  state.info.scale_num = state.ChooseScale(needed);
  state.info.scale_denom = kFullScale;
  if (!CallJpegLibrary(state.errors, [&] { jpeg_start_decompress(&state.info); })) {
    return false;
  }
  return state.info.output_components == state.info.num_components;
}

bool JpegReader::IsReduced() const {
  return state_->info.scale_num != kFullScale;
}

int JpegReader::Width() const {
  return static_cast<int>(state_->info.output_width);
}

int JpegReader::Height() const {
  return static_cast<int>(state_->info.output_height);
}

int JpegReader::Channels() const {
  return state_->info.num_components;
}

bool JpegReader::ReadRow(uint8_t* row) {
  State& state = *state_;
  unsigned rows = 0;
  return CallJpegLibrary(state.errors, [&] { rows = jpeg_read_scanlines(&state.info, &row, 1); }) &&
         rows == 1;
}

const char* JpegReader::Error() const {
  return state_->errors.message;
}

}  // namespace vela
