#include "decoding/gif_library.h"

#include <dlfcn.h>

namespace vela {

namespace {

constexpr char kLibraryName[] = "libgif.so.7";

}  // namespace

GifLibrary::GifLibrary() : LoadedLibrary(kLibraryName, RTLD_NOW) {
  Find("DGifOpen", open);
  Find("DGifCloseFile", close);
  Find("DGifGetRecordType", getRecordType);
  Find("DGifGetImageDesc", getImage);
  Find("DGifGetExtension", getExtension);
  Find("DGifGetExtensionNext", getExtensionNext);
}

const GifLibrary* GifLibrary::Get() {
  static const GifLibrary library;
  return library.IsLoaded() ? &library : nullptr;
}

}  // namespace vela
