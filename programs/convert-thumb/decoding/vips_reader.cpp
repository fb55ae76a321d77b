#include "decoding/vips_reader.h"

#include <algorithm>
#include <optional>
#include <string>

#include "decoding/gif_frame.h"
#include "decoding/pixel_rows.h"
#include "decoding/png_header.h"
#include "decoding/tiff_colours.h"
#include "decoding/vips_library.h"
#include "decoding/vips_traits.h"
#include "decoding/webp_frame.h"
#include "picture/picture.h"
#include "platform/installed_names.h"

namespace vela {

namespace {

/// Number of rows that sequential decoders deliver at once.
constexpr int kStripRows = 16;
constexpr Background kWhite = {kBrightest, kBrightest, kBrightest};
constexpr char kInterlaced[] = "interlaced";
/// Later versions of ImageMagick let the library of the format convert to RGB, with opacity, and so
/// does libvips.
constexpr bool kReadsHeifAsLumaChroma = kImageMagickVersion <= 6;

VipsImage* Load(const VipsLibrary& vips, VipsSource* source, PhotoFormat format) {
  VipsImage* image = nullptr;
  const auto load = [&](auto loader) {
    loader(source, &image, "access", VIPS_ACCESS_SEQUENTIAL, "fail_on", VIPS_FAIL_ON_ERROR,
           nullptr);
  };
  switch (format) {
    case PhotoFormat::kPng:
      load(vips.loadPng);
      break;
    case PhotoFormat::kTiff:
      load(vips.loadTiff);
      break;
    case PhotoFormat::kGif:
      load(vips.loadGif);
      break;
    case PhotoFormat::kWebp:
      load(vips.loadWebp);
      break;
    case PhotoFormat::kHeif:
      vips.LoadHeifModule();
      load(vips.loadHeif);
      break;
    case PhotoFormat::kJpeg2000:
      load(vips.loadJpeg2000);
      break;
    default:
      break;
  }
  return image;
}

/// Returns true when ChangeRow supports these samples.
bool HasSupportedSamples(const VipsImage& image) {
  const bool wide = image.BandFmt == VIPS_FORMAT_USHORT;
  if ((image.BandFmt != VIPS_FORMAT_UCHAR && !wide) || image.Coding != VIPS_CODING_NONE) {
    return false;
  }
  switch (image.Type) {
    case VIPS_INTERPRETATION_B_W:
    case VIPS_INTERPRETATION_GREY16:
      return image.Bands == 1 || image.Bands == 2;
    case VIPS_INTERPRETATION_sRGB:
    case VIPS_INTERPRETATION_RGB16:
      return image.Bands == 3 || image.Bands == 4;
    case VIPS_INTERPRETATION_CMYK:
      return image.Bands == 4;
    default:
      return false;
  }
}

bool HasOpacity(const VipsImage& image) {
  return image.Bands == 2 || (image.Bands == 4 && image.Type != VIPS_INTERPRETATION_CMYK);
}

}  // namespace

struct VipsReader::State {
  const VipsLibrary* vips = nullptr;
  VipsSourceFile file;
  size_t memoryLimit = 0;
  VipsSource* source = nullptr;
  VipsImage* image = nullptr;
  VipsRegion* region = nullptr;
  TiffColours tiffColours = TiffColours::kSupported;
  PngHeader pngHeader;
  PhotoTraits traits;
  RowChange change = RowChange::kNone;
  Background background = kWhite;
  int next = 0;      ///< row to be read
  int prepared = 0;  ///< end of the rows in the region
  std::string error;

  ~State() {
    Release(region);
    Release(image);
    Release(source);
  }

  template <typename Object>
  void Release(Object* object) {
    if (object != nullptr) {
      vips->unref(object);
    }
  }

  uint64_t Pixels() const {
    return static_cast<uint64_t>(image->Xsize) * static_cast<uint64_t>(image->Ysize);
  }

  size_t SampleBytes() const {
    return image->BandFmt == VIPS_FORMAT_USHORT ? sizeof(uint16_t) : sizeof(uint8_t);
  }

  /// Memory that decoding needs besides a few rows.
  uint64_t WholePictureBytes() const {
    const bool interlaced = HasVipsField(*vips, image, kInterlaced);
    const bool streamed =
        file.format == PhotoFormat::kTiff || (file.format == PhotoFormat::kPng && !interlaced);
    return streamed ? 0 : Pixels() * static_cast<uint64_t>(image->Bands) * SampleBytes();
  }

  bool CheckPngHeader() {
    const std::optional<PngHeader> header = ReadPngHeader(*vips, file.descriptor);
    pngHeader = header.value_or(PngHeader());
    return header && !header->linear;
  }

  /// Returns false when libvips would interpret the file differently from ImageMagick in ways that
  /// the returned picture does not show.
  bool IsInterpretedAlike() {
    switch (file.format) {
      case PhotoFormat::kTiff:
        tiffColours = ReadTiffColours(*vips, file.descriptor);
        return tiffColours != TiffColours::kUnsupported;
      case PhotoFormat::kPng:
        return CheckPngHeader();
      case PhotoFormat::kGif:
        return FirstFrameCoversGif(file.descriptor);
      default:
        return true;
    }
  }

  bool Open() {
    source = vips->openDescriptor(file.descriptor);
    image = source == nullptr ? nullptr : Load(*vips, source, file.format);
    return image != nullptr;
  }

