#pragma once

#include <algorithm>
#include <map>
#include <memory>
#include <unordered_map>
#include <utility>
#include <vector>

#include "foundation/fault.h"
#include "fx/attribute_forms.h"
#include "fx/label_census.h"
#include "geometry/label_vectorizer.h"
#include "raster/tile_process.h"
#include "tasks/parallel.h"

namespace lumo {

/// The polygons that some lines of labels complete, in the order of the vectorizer.
struct LabelledPolygons {
  std::vector<std::uint32_t> labels;
  std::vector<TracedPolygon> polygons;
};

/// Gathers the polygons of a vectorizer.
class LabelledPolygonSink final : public LabelPolygonSink {
 public:
  bool Take(double label, TracedPolygon& polygon) override {
    taken_.labels.push_back(static_cast<std::uint32_t>(label));
    taken_.polygons.emplace_back();
    std::swap(taken_.polygons.back(), polygon);
    return true;
  }
  /// Gives what was taken since the last call.
  LabelledPolygons TakeAll() { return std::exchange(taken_, {}); }

 private:
  LabelledPolygons taken_;
};

/// Holds regions until their last polygon has come, which a census knows beforehand.
template <typename Item>
class PendingRegions {
 public:
  explicit PendingRegions(const LabelCensus& census) : census_(census) {}

  /// Adds an item of a region. `merge(Item&, Item&&)` joins it to those that came before.
  template <typename Merge>
  void Add(std::uint32_t label, Item&& item, const Merge& merge) {
    const auto [at, isNew] = items_.try_emplace(label);
    if (isNew) {
      at->second = std::move(item);
      endings_[census_.Of(label).last].push_back(label);
    } else {
      merge(at->second, std::move(item));
    }
  }

  /// Takes out the regions that have ended once so many lines were vectorized: calls
  /// `finish(label, Item&)` for each, by ascending label within a strip.
  template <typename Finish>
  bool Close(std::uint64_t lines, bool isEnd, const Finish& finish) {
    while (!endings_.empty()) {
      const auto ending = endings_.begin();
      // The line behind the last one of a region completes its polygons.
      if (!isEnd && (std::uint64_t{ending->first} + 1) * kStripLines + 1 > lines) break;
      std::sort(ending->second.begin(), ending->second.end());
      for (const std::uint32_t label : ending->second) {
        const auto at = items_.find(label);
        if (!finish(label, at->second)) return false;
        items_.erase(at);
      }
      endings_.erase(ending);
    }
    return true;
  }

 private:
  const LabelCensus& census_;
  std::unordered_map<std::uint32_t, Item> items_;
  std::map<std::uint32_t, std::vector<std::uint32_t>> endings_;  // by strip
};

/// Vectorizes a raster of labels and hands out its regions as they are complete: makes an item out
/// of each polygon, on all threads, joins those of a region and finishes it, one at a time.
///
/// @param labels  of a type of LabelTypes; the first band counts.
/// @param parts   kTold: each polygon is finished by itself, in the order of the vectorizer.
/// @param make    Item make(TracedPolygon& polygon)
/// @param merge   void merge(Item& to, Item&& from)
/// @param finish  bool finish(std::uint32_t label, Item& item)
/// @return false, with the fault set, after a failure or an abort.
template <typename L, typename Make, typename Merge, typename Finish>
bool ForEachRegion(const RasterPtr<L>& labels, const LabelCensus& census, RegionParts parts,
                   const Make& make, const Merge& merge, const Finish& finish, const IPC& ipc) {
  using Item = std::invoke_result_t<Make, TracedPolygon&>;
  struct Batch {
    std::vector<std::uint32_t> labels;
    std::vector<Item> items;
    std::uint64_t lines;  // vectorized so far
  };
  const unsigned lines = labels->Lines();
  LabelledPolygonSink sink;
  LabelVectorizer<L> vectorizer(labels->Samples(), sink);
  PendingRegions<Item> open(census);
  TileProcess<> process("RegionShapes", ipc);
  const auto tiles =
      process.Read(LabelTiles(labels, StripTiles(*labels, labels->Samples() * sizeof(L))));
  const auto polygons = process.template TakeSlot<ValueSlot<LabelledPolygons>>();
  const auto batches = process.template TakeSlot<ValueSlot<Batch>>();
  process.Add("Vectorize", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag* abort) {
    const TilePtr<L> tile = tiles.In(token);
    if (!tile || !tile->IsValid()) return false;
    for (unsigned y = 0; y < tile->Height() && !(abort != nullptr && abort->IsSet()); ++y) {
      const std::size_t at = tile->Offset(0, y);
      vectorizer.AddLine(tile->PixelArray().GetData() + at,
                         std::as_const(*tile).StateArray().GetData() + at);
    }
    if (vectorizer.LineCount() == lines) vectorizer.Finish();
    return polygons.Put(token, sink.TakeAll());
  });
  process.Add("Shapes", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag* abort) {
    LabelledPolygons* const from = polygons.In(token);
    const TilePtr<L> tile = tiles.In(token);
    if (from == nullptr || !tile) return false;
    Batch batch{std::move(from->labels), std::vector<Item>(from->polygons.size()),
                std::uint64_t{tile->Origin().second} + tile->Height()};
    ParallelFor(static_cast<unsigned>(batch.items.size()), abort,
                [&](unsigned i) { batch.items[i] = make(from->polygons[i]); });
    from->polygons.clear();
    return batches.Put(token, std::move(batch));
  });
  process.Add("Regions", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag*) {
    Batch* const batch = batches.In(token);
    if (batch == nullptr) return false;
    for (std::size_t i = 0; i < batch->items.size(); ++i) {
      if (parts == RegionParts::kTogether) {
        open.Add(batch->labels[i], std::move(batch->items[i]), merge);
      } else if (!finish(batch->labels[i], batch->items[i])) {
        return false;
      }
    }
    return open.Close(batch->lines, batch->lines == lines, finish);
  });
  process.Close();
  const bool hasRun = process.RunProcess(process.kHere);
  const bool isAborted = ipc.abort->IsSet();
  if (hasRun && !isAborted) return true;
  SetFault(isAborted ? String("the work was aborted") : process.GetFault());
  return false;
}

}  // namespace lumo
