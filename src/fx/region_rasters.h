#pragma once

#include <functional>

#include "fx/fuzzy_rules.h"
#include "fx/region_kinds.h"
#include "raster/tile_process.h"

// Rasters of what regions have: of each pixel the values, scores or class of its region. Slot 0 of
// a token holds a tile of labels, slot 1 receives the painted one; they may be one slot.

namespace lumo {

/// Picks the class of the largest score above 0; of equal ones that of the lowest index.
struct VEXG_EXPORT BestMatchClassificationAlgorithm {
  /// @return the index of the class and 1; 0 where no score is above 0.
  static unsigned Pick(const float* scores, unsigned count);
};

/// Names what a region is painted with: attributes, and perhaps rules that compute scores of them.
struct RegionPaint {
  const ChosenAttributes* columns = nullptr;
  const FuzzyRuleSet* rules = nullptr;  ///< null where attributes are painted as they are
};

/// Paints the chosen attributes of regions, a band for each. Setup argument: Scalar<RegionPaint>,
/// whose parts outlive the task.
class VEXG_EXPORT RasterApplySelectRegionAttributesTask final : public SequentialTask {
 public:
  explicit RasterApplySelectRegionAttributesTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  RegionPaint paint_;
  TilePool<float> pool_;
};

/// Paints the scores of rules, a band for each.
class VEXG_EXPORT RasterApplyRegionRuleScoresTask final : public SequentialTask {
 public:
  explicit RasterApplyRegionRuleScoresTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  RegionPaint paint_;
  TilePool<float> pool_;
};

/// Paints the scores of classes, which are not normalized, a band for each.
class VEXG_EXPORT RasterApplyRegionClassScoresTask final : public SequentialTask {
 public:
  explicit RasterApplyRegionClassScoresTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  RegionPaint paint_;
  TilePool<float> pool_;
};

/// Paints classes that an algorithm picks from the scores of regions: the index and 1, 0 where it
/// picks none and where a pixel does not count, and the number of classes and 1 for label 0; of all
/// the low 8 bits. Setup argument: the file of scores. Exists for
/// RegionClassificationProbabilityFile and BestMatchClassificationAlgorithm.
template <typename File, typename Algorithm>
class RasterClassifyTask final : public StatelessTask {
 public:
  explicit RasterClassifyTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  std::vector<unsigned char> classes_;  // by region
  unsigned char noLabel_ = 0;
  TilePool<unsigned char> pool_;
};

extern template class VEXG_EXPORT
    RasterClassifyTask<RegionClassificationProbabilityFile, BestMatchClassificationAlgorithm>;

/// The processes read labels, paint, and write the first bands of a raster of their size, of which
/// it has at least as many as are painted. What they are made from outlives them.
class VEXG_EXPORT CreateRegionAttributesRasterProcess final : public TileProcess<> {
 public:
  CreateRegionAttributesRasterProcess(const RasterPtr<std::int32_t>& labels,
                                      const ChosenAttributes& columns,
                                      const RasterPtr<float>& output, const IPC& ipc = {});
};

class VEXG_EXPORT CreateRegionRuleScoresRasterProcess final : public TileProcess<> {
 public:
  CreateRegionRuleScoresRasterProcess(const RasterPtr<std::int32_t>& labels,
                                      const ChosenAttributes& columns, const FuzzyRuleSet& rules,
                                      const RasterPtr<float>& output, const IPC& ipc = {});
};

class VEXG_EXPORT CreateRegionClassScoresRasterProcess final : public TileProcess<> {
 public:
  CreateRegionClassScoresRasterProcess(const RasterPtr<std::int32_t>& labels,
                                       const ChosenAttributes& columns, const FuzzyRuleSet& rules,
                                       const RasterPtr<float>& output, const IPC& ipc = {});
};

class VEXG_EXPORT RasterClassifyProcess final : public TileProcess<> {
 public:
  RasterClassifyProcess(const RasterPtr<std::int32_t>& labels,
                        const Pointer<RegionClassificationProbabilityFile>& scores,
                        const RasterPtr<unsigned char>& output, const IPC& ipc = {});
};

}  // namespace lumo
