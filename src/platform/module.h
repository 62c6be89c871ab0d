#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

/// A library that is loaded while the program runs. It stays loaded as long as the process lives,
/// since objects that it made, and code that it registered, may outlast any Module.
class VEXG_EXPORT Module {
 public:
  Module() = default;

  /// When the functions that a library takes from others are looked for.
  enum class Binding {
    kAtLoad,  ///< one that isn't there is a fault of the load
    kAtCall   ///< quick, and ends the process where one isn't there
  };

  /// Loads a library, and those that it needs.
  /// @param path  UTF-8: a file's path, or a bare file name, for which the system's own rules of
  ///              search hold.
  /// @param fault  [out] why it could not be loaded, one line; untouched on success. May be null.
  /// @return a Module that IsLoaded() unless the file is missing or can't be loaded.
  static Module Load(const std::string& path, std::string* fault = nullptr,
                     Binding binding = Binding::kAtLoad);

  bool IsLoaded() const { return handle_ != nullptr; }

  /// The system's handle of the library; null when it isn't loaded.
  void* Handle() const { return handle_; }

  /// The function that the library exports under `name`, null when there is none.
  template <typename Function>
  Function* Find(const char* name) const {
    return reinterpret_cast<Function*>(FindSymbol(name));
  }

 private:
  void* FindSymbol(const char* name) const;

  void* handle_ = nullptr;
};

/// File name of the library called `name` here: "lib<name>.so".
VEXG_EXPORT std::string ModuleFileName(const std::string& name);

/// Directory, without a slash at its end, that holds libvexg.so, links on the way to it followed;
/// empty when the system doesn't know.
VEXG_EXPORT std::string LibraryDirectory();

}  // namespace lumo::platform
