#pragma once

#include <atomic>
#include <mutex>

#include "raster/raster.h"

namespace lumo {

/// The states of a block that is read, which come into being when somebody has one to set: until
/// then every pixel is valid, and there is no array.
///
/// Threads: any number may call Make while a block is read; what it gives they share out among
///          them.
class VEXG_EXPORT BlockStates {
 public:
  /// @param room  the array that becomes the states, whatever it holds now; outlives them.
  explicit BlockStates(Array<unsigned char>& room) : room_(room) {}
  BlockStates(const BlockStates&) = delete;
  BlockStates& operator=(const BlockStates&) = delete;

  /// The states of the block, made with all of them 0 unless they are there.
  /// @return null where there is no memory, or the array wraps too little.
  unsigned char* Make(Interleave order, unsigned width, unsigned height, unsigned bands);
  /// The array, for who sizes and fills it whole by another way.
  Array<unsigned char>& Fill() {
    areMade_ = true;
    return room_;
  }
  /// False while every pixel is valid for want of states.
  bool AreMade() const { return areMade_; }

 private:
  Array<unsigned char>& room_;
  std::mutex lock_;
  std::atomic<bool> areMade_{false};
};

/// Marks a raster that reads blocks without states where none of their pixels has one.
template <typename T>
class StatesOnDemand {
 public:
  virtual ~StatesOnDemand() = default;
  /// Reads a block as Raster::GetSubRect does.
  /// @param states  are made only where a pixel has one; or filled.
  virtual bool GetBlock(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                        Array<T>& pixels, BlockStates& states) = 0;
  /// True where PutSubRect leaves the states alone that it is given, so that they may lie in memory
  /// that can only be read.
  virtual bool OnlyReadsStates() const { return false; }
};

/// Reads a block of any raster, with its states where the raster makes no difference.
template <typename T>
bool GetBlockOf(Raster<T>& raster, const SubRect& rect, const Array<unsigned>& bands,
                Interleave interleave, Array<T>& pixels, BlockStates& states) {
  if (auto* const onDemand = dynamic_cast<StatesOnDemand<T>*>(&raster)) {
    return onDemand->GetBlock(rect, bands, interleave, pixels, states);
  }
  Array<unsigned char>& filled = states.Fill();
  filled.Resize(pixels.GetDims());  // as who calls GetSubRect with arrays of a tile does
  return raster.GetSubRect(rect, bands, interleave, pixels, filled);
}

}  // namespace lumo
