// Reads PGM and PPM photos with binary samples, the formats of decoded camera raw files. libvips
// would map the whole file into memory, and takes longer to load than such a photo takes to read.
#pragma once

#include <cstdio>
#include <memory>
#include <string>

#include "decoding/photo_reader.h"

namespace vela {

class PnmReader final : public PhotoReader {
 public:
  /// `descriptor`: must stay open while the reader is used. `firstPageOnly`: ignore further
  /// pictures in the file.
  PnmReader(int descriptor, bool firstPageOnly);

  /// Returns false also when the largest sample value is neither 255 nor 65535, or when the file
  /// has further pictures that are not ignored.
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
  bool HasMoreData() const;

  int descriptor_;
  std::unique_ptr<FILE, CloseFile> file_;
  bool firstPageOnly_;
  PictureSize size_;
  PhotoTraits traits_;
  int channels_ = 0;
  size_t sampleSize_ = 1;
  std::string error_;
};

}  // namespace vela
