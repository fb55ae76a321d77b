// A library that is loaded when it is needed and not with the program.
#pragma once

namespace vela {

/// Base of the wrappers that hold a library's functions. The library stays until the process ends.
class LoadedLibrary {
 public:
  LoadedLibrary(const LoadedLibrary&) = delete;
  LoadedLibrary& operator=(const LoadedLibrary&) = delete;

 protected:
  /// `name`: of the library's file. `mode`: RTLD_NOW or RTLD_LAZY.
  LoadedLibrary(const char* name, int mode);
  ~LoadedLibrary() = default;

  /// Sets `function` to the library's, or that of a library below it; to null when there is none.
  template <typename Function>
  void Find(const char* name, Function& function) {
    function = reinterpret_cast<Function>(Address(name));
  }

  /// Whether the library has been loaded and every function has been found so far.
  bool IsLoaded() const { return isLoaded_; }

 private:
  void* Address(const char* name);

  void* library_;
  bool isLoaded_;
};

}  // namespace vela
