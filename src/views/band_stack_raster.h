#pragma once

#include <vector>

#include "raster/raster_def.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shows the bands of several rasters of one pixel type as those of one raster, in order. Size and
/// geo-reference are the first member's; a read goes to every member with the same rectangle. Min,
/// max and the like of a band are its member's; statistics that need two bands, and histograms, are
/// computed on the stack, whatever the members have: their arrays are of their own bands alone.
/// Exists for EightTypes.
///
///     const RasterPtr<float> stack(new BandStackRaster<float>(members));  // of 3 bands, then 1
///     stack->Mean(3, ipc);                                                // of the second member
///
/// Ownership: shares the members, which do not know the stack.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   without a member IsValid() is false and operations give false, 0 or empty. A member
///            whose read fails fails the whole read.
template <typename T>
class BandStackRaster final : public ComputedRaster<T> {
 public:
  /// @param members  empty ones are passed over.
  /// @param form     kTold: the details of bands are the first member's; kExact: each band has its
  ///                 own.
  explicit BandStackRaster(const Array<RasterPtr<T>>& members, Form form = Form::kTold);
  ~BandStackRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("BandStackRaster"); }
  /// True when all members can be written.
  bool CanWrite() const override;
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Bands() const override { return def_.bands; }

  bool PyramidExists() const override;
  /// The levels that all members have.
  PyramidDef GetPyramidDef() const override { return pyramidDef_; }
  AsyncPtr PyramidAsync() const override { return {}; }
  bool PyramidDelete() override;
  bool PyramidRefresh() override;
  /// The stack of the members' levels; empty where one has none.
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }

  bool StatsExist(unsigned band, unsigned mask) const override;
  bool WriteStats() override;
  RasterBandStats<T> BandStats(unsigned band) const override;
  StatValue<T> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                      const IPC& ipc) override;
  bool WriteHistogram() override;

  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  bool HasPalette(unsigned band) const override;
  PalettePtr Palette(unsigned band) const override;
  bool WritePalette(unsigned band, const PalettePtr& palette) override;
  bool DeletePalette(unsigned band) override;

  void SetTileDimensions(const lumo::TileDimensions&) override {}
  /// Whole lines, one at a time.
  lumo::TileDimensions TileDimensions() const override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  std::uint64_t WriteCount() const override;

 private:
  /// Where a band of the stack comes from.
  struct Source {
    unsigned member;
    unsigned band;
  };
  /// The bands of one member within a block, and their places in it.
  struct Share {
    Array<unsigned> bands;
    Array<unsigned> places;
  };

  template <typename Call>
  auto AskMember(unsigned band, const Call& call) const;
  Share ShareOf(unsigned member, const Array<unsigned>& bands) const;
  bool Knows(const Array<unsigned>& bands) const;

  std::vector<RasterPtr<T>> members_;
  std::vector<Source> sources_;  // by band of the stack
  RasterDef def_;
  PyramidDef pyramidDef_;
};

VEXG_EXTERN(EIGHT, BandStackRaster);

}  // namespace lumo
