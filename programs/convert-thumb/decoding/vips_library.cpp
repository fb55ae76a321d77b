#include "decoding/vips_library.h"

#include <gmodule.h>

#include <cstdlib>
#include <optional>
#include <string>

#include "platform/installed_names.h"

namespace vela {

namespace {

constexpr char kProgramName[] = "convert-thumb";
/// Where libvips looks for modules; scanning them takes longer than making a thumbnail.
constexpr char kModulesVariable[] = "VIPSHOME";
constexpr char kNoDirectory[] = "/dev/null";

/// Errors are reported by the results of calls.
void IgnoreMessage(const gchar*, GLogLevelFlags, const gchar*, gpointer) {}

/// Hides the modules from libvips during its lifetime; ImageMagick may need the variable later.
class ModulesHidden {
 public:
  ModulesHidden() {
    if (const char* const value = std::getenv(kModulesVariable)) {
      original_ = value;
    }
    setenv(kModulesVariable, kNoDirectory, 1);
  }
  ~ModulesHidden() {
    if (original_) {
      setenv(kModulesVariable, original_->c_str(), 1);
    } else {
      unsetenv(kModulesVariable);
    }
  }
  ModulesHidden(const ModulesHidden&) = delete;
  ModulesHidden& operator=(const ModulesHidden&) = delete;

 private:
  std::optional<std::string> original_;
};

}  // namespace

VipsLibrary::VipsLibrary() : LoadedLibrary(kVipsLibrary, Binding::kLazy) {
  Find("vips_source_new_from_descriptor", openDescriptor);
  Find("vips_pngload_source", loadPng);
  Find("vips_tiffload_source", loadTiff);
  Find("vips_gifload_source", loadGif);
  Find("vips_webpload_source", loadWebp);
  Find("vips_heifload_source", loadHeif);
  Find("vips_jp2kload_source", loadJpeg2000);
  Find("vips_image_get_typeof", typeOf);
  Find("vips_image_get_int", getInt);
  Find("vips_image_get_string", getString);
  Find("vips_image_get_blob", getBlob);
  Find("vips_image_get_array_double", getDoubles);
  Find("vips_region_new", newRegion);
  Find("vips_region_prepare", prepareRegion);
  Find("vips_error_buffer", errorBuffer);
  Find("vips_thread_shutdown", shutDownThread);
  Find("g_object_unref", unref);
  Find("png_create_read_struct", createPng);
  Find("png_create_info_struct", createPngInfo);
  Find("png_destroy_read_struct", destroyPng);
  Find("png_set_longjmp_fn", setPngJump);
  Find("png_longjmp", abortPng);
  Find("png_set_read_fn", setPngReader);
  Find("png_set_chunk_malloc_max", limitPngChunks);
  Find("png_set_keep_unknown_chunks", skipPngChunks);
  Find("png_get_io_ptr", getPngInput);
  Find("png_read_info", readPngInfo);
  Find("png_get_bit_depth", getPngDepth);
  Find("png_get_gAMA_fixed", getPngGamma);
  Find("png_get_pHYs", getPngDensity);
  Find("TIFFFdOpen", openTiff);
  Find("TIFFGetField", getTiffField);
  Find("TIFFClose", closeTiff);
  Find("TIFFSetErrorHandler", setTiffErrorHandler_);
  Find("TIFFSetWarningHandler", setTiffWarningHandler_);
  Find("WebPDemuxInternal", openWebp);
  Find("WebPDemuxDelete", closeWebp);
  Find("WebPDemuxGetI", getWebpNumber);
  Find("WebPDemuxGetFrame", getWebpFrame);
  Find("WebPDemuxReleaseIterator", releaseWebpFrame);
  Find("vips_init", initialise_);
  Find("vips_version", version_);
  Find("vips_cache_set_max", setCache_);
  Find("vips_concurrency_set", setConcurrency_);
  Find("g_log_set_default_handler", setLogHandler_);
  Find("g_module_open", openModule_);
  isStarted_ = IsLoaded() && Start();
}

bool VipsLibrary::Start() {
  setLogHandler_(IgnoreMessage, nullptr);
  // libvips installs its own handlers only when it opens its first TIFF.
  setTiffErrorHandler_(nullptr);
  setTiffWarningHandler_(nullptr);
  const ModulesHidden hidden;
  const bool started = initialise_(kProgramName) == 0;
  if (started) {
    // Every picture is read once, in a separate thread.
    setCache_(0);
    setConcurrency_(1);
  }
  return started;
}

void VipsLibrary::LoadHeifModule() const {
  const std::string path = DirectoryOf(initialise_) + "vips-modules-" +
                           std::to_string(version_(0)) + "." + std::to_string(version_(1)) +
                           "/vips-heif.so";
  openModule_(path.c_str(), G_MODULE_BIND_LAZY);
}

const VipsLibrary* VipsLibrary::Get() {
  static const VipsLibrary library;
  return library.isStarted_ ? &library : nullptr;
}

}  // namespace vela
