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

// The same sets for the preprocessor, which lists a template's instances: the one place where the
// types of a set stand one by one. `VEXG_EXTERN(EIGHT, MaskedRaster);` in a header says that the
// library holds MaskedRaster<T> for EightTypes; `VEXG_INSTANCES(EIGHT, MaskedRaster);` in one .cpp
// makes them there, out of the bodies in masked_raster_body.h. SET is EIGHT, TEN or TWELVE.

#define VEXG_TYPE_1(M, ...) M(std::uint8_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_2(M, ...) M(std::int8_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_3(M, ...) M(std::uint16_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_4(M, ...) M(std::int16_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_5(M, ...) M(std::uint32_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_6(M, ...) M(std::int32_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_7(M, ...) M(float __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_8(M, ...) M(double __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_9(M, ...) M(std::uint64_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_10(M, ...) M(std::int64_t __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_11(M, ...) M(Complex<float> __VA_OPT__(, ) __VA_ARGS__)
#define VEXG_TYPE_12(M, ...) M(Complex<double> __VA_OPT__(, ) __VA_ARGS__)
// clang-format off
#define VEXG_EIGHT(...)                             \
  VEXG_TYPE_1(__VA_ARGS__) VEXG_TYPE_2(__VA_ARGS__) \
  VEXG_TYPE_3(__VA_ARGS__) VEXG_TYPE_4(__VA_ARGS__) \
  VEXG_TYPE_5(__VA_ARGS__) VEXG_TYPE_6(__VA_ARGS__) \
  VEXG_TYPE_7(__VA_ARGS__) VEXG_TYPE_8(__VA_ARGS__)
#define VEXG_TEN(...) VEXG_EIGHT(__VA_ARGS__) VEXG_TYPE_9(__VA_ARGS__) VEXG_TYPE_10(__VA_ARGS__)
#define VEXG_TWELVE(...) VEXG_TEN(__VA_ARGS__) VEXG_TYPE_11(__VA_ARGS__) VEXG_TYPE_12(__VA_ARGS__)

/// VEXG_EIGHT for the M of another list, where the preprocessor doesn't expand that again: lists
/// pairs of types.
#define VEXG_EIGHT_WITHIN(M, ...)                               \
  M(std::uint8_t, __VA_ARGS__) M(std::int8_t, __VA_ARGS__)     \
  M(std::uint16_t, __VA_ARGS__) M(std::int16_t, __VA_ARGS__)   \
  M(std::uint32_t, __VA_ARGS__) M(std::int32_t, __VA_ARGS__)   \
  M(float, __VA_ARGS__) M(double, __VA_ARGS__)
// clang-format on
/// Writes M(T, more...) for every type of a set. M ends in a semicolon, and so does the call.
#define VEXG_FOR_ALL(SET, ...) VEXG_##SET(__VA_ARGS__) static_assert(true)

/// VEXG_FOR_ALL for instances: a file that the build cuts by type (see cmake/CutByType.cmake) makes
/// those of one type at a time.
#ifdef VEXG_ONLY_TYPE
#define VEXG_PASTE(a, b) a##b
#define VEXG_TYPE_OF(NUMBER, ...) VEXG_PASTE(VEXG_TYPE_, NUMBER)(__VA_ARGS__)
#define VEXG_FOR(SET, ...) VEXG_TYPE_OF(VEXG_ONLY_TYPE, __VA_ARGS__) static_assert(true)
#else
#define VEXG_FOR(SET, ...) VEXG_FOR_ALL(SET, __VA_ARGS__)
#endif

// A second name after the class makes Class<T, Name<T>>: VEXG_EXTERN(TEN, Process, RasterStats)
// declares Process<T, RasterStats<T>> for each T of TenTypes.
#define VEXG_EXTERN_ONE(T, CLASS, ...) \
  extern template class VEXG_EXPORT CLASS<T __VA_OPT__(, __VA_ARGS__<T>)>;
#define VEXG_EXTERN_HIDDEN_ONE(T, CLASS, ...) \
  extern template class CLASS<T __VA_OPT__(, __VA_ARGS__<T>)>;
#define VEXG_INSTANCES_ONE(T, CLASS, ...) template class CLASS<T __VA_OPT__(, __VA_ARGS__<T>)>;

#define VEXG_EXTERN(SET, ...) VEXG_FOR_ALL(SET, VEXG_EXTERN_ONE, __VA_ARGS__)
/// VEXG_EXTERN for a class that its library keeps to itself.
#define VEXG_EXTERN_HIDDEN(SET, ...) VEXG_FOR_ALL(SET, VEXG_EXTERN_HIDDEN_ONE, __VA_ARGS__)
#define VEXG_INSTANCES(SET, ...) VEXG_FOR(SET, VEXG_INSTANCES_ONE, __VA_ARGS__)

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
/// For example, the bytes of a pixel:
///
///     std::size_t bytes = 0;
///     DispatchType(TwelveTypes{}, raster.DataType(), [&]<typename T>() {
///       bytes = sizeof(T);
///       return true;
///     });
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
