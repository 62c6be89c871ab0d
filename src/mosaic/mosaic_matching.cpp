#include "mosaic/mosaic_matching.h"

#include <algorithm>
#include <cmath>
#include <filesystem>

#include "foundation/fault.h"
#include "mosaic/histogram_match.h"
#include "mosaic/mosaic_tables.h"
#include "mosaic/overlap_raster.h"
#include "mosaic/step_progress.h"
#include "platform/file_swap.h"
#include "platform/temporary_file.h"
#include "stats/histogram_run.h"
#include "stats/raster_histogram.h"

namespace lumo {
namespace {

constexpr unsigned kMatchWhole = 1;

// Overlaps with more than this part of a scene's pixels are matched alone.
constexpr double kLeastOverlap = 0.1;

/// A raster whose histograms are matched, and its name for reasons.
template <typename T>
struct MatchSide {
  RasterPtr<T> raster;
  std::string name;
};

/// The histogram of one band with the range that it covers.
template <typename T>
struct BandCounts {
  T min{};
  T max{};
  RasterBandHistogram<T> histogram;

  SceneDistribution Scene() const {
    return {Cumulative(), static_cast<double>(min), histogram.binSize, histogram.binCount};
  }
  ReferenceDistribution Reference() const {
    return {Cumulative(), static_cast<double>(min), static_cast<double>(max)};
  }

 private:
  std::vector<double> Cumulative() const {
    const Array<unsigned long long>& counts = histogram.counts;
    return CumulativeDistribution({counts.GetData(), counts.GetCount()});
  }
};

/// The two files of tables while they are made: they take their places together.
class TableFiles {
 public:
  TableFiles(const String& base, unsigned scenes, unsigned bands)
      : paths_{base.ToUTF8() + ".mlh", base.ToUTF8() + ".mlt"},
        growing_{Begin(paths_[0]), Begin(paths_[1])},
        items(String(growing_[0]), scenes, bands),
        entries(String(growing_[1]), scenes, bands) {}
  ~TableFiles() {
    const String why = TakeFault();  // of what ended the run; closing may find another
    items.Close();
    entries.Close();
    SetFault(why);
    std::error_code ignored;
    for (const std::string& path : growing_) std::filesystem::remove(path, ignored);
  }
  TableFiles(const TableFiles&) = delete;
  TableFiles& operator=(const TableFiles&) = delete;

  bool Keep() {
    std::string fault;
    const bool isWhole = items.Close() && entries.Close();
    platform::FileSwap swap;
    if (!isWhole) fault = TakeFaultOr("the tables could not be written").ToUTF8();
    if (!isWhole || !swap.MoveIn(growing_[0], paths_[0], &fault) ||
        !swap.MoveIn(growing_[1], paths_[1], &fault)) {
      SetFault(String(fault));
      return false;
    }
    swap.Keep();
    return true;
  }

 private:
  static std::string Begin(const std::string& path) {
    platform::RemoveAbandonedFiles(path);
    return platform::TemporaryPathBeside(path);
  }

  const std::string paths_[2];
  const std::string growing_[2];

 public:
  MosaicHistMatchingLUTBaseFile<MosaicLUTItemBase> items;
  MosaicHistMatchingLUTFile<double> entries;
};

/// One run of MatchScenes.
template <typename T>
class Matching {
 public:
  Matching(MosaicRasterDef<T>& definition, const IPC& ipc, SceneShares& shares)
      : definition_(definition), ipc_(ipc), shares_(shares) {}

  bool Run() {
    if (!CheckScenes()) return false;
    if (shares_.IsShare()) return MakeShare();
    if (!shares_.Joins() && !Prepare()) return false;
    const unsigned bands = reference_.raster->Bands();
    TableFiles files(definition_.LutPath(), definition_.SceneCount(), bands);
    for (unsigned scene = 0; scene < definition_.SceneCount(); ++scene) {
      if (definition_.MatchFlags()[scene] == 0) continue;
      ShareReader* done = nullptr;
      if (!shares_.Find(scene, done)) return false;
      for (unsigned band = 0; band < bands; ++band) {
        BandTable table;
        const bool isThere =
            done != nullptr ? Restore(*done, table) : MatchBand(scene, band, table);
        if (!isThere || !Write(scene, band, table, files)) return false;
      }
    }
    return files.Keep();
  }

