// Loads a shared library on demand instead of at program start.
#pragma once

#include <string>

namespace vela {

/// Base class of the wrappers that hold the functions of a library. The library stays loaded until
/// the process ends.
class LoadedLibrary {
 public:
  LoadedLibrary(const LoadedLibrary&) = delete;
  LoadedLibrary& operator=(const LoadedLibrary&) = delete;

 protected:
  /// When the library's own references to other libraries are resolved.
  enum class Binding { kNow, kLazy };

  /// `name`: file name of the library.
  explicit LoadedLibrary(const char* name, Binding binding = Binding::kNow);
  ~LoadedLibrary() = default;

  /// Sets `function` to the function of this name in the library or one of its dependencies; to
  /// null when there is none.
  template <typename Function>
  void Find(const char* name, Function& function) {
    function = reinterpret_cast<Function>(Address(name));
  }

  /// Returns true when the library has been loaded and every function so far has been found.
  bool IsLoaded() const { return isLoaded_; }

  /// Returns the directory of the library file that contains `function`, with a trailing slash;
  /// empty when it is not known.
  template <typename Function>
  static std::string DirectoryOf(Function function) {
    return DirectoryOfAddress(reinterpret_cast<const void*>(function));
  }

 private:
  void* Address(const char* name);
  static std::string DirectoryOfAddress(const void* address);

  void* library_;
  bool isLoaded_;
};

}  // namespace vela
