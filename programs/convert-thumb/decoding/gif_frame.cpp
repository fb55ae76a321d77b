#include "decoding/gif_frame.h"

#include "decoding/file_input.h"
#include "decoding/gif_library.h"

namespace vela {

namespace {

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

bool Fills(const GifFileType& gif) {
  const GifImageDesc& frame = gif.Image;
  return frame.Left == 0 && frame.Top == 0 && frame.Width == gif.SWidth &&
         frame.Height == gif.SHeight;
}

}  // namespace

bool FirstFrameFillsGif(int descriptor) {
  const GifLibrary* const library = GifLibrary::Get();
  if (library == nullptr) {
    return false;
  }
  FileInput input(descriptor);
  GifFileType* const gif = library->open(&input, ReadInput, nullptr);
  if (gif == nullptr) {
    return false;
  }
  const bool fills = FindFrame(*library, gif) && Fills(*gif);
  library->close(gif, nullptr);
  return fills;
}

}  // namespace vela
