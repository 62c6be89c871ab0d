#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include "foundation/packing.h"
#include "georef/georef.h"
#include "platform/random_access_file.h"
#include "raster/raster_enums.h"

namespace lumo {

/// Describes a segmentation of which a tree is kept.
struct TreeScene {
  std::uint32_t samples = 0;
  std::uint32_t lines = 0;
  std::uint32_t bands = 0;      ///< of the raster that drove merging
  std::uint32_t dataType = 0;   ///< code, of the same
  std::uint32_t tileWidth = 0;  ///< of the storage of the raster, and so of the labels; 0 for none
  std::uint32_t tileHeight = 0;
  Interleave interleave = Interleave::None;                     ///< of the same storage
  double compactness = 0;                                       ///< see GrowthLimits
  double mostPixels = std::numeric_limits<double>::infinity();  ///< see GrowthLimits
  /// True where segments merged in rounds. Merges come by the most that any merge of the same
  /// segment costs, so that those up to a cost are whole segments; see CutTree.
  bool isNested = false;
  GeoRefPtr geoRef;  ///< of the labels; null for none
};

/// One merge of two segments, which are called by the basins that stand for them.
struct TreeMerge {
  double cost = 0;
  std::uint32_t lower = 0;   ///< stands for both from then on
  std::uint32_t higher = 0;  ///< stands for none any more
  std::uint32_t border = 0;  ///< length of their common border, in pixel edges
};

/// Holds the sizes and the variation of basins, by their numbers from 1 on, less 1.
struct TreeBasins {
  std::vector<std::uint32_t> pixels;
  /// Squared differences of the values from the mean of their band in the basin, added up over
  /// pixels and bands.
  std::vector<double> squares;
};

namespace detail {

/// A stretch of a tree file. One that is as long as what it stands for is not packed.
struct TreeExtent {
  std::uint64_t offset = 0;
  std::uint64_t bytes = 0;
  std::uint64_t checksum = 0;
};

/// The header of a tree file, as it stands there.
struct TreeHeader {
  char mark[16];
  std::uint32_t samples, lines, bands, dataType;
  std::uint32_t stripLines, basins;
  std::uint32_t tileWidth, tileHeight;
  std::int32_t interleave;
  std::uint32_t isNested;
  std::uint64_t merges;
  std::uint64_t fileBytes;
  double compactness, mostPixels;
  TreeExtent values;                              // text
  TreeExtent labelIndex, basinIndex, mergeIndex;  // each a list of extents
  std::uint64_t checksum;                         // of all before
};

}  // namespace detail

/// Writes the tree of a segmentation: the basins of a raster, numbered from 1 in raster order of
/// their first pixels, and all merges in their order (TreeScene::isNested). See
/// docs/file-formats.md.
///
/// The file grows under another name beside its place, and has no header until it is whole. What
/// isn't placed goes with the writer.
///
///     SegmentTreeWriter tree;
///     bool isWell = tree.Begin("scene.tree", scene);
///     for (…) isWell = isWell && tree.AddLines(labels, count);
///     isWell = isWell && tree.AddBasins(basins);
///     for (…) isWell = isWell && tree.AddMerge(merge);
///     if (!isWell || !tree.Complete() || !tree.Place()) return false;  // TakeFault() says why
///
/// Threads: one at a time. Failure: false, with the fault set.
class VEXG_EXPORT SegmentTreeWriter {
 public:
  SegmentTreeWriter() = default;
  ~SegmentTreeWriter();
  SegmentTreeWriter(const SegmentTreeWriter&) = delete;
  SegmentTreeWriter& operator=(const SegmentTreeWriter&) = delete;

  /// Makes the file. One at the place that is no tree is never replaced.
  bool Begin(const std::string& path, const TreeScene& scene);
  /// Adds the basins of the next lines, first line first; 0 for pixels without one.
  bool AddLines(const std::uint32_t* basins, std::size_t lines);
  /// Adds what the basins hold, behind all lines.
  bool AddBasins(const TreeBasins& basins);
  /// Adds the next merge, behind the basins.
  bool AddMerge(const TreeMerge& merge);
  /// Completes the file, which can be opened by WorkPath() then.
  bool Complete();
  /// Gives the file its place.
  bool Place();

  const std::string& WorkPath() const { return workPath_; }

 private:
  using Index = std::vector<detail::TreeExtent>;

  bool FailBy(const std::string& fault);
  bool Put(const void* data, std::size_t bytes, Packing packing, detail::TreeExtent& extent);
  bool PutStrip();
  bool PutMerges();

  std::string path_, workPath_;
  std::unique_ptr<platform::RandomAccessFile> file_;
  bool isMade_ = false;  // there is a file at workPath_
  detail::TreeHeader header_{};
  TreeScene scene_;
  std::uint64_t end_ = 0;
  std::vector<std::uint32_t> strip_;
  std::vector<TreeMerge> merges_;
  Index labelIndex_, basinIndex_, mergeIndex_;
  RawBytes packed_;
};

/// Reads the tree of a segmentation, as SegmentTreeWriter made it.
///
/// It reads nothing from a damaged file that could not be, whatever the checksums say: labels are
/// those of basins, and merges join two that stand for segments.
///
/// Threads: any number may read at once. Failure: null or false, with the fault set: one line that
///          names the file.
class VEXG_EXPORT SegmentTree {
 public:
  static std::shared_ptr<const SegmentTree> Open(const std::string& path);
  /// True for a file that begins as a tree does, of whatever version.
  static bool IsTree(const std::string& path);

  const std::string& Path() const { return file_->Path(); }
  const TreeScene& Scene() const { return scene_; }
  std::uint32_t Basins() const { return header_.basins; }
  std::uint64_t Merges() const { return header_.merges; }
  /// The lines of labels are stored in strips of so many; the last may have fewer.
  std::uint32_t StripLines() const { return header_.stripLines; }
  unsigned Strips() const { return static_cast<unsigned>(labelIndex_.size()); }
  std::uint32_t LinesOf(unsigned strip) const;

  /// Reads the basins of a strip: 0 for pixels without one. @param basins  [out] by pixel.
  bool ReadStrip(unsigned strip, std::vector<std::uint32_t>& basins) const;
  bool ReadBasins(TreeBasins& basins) const;
  /// Calls `visit(merge)` with the merges in their order, as long as it gives true. Whether two
  /// basins stand for segments is for `visit` to know; both are basins, and not the same.
  bool ForEachMerge(const std::function<bool(const TreeMerge&)>& visit) const;

 private:
  using Index = std::vector<detail::TreeExtent>;

  bool Fail(const std::string& fault) const;
  bool ReadHeader();
  const char* FindFault(std::uint64_t fileBytes) const;
  bool ReadIndex(const detail::TreeExtent& extent, std::uint64_t count, Index& index) const;
  bool ReadIndices();
  bool ReadValues();
  bool Get(const detail::TreeExtent& extent, void* data, std::uint64_t bytes) const;
  std::uint64_t ValuesIn(std::uint64_t block, std::uint64_t all) const;

  std::unique_ptr<platform::RandomAccessFile> file_;
  detail::TreeHeader header_{};
  TreeScene scene_;
  Index labelIndex_, basinIndex_, mergeIndex_;
};

using SegmentTreePtr = std::shared_ptr<const SegmentTree>;

}  // namespace lumo
