#include "platform/module.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <dlfcn.h>
#include <filesystem>
#include <iterator>
#include <memory>

#include "platform/memory_shortage.h"

namespace lumo::platform {

namespace {

/// True for what the loader says where it is short of memory, which it has several words for.
bool IsOfMemory(const std::string& why) {
  const char* const words[] = {std::strerror(ENOMEM), "out of memory", "cannot allocate",
                               "cannot create",       "failed to map", "cannot map"};
  return std::any_of(std::begin(words), std::end(words),
                     [&](const char* word) { return why.find(word) != why.npos; });
}

}  // namespace

Module Module::Load(const std::string& path, std::string* fault, Binding binding) {
  Module module;
  module.handle_ =
      dlopen(path.c_str(), (binding == Binding::kAtCall ? RTLD_LAZY : RTLD_NOW) | RTLD_LOCAL);
  if (module.handle_ != nullptr) return module;
  const char* const told = dlerror();
  std::string why = told != nullptr ? told : path;
  if (IsOfMemory(why)) why = path + ": " + SystemErrorText(ENOMEM);
  if (fault != nullptr) *fault = why;
  return module;
}

void* Module::FindSymbol(const char* name) const {
  return handle_ != nullptr ? dlsym(handle_, name) : nullptr;
}

std::string ModuleFileName(const std::string& name) {
  return "lib" + name + ".so";
}

namespace {

std::string FindLibraryDirectory() {
  Dl_info info{};
  if (dladdr(reinterpret_cast<const void*>(&ModuleFileName), &info) == 0) return {};
  const std::filesystem::path folder = std::filesystem::path(info.dli_fname).parent_path();
  if (folder.empty()) return {};
  // The loader may come by a link, as /lib to /usr/lib, from which ".." leads elsewhere.
  std::error_code unresolved;
  const std::filesystem::path real = std::filesystem::canonical(folder, unresolved);
  return unresolved ? folder.string() : real.string();
}

}  // namespace

std::string LibraryDirectory() {
  // Asked for with each plug-in; the system walks through all symbols of the library to tell. Who
  // comes first waits for nobody: the loader may hold its lock there.
  static std::atomic<const std::string*> known{nullptr};
  const std::string* directory = known;
  if (directory == nullptr) {
    auto fresh = std::make_unique<const std::string>(FindLibraryDirectory());
    if (known.compare_exchange_strong(directory, fresh.get())) directory = fresh.release();
  }
  return *directory;
}

}  // namespace lumo::platform
