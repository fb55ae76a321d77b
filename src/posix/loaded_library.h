// A library that is loaded when it is needed and not with the program.
#pragma once

namespace vela {

/// Base of classes that hold the functions of a library. The library stays loaded until the process
/// ends.
class LoadedLibrary {
 public:
  LoadedLibrary(const LoadedLibrary&) = delete;
  LoadedLibrary& operator=(const LoadedLibrary&) = delete;

 protected:
  enum class Binding { kNow, kLazy };

  /// `name` is the name of the library's file.
  LoadedLibrary(const char* name, Binding binding);
  ~LoadedLibrary() = default;

  /// Sets `function` to that of the library or of a library it depends on; to null when there is
  /// none.
  template <typename Function>
  void Find(const char* name, Function& function) {
    function = reinterpret_cast<Function>(Address(name));
  }

  /// Returns whether the library is loaded and every function has been found so far.
  bool IsLoaded() const { return isLoaded_; }

 private:
  void* Address(const char* name);

  void* library_;
  bool isLoaded_;
};

}  // namespace vela
