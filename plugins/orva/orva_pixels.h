#pragma once

#include <cstddef>
#include <functional>

#include "orva/orva_file.h"
#include "raster/flat_block.h"

namespace lumo::orva {

/// Called when a run of a block has been read, in the byte order of this machine: its first element
/// and their number. Runs come on several threads at once, and are small enough to lie in the cache
/// yet.
using StretchRead = std::function<void(std::uint64_t first, std::uint64_t count)>;

/// Reads a block, in the interleave of the file. Small gaps in the file are read and dropped, large
/// ones are left out.
/// @param block   IsInside.
/// @param pixels  room for its elements.
bool ReadPixels(const File& file, FlatBlock block, void* pixels, const StretchRead& stretchRead);

/// Writes a block, in the interleave of the file.
bool WritePixels(File& file, FlatBlock block, const void* pixels);

/// Turns the bytes of each number round. Of a complex element these are two numbers.
/// @param bytes  of all numbers together.
/// @param numberBytes  1, 2, 4 or 8.
void SwapBytes(void* numbers, std::size_t bytes, unsigned numberBytes);

}  // namespace lumo::orva