 private:
  /// The table of a band of a scene, and the range that it covers.
  struct BandTable {
    double min = 0;
    double max = 0;
    std::vector<double> entries{};
  };

  /// Makes the tables of the scenes of a share.
  bool MakeShare() {
    for (unsigned scene = 0; scene < definition_.SceneCount(); ++scene) {
      if (definition_.MatchFlags()[scene] == 0 || !shares_.IsWanted(scene)) continue;
      const IPC ipc = StepOf(ipc_, 1.0 / definition_.SceneCount());
      const bool isPrepared =
          definition_.ColourMatchMode() == kMatchWhole || scene == definition_.ReferenceIndex()
              ? PrepareWhole(Side(scene), ipc)
              : PrepareOverlap(scene, ipc);
      if (!isPrepared) return false;
      ShareWriter& out = shares_.Out(scene);
      for (unsigned band = 0; band < reference_.raster->Bands(); ++band) {
        BandTable table;
        if (!MatchBand(scene, band, table)) return false;
        const std::uint64_t count = table.entries.size();
        out.Put(table.min);
        out.Put(table.max);
        out.Put(count);
        out.PutAll(table.entries.data(), table.entries.size());
      }
    }
    return true;
  }

  static bool Restore(ShareReader& in, BandTable& table) {
    std::uint64_t count = 0;
    if (in.Get(table.min) && in.Get(table.max) && in.Get(count) && count <= kMosaicTableBins) {
      table.entries.resize(count);
      if (in.GetAll(table.entries.data(), table.entries.size())) return true;
    }
    return Refuse("the file of a share of the tables is damaged");
  }

  MatchSide<T> Side(unsigned scene) const {
    return {definition_.Scenes()[scene], definition_.SceneKey(scene).ToUTF8()};
  }

  bool CheckScenes() {
    if (definition_.SceneCount() == 0 || !definition_.ReferenceScene()) {
      return Refuse("the mosaic has no reference scene");
    }
    if (definition_.LutPath().GetLength() == 0) return Refuse("the mosaic names no tables");
    reference_ = Side(definition_.ReferenceIndex());
    for (unsigned i = 0; i < definition_.SceneCount(); ++i) {
      const RasterPtr<T>& scene = definition_.Scenes()[i];
      if (!scene || !scene->IsValid()) {
        return Refuse("scene " + std::to_string(i) + " " + definition_.SceneKey(i).ToUTF8() +
                      ": is gone");
      }
      if (scene->Bands() < reference_.raster->Bands()) {
        return Refuse(Side(i).name + ": has " + std::to_string(scene->Bands()) +
                      " bands, the reference scene " + std::to_string(reference_.raster->Bands()));
      }
    }
    return true;
  }

  /// Computes statistics and histograms of all that will be asked for.
  bool Prepare() {
    const unsigned scenes = definition_.SceneCount();
    for (unsigned i = 0; i < scenes; ++i) {
      const IPC ipc = StepOf(ipc_, 1.0 / scenes);
      const bool isDone =
          definition_.ColourMatchMode() == kMatchWhole || i == definition_.ReferenceIndex()
              ? PrepareWhole(Side(i), ipc)
              : PrepareOverlap(i, ipc);
      if (!isDone) return false;
    }
    return true;
  }

  bool PrepareOverlap(unsigned scene, const IPC& ipc) {
    const RasterPtr<T>& raster = definition_.Scenes()[scene];
    const MatchSide<T> overlap = Overlap(raster, reference_.raster);
    bool isLarge = false;
    if (!IsLarge(scene, 0, StepOf(ipc, 0.2), isLarge)) return false;
    if (!isLarge) return PrepareWhole(Side(scene), StepOf(ipc, 0.8));
    return PrepareWhole(overlap, StepOf(ipc, 0.4)) &&
           PrepareWhole(Overlap(reference_.raster, raster), StepOf(ipc, 0.4));
  }

