// What is used of libnetpbm, which is loaded for a photo that needs it and not with the program.
#pragma once

#include <csetjmp>
#include <cstdio>

extern "C" {
#include <netpbm/pam.h>
}

#include "loaded_library.h"

namespace vela {

/// The functions of libnetpbm that are used. It keeps settings for the whole process, so one
/// thread at a time may use it.
class NetpbmLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded by the first call and silenced; null when it, or a function of it,
  /// is missing.
  static const NetpbmLibrary* Get();

  decltype(&::pm_setjmpbuf) setJump =
      nullptr;  ///< where an error goes; without: it ends the process
  decltype(&::pnm_readpaminit) readHeader = nullptr;

 private:
  NetpbmLibrary();
};

}  // namespace vela
