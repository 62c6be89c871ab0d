#pragma once

#include <cpl_conv.h>
#include <string>

namespace lumo::gdal {

/// A setting of GDAL's on this thread while it lives.
class Setting {
 public:
  Setting(const char* name, const char* value) : name_(name) {
    const char* const before = CPLGetThreadLocalConfigOption(name, nullptr);
    if (before != nullptr) before_ = before;
    CPLSetThreadLocalConfigOption(name, value);
  }
  ~Setting() { CPLSetThreadLocalConfigOption(name_, before_.empty() ? nullptr : before_.c_str()); }
  Setting(const Setting&) = delete;
  Setting& operator=(const Setting&) = delete;

 private:
  const char* const name_;
  std::string before_;
};

}  // namespace lumo::gdal