  /// Whether the overlap of a scene with the reference has enough valid pixels of a band. False
  /// when that can't be found out.
  bool IsLarge(unsigned scene, unsigned band, const IPC& ipc, bool& isLarge) {
    const RasterPtr<T>& raster = definition_.Scenes()[scene];
    const MatchSide<T> overlap = Overlap(raster, reference_.raster);
    BandCounts<T> range;
    if (overlap.raster->Samples() == 0) return true;
    if (!FindRange(overlap, band, ipc, range)) return false;
    const double pixels = static_cast<double>(overlap.raster->PixelCount(band, ipc));
    isLarge = pixels / (static_cast<double>(raster->Samples()) * raster->Lines()) > kLeastOverlap;
    return true;
  }

  /// The area that two rasters have in common, as pixels of the first one.
  MatchSide<T> Overlap(const RasterPtr<T>& first, const RasterPtr<T>& second) {
    const auto identity = [](const RasterPtr<T>& raster) {
      char text[32];
      std::snprintf(
          text, sizeof(text), "{Scene}@%llx",
          static_cast<unsigned long long>(reinterpret_cast<std::uintptr_t>(raster.Get())));
      return std::string(text);
    };
    RasterPtr<T>& overlap = definition_.Overlaps()[String(identity(first) + identity(second))];
    if (!overlap) overlap.Reset(new OverlapRaster<T, T>(first, second));
    return {overlap, "the overlap with the reference scene"};
  }

  bool PrepareWhole(const MatchSide<T>& side, const IPC& ipc) {
    side.raster->SetStatsMode(StatsMode::kBasic);
    const unsigned bands = reference_.raster->Bands();
    for (unsigned band = 0; band < bands; ++band) {
      const IPC part = StepOf(ipc, 1.0 / bands);
      BandCounts<T> counts;
      if (!FindCounts(side, band, part, counts)) return false;
    }
    return true;
  }

  /// The least and the greatest value of a band, computed where they are not at hand.
  bool FindRange(const MatchSide<T>& side, unsigned band, const IPC& ipc, BandCounts<T>& counts) {
    constexpr unsigned kRange = StatsMask::Min | StatsMask::Max;
    TakeFault();
    const RasterBandStats<T> stats = side.raster->ComputeBandStats(band, kRange, ipc);
    if (ipc.abort->IsSet()) return Refuse("the matching was aborted");
    if ((stats.mask & kRange) != kRange) {
      return Refuse(side.name + ": " + TakeFaultOr("the pixels can't be read").ToUTF8());
    }
    counts.min = stats.min;
    counts.max = stats.max;
    return true;
  }

  /// The histogram of a band, counted where it is not at hand.
  bool FindCounts(const MatchSide<T>& side, unsigned band, const IPC& ipc, BandCounts<T>& counts) {
    if (!FindRange(side, band, StepOf(ipc, 0.5), counts)) return false;
    HistogramRequest<T> request = MatchingHistogram(counts.min, counts.max, definition_.Bins());
    request.bands.Resize(ArrayDims(1));
    request.bands[0] = band;
    if (FindAtHand(*side.raster, request, counts.histogram)) {
      ipc.progress->Update(1.0);
      return true;
    }
    const Turn turn(BasicRasterPtr(side.raster), Waiting::kAlways, ipc);
    const String why = RunHistogram(*side.raster, request, turn, StepOf(ipc, 0.5));
    if (ipc.abort->IsSet()) return Refuse("the matching was aborted");
    if (why.GetLength() != 0) return Refuse(side.name + ": " + why.ToUTF8());
    return FindAtHand(*side.raster, request, counts.histogram) ||
           Refuse(side.name + ": the histogram that was counted can't be found");
  }

  /// Finds the histogram of a request among those at hand: of its limits, as they were asked for or
  /// as the count changed them, and of its number or its size of bins.
  static bool FindAtHand(const Raster<T>& raster, const HistogramRequest<T>& request,
                         RasterBandHistogram<T>& found) {
    const auto one = [](auto value) {
      Array<decltype(value)> values{ArrayDims(1)};
      values[0] = value;
      return values;
    };
    const RasterHistogram<T> bins =
        request.binSize > 0 ? RasterHistogram<T>(1, one(request.binSize), one(request.lower),
                                                 one(request.upper), request.sign, request.bins)
                            : RasterHistogram<T>(1, one(request.binCount), one(request.lower),
                                                 one(request.upper), request.sign, request.bins);
    const auto isMeant = [&](const RasterBandHistogram<T>& histogram) {
      const bool hasForm =
          histogram.bins == request.bins || (std::is_integral_v<T> && bins.BinSize(0) == 1);
      return hasForm && histogram.sign == request.sign && histogram.min == request.lower &&
             (histogram.max == request.upper || histogram.max == bins.Max(0)) &&
             (histogram.binCount == bins.BinCount(0) || histogram.binSize == bins.BinSize(0)) &&
             histogram.counts.GetCount() == histogram.binCount &&
             histogram.binCount <= kMosaicTableBins;
    };
    const Array<RasterBandHistogram<T>> all = raster.BandHistogram(request.bands[0]);
    const auto at = std::find_if(all.begin(), all.end(), isMeant);
    if (at != all.end()) found = *at;
    return at != all.end();
  }

