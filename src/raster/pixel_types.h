#pragma once

#include <cstdint>

#include "foundation/array.h"
#include "foundation/string.h"

namespace lumo {

/// A list of types, to be passed as a value.
template <typename... Ts>
struct TypeList {};

/// The pixel types of most rasters, and of the commands that make a raster from a type name.
using EightTypes = TypeList<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t, std::uint32_t,
                            std::int32_t, float, double>;
/// The pixel types that have statistics.
using TenTypes = TypeList<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t, std::uint32_t,
                          std::int32_t, float, double, std::uint64_t, std::int64_t>;
/// The pixel types that a source can have.
using TwelveTypes =
    TypeList<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t, std::uint32_t, std::int32_t,
             float, double, std::uint64_t, std::int64_t, Complex<float>, Complex<double>>;

/// The data type code of a pixel type; 0, "Unknown", for every other type.
template <typename T>
inline constexpr unsigned kDataTypeOf = 0;
template <>
inline constexpr unsigned kDataTypeOf<std::uint8_t> = 1;
template <>
inline constexpr unsigned kDataTypeOf<std::int16_t> = 2;
template <>
inline constexpr unsigned kDataTypeOf<std::int32_t> = 3;
template <>
inline constexpr unsigned kDataTypeOf<float> = 4;
template <>
inline constexpr unsigned kDataTypeOf<double> = 5;
template <>
inline constexpr unsigned kDataTypeOf<Complex<float>> = 6;
template <>
inline constexpr unsigned kDataTypeOf<Complex<double>> = 9;
template <>
inline constexpr unsigned kDataTypeOf<std::uint16_t> = 12;
template <>
inline constexpr unsigned kDataTypeOf<std::uint32_t> = 13;
template <>
inline constexpr unsigned kDataTypeOf<std::int64_t> = 14;
template <>
inline constexpr unsigned kDataTypeOf<std::uint64_t> = 15;
template <>
inline constexpr unsigned kDataTypeOf<std::int8_t> = 99;

/// Runs `body` for the pixel type that `code` names: one compare per type, then one call.
/// `DispatchType(EightTypes{}, code, [&]<typename T>() { return …; })`; pairs of types nest.
/// @return what the body gave; false, with no call, when `code` is not in the set.
template <typename... Ts, typename Body>
bool DispatchType(TypeList<Ts...>, unsigned code, Body&& body) {
  return ((code == kDataTypeOf<Ts> && body.template operator()<Ts>()) || ...);
}

/// The name of a data type code: "Byte", "UInt16", …; "Unknown" for a code that has none.
VEXG_EXPORT String DataTypeName(unsigned code);

/// The data type code of a name, compared exactly. A name that is not in the table gives 12 when it
/// contains "USHORT", else 0.
VEXG_EXPORT unsigned ParseDataType(const String& name);

/// Bytes of one element; 0 for a code without a pixel type.
VEXG_EXPORT unsigned DataTypeBytes(unsigned code);

}  // namespace lumo
