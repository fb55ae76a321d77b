#include "decoding/gif_frame.h"

#include "decoding/file_input.h"
#include "platform/installed_names.h"
#include "posix/loaded_library.h"

#include <gif_lib.h>

namespace vela {

namespace {

/// The functions of giflib that are used. It is loaded for a GIF only.
class GifLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded by the first call; null when it, or one of its functions, is
  /// missing.
  static const GifLibrary* Get() {
    static const GifLibrary library;
    return library.IsLoaded() ? &library : nullptr;
  }

  decltype(&::DGifOpen) open = nullptr;
  decltype(&::DGifCloseFile) close = nullptr;
  decltype(&::DGifGetRecordType) getRecordType = nullptr;
  decltype(&::DGifGetImageDesc) getImage = nullptr;
  decltype(&::DGifGetExtension) getExtension = nullptr;
  decltype(&::DGifGetExtensionNext) getExtensionNext = nullptr;

 private:
  GifLibrary() : LoadedLibrary(kGifLibrary) {
    Find("DGifOpen", open);
    Find("DGifCloseFile", close);
    Find("DGifGetRecordType", getRecordType);
    Find("DGifGetImageDesc", getImage);
    Find("DGifGetExtension", getExtension);
    Find("DGifGetExtensionNext", getExtensionNext);
  }
};

int ReadInput(GifFileType* gif, GifByteType* bytes, int size) {
  return static_cast<FileInput*>(gif->UserData)->Read(bytes, size);
}

bool SkipExtension(const GifLibrary& library, GifFileType* gif) {
  int code = 0;
  GifByteType* block = nullptr;
  int result = library.getExtension(gif, &code, &block);
  while (result != GIF_ERROR && block != nullptr) {
    result = library.getExtensionNext(gif, &block);
  }
  return result != GIF_ERROR;
}

bool FindFrame(const GifLibrary& library, GifFileType* gif) {
  GifRecordType type = UNDEFINED_RECORD_TYPE;
  while (library.getRecordType(gif, &type) != GIF_ERROR) {
    if (type == IMAGE_DESC_RECORD_TYPE) {
      return library.getImage(gif) != GIF_ERROR;
    }
    if (type != EXTENSION_RECORD_TYPE || !SkipExtension(library, gif)) {
      return false;
    }
  }
  return false;
}

bool CoversPicture(const GifFileType& gif) {
  const GifImageDesc& frame = gif.Image;
  return frame.Left == 0 && frame.Top == 0 && frame.Width == gif.SWidth &&
         frame.Height == gif.SHeight;
}

}  // namespace

bool FirstFrameCoversGif(int descriptor) {
  const GifLibrary* const library = GifLibrary::Get();
  if (library == nullptr) {
    return false;
  }
  FileInput input(descriptor);
  GifFileType* const gif = library->open(&input, ReadInput, nullptr);
  if (gif == nullptr) {
    return false;
  }
  const bool covers = FindFrame(*library, gif) && CoversPicture(*gif);
  library->close(gif, nullptr);
  return covers;
}

}  // namespace vela
