#include "decoding/netpbm_library.h"

#include <dlfcn.h>

namespace {

constexpr char kLibraryName[] = "libnetpbm.so.11";
constexpr char kProgramName[] = "convert-thumb";

void DropMessage(const char*) {}

}  // namespace

template <typename Function>
void NetpbmLibrary::Find(void* library, const char* name, Function& function) {
  function = reinterpret_cast<Function>(dlsym(library, name));
  isLoaded_ = isLoaded_ && function != nullptr;
}

NetpbmLibrary::NetpbmLibrary() {
  void* const library = dlopen(kLibraryName, RTLD_NOW | RTLD_LOCAL);
  if (library == nullptr) {
    return;
  }
  isLoaded_ = true;
  decltype(&::pm_init) initialise = nullptr;
  decltype(&::pm_setusermessagefn) setMessage = nullptr;
  decltype(&::pm_setusererrormsgfn) setErrorMessage = nullptr;
  Find(library, "pm_init", initialise);
  Find(library, "pm_setusermessagefn", setMessage);
  Find(library, "pm_setusererrormsgfn", setErrorMessage);
  Find(library, "pm_setjmpbuf", setJump);
  Find(library, "pnm_readpaminit", readHeader);
  if (isLoaded_) {
    initialise(kProgramName, 0);
    setMessage(DropMessage);
    setErrorMessage(DropMessage);
  }
}

const NetpbmLibrary* NetpbmLibrary::Get() {
  static const NetpbmLibrary library;
  return library.isLoaded_ ? &library : nullptr;
}
