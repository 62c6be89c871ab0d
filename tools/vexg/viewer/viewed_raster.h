#pragma once

#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "georef/georef.h"
#include "rasters/raster_chain.h"
#include "rasters/raster_source.h"
#include "rasters/tree_steps.h"
#include "viewer/job_door.h"

namespace lumo::host {

/// A block of pixels of one level for the page: the bands one after the other in the raster's own
/// type, then a byte for each of their values, 0 where it counts.
struct ViewedTile {
  unsigned width = 0;
  unsigned height = 0;
  std::string bytes;
};

/// A raster as the viewer shows it: tiles of its levels, and the values of single pixels.
///
/// Complex pixels are shown by their magnitude, and 64-bit integers as doubles; the value of a
/// pixel is always that of the source. Level n has every 2^n-th pixel, from the pyramid where it
/// has one with such levels, else by reading what is needed of the raster.
///
/// Threads: any, several at once. Failure: HostError.
class ViewedRaster {
 public:
  /// Which stored levels may be shown: all, or those alone that hold pixels of the raster and no
  /// means of them, as labels and classes need it.
  enum class Levels { kAll, kPicked };

  /// Opens a file.
  /// @param door  outlives the raster.
  /// @param grid  the geo-reference of a grid to show it in, pixel by pixel; empty for its own.
  ViewedRaster(JobDoor& door, const SourceOptions& source, const GeoRefPtr& grid, Levels levels);
  /// Takes a raster that somebody has open behind the door; it stays open with the viewer.
  ViewedRaster(JobDoor& door, const String& uri, const GeoRefPtr& grid, Levels levels);
  /// Opens the segments of a tree.
  ViewedRaster(JobDoor& door, const TreeCutRequest& request);

  JobDoor& GetDoor() const { return door_; }

  /// The file's name without folders.
  const std::string& GetName() const { return name_; }
  const Json& GetDescription() const { return description_; }  ///< of what is shown
  unsigned Samples() const { return samples_; }
  unsigned Lines() const { return lines_; }
  unsigned Bands() const { return bands_; }
  unsigned Code() const { return code_; }                 ///< of the pixel type that tiles have
  const GeoRefPtr& GetGeoRef() const { return geoRef_; }  ///< empty when there is none
  /// Levels that are shown, the raster itself among them.
  unsigned LevelCount() const { return levelCount_; }
  /// Whether the coarser levels are at hand and cost no more than the others.
  bool HasLevels() const { return !levels_.empty(); }

  /// Reads pixels of a level.
  /// @param rect  of the level; cut to it.
  /// @return empty where nothing of the level lies in there.
  std::optional<ViewedTile> ReadTile(unsigned level, const SubRect& rect,
                                     const std::vector<std::uint32_t>& bands) const;

  /// The values of all bands of a pixel of the source as texts, null where they do not count.
  Json ReadValues(unsigned x, unsigned y) const;

  /// Adds the commands that open it, or a level of it, to a chain.
  /// @param prefix  of the names of the steps and variables.
  void AddTo(RasterChain& chain, unsigned level = 0, const std::string& prefix = {}) const;

  const SourceOptions& GetSource() const { return source_; }
  bool IsFile() const { return !source_.file.empty(); }  ///< which GetSource tells
  bool IsTree() const { return tree_.has_value(); }      ///< segments of a tree, and no file

 private:
  struct Size {
    unsigned samples, lines;
  };
  void Open();
  void AddSourceTo(RasterChain& chain, const std::string& prefix) const;
  void AddLevelTo(RasterChain& chain, unsigned level, const std::string& prefix) const;
  void AddCarriedTo(RasterChain& chain, unsigned level, const std::string& prefix) const;
  void FindLevels();
  void FindStep();
  JobDraft JobOf(unsigned level) const;
  Size SizeOf(unsigned level) const;

  JobDoor& door_;
  std::string name_;
  SourceOptions source_;
  String uri_;  // of a raster that is open; empty for none
  std::optional<TreeCutRequest> tree_;
  Levels wanted_ = Levels::kPicked;
  GeoRefPtr grid_;
  Json sourceDescription_;
  Json description_;
  unsigned sourceCode_ = 0;
  unsigned code_ = 0;
  unsigned samples_ = 0, lines_ = 0, bands_ = 0;
  unsigned levelCount_ = 1;
  std::vector<unsigned> levels_;  // of the source's pyramid that are used, ascending
  double step_ = 1;               // pixels of the source from one pixel of the grid to the next
  GeoRefPtr geoRef_;

  mutable std::mutex mutex_;  // of the sizes
  mutable std::map<unsigned, Size> sizes_;
};

}  // namespace lumo::host
