#pragma once

#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "viewer/segment_attributes.h"
#include "viewer/viewed_raster.h"
#include "viewer/viewed_shapes.h"
#include "viewer/work_folder.h"

namespace lumo::host {

/// The files that a user wants to see, and the rasters that are open behind the door.
struct ViewRequest {
  std::vector<std::string> files;
  std::vector<String> open{};                   ///< URIs; those that can't be shown are left out
  std::string labels, classes, shapes, mosaic;  ///< empty for none
};

/// All that one viewer shows: rasters and shapes by their numbers. Rasters of another grid than the
/// first one's are shown in that of the first one, each pixel by the nearest of the source.
///
/// Threads: any, several at once. Failure: HostError.
class ViewedScene {
 public:
  /// Opens all files, so that what can't be shown is told at the start.
  /// @param door    to the library; outlives the scene, as the folder does.
  /// @param folder  for files on the way.
  ViewedScene(JobDoor& door, const ViewRequest& request, WorkFolder& folder);

  /// Tells all that the page needs at its beginning.
  Json Describe() const;

  std::size_t RasterCount() const { return entries_.size(); }
  /// A raster by its number.
  /// @param cost  up to which segments of a tree are merged; of other rasters without effect.
  std::shared_ptr<const ViewedRaster> GetRaster(std::size_t number, double cost = 0);
  /// The colours and names of a raster's values; null where it has none.
  Json GetLegend(std::size_t number) const;
  /// The shapes of a number.
  const ViewedShapes& GetShapes(std::size_t number) const { return shapes_.at(number); }
  std::size_t ShapesCount() const { return shapes_.size(); }

  /// The attributes of the segment at a pixel of a raster of labels, see SegmentAttributes::Find.
  Json FindSegment(std::size_t number, unsigned x, unsigned y, double cost);
  /// The costs of a tree's scales, and how many segments there are at each.
  Json FindScales(std::size_t number);
  /// Values of all rasters at a pixel, and where it lies.
  /// @param cost  up to which segments of a tree are merged.
  Json ReadPixel(unsigned x, unsigned y, double cost);

  /// Begins to build the pyramid of a raster; tells how far it is where it has begun.
  Json BuildPyramid(std::size_t number);
  Json TellPyramid();

  WorkFolder& GetFolder() { return folder_; }
  /// Throws HostError when nothing can be read any more, as from a server that has gone away.
  void Check() { door_.Check(); }
  /// Aborts what runs in the background and waits for it.
  void Stop();

 private:
  enum class Role { kImage, kLabels, kClasses };
  struct Entry {
    Role role;
    std::string tree;  // file; empty for a raster
    std::shared_ptr<const ViewedRaster> raster;
    Json legend;  // of the values of a palette; null for none
  };
  struct Cut {
    std::size_t number;
    double cost;
    std::shared_ptr<const ViewedRaster> raster;
  };
  struct Attributes {
    std::size_t number;
    double cost;
    std::shared_ptr<SegmentAttributes> values;
  };

  void Add(Role role, const std::string& file);
  void AddOpenRasters(const std::vector<String>& uris);
  void AddRaster(Entry entry);
  /// The grid of the first raster, where others can be carried to it.
  GeoRefPtr GridToCarryTo() const;
  Json DescribeEntry(const Entry& entry) const;
  std::shared_ptr<SegmentAttributes> GetAttributes(std::size_t number, double cost);
  void RunPyramid(std::size_t number);
  void Build(const String& uri, unsigned last);

  JobDoor& door_;
  WorkFolder& folder_;
  std::vector<ViewedShapes> shapes_;
  std::vector<std::string> shapeNames_;
  GeoRefPtr grid_;  // of the first raster; empty for none

  mutable std::mutex mutex_;  // of what follows
  std::vector<Entry> entries_;
  std::deque<Cut> cuts_;  // the last used first
  std::deque<Attributes> attributes_;
  std::thread pyramid_;
  enum class Building { kNone, kRuns, kDone, kFailed } building_ = Building::kNone;
  std::string pyramidFault_;
  std::uint8_t pyramidAbort_ = 0;
  double pyramidProgress_ = 0;
};

}  // namespace lumo::host
