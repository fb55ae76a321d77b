#include "decoding/gif_library.h"

#include <dlfcn.h>

namespace {

constexpr char kLibraryName[] = "libgif.so.7";

}  // namespace

template <typename Function>
void GifLibrary::Find(void* library, const char* name, Function& function) {
  function = reinterpret_cast<Function>(dlsym(library, name));
  isLoaded_ = isLoaded_ && function != nullptr;
}

GifLibrary::GifLibrary() {
  void* const library = dlopen(kLibraryName, RTLD_NOW | RTLD_LOCAL);
  if (library == nullptr) {
    return;
  }
  isLoaded_ = true;
  Find(library, "DGifOpen", open);
  Find(library, "DGifCloseFile", close);
  Find(library, "DGifGetRecordType", getRecordType);
  Find(library, "DGifGetImageDesc", getImage);
  Find(library, "DGifGetExtension", getExtension);
  Find(library, "DGifGetExtensionNext", getExtensionNext);
}

const GifLibrary* GifLibrary::Get() {
  static const GifLibrary library;
  return library.isLoaded_ ? &library : nullptr;
}
