#pragma once

#include <algorithm>
#include <utility>

#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/lambda_schedule.h"
#include "fx/pair_join.h"
#include "fx/rigorous_merge.h"
#include "fx/seamless_segmentation.h"
#include "fx/strip_numbers.h"
#include "fx/strip_process.h"
#include "fx/task_setup.h"
#include "fx/tree_cut.h"
#include "fx/usable_pixels.h"
#include "fx/watershed_task.h"
#include "platform/system_memory.h"
#include "raster/raster_def.h"

namespace lumo {
namespace detail {

inline constexpr unsigned kSeamlessPasses = 4;  // basins, graph, merging, labels

/// The labels of a strip, and the neighbours among them. Lent, since the memory of strips that come
/// and go stays with each thread.
struct StripGraph {
  std::vector<std::int32_t> labels;
  LabelPairs pairs;
};
using LentGraph = std::shared_ptr<ScratchPool<StripGraph>::Loan>;

inline void AddTo(LambdaSchedule& schedule, std::uint32_t label, const auto* values,
                  const unsigned char* /*states*/, unsigned /*bands*/) {
  schedule.AddPixel(label, values, 1);
}
inline void AddTo(RigorousMerge& merge, std::uint32_t label, const auto* values,
                  const unsigned char* states, unsigned bands) {
  if (IsUsable(states, bands)) merge.AddPixel(label, values, 1);
}

/// Finds for each label below `count` the first one that is in its group. `groupOf` gives the
/// groups, by numbers of at most `count`.
template <typename GroupOf>
std::vector<std::uint32_t> FindFirstOfGroups(std::size_t count, const GroupOf& groupOf) {
  std::vector<std::uint32_t> first(count + 1, 0), found(count, 0);
  for (std::uint32_t label = 1; label < count; ++label) {
    std::uint32_t& of = first[groupOf(label)];
    if (of == 0) of = label;
    found[label] = of;
  }
  return found;
}

}  // namespace detail

template <typename T>
SeamlessSegmentation<T>::SeamlessSegmentation(const RasterPtr<T>& segment,
                                              const RasterPtr<T>& merge,
                                              const RasterPtr<std::int32_t>& labels,
                                              const SegmentRequest& request, const IPC& ipc,
                                              const SegmentShares* shares)
    : segment_(segment),
      merge_(merge),
      labels_(labels),
      request_(request),
      ipc_(ipc),
      stripLines_(SeamlessStripLines(*segment, sizeof(T), request.tileBytes)),
      shares_(shares),
      watershed_(shares != nullptr ? static_cast<BasinLabels&>(shared_) : flood_) {}

template <typename T>
IPC SeamlessSegmentation<T>::NextPass() const {
  platform::ReturnFreeMemory();  // each pass has large arrays of its own
  return IPC(ipc_.abort,
             ProgressReportPtr(new ScaledProgressReport(ipc_.progress, detail::kSeamlessPasses)));
}

template <typename T>
TileDimensions SeamlessSegmentation<T>::Strips(unsigned border) const {
  return detail::StripTiles(*segment_, stripLines_, border);
}

template <typename T>
bool SeamlessSegmentation<T>::Run() {
  if (!BeginTree() || !FindBasins()) return false;
  if (IsAborted()) return true;
  forest_.Begin(std::uint64_t{watershed_.Count()} + 1);
  const bool merges = request_.mergeValue > 0 || request_.leastPixels > 1;
  if (((merges && watershed_.Count() > 0) || tree_) && !Merge()) return false;
  if (IsAborted()) return true;
  if (!Write()) return false;
  return IsAborted() || !tree_ || tree_->Place();
}

template <typename T>
bool SeamlessSegmentation<T>::FindBasins() {
  if (shares_ != nullptr) return OpenShares();
  const bool isRanked = request_.order != MergeOrder::kLocal;
  if (!flood_.Begin({segment_->Samples(), segment_->Lines(), stripLines_, isRanked})) {
    return false;
  }
  const RasterIteratorPtr<T> strips(
      new RasterIterator<T>(segment_, Strips(detail::GradientBorder(request_.algorithm, 1))));
  detail::StripProcess process("SeamlessBasins", NextPass());
  const ArgID slot = process.Read(strips).id;
  detail::AddLevels<T>(process, request_, slot);
  process.Add("Basins", StageOrder::kSeveralAtOnce, [this, slot](ArgList& token, const AbortFlag*) {
    const TilePtr<std::int32_t> levels = TileSlot<std::int32_t>{slot}.In(token);
    if (!levels || !levels->IsValid()) return false;
    return flood_.AddStrip(levels->Index().second,
                           {levels->PixelArray().GetData(), FindExcluded(*levels)});
  });
  process.Close();
  if (!process.RunProcess(process.kHere)) return false;
  return IsAborted() || flood_.Connect(ipc_.abort.Get());
}

template <typename T>
bool SeamlessSegmentation<T>::Merge() {
  if (request_.order == MergeOrder::kLocal) return MergeLocally();
  const std::uint64_t needed = MemoryOfMerging(watershed_.Count(), merge_->Bands(), request_);
  if (needed > request_.memory) {
    SetFault(MemoryFault(watershed_.Count(), needed, request_.memory));
    return false;
  }
  return request_.isRigorous ? MergeRigorously() : MergeBySchedule();
}

/// Adds all pixels to a graph, in raster order, and finds the neighbours.
template <typename T>
template <typename Graph, typename Pairs>
bool SeamlessSegmentation<T>::Gather(Graph& graph, Pairs& pairs) {
  if (shares_ != nullptr) return GatherShares(graph, pairs);
  std::vector<bool> atSeams;
  if (!watershed_.MarkSeamBasins(atSeams)) return false;
  detail::PairJoin<Pairs> join(pairs, std::move(atSeams));
  const RasterIteratorPtr<T> strips(new RasterIterator<T>(merge_, Strips(0)));
  ScratchPool<detail::StripGraph> pool;
  detail::StripProcess process("SeamlessGraph", NextPass());
  const auto tiles = process.Read(strips);
  const auto graphs = process.template TakeSlot<ValueSlot<detail::LentGraph>>();
  process.Add(
      "Neighbours", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag* abort) {
        const unsigned strip = tiles.In(token)->Index().second;
        const std::uint32_t width = watershed_.Width();
        detail::LentGraph made(new auto(pool.Borrow()));
        std::vector<std::int32_t>& labels = (*made)->labels;
        LabelPairs& found = (*made)->pairs;
        labels.resize(std::size_t{width} * watershed_.LinesOf(strip));
        std::vector<std::int32_t> below;
        if (!watershed_.Label(strip, labels.data()) || !watershed_.ReadLabelsBelow(strip, below)) {
          return false;
        }
        if (abort != nullptr && abort->IsSet()) return false;
        found.Begin(watershed_.Count() / watershed_.Strips() + 1);
        ForEachStripEdge(labels.data(), labels.size(), width,
                         below.empty() ? nullptr : below.data(),
                         [&](std::uint32_t a, std::uint32_t b) { found.AddEdge(a, b); });
        return graphs.Put(token, std::move(made));
      });
  process.Add("Sums", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<T> tile = tiles.In(token);
    const detail::LentGraph* const lent = graphs.In(token);
    if (!tile || !tile->IsValid() || lent == nullptr) return false;
    const detail::StripGraph& made = ***lent;
    const unsigned bands = tile->Bands();
    const T* values = tile->PixelArray().GetData();
    const unsigned char* states = std::as_const(*tile).StateArray().GetData();
    for (const std::int32_t label : made.labels) {
      if (label != 0) {
        detail::AddTo(graph, static_cast<std::uint32_t>(label), values, states, bands);
        if (tree_) AddSquares(static_cast<std::uint32_t>(label), values, bands);
      }
      values += bands;
      states += bands;
    }
    for (const LabelPair& pair : made.pairs.Pairs()) join.Add(pair);
    return !tree_ || KeepLines(made.labels);
  });
  process.Close();
  return process.RunProcess(process.kHere);
}

