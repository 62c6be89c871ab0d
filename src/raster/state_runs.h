#pragma once

#include <cstddef>

#include "foundation/array.h"
#include "raster/block_strides.h"

namespace lumo {

/// Sets one bit of the states of a block, or clears it, many pixels at a time: all, a run of pixels
/// of one line in all bands, or a line as the bytes of a mask say. Other bits stay.
///
/// The states are the caller's. Threads: one at a time.
///
///     StateRuns runs(PixelValueState::Masked, states, interleave, width, height, bands);
///     if (!runs.Fits()) return false;
///     runs.PutAll(false);
///     runs.PutRun(line, first, count, true);
class VEXG_EXPORT StateRuns {
 public:
  /// @param states  of the block that GetSubRect has given, whose axes `interleave` orders.
  /// @param bands   how many the block was asked for; without an axis for bands it has one.
  StateRuns(PixelValueState::Code bit, Array<unsigned char>& states, Interleave interleave,
            std::size_t width, std::size_t height, std::size_t bands);

  /// False when the states are not as many as the block has values.
  bool Fits() const { return fits_; }

  /// Sets or clears the bit in the whole block.
  void PutAll(bool on) { Put(states_, width_ * height_ * bands_, on); }
  /// Sets or clears it in pixels of one line, in all bands.
  void PutRun(std::size_t line, std::size_t first, std::size_t count, bool on);
  /// Sets it in the pixels of a line whose byte in the mask is `set`, and clears it in the others.
  /// @param mask  a byte of 0 or 1 for each pixel.
  void PutLine(std::size_t line, const unsigned char* mask, unsigned char set);
  /// The same in one band of the block alone.
  /// @param position  of the band in the block.
  void PutLineOfBand(std::size_t line, std::size_t position, const unsigned char* mask,
                     unsigned char set);

 private:
  void Put(unsigned char* states, std::size_t count, bool on) const;
  void PutPixels(std::size_t line, std::size_t first, std::size_t count, const unsigned char* mask,
                 unsigned char set);

  unsigned char* states_;
  unsigned char bit_;
  std::size_t width_;
  std::size_t height_;
  std::size_t bands_;
  BlockStrides strides_;
  bool fits_;
};

}  // namespace lumo
