#include <array>
#include <string_view>

#include "platform/standalone/path_text.h"
#include "platform/velaindex.h"

namespace {

using Extension = std::string_view;

constexpr std::array kRawExtensions = {
    Extension("3fr"), Extension("arw"), Extension("cr2"), Extension("crw"), Extension("dcr"),
    Extension("dng"), Extension("erf"), Extension("k25"), Extension("kdc"), Extension("mef"),
    Extension("mos"), Extension("mrw"), Extension("nef"), Extension("orf"), Extension("pef"),
    Extension("ptx"), Extension("raf"), Extension("raw"), Extension("rw2"), Extension("sr2"),
    Extension("srf"), Extension("srw"), Extension("x3f")};

constexpr std::array kPictureExtensions = {Extension("bmp"),  Extension("gif"),  Extension("heic"),
                                           Extension("heif"), Extension("jpe"),  Extension("jpeg"),
                                           Extension("jpg"),  Extension("png"),  Extension("psd"),
                                           Extension("tif"),  Extension("tiff"), Extension("webp")};

constexpr std::array kMultiplePageExtensions = {
    Extension("gif"), Extension("heic"), Extension("heif"), Extension("psd"),
    Extension("tif"), Extension("tiff"), Extension("webp")};

constexpr std::array kVideoExtensions = {
    Extension("3g2"),  Extension("3gp"),  Extension("asf"),  Extension("avi"), Extension("dat"),
    Extension("divx"), Extension("f4v"),  Extension("flv"),  Extension("m2t"), Extension("m2ts"),
    Extension("m2v"),  Extension("m4v"),  Extension("mkv"),  Extension("mov"), Extension("mp4"),
    Extension("mpe"),  Extension("mpeg"), Extension("mpg"),  Extension("mts"), Extension("ogv"),
    Extension("qt"),   Extension("rm"),   Extension("rmvb"), Extension("ts"),  Extension("vob"),
    Extension("webm"), Extension("wmv"),  Extension("xvid")};

constexpr size_t kLongestExtension = 4;

template <size_t N>
constexpr bool IsSortedTable(const std::array<Extension, N>& table) {
  for (size_t i = 0; i < N; ++i) {
    if (table[i].empty() || table[i].size() > kLongestExtension) {
      return false;
    }
    if (i > 0 && !(table[i - 1] < table[i])) {
      return false;
    }
  }
  return true;
}

static_assert(IsSortedTable(kRawExtensions));
static_assert(IsSortedTable(kPictureExtensions));
static_assert(IsSortedTable(kMultiplePageExtensions));
static_assert(IsSortedTable(kVideoExtensions));

constexpr char ToLower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// Returns whether `extension` is in the table, in any case of its ASCII letters.
template <size_t N>
bool IsIn(const std::array<Extension, N>& table, std::string_view extension) {
  if (extension.size() > kLongestExtension) {
    return false;
  }
  char lower[kLongestExtension];
  for (size_t i = 0; i < extension.size(); ++i) {
    lower[i] = ToLower(extension[i]);
  }
  const std::string_view wanted(lower, extension.size());
  for (const Extension known : table) {
    if (known == wanted) {
      return true;
    }
  }
  return false;
}

std::string_view ExtensionOfPath(const char* path) {
  return path == nullptr ? std::string_view() : vela::ExtensionOf(path);
}

bool IsPhoto(std::string_view extension) {
  return IsIn(kPictureExtensions, extension) || IsIn(kRawExtensions, extension);
}

}  // namespace

bool BlVELAIndexIsRawImage(const char* extension) {
  return extension != nullptr && IsIn(kRawExtensions, extension);
}

bool BlVELAIndexIsPhotoOnWebFile(const char* path) {
  return IsPhoto(ExtensionOfPath(path));
}

bool BlVELAIndexIsPhotoOnWebConvertFile(const char* path) {
  return IsPhoto(ExtensionOfPath(path));
}

bool BlVELAIndexIsMultiplePagePhotoFile(const char* path) {
  return IsIn(kMultiplePageExtensions, ExtensionOfPath(path));
}

bool BlVELAIndexIsVideoOnWebFile(const char* path) {
  return IsIn(kVideoExtensions, ExtensionOfPath(path));
}

int EntryNameShouldIndex(const char* name) {
  if (name == nullptr) {
    return 0;
  }
  const std::string_view text(name);
  if (text.empty() || text == "lost+found") {
    return 0;
  }
  return text.front() == '.' || text.front() == '@' || text.front() == '#' ? 0 : 1;
}
