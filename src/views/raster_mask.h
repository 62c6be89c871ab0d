#pragma once

#include <atomic>
#include <cstdint>

#include "foundation/run_controls.h"
#include "raster/raster.h"

namespace lumo {

/// Says which values of which band a mask marks.
template <typename T>
struct RasterMaskDef {
  unsigned band = 0;
  Array<T> values;  ///< compared exactly; NaN is equal to every NaN
};

/// A bitmap that marks pixels of a raster: a plane of one bit a pixel for each band.
///
/// Pixel (x, y) is bit width * y + x of its plane, and the first pixel of a byte its top bit. It is
/// marked where the bit differs from IsInversed().
///
/// Threads: the bits do not change once the mask is made, and any number of threads may ask;
///          SetInversed may come between their questions.
/// Failure: a mask whose planes could not be had, or whose raster could not be read, has none and
///          marks nothing; IsValid() is false, and the fault set.
class VEXG_EXPORT RasterMask final : public Object {
 public:
  static const unsigned TypeCode;

  /// Marks the pixels of a raster, one of EightTypes, that have one of the values in one of the
  /// bands, whatever their states. A definition without values, or of a band that isn't there,
  /// marks none.
  /// @param ipc  with the progress of the reading; an abort leaves the mask without planes.
  template <typename T>
  RasterMask(const RasterPtr<T>& raster, const Array<RasterMaskDef<T>>& defs, const IPC& ipc = {});

  /// Shows another mask at another size, by its nearest pixels toward the first; not inversed. At a
  /// width or height of 1 these are the first column or line.
  RasterMask(const RasterMask& source, unsigned width, unsigned height, unsigned planes);

  ~RasterMask() override;
  bool IsA(unsigned typeCode) const override;

  unsigned Width() const { return width_; }                  ///< pixels of a line
  unsigned Height() const { return height_; }                ///< lines
  unsigned Planes() const { return planeBits_.GetCount(); }  ///< bands that are marked
  unsigned BytesPerPlane() const { return bytesPerPlane_; }  ///< bits of all pixels, rounded up
  /// The bytes of a plane that is there.
  const unsigned char* PlaneBits(unsigned plane) const { return planeBits_[plane]; }

  /// The sense of the bits: true where marked pixels are those whose bit is not set.
  bool IsInversed() const { return inversed_.load(std::memory_order_relaxed); }
  /// Reverses the sense without touching a bit, for all views that share the mask.
  void SetInversed(bool inversed);
  /// How often the sense has changed since the mask was made.
  std::uint64_t ChangeCount() const { return changes_.load(std::memory_order_relaxed); }

  /// True when some plane marks the pixel; false outside the mask.
  bool IsMarked(unsigned x, unsigned y) const;
  /// True when one plane does; false for one that isn't there.
  bool IsMarked(unsigned x, unsigned y, unsigned plane) const;

  /// Finds the pixels of a line, from (x, y) on, that some plane marks, 64 at a time.
  /// @param marks  [out] a byte for each, 1 where it is marked, else 0.
  void GetMarks(unsigned x, unsigned y, std::size_t count, unsigned char* marks) const;

 private:
  bool MakePlanes(unsigned width, unsigned height, unsigned planes);
  void DropPlanes();
  std::size_t BitAt(unsigned x, unsigned y) const { return std::size_t{width_} * y + x; }
  /// Sets bits of a plane from `first` on where `bytes` are 1; several threads may at once.
  void SetBits(unsigned plane, std::size_t first, std::size_t count, const unsigned char* bytes);
  /// The 64 bits from a place on, the first one at the top; those behind the plane are 0.
  std::uint64_t BitsAt(unsigned plane, std::size_t first) const;

  std::atomic<bool> inversed_{false};
  unsigned width_ = 0;
  unsigned height_ = 0;
  Array<unsigned char*> planeBits_;
  unsigned bytesPerPlane_ = 0;
  std::atomic<std::uint64_t> changes_{0};
};

using RasterMaskPtr = Pointer<RasterMask>;

}  // namespace lumo
