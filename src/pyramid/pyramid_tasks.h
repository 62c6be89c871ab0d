#pragma once

#include <functional>
#include <memory>

#include "pyramid/level_window.h"
#include "raster/raster_tasks.h"

// The stages of a process that makes the levels of a pyramid: one that reads, and one for each
// level, which takes the pixels of its level out of every block that was read. A pixel of a level
// is a copy of one pixel of the raster, see LevelShape. All exist for TwelveTypes.
//
// Setup arguments of a task for a level: the raster whose StoredPyramidLevel is written, the number
// of the level and the side of its tiles, both as Scalar<unsigned>.

namespace lumo {

/// A position on the walk along Z through a square grid, on which neighbours stay close together.
struct ZPosition {
  std::uint64_t x = 0;  ///< column of the grid
  std::uint64_t y = 0;  ///< row of the grid
};
/// Position `index` of the walk, from 0, through a grid of 2^bits by 2^bits: the bits of x and y
/// alternate in the index, x lowest.
VEXG_EXPORT ZPosition PositionAlongZ(std::uint64_t index, unsigned bits);

/// Takes a row of tiles of a level, one behind the other in a block of its own each. False, with
/// the fault set, when it can't be written.
template <typename T>
using LevelRowSink = std::function<bool(unsigned row, Tile<T>& tiles)>;

/// Gives what writes some bands of a level, as a raster that can be written.
template <typename T>
LevelRowSink<T> MakeRowSink(const RasterPtr<T>& level, const LevelShape& shape,
                            const Array<unsigned>& bands);

/// Writes a level in strips, as blocks of the raster come row by row.
template <typename T>
class LevelStripWriter {
 public:
  /// @param level  as a raster that can be written.
  LevelStripWriter(const RasterPtr<T>& level, const LevelShape& shape, unsigned samples);
  /// Writes some rows of tiles.
  /// @param endRow  behind the last.
  LevelStripWriter(const LevelRowSink<T>& sink, const LevelShape& shape, unsigned samples,
                   unsigned firstRow, unsigned endRow)
      : sink_(sink), strip_(shape), samples_(samples), endRow_(endRow), row_(firstRow) {}

  /// Takes the pixels of the level out of a block, and writes the strips that are whole with it. A
  /// row of more than one block lies within one strip.
  /// @return false, with the fault set, when a strip can't be had or written.
  bool Take(const Tile<T>& block);

 private:
  const LevelRowSink<T> sink_;
  LevelWindow<T> strip_;
  const unsigned samples_;  // of the raster
  const unsigned endRow_;   // of tiles, that isn't written any more
  unsigned row_;            // of tiles, that the strip is
  bool isBegun_ = false;
};

/// Holds the level of a task that makes one, and the block that it is given.
template <typename T>
class LevelTask : public SequentialTask {
 protected:
  LevelTask(const char* name, ArgList& setup);

  /// The block in slot 0; empty, with the error stored, when there is none.
  TilePtr<T> BlockOf(ArgList& args);
  /// Stores the error of the task. @return false.
  bool Fail();

  /// The level, as a raster that can be written.
  const RasterPtr<T>& Level() const { return level_; }
  const LevelShape& Shape() const { return shape_; }
  /// Pixels of a line of the raster.
  unsigned FullSamples() const { return samples_; }
  /// Lines of the raster.
  unsigned FullLines() const { return lines_; }
  /// Chooses tiles of another side than the setup argument says.
  void UseTiles(unsigned side);

 private:
  RasterPtr<T> level_;
  LevelShape shape_{0, 0, 0, 1};
  unsigned samples_ = 0;
  unsigned lines_ = 0;
};

/// Makes a level out of blocks of whole lines.
template <typename T>
class RasterPyramidScanlineDecimateTask final : public LevelTask<T> {
 public:
  explicit RasterPyramidScanlineDecimateTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  std::unique_ptr<LevelStripWriter<T>> writer_;
};

/// Makes a level out of square blocks as large as a tile of the level, which come row by row. Level
/// 0 is written block by block.
template <typename T>
class RasterPyramidRowDecimateTask final : public LevelTask<T> {
 public:
  explicit RasterPyramidRowDecimateTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  bool Copy(const Tile<T>& block);

  std::unique_ptr<LevelStripWriter<T>> writer_;
  RasterIteratorPtr<T> tiles_;  // of level 0
};

/// The first stage for rasters of many bands: reads one band after the other, each along Z, and
/// gives a tile in slot 0. The tiles that make one tile of a level come together that way. Setup
/// arguments: the raster, and width and height of the tiles as Scalar<unsigned>.
template <typename T>
class RasterMortenReadTask final : public SequentialTask {
 public:
  explicit RasterMortenReadTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  bool BeginBand();
  ZPosition NextPosition();

  RasterPtr<T> raster_;
  TileDimensions tiles_;
  RasterIteratorPtr<T> iterator_;  // of the band
  TilePool<T> pool_;
  unsigned band_ = 0;
  unsigned bits_ = 0;
  std::uint64_t index_ = 0;
  std::uint64_t done_ = 0;
};

/// Makes a level, tile by tile, out of the tiles that RasterMortenReadTask gives. Two more setup
/// arguments: width and height of the tiles that are read.
template <typename T>
class RasterPyramidMortenDecimateTask final : public LevelTask<T> {
 public:
  explicit RasterPyramidMortenDecimateTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  bool TakeTile(const Tile<T>& block);
  bool BeginBand();

  std::unique_ptr<LevelWindow<T>> tile_;  // of the level
  RasterIteratorPtr<T> iterator_;         // of the level, with the band
  unsigned blockSide_ = 0;
  unsigned lastColumn_ = 0;  // of the grid of blocks
  unsigned lastRow_ = 0;
  unsigned band_ = 0;
  bool isBegun_ = false;
};

VEXG_EXTERN(TWELVE, RasterPyramidScanlineDecimateTask);
VEXG_EXTERN(TWELVE, RasterPyramidRowDecimateTask);
VEXG_EXTERN(TWELVE, RasterMortenReadTask);
VEXG_EXTERN(TWELVE, RasterPyramidMortenDecimateTask);

}  // namespace lumo