template <typename T>
bool SeamlessSegmentation<T>::MergeBySchedule() {
  const std::uint32_t count = watershed_.Count();
  std::optional<LambdaSchedule> schedule(std::in_place);
  schedule->Begin(count + 1, merge_->Bands());
  schedule->Limit(request_.growth);
  schedule->CompareBy(watershed_.TakeRanks());
  if (tree_) BeginBasins();
  schedule->ReservePairs(std::size_t{3} * count);  // more pairs of areas touch in no plane
  if (!Gather(*schedule, *schedule)) return false;
  if (IsAborted()) return true;
  schedule->Build();
  if (tree_) {
    CenterSquares(*schedule);
    if (!KeepBasins([&](std::uint32_t label) { return schedule->AreaOf(label); })) return false;
  }
  if (!DoSteps(*schedule)) return false;
  schedule.reset();  // the cut takes memory as well
  return !tree_ || IsAborted() || CutOwnTree();
}

/// Merges up to the threshold, or with a tree to the end.
template <typename T>
bool SeamlessSegmentation<T>::DoSteps(LambdaSchedule& schedule) {
  const std::uint32_t count = watershed_.Count();
  const IPC pass = NextPass();
  LambdaSchedule::Merge merge;
  const bool doesSteps = request_.mergeValue > 0 || tree_;
  for (std::uint32_t step = 0; doesSteps && schedule.Step(merge); ++step) {
    if (tree_) {
      const TreeMerge kept{merge.lambda, order_[merge.lower], order_[merge.higher], merge.border};
      if (!tree_->AddMerge(kept)) return false;
    } else if (merge.lambda > request_.mergeValue) {
      break;
    }
    constexpr std::uint32_t kEvery = 4096;
    if (step % kEvery != 0) continue;
    if (IsAborted()) return true;
    pass.progress->Update(static_cast<double>(step) / count);
  }
  if (tree_) return true;
  schedule.JoinSmall(request_.leastPixels, [](const auto& /*join*/) {});
  for (std::uint32_t label = 1; label <= count; ++label) {
    const std::uint32_t root = schedule.RootOf(label);
    if (root != label) forest_.Join(label, root);
  }
  return true;
}

