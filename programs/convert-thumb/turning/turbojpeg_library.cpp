#include "turning/turbojpeg_library.h"

#include <dlfcn.h>

namespace {

constexpr char kLibraryName[] = "libturbojpeg.so.0";

}  // namespace

template <typename Function>
void TurbojpegLibrary::Find(void* library, const char* name, Function& function) {
  function = reinterpret_cast<Function>(dlsym(library, name));
  isLoaded_ = isLoaded_ && function != nullptr;
}

TurbojpegLibrary::TurbojpegLibrary() {
  void* const library = dlopen(kLibraryName, RTLD_NOW | RTLD_LOCAL);
  if (library == nullptr) {
    return;
  }
  isLoaded_ = true;
  Find(library, "tjInitTransform", initTransform);
  Find(library, "tjDecompressHeader3", readHeader);
  Find(library, "tjTransform", transform);
  Find(library, "tjDestroy", destroy);
  Find(library, "tjFree", freeBuffer);
}

const TurbojpegLibrary* TurbojpegLibrary::Get() {
  static const TurbojpegLibrary library;
  return library.isLoaded_ ? &library : nullptr;
}
