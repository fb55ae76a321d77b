// What is used of libturbojpeg, which is loaded when a file is to be turned and not with the
// program: thumbnails never need it.
#pragma once

#include <turbojpeg.h>

/// The functions of libturbojpeg that are used.
class TurbojpegLibrary {
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

  template <typename Function>
  void Find(void* library, const char* name, Function& function);

  bool isLoaded_ = false;
};