template <typename T>
bool SeamlessSegmentation<T>::BeginTree() {
  if (request_.tree.empty()) return true;
  TreeScene scene;
  scene.samples = segment_->Samples();
  scene.lines = segment_->Lines();
  scene.bands = merge_->Bands();
  scene.dataType = merge_->DataType();
  scene.isNested = request_.order == MergeOrder::kLocal;
  scene.compactness = request_.growth.compactness;
  scene.mostPixels = request_.growth.mostPixels;
  const RasterDef def = segment_->GetRasterDef();
  scene.tileWidth = def.tileWidth;
  scene.tileHeight = def.tileHeight;
  scene.interleave = def.interleave;
  scene.geoRef = def.geoRef;
  return tree_.emplace().Begin(request_.tree, scene);
}

template <typename T>
void SeamlessSegmentation<T>::BeginBasins() {
  order_.assign(std::size_t{watershed_.Count()} + 1, 0);
  squares_.assign(std::size_t{watershed_.Count()} + 1, 0);
}

/// Gives the basins of the next strip their numbers in raster order, and puts them into the tree.
template <typename T>
bool SeamlessSegmentation<T>::KeepLines(const std::vector<std::int32_t>& labels) {
  std::vector<std::uint32_t> numbers(labels.size());
  for (std::size_t i = 0; i < labels.size(); ++i) {
    if (labels[i] == 0) continue;
    std::uint32_t& number = order_[static_cast<std::size_t>(labels[i])];
    if (number == 0) number = ++ordered_;
    numbers[i] = number;
  }
  return tree_->AddLines(numbers.data(), labels.size() / watershed_.Width());
}

template <typename T>
template <typename V>
void SeamlessSegmentation<T>::AddSquares(std::uint32_t label, const V* values, unsigned bands) {
  squares_[label] += SharedGraph<V>::SumOfSquares(values, bands);
}

