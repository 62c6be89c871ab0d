#pragma once

#include <mutex>

#include "data/raster_reader.h"
#include "views/computed_raster.h"

namespace lumo {

/// One level of a pyramid as a raster. Exists for TwelveTypes.
///
/// Every pixel call goes to a reader, with the number of the level. Where a reader of a type that
/// may lack levels of its own (ReaderType 5 and 8) fails on one, the level is sampled from level 0:
/// its pixel (x, y) is the pixel (x << level, y << level) there. Statistics and histograms are this
/// object's own, of the pixels of the level.
///
/// Ownership: shares the connection, which owns the reader, so that the level can be read as long
///            as somebody holds it.
/// Threads:   every operation may run on many threads at once; one block is read and one is written
///            at a time.
/// Failure:   over an empty reader operations give false, 0 or empty. Of a level that the reader
///            doesn't hold, blocks can't be read.
template <typename T>
class PyramidRasterImpl final : public ComputedRaster<T> {
 public:
  /// @param raster  the one that the level belongs to: its size and geo-reference are taken over,
  ///                adapted, in the told form unless ExactLevels are wanted.
  PyramidRasterImpl(const Raster<T>& raster, const RasterReaderPtr<T>& reader,
                    const RasterDataConnectionPtr& connection, unsigned level);
  ~PyramidRasterImpl() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("PyramidRasterImpl"); }
  bool IsValid() const override { return Object::IsValid(); }
  bool CanWrite() const override { return reader_ && reader_->CanWritePixels(level_); }
  RasterDef GetRasterDef() const override { return def_; }

  /// A level has no levels of its own; it only gives its number.
  PyramidDef GetPyramidDef() const override;

  bool WriteStats() override;
  bool WriteHistogram() override;

  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return def_.bands; }
  lumo::TileDimensions TileDimensions() const override { return {kTileSide, kTileSide}; }

  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  bool HasPalette(unsigned band) const override;
  PalettePtr Palette(unsigned band) const override;
  bool WritePalette(unsigned band, const PalettePtr& palette) override;
  bool DeletePalette(unsigned band) override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  /// Writes to the level, and to level 0, from which it may be sampled.
  std::uint64_t WriteCount() const override;

 private:
  static constexpr unsigned kTileSide = 256;

  GeoRefPtr LevelGeoRef(const Raster<T>& raster) const;
  bool Holds(const SubRect& rect, const Array<unsigned>& bands) const;
  bool Sample(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
              Array<T>& pixels, Array<unsigned char>& state);

  RasterDataConnectionPtr connection_;  // goes last: it owns the reader
  RasterReaderPtr<T> reader_;
  const unsigned level_;
  RasterDef def_;
  std::mutex readLock_;
  std::mutex writeLock_;
};

VEXG_EXTERN(TWELVE, PyramidRasterImpl);

}  // namespace lumo
