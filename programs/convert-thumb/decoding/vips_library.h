// libvips, which is loaded only for photos that need it: loading it takes many times as long as
// making the thumbnails of a JPEG.
#pragma once

#include <png.h>
#include <tiffio.h>
#include <vips/vips.h>
#include <webp/demux.h>

#include "posix/loaded_library.h"

namespace vela {

/// The functions that are used of libvips and of its dependencies.
class VipsLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded and initialised by the first call, without its loadable modules;
  /// null when it, or one of its functions, is missing.
  static const VipsLibrary* Get();

  /// Loads the module for HEIC and AVIF, which loadHeif needs.
  void LoadHeifModule() const;

  decltype(&::vips_source_new_from_descriptor) openDescriptor = nullptr;
  decltype(&::vips_pngload_source) loadPng = nullptr;
  decltype(&::vips_tiffload_source) loadTiff = nullptr;
  decltype(&::vips_gifload_source) loadGif = nullptr;
  decltype(&::vips_webpload_source) loadWebp = nullptr;
  decltype(&::vips_heifload_source) loadHeif = nullptr;
  decltype(&::vips_jp2kload_source) loadJpeg2000 = nullptr;
  decltype(&::vips_image_get_typeof) typeOf = nullptr;
  decltype(&::vips_image_get_int) getInt = nullptr;
  decltype(&::vips_image_get_string) getString = nullptr;
  decltype(&::vips_image_get_blob) getBlob = nullptr;
  decltype(&::vips_image_get_array_double) getDoubles = nullptr;
  decltype(&::vips_region_new) newRegion = nullptr;
  decltype(&::vips_region_prepare) prepareRegion = nullptr;
  decltype(&::vips_error_buffer) errorBuffer = nullptr;
  decltype(&::vips_thread_shutdown) shutDownThread = nullptr;
  decltype(&::g_object_unref) unref = nullptr;
  decltype(&::png_create_read_struct) createPng = nullptr;
  decltype(&::png_create_info_struct) createPngInfo = nullptr;
  decltype(&::png_destroy_read_struct) destroyPng = nullptr;
  decltype(&::png_set_longjmp_fn) setPngJump = nullptr;
  decltype(&::png_longjmp) abortPng = nullptr;
  decltype(&::png_set_read_fn) setPngReader = nullptr;
  decltype(&::png_set_chunk_malloc_max) limitPngChunks = nullptr;
  decltype(&::png_set_keep_unknown_chunks) skipPngChunks = nullptr;
  decltype(&::png_get_io_ptr) getPngInput = nullptr;
  decltype(&::png_read_info) readPngInfo = nullptr;
  decltype(&::png_get_bit_depth) getPngDepth = nullptr;
  decltype(&::png_get_gAMA_fixed) getPngGamma = nullptr;
  decltype(&::png_get_pHYs) getPngDensity = nullptr;
  decltype(&::TIFFFdOpen) openTiff = nullptr;
  decltype(&::TIFFGetField) getTiffField = nullptr;
  decltype(&::TIFFClose) closeTiff = nullptr;
  decltype(&::WebPDemuxInternal) openWebp = nullptr;
  decltype(&::WebPDemuxDelete) closeWebp = nullptr;
  decltype(&::WebPDemuxGetI) getWebpNumber = nullptr;
  decltype(&::WebPDemuxGetFrame) getWebpFrame = nullptr;
  decltype(&::WebPDemuxReleaseIterator) releaseWebpFrame = nullptr;

 private:
  VipsLibrary();

  bool Start();

  decltype(&::vips_init) initialise_ = nullptr;
  decltype(&::vips_version) version_ = nullptr;
  decltype(&::TIFFSetErrorHandler) setTiffErrorHandler_ = nullptr;
  decltype(&::TIFFSetWarningHandler) setTiffWarningHandler_ = nullptr;
  decltype(&::vips_cache_set_max) setCache_ = nullptr;
  decltype(&::vips_concurrency_set) setConcurrency_ = nullptr;
  decltype(&::g_log_set_default_handler) setLogHandler_ = nullptr;
  decltype(&::g_module_open) openModule_ = nullptr;
  bool isStarted_ = false;
};

}  // namespace vela
