#pragma once

#include "metadata/metadata_object.h"

namespace lumo {

namespace detail {

/// Runs `body` for the one of Ts with the type code `code`.
template <typename... Ts, typename Body>
bool DispatchMetadataTypeOf(unsigned code, Body&& body) {
  return ((code == MetadataTypeOf<Ts>::kCode && body.template operator()<Ts>()) || ...);
}

}  // namespace detail

/// Runs `body` for the element type with the type code `code`, one of the ten that hold values.
/// @return what the body gave; false, with no call, for another code.
template <typename Body>
bool DispatchMetadataType(unsigned code, Body&& body) {
  return detail::DispatchMetadataTypeOf<std::uint8_t, std::int16_t, std::int32_t, float, double,
                                        String, std::uint16_t, std::uint32_t, std::int64_t,
                                        std::uint64_t>(code, std::forward<Body>(body));
}

}  // namespace lumo
