// What is used of libturbojpeg, which is loaded when a file is to be turned and not with the
// program: thumbnails never need it.
#pragma once

#include <turbojpeg.h>

#include "loaded_library.h"

namespace vela {

/// The functions of libturbojpeg that are used.
class TurbojpegLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded by the first call; null when it, or a function of it, is missing.
  static const TurbojpegLibrary* Get();

  decltype(&::tjInitTransform) initTransform = nullptr;
  decltype(&::tjDecompressHeader3) readHeader = nullptr;
  decltype(&::tjTransform) transform = nullptr;
  decltype(&::tjDestroy) destroy = nullptr;
  decltype(&::tjFree) freeBuffer = nullptr;

 private:
  TurbojpegLibrary();
};

}  // namespace vela
