#pragma once

#include <memory>
#include <vector>

#include "fx/region_kinds.h"
#include "raster/tile.h"
#include "tasks/task.h"

// The stages that gather values of regions in float, tile after tile. Slot 0 of a token holds the
// tile of the image, slot 1 that of the labels, of int or unsigned int, in the same place. They
// exist for EightTypes and the files of region_kinds.h; region_pass.h gives the same values from
// exact sums, in a fraction of the time.

namespace lumo {

/// Holds the setup of a stage: the file that it fills, and the side of its windows.
template <typename File>
struct RegionComputeSetup : Object {
  Pointer<File> file;
  unsigned kernel = 1;  ///< pixels; of texture alone
};

/// Walks the pixels of tiles that count, gathers in a map, and adds the map to the file when it has
/// more regions than 1,048,576 / bands.
///
/// A derived class says what a pixel adds, how a band is added to the file, and how its sums become
/// the values; it calls Complete in its destructor.
/// Failure: TaskErrorBadParams without a file, TaskErrorBadArgs for tiles that do not fit. A stage
///          in error leaves sums in the file, not values.
template <typename T, typename File>
class RegionComputeTask : public SequentialTask {
 public:
  bool Execute(ArgList& args) override;

 protected:
  RegionComputeTask(const char* name, ArgList& setup);

  virtual void AddPixel(const Tile<T>& image, int x, int y, unsigned label) = 0;
  virtual void AddToFile(unsigned region, unsigned band) = 0;
  virtual void Finish(unsigned region, unsigned band) = 0;
  /// The pixels that are needed on each side of a tile.
  virtual unsigned Reach() const { return 0; }

  /// Adds the map to the file and finishes its regions, unless the stage is in error.
  void Complete();

  RegionAttributesMap<float>& Map() { return *map_; }
  File& GetFile() { return *setup_->file; }
  unsigned Kernel() const { return setup_->kernel; }

 private:
  void Flush();

  ObjectPtr held_;
  RegionComputeSetup<File>* setup_;  // the same
  std::unique_ptr<RegionAttributesMap<float>> map_;
  std::vector<unsigned> touched_;  // regions of the file, ascending
};

/// Gathers sums, sums of squares, extremes and counts. Setup arguments: a RegionComputeSetup.
template <typename T, typename File = SpectralRegionAttributesFile>
class SpectralRegionAttributesComputeTask final : public RegionComputeTask<T, File> {
 public:
  explicit SpectralRegionAttributesComputeTask(ArgList& setup)
      : RegionComputeTask<T, File>("SpectralRegionAttributesComputeTask", setup) {}
  ~SpectralRegionAttributesComputeTask() override { this->Complete(); }

 private:
  void AddPixel(const Tile<T>& image, int x, int y, unsigned label) override;
  void AddToFile(unsigned region, unsigned band) override;
  void Finish(unsigned region, unsigned band) override;
};

/// Gathers range, mean, variance and entropy of the windows round pixels. Setup arguments: a
/// RegionComputeSetup. Fails also when a tile's border is narrower than half a window.
template <typename T, typename File = TextureRegionAttributesFile>
class TextureRegionAttributesComputeTask final : public RegionComputeTask<T, File> {
 public:
  explicit TextureRegionAttributesComputeTask(ArgList& setup)
      : RegionComputeTask<T, File>("TextureRegionAttributesComputeTask", setup) {}
  ~TextureRegionAttributesComputeTask() override { this->Complete(); }

 private:
  void AddPixel(const Tile<T>& image, int x, int y, unsigned label) override;
  void AddToFile(unsigned region, unsigned band) override;
  void Finish(unsigned region, unsigned band) override;
  unsigned Reach() const override { return this->Kernel() / 2; }

  std::vector<double> values_;  // of a window
};

/// Gathers sums and counts. Setup arguments: a RegionComputeSetup.
template <typename T, typename File = RegionMeansFile>
class RegionMeansComputeTask final : public RegionComputeTask<T, File> {
 public:
  explicit RegionMeansComputeTask(ArgList& setup)
      : RegionComputeTask<T, File>("RegionMeansComputeTask", setup) {}
  ~RegionMeansComputeTask() override { this->Complete(); }

 private:
  void AddPixel(const Tile<T>& image, int x, int y, unsigned label) override;
  void AddToFile(unsigned region, unsigned band) override;
  void Finish(unsigned region, unsigned band) override;
};

VEXG_EXTERN(EIGHT, SpectralRegionAttributesComputeTask);
VEXG_EXTERN(EIGHT, TextureRegionAttributesComputeTask);
VEXG_EXTERN(EIGHT, RegionMeansComputeTask);

}  // namespace lumo
