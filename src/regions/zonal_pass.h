#pragma once

#include <memory>
#include <mutex>

#include "commands/division.h"
#include "raster/chosen_blocks.h"
#include "regions/rasterized_geometry.h"
#include "regions/zone_values.h"

namespace lumo {

/// Says which figures of which zones are wanted.
struct ZonalPlan {
  GeometryPtr geometry;  ///< a zone for each record, whose ids count from 0
  ScanOptions options;
  ZonalWeights weights = ZonalWeights::kNone;
  std::vector<ZonalRequest> requests;
  Array<unsigned> bands;  ///< of the raster
};

/// Gives the figures of zones of a raster: for each zone, for each band, for each request. NaN
/// stands for none.
///
///     ZonalPass<float> pass(raster, plan);
///     if (!pass.Run(ipc)) return false;  // TakeFault() says why
///     const double first = pass.GetFigures()[0];
///
/// The raster is read once, block after block in its own order; the zones of a block are gathered
/// at the same time, each by one thread, so the result doesn't depend on their number. The values
/// of a zone are freed with the last block that it touches. Exists for EightTypes.
///
/// Failure: false, with the fault set, when a shape can't be carried to the raster, or the raster
///          fails; and at an abort.
template <typename T>
class VEXG_EXPORT ZonalPass {
 public:
  /// @param plan  outlives the pass.
  ZonalPass(const RasterPtr<T>& raster, const ZonalPlan& plan);

  /// Reads the raster and computes the figures.
  bool Run(const IPC& ipc);
  /// Computes the figures of a share of the zones: of some whose first blocks follow one another,
  /// so that it reads a part of the raster. They are those of the whole, to the bit. Other zones
  /// have none.
  bool RunShare(const Share& share, const IPC& ipc);
  /// The zones of the share that was computed.
  const std::vector<std::uint32_t>& GetZones() const { return zonesOfShare_; }
  /// The figures, zones by bands by requests, after Run.
  const std::vector<double>& GetFigures() const { return figures_; }

 private:
  struct Zone {
    std::vector<ZoneValues<T>> bands;
  };
  class ZonesOfBlock;

  void Begin(const RasterIterator<T>& iterator);
  void CountBlocks(const RasterIterator<T>& iterator);
  void ChooseZones(const RasterIterator<T>& iterator, const Share& share);
  template <typename Visit>
  void ForEachBlock(const RasterIterator<T>& iterator, const Visit& visit) const;
  std::vector<std::int32_t> ZonesIn(const RegionWindow& window);
  bool RunOver(TileProcess<>& process, const TileSlot<T>& slot, const IPC& ipc);
  bool TakeBlock(const Tile<T>& block);
  bool TakeZone(std::int32_t zone, const Tile<T>& block, const RegionWindow& window);
  bool AddPixels(std::int32_t zone, const Tile<T>& block, const RegionWindow& window);
  bool AddShares(std::int32_t zone, const Tile<T>& block, const RegionWindow& window);
  void AddRun(Zone& zone, const Tile<T>& block, std::size_t line, std::size_t first,
              std::size_t count, const double* weights);
  Zone& ZoneOf(std::int32_t zone);
  void Finish(std::int32_t zone);

  RasterPtr<T> raster_;
  const ZonalPlan& plan_;
  GeoRefPtr geoRef_;
  RasterizedGeometry shapes_;
  GeometryPtr onGrid_;
  bool withValues_ = false;
  std::vector<std::unique_ptr<Zone>> zones_;  // those that blocks are still added to
  std::vector<std::uint32_t> blocksLeft_;     // for each zone
  std::vector<std::uint32_t> firstBlocks_;    // for each zone
  std::vector<bool> isLeftOut_;               // zones of other shares; empty without
  std::vector<std::uint32_t> zonesOfShare_;
  std::vector<TilePlace> blocks_;  // that the zones of a share touch
  std::vector<double> figures_;
};

VEXG_EXTERN(EIGHT, ZonalPass);

}  // namespace lumo
