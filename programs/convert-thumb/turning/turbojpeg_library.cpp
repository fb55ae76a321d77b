#include "turning/turbojpeg_library.h"

#include <dlfcn.h>

namespace vela {

namespace {

constexpr char kLibraryName[] = "libturbojpeg.so.0";

}  // namespace

TurbojpegLibrary::TurbojpegLibrary() : LoadedLibrary(kLibraryName, RTLD_NOW) {
  Find("tjInitTransform", initTransform);
  Find("tjDecompressHeader3", readHeader);
  Find("tjTransform", transform);
  Find("tjDestroy", destroy);
  Find("tjFree", freeBuffer);
}

const TurbojpegLibrary* TurbojpegLibrary::Get() {
  static const TurbojpegLibrary library;
  return library.IsLoaded() ? &library : nullptr;
}

}  // namespace vela
