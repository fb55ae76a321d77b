#include "decoding/netpbm_library.h"

#include <dlfcn.h>

namespace vela {

namespace {

constexpr char kLibraryName[] = "libnetpbm.so.11";
constexpr char kProgramName[] = "convert-thumb";

void DropMessage(const char*) {}

}  // namespace

NetpbmLibrary::NetpbmLibrary() : LoadedLibrary(kLibraryName, RTLD_NOW) {
  decltype(&::pm_init) initialise = nullptr;
  decltype(&::pm_setusermessagefn) setMessage = nullptr;
  decltype(&::pm_setusererrormsgfn) setErrorMessage = nullptr;
  Find("pm_init", initialise);
  Find("pm_setusermessagefn", setMessage);
  Find("pm_setusererrormsgfn", setErrorMessage);
  Find("pm_setjmpbuf", setJump);
  Find("pnm_readpaminit", readHeader);
  if (IsLoaded()) {
    initialise(kProgramName, 0);
    setMessage(DropMessage);
    setErrorMessage(DropMessage);
  }
}

const NetpbmLibrary* NetpbmLibrary::Get() {
  static const NetpbmLibrary library;
  return library.IsLoaded() ? &library : nullptr;
}

}  // namespace vela
