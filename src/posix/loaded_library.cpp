#include "posix/loaded_library.h"

#include <dlfcn.h>

namespace vela {

LoadedLibrary::LoadedLibrary(const char* name, Binding binding)
    : library_(dlopen(name, (binding == Binding::kNow ? RTLD_NOW : RTLD_LAZY) | RTLD_LOCAL)),
      isLoaded_(library_ != nullptr) {}

void* LoadedLibrary::Address(const char* name) {
  void* const address = library_ == nullptr ? nullptr : dlsym(library_, name);
  isLoaded_ = isLoaded_ && address != nullptr;
  return address;
}

std::string LoadedLibrary::DirectoryOfAddress(const void* address) {
  Dl_info info = {};
  if (dladdr(address, &info) == 0 || info.dli_fname == nullptr) {
    return "";
  }
  const std::string file = info.dli_fname;
  return file.substr(0, file.rfind('/') + 1);
}

}  // namespace vela
