// Reads PGM and PPM photos with binary samples, as which camera raw files arrive. libvips would map
// the whole file into memory, and takes longer to load than reading such a photo takes.
#pragma once

#include <cstdio>
#include <memory>
#include <string>

#include "decoding/photo_reader.h"

namespace vela {

class PnmReader final : public PhotoReader {
 public:
  /// Reads from `descriptor`. `firstPageOnly`: leave further pictures in the file alone.
  PnmReader(int descriptor, bool firstPageOnly);

  /// False also when the brightest sample is neither 255 nor 65535, or more than a picture follows.
  bool ReadHeader() override;
  PictureSize FullSize() const override { return size_; }
  const PhotoTraits& Traits() const override { return traits_; }
  bool Start(PictureSize needed) override;
  bool IsReduced() const override { return false; }
  int Width() const override { return size_.width; }
  int Height() const override { return size_.height; }
  int Channels() const override { return channels_; }
  size_t SampleSize() const override { return sampleSize_; }
  bool ReadRow(uint8_t* row) override;
  const char* Error() const override { return error_.c_str(); }

 private:
  struct CloseFile {
    void operator()(FILE* file) const { std::fclose(file); }
  };

  size_t RowBytes() const;
  bool IsFollowed() const;

  std::unique_ptr<FILE, CloseFile> file_;
  bool firstPageOnly_;
  PictureSize size_;
  PhotoTraits traits_;
  int channels_ = 0;
  size_t sampleSize_ = 1;
  std::string error_;
};

}  // namespace vela