/// Takes the squares of the means of a basin from those of its values.
template <typename T>
void SeamlessSegmentation<T>::CenterSquares(const LambdaSchedule& schedule) {
  for (std::uint32_t label = 1; label <= watershed_.Count(); ++label) {
    const double area = schedule.AreaOf(label);
    for (unsigned band = 0; band < merge_->Bands(); ++band) {
      const double mean = schedule.MeanOf(label, band);
      squares_[label] -= area * mean * mean;
    }
  }
}

/// Puts the basins into the tree. `pixelsOf(label)` gives their sizes.
template <typename T>
template <typename PixelsOf>
bool SeamlessSegmentation<T>::KeepBasins(const PixelsOf& pixelsOf) {
  const std::uint32_t count = watershed_.Count();
  TreeBasins basins;
  basins.pixels.resize(count);
  basins.squares.resize(count);
  for (std::uint32_t label = 1; label <= count; ++label) {
    const std::uint32_t at = order_[label] - 1;
    basins.pixels[at] = static_cast<std::uint32_t>(pixelsOf(label));
    basins.squares[at] = squares_[label] > 0 ? squares_[label] : 0;  // not for those of no numbers
  }
  squares_ = {};
  return tree_->AddBasins(basins);
}

/// Finds the segments from the tree, as everybody will.
template <typename T>
bool SeamlessSegmentation<T>::CutOwnTree() {
  if (!tree_->Complete()) return false;
  const SegmentTreePtr tree = SegmentTree::Open(tree_->WorkPath());
  if (!tree) return false;
  double mergeValue = request_.mergeValue;
  if (request_.mergePercent && !FindMergeValue(*tree, *request_.mergePercent, mergeValue)) {
    return false;
  }
  TreeCut cut;
  if (!CutTree(*tree, mergeValue, cut)) return false;
  roots_ = detail::FindFirstOfGroups(order_.size(),
                                     [&](std::size_t label) { return cut.numbers[order_[label]]; });
  order_ = {};
  return true;
}

template <typename T>
bool SeamlessSegmentation<T>::MergeRigorously() {
  const std::uint32_t count = watershed_.Count();
  RigorousMerge merge;
  merge.Begin(count, merge_->Bands(), request_.sums);
  detail::PairList list;
  list.pairs.reserve(std::size_t{3} * count);
  if (!Gather(merge, list)) return false;
  if (IsAborted()) return true;
  const std::vector<std::uint32_t> groups = merge.Join(list.pairs, request_.mergeValue);
  roots_ =
      detail::FindFirstOfGroups(groups.size(), [&](std::size_t label) { return groups[label]; });
  return true;
}

template <typename T>
bool SeamlessSegmentation<T>::Write() {
  detail::StripProcess process("SeamlessLabels", NextPass());
  const auto numbers = process.template TakeSlot<TileSlot<Scalar<unsigned>>>();
  const auto tiles = process.template TakeSlot<TileSlot<std::int32_t>>();
  process.SetStrips(watershed_.Strips());
  process.template AddTask<StripNumberTask>(ArgIDs({numbers.id}), MakeSetup(watershed_.Strips()));
  for (std::uint32_t label = 1; label < roots_.size(); ++label) {
    if (roots_[label] != label) forest_.Join(label, roots_[label]);
  }
  roots_ = {};
  platform::ReturnFreeMemory();
  SegmentNumbers segments(watershed_, forest_, joined_ ? &*joined_ : nullptr, request_.bordersOnly);
  TilePool<std::int32_t> pool;
  process.Add("Labels", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<std::int32_t> tile = pool.Take();
    return segments.FindBasins(*FindScalarValue<unsigned>(token.Get(numbers.id)), *tile) &&
           tiles.Put(token, tile);
  });
  process.Add("Numbers", StageOrder::kOneByOne,
              [&](ArgList& token, const AbortFlag*) { return segments.Number(*tiles.In(token)); });
  process.Write(
      tiles, RasterIteratorPtr<std::int32_t>(new RasterIterator<std::int32_t>(labels_, Strips(0))));
  process.Close();
  return process.RunProcess(process.kHere);
}

}  // namespace lumo
