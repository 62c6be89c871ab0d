#pragma once

#include <cmath>
#include <type_traits>

#include <nlohmann/json.hpp>

#include "commands/value_text.h"
#include "raster/pixel_types.h"

namespace lumo::host {

using Json = nlohmann::ordered_json;

/// A number of JSON. NaN and infinities, which JSON can't hold, are null.
template <typename T>
Json NumberAsJson(T value) {
  if constexpr (std::is_floating_point_v<T>) {
    if (!std::isfinite(value)) return {};
    return static_cast<double>(value);
  } else {
    return value;
  }
}

template <typename T>
Json NumberAsJson(const Complex<T>& value) {
  return Json::array({NumberAsJson(value.real), NumberAsJson(value.imag)});
}

}  // namespace lumo::host