  bool IsSupported() const {
    return HasSupportedSamples(*image) && Pixels() <= kMaxPixels &&
           (file.firstPageOnly || !HasFurtherPages(*vips, image, file.format));
  }

  void ReadTraits() {
    traits = ReadVipsTraits(*vips, image, file.format);
    traits.palette = traits.palette || tiffColours == TiffColours::kPalette;
    if (file.format == PhotoFormat::kPng) {
      traits.density = pngHeader.density;
    }
  }

  /// libvips makes every frame of an animation transparent when one of them is. Returns false when
  /// the first frame is not supported.
  bool CheckFirstFrame() {
    if (file.format != PhotoFormat::kWebp || !HasFurtherPages(*vips, image, file.format)) {
      return true;
    }
    const WebpFrame frame = ReadFirstWebpFrame(*vips, file.descriptor);
    traits.transparent = frame == WebpFrame::kTransparent;
    return frame != WebpFrame::kUnsupported && (HasOpacity(*image) || !traits.transparent);
  }

  /// Opacity is ignored. The file stores brightness and colour differences, which ImageMagick 6
  /// converts to RGB before other steps only if there is a colour profile.
  void ChooseHeifChange() {
    if (traits.colourProfile.empty()) {
      change = RowChange::kLumaChroma;
      traits.space = ColourSpace::kLumaChroma;
    } else {
      change = RowChange::kThroughLumaChroma;
    }
  }

  void ChooseChange() {
    if (file.format == PhotoFormat::kHeif && kReadsHeifAsLumaChroma) {
      ChooseHeifChange();
    } else if (image->Type == VIPS_INTERPRETATION_CMYK) {
      change = RowChange::kInvert;
      traits.space = ColourSpace::kCmyk;
    } else if (HasOpacity(*image)) {
      change = RowChange::kOnBackground;
      background = ReadVipsBackground(*vips, image, std::min(pngHeader.bitDepth, 8));
      traits.transparent = true;
    }
    if (ChangedBands(change, image->Bands) == 1) {
      traits.space = ColourSpace::kGrey;
    }
  }

  const uint8_t* Row(int y) const {
    return region->data + static_cast<size_t>(y - region->valid.top) * VIPS_REGION_LSKIP(region);
  }

  void StoreError() {
    error = vips->errorBuffer();
    error.erase(std::min(error.find('\n'), error.size()));
  }

  /// ImageMagick can read most damaged GIFs, so those that libvips cannot decode are left to it.
  bool IsDamagedGif() {
    if (file.format != PhotoFormat::kGif || WholePictureBytes() > memoryLimit) {
      return false;
    }
    const bool damaged = !PrepareRows();
    DropRegion();
    return damaged;
  }

  void DropRegion() {
    prepared = 0;
    Release(region);
    region = nullptr;
  }

  bool PrepareRows() {
    // A region belongs to the thread that creates it, and rows may be read by another thread than
    // the header.
    if (region == nullptr) {
      region = vips->newRegion(image);
    }
    const VipsRect rows = {0, next, image->Xsize, std::min(kStripRows, image->Ysize - next)};
    if (region == nullptr || vips->prepareRegion(region, &rows) != 0) {
      StoreError();
      return false;
    }
    prepared = next + rows.height;
    return true;
  }
};

VipsReader::VipsReader(const VipsSourceFile& file, size_t memoryLimit)
    : state_(std::make_unique<State>()) {
  state_->file = file;
  state_->memoryLimit = memoryLimit;
}

VipsReader::~VipsReader() = default;

bool VipsReader::ReadHeader() {
  State& state = *state_;
  state.vips = VipsLibrary::Get();
  if (state.vips == nullptr) {
    return false;
  }
  if (!state.IsInterpretedAlike() || !state.Open() || !state.IsSupported()) {
    return false;
  }
  state.ReadTraits();
  state.ChooseChange();
  return state.CheckFirstFrame() && !state.IsDamagedGif();
}

PictureSize VipsReader::FullSize() const {
  return {state_->image->Xsize, state_->image->Ysize};
}

const PhotoTraits& VipsReader::Traits() const {
  return state_->traits;
}

bool VipsReader::Start(PictureSize) {
  if (state_->WholePictureBytes() > state_->memoryLimit) {
    state_->error = "it would take too much memory";
    return false;
  }
  return true;
}

int VipsReader::Width() const {
  return state_->image->Xsize;
}

int VipsReader::Height() const {
  return state_->image->Ysize;
}

int VipsReader::Channels() const {
  return ChangedBands(state_->change, state_->image->Bands);
}

size_t VipsReader::SampleSize() const {
  return ChangedSampleSize(state_->change, state_->SampleBytes());
}

bool VipsReader::ReadRow(uint8_t* row) {
  State& state = *state_;
  if (state.next >= state.prepared && !state.PrepareRows()) {
    return false;
  }
  const DecodedRow decoded = {state.Row(state.next), Width(), state.image->Bands,
                              state.SampleBytes()};
  ChangeRow(decoded, state.change, state.background, row);
  ++state.next;
  return true;
}

void VipsReader::LeaveThread() {
  // The region uses memory that belongs to the thread.
  state_->DropRegion();
  state_->vips->shutDownThread();
}

const char* VipsReader::Error() const {
  return state_->error.c_str();
}

}  // namespace vela
