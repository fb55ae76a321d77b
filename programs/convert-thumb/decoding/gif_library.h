// What is used of giflib, which is loaded for a GIF and not with the program.
#pragma once

#include <gif_lib.h>

#include "loaded_library.h"

namespace vela {

/// The functions of giflib that are used.
class GifLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded by the first call; null when it, or a function of it, is missing.
  static const GifLibrary* Get();

  decltype(&::DGifOpen) open = nullptr;
  decltype(&::DGifCloseFile) close = nullptr;
  decltype(&::DGifGetRecordType) getRecordType = nullptr;
  decltype(&::DGifGetImageDesc) getImage = nullptr;
  decltype(&::DGifGetExtension) getExtension = nullptr;
  decltype(&::DGifGetExtensionNext) getExtensionNext = nullptr;

 private:
  GifLibrary();
};

}  // namespace vela