  /// Makes the table of a band of a scene.
  bool MatchBand(unsigned scene, unsigned band, BandTable& made) {
    MatchSide<T> ofScene = Side(scene), ofReference = reference_;
    const IPC ipc(ipc_.abort, ProgressReportPtr(new StandardProgressReport));
    bool isLarge = false;
    const bool looks =
        definition_.ColourMatchMode() != kMatchWhole && scene != definition_.ReferenceIndex();
    if (looks && !IsLarge(scene, band, ipc, isLarge)) return false;
    if (isLarge) {
      ofScene = Overlap(ofScene.raster, reference_.raster);
      ofReference = Overlap(reference_.raster, Side(scene).raster);
    }
    BandCounts<T> sceneCounts, referenceCounts;
    if (!FindCounts(ofScene, band, ipc, sceneCounts) ||
        !FindCounts(ofReference, band, ipc, referenceCounts)) {
      return false;
    }
    made = {static_cast<double>(sceneCounts.min), static_cast<double>(sceneCounts.max),
            MatchDistributions(referenceCounts.Reference(), sceneCounts.Scene())};
    return true;
  }

  static bool Write(unsigned scene, unsigned band, const BandTable& made, TableFiles& files) {
    const std::vector<double>& table = made.entries;
    files.items.Ref(scene, band) = {made.min, made.max, static_cast<std::uint32_t>(table.size()),
                                    0};
    // With its window over this table alone the file stays sparse.
    files.entries.At(scene, band, kMosaicTableBins - 1);
    for (unsigned bin = 0; bin < table.size(); ++bin) {
      files.entries.Ref(scene, band, bin) = table[bin];
    }
    if (files.items.IsValid() && files.entries.IsValid()) return true;
    return Refuse(TakeFaultOr("the tables could not be written").ToUTF8());
  }

  MosaicRasterDef<T>& definition_;
  const IPC& ipc_;
  SceneShares& shares_;
  MatchSide<T> reference_;
};

}  // namespace

template <typename T>
HistogramRequest<T> MatchingHistogram(T min, T max, Form bins) {
  HistogramRequest<T> request;
  request.lower = min;
  request.upper = max;
  request.bins = bins;
  const double low = static_cast<double>(min), high = static_cast<double>(max);
  if constexpr (std::is_floating_point_v<T>) {
    const double upper = low + (high - low) / (kMosaicTableBins - 1) * kMosaicTableBins;
    constexpr auto kMost = std::numeric_limits<T>::max();
    request.upper = upper < static_cast<double>(kMost) ? static_cast<T>(upper) : kMost;
    request.binCount = kMosaicTableBins;
  } else if constexpr (sizeof(T) == 4) {
    request.binSize = std::max(1.0, std::trunc((high - low) / 32767));
  } else {
    request.binSize = 1;
  }
  return request;
}

template <typename T>
bool MatchScenes(MosaicRasterDef<T>& definition, const IPC& ipc, SceneShares& shares) {
  return Matching<T>(definition, ipc, shares).Run();
}

#define VEXG_MATCHING(T)                                                     \
  template VEXG_EXPORT HistogramRequest<T> MatchingHistogram<T>(T, T, Form); \
  template VEXG_EXPORT bool MatchScenes<T>(MosaicRasterDef<T>&, const IPC&, SceneShares&);
VEXG_FOR_ALL(EIGHT, VEXG_MATCHING);
#undef VEXG_MATCHING

}  // namespace lumo
