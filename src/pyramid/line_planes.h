#pragma once

#include <complex>
#include <span>

#include "commands/share_file.h"
#include "pyramid/line_reducer.h"

namespace lumo {

/// Puts numbers that lie side by side into the file of a share, packed: their first bytes, then
/// their second ones.
/// @param numberBytes  of each of them.
VEXG_EXPORT void PutPlane(ShareWriter& out, std::span<const unsigned char> bytes,
                          unsigned numberBytes);
/// Gets as many numbers as PutPlane was given. @return false for a file that has others.
VEXG_EXPORT bool GetPlane(ShareReader& in, std::span<unsigned char> bytes, unsigned numberBytes);

namespace detail {

template <typename E>
std::span<const unsigned char> BytesOf(const std::vector<E>& numbers) {
  return {reinterpret_cast<const unsigned char*>(numbers.data()), numbers.size() * sizeof(E)};
}

template <typename E>
std::span<unsigned char> BytesOf(std::vector<E>& numbers) {
  return {reinterpret_cast<unsigned char*>(numbers.data()), numbers.size() * sizeof(E)};
}

/// Numbers of 64 bits that sums are kept as, with all digits: a long double is one with those that
/// come first, and one with the rest.
template <typename Sum>
std::vector<double> PartsOfSums(const std::vector<Sum>& sums) {
  std::vector<double> parts;
  parts.reserve(2 * sums.size());
  for (const Sum& sum : sums) {
    if constexpr (std::is_same_v<Sum, std::complex<double>>) {
      parts.push_back(sum.real()), parts.push_back(sum.imag());
    } else {
      parts.push_back(static_cast<double>(sum));
      if constexpr (!std::is_same_v<Sum, double>) {
        parts.push_back(static_cast<double>(sum - static_cast<Sum>(parts.back())));
      }
    }
  }
  return parts;
}

template <typename Sum>
Sum SumOfParts(const double* parts) {
  if constexpr (std::is_same_v<Sum, double>) {
    return parts[0];
  } else if constexpr (std::is_same_v<Sum, std::complex<double>>) {
    return {parts[0], parts[1]};
  } else {
    return static_cast<Sum>(parts[0]) + static_cast<Sum>(parts[1]);
  }
}

/// Keeps all of a line that the lines above it come out of.
template <typename T>
void PutLine(ShareWriter& out, const LevelLine<T>& line, LevelReduction reduction) {
  PutPlane(out, BytesOf(line.values), sizeof(T));
  PutPlane(out, line.states, 1);
  if (reduction == LevelReduction::kTold) return;
  PutPlane(out, BytesOf(line.counts), sizeof(double));
  if (reduction != LevelReduction::kAverage) return;
  const std::vector<double> parts = PartsOfSums(line.sums);
  PutPlane(out, BytesOf(parts), sizeof(double));
}

/// Gets a line of the size that it has. @return false for a file that has another.
template <typename T>
bool GetLine(ShareReader& in, LevelLine<T>& line, LevelReduction reduction) {
  if (!GetPlane(in, BytesOf(line.values), sizeof(T)) || !GetPlane(in, line.states, 1)) return false;
  if (reduction == LevelReduction::kTold) return true;
  if (!GetPlane(in, BytesOf(line.counts), sizeof(double))) return false;
  if (reduction != LevelReduction::kAverage) return true;
  constexpr unsigned kParts = std::is_same_v<LevelSum<T>, double> ? 1 : 2;
  std::vector<double> parts(kParts * line.sums.size());
  if (!GetPlane(in, BytesOf(parts), sizeof(double))) return false;
  for (std::size_t i = 0; i < line.sums.size(); ++i) {
    line.sums[i] = SumOfParts<LevelSum<T>>(&parts[kParts * i]);
  }
  return true;
}

}  // namespace detail

}  // namespace lumo
