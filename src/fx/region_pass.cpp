#include "fx/region_pass.h"

#include <algorithm>
#include <unordered_map>

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "fx/record_spool.h"
#include "fx/region_sums.h"
#include "fx/run_kernels.h"
#include "fx/strip_regions.h"
#include "fx/texture_windows.h"
#include "fx/usable_pixels.h"
#include "raster/chosen_blocks.h"
#include "raster/pixel_states.h"
#include "raster/tile_functions.h"
#include "tasks/scratch_pool.h"

namespace lumo {
namespace {

using Wanted = RegionPassValues;

/// Records of finished regions, as the files have them.
struct FinishedRegions {
  std::vector<std::uint32_t> labels;
  std::vector<float> spectral, texture, means, entropy;

  void AddSpectral(const SpectralValues& values, const Wanted& wanted) {
    const auto mean = static_cast<float>(values.mean);
    const auto count = static_cast<float>(values.count);
    if (wanted.means) means.insert(means.end(), {mean, count});
    if (!wanted.spectral) return;
    spectral.insert(spectral.end(),
                    {mean, static_cast<float>(values.deviation), static_cast<float>(values.min),
                     static_cast<float>(values.max), count});
  }

  void AddTexture(const TextureSums& sums, const Wanted& wanted) {
    const double n = static_cast<double>(sums.count);
    const auto mean = [&](unsigned figure) {
      return sums.count != 0 ? static_cast<float>(sums.sums[figure] / n) : 0.0F;
    };
    if (wanted.texture) {
      for (const unsigned figure : {TextureSums::kRange, TextureSums::kMean, TextureSums::kVariance,
                                    TextureSums::kEntropy}) {
        texture.push_back(mean(figure));
      }
      texture.push_back(static_cast<float>(n));
    }
    if (wanted.entropy) {
      entropy.insert(entropy.end(), {mean(TextureSums::kEntropyOverN), static_cast<float>(n)});
    }
  }
};

/// Holds the regions of a strip: of those that lie in it alone the records, of others the sums of
/// each band.
template <typename T>
struct StripValues {
  std::uint32_t strip = 0;
  FinishedRegions finished;
  std::vector<std::uint32_t> labels;
  std::vector<RegionTotal<T>> totals;  // labels by bands
  std::vector<TextureSums> textures;
};

/// Gives numbers to the file of a share, and takes them from there.
template <typename N>
void Save(const std::vector<N>& numbers, ShareWriter& out) {
  out.Put(std::uint64_t{numbers.size()});
  out.PutAll(numbers.data(), numbers.size());
}
template <typename N>
bool Restore(std::vector<N>& numbers, ShareReader& in) {
  std::uint64_t count = 0;
  if (!in.Get(count) || count > in.Left() / sizeof(N)) return false;
  numbers.resize(count);
  return in.GetAll(numbers.data(), count);
}

template <typename T>
void Save(StripValues<T>& strip, ShareWriter& out) {
  out.Put(strip.strip);
  for (const auto* const labels : {&strip.finished.labels, &strip.labels}) Save(*labels, out);
  for (const auto* const values : {&strip.finished.spectral, &strip.finished.texture,
                                   &strip.finished.means, &strip.finished.entropy}) {
    Save(*values, out);
  }
  out.Put(std::uint64_t{strip.totals.size()});
  for (RegionTotal<T>& total : strip.totals) {
    total.ForEachNumber([&](const auto& number) { out.Put(number); });
  }
  out.Put(std::uint64_t{strip.textures.size()});
  for (const TextureSums& sums : strip.textures) {
    out.PutAll(sums.sums, TextureSums::kFigures);
    out.Put(sums.count);
  }
}

template <typename T>
bool Restore(StripValues<T>& strip, ShareReader& in) {
  bool isThere = in.Get(strip.strip);
  for (auto* const labels : {&strip.finished.labels, &strip.labels}) {
    isThere = isThere && Restore(*labels, in);
  }
  for (auto* const values : {&strip.finished.spectral, &strip.finished.texture,
                             &strip.finished.means, &strip.finished.entropy}) {
    isThere = isThere && Restore(*values, in);
  }
  std::uint64_t count = 0;
  isThere = isThere && in.Get(count) && count <= in.Left();
  if (!isThere) return false;
  strip.totals.resize(count);
  for (RegionTotal<T>& total : strip.totals) {
    total.ForEachNumber([&](auto& number) { isThere = isThere && in.Get(number); });
  }
  isThere = isThere && in.Get(count) && count <= in.Left() / sizeof(TextureSums);
  if (!isThere) return false;
  strip.textures.resize(count);
  for (TextureSums& sums : strip.textures) {
    isThere = isThere && in.GetAll(sums.sums, TextureSums::kFigures) && in.Get(sums.count);
  }
  return isThere;
}

/// Marks the pixels of a line that take part. @return null when all of them do.
const unsigned char* FindUsable(const unsigned char* states, std::size_t width, std::size_t bands,
                                std::vector<unsigned char>& usable) {
  if (AllValid(states, width * bands)) return nullptr;
  usable.resize(width);
  for (std::size_t x = 0; x < width; ++x, states += bands) {
    usable[x] = IsUsable(states, bands) ? 1 : 0;
  }
  return usable.data();
}

/// The buffers of a thread.
template <typename T>
struct Scratch {
  Scratch(unsigned reach, bool findsOverN) : windows(reach, findsOverN) {}

  StripRegions regions;
  std::vector<unsigned char> usable;
  std::vector<RegionSums<T>> sums;  // regions by bands
  std::vector<TextureSums> textures;
  TextureWindows<T> windows;
};

/// Adds the windows of a line to those of a band of their regions.
template <typename T>
void AddWindows(std::span<const LabelRun> runs, const TextureWindows<T>& windows, std::size_t band,
                std::size_t bands, std::vector<TextureSums>& textures) {
  const double* figures[TextureSums::kFigures];
  for (unsigned i = 0; i < TextureSums::kFigures; ++i) figures[i] = windows.Figure(i);
  for (const LabelRun& run : runs) {
    TextureSums& to = textures[run.region * bands + band];
    TextureSums sums = to;
    for (std::size_t x = run.first; x < std::size_t{run.first} + run.count; ++x) {
      if (!windows.IsCounted(x)) continue;
      for (unsigned i = 0; i < TextureSums::kFigures; ++i) sums.sums[i] += figures[i][x];
      ++sums.count;
    }
    to = sums;
  }
}

/// Sums up a strip.
template <typename T, typename L>
class StripWork {
 public:
  StripWork(const Tile<T>& image, const Tile<L>& labels, const Wanted& wanted,
            const LabelCensus& census)
      : image_(image), labels_(labels), wanted_(wanted), census_(census) {}

  StripValues<T> Sum(unsigned from, Scratch<T>& scratch) const {
    const unsigned to = std::min(from + kStripLines, image_.Height());
    FindRegions(from, to, scratch);
    const std::size_t bands = image_.Bands();
    const std::size_t pairs = scratch.regions.Labels().size() * bands;
    if (wanted_.Sums()) {
      scratch.sums.assign(pairs, {});
      for (unsigned y = from; y < to; ++y) {
        AddRuns(scratch.regions.RunsOf(y - from),
                image_.PixelArray().GetData() + image_.Offset(0, y), image_.PixelArray().end(),
                bands, scratch.sums.data());
      }
    }
    if (wanted_.Windows()) {
      scratch.textures.assign(pairs, {});
      for (unsigned band = 0; band < bands && pairs != 0; ++band) {
        scratch.windows.Load(image_, band, from, to);
        for (unsigned y = from; y < to; ++y) {
          scratch.windows.ComputeLine();
          AddWindows(scratch.regions.RunsOf(y - from), scratch.windows, band, bands,
                     scratch.textures);
        }
      }
    }
    return Collect((image_.Origin().second + from) / kStripLines, scratch);
  }

 private:
  void FindRegions(unsigned from, unsigned to, Scratch<T>& scratch) const {
    scratch.regions.Clear();
    for (unsigned y = from; y < to; ++y) {
      const std::size_t at = labels_.Offset(0, y);
      const unsigned char* const usable =
          FindUsable(image_.StateArray().GetData() + image_.Offset(0, y), image_.Width(),
                     image_.Bands(), scratch.usable);
      scratch.regions.AddLine(labels_.PixelArray().GetData() + at,
                              labels_.StateArray().GetData() + at, usable, image_.Width());
    }
  }

  StripValues<T> Collect(std::uint32_t strip, const Scratch<T>& scratch) const {
    StripValues<T> values;
    values.strip = strip;
    const std::vector<std::uint32_t>& labels = scratch.regions.Labels();
    const std::size_t bands = image_.Bands();
    for (std::size_t i = 0; i < labels.size(); ++i) {
      const LabelCensus::Extent extent = census_.Of(labels[i]);
      const bool isWhole = extent.first == extent.last;
      (isWhole ? values.finished.labels : values.labels).push_back(labels[i]);
      for (std::size_t at = i * bands; at < (i + 1) * bands; ++at) {
        if (wanted_.Sums()) {
          const RegionTotal<T> total = scratch.sums[at].Total();
          if (isWhole) {
            values.finished.AddSpectral(ValuesOf<T>(total), wanted_);
          } else {
            values.totals.push_back(total);
          }
        }
        if (wanted_.Windows()) {
          if (isWhole) {
            values.finished.AddTexture(scratch.textures[at], wanted_);
          } else {
            values.textures.push_back(scratch.textures[at]);
          }
        }
      }
    }
    return values;
  }

  const Tile<T>& image_;
  const Tile<L>& labels_;
  const Wanted& wanted_;
  const LabelCensus& census_;
};

/// Joins strips from top to bottom, and writes regions that are complete.
template <typename T>
class StripJoin {
 public:
  StripJoin(const RegionPassPlan& plan, const Wanted& wanted, const LabelCensus& census,
            std::size_t bands)
      : wanted_(wanted), census_(census), bands_(bands) {
    if (plan.spectral) spectral_.emplace(*plan.spectral);
    if (plan.texture) texture_.emplace(*plan.texture);
    if (plan.means) means_.emplace(*plan.means);
    if (plan.entropy) entropy_.emplace(*plan.entropy);
  }

  bool Add(const StripValues<T>& strip) {
    for (std::size_t i = 0; i < strip.labels.size(); ++i) {
      const std::uint32_t label = strip.labels[i];
      const std::size_t slot = SlotOf(label);
      for (std::size_t band = 0; band < bands_; ++band) {
        const std::size_t from = i * bands_ + band, to = slot * bands_ + band;
        if (wanted_.Sums()) totals_[to].Merge(strip.totals[from]);
        if (wanted_.Windows()) textures_[to].Merge(strip.textures[from]);
      }
    }
    // Regions whose last pixels do not count in the image end with the strip all the same.
    std::vector<std::uint32_t>& ending = endingAt_[strip.strip];
    FinishedRegions finished;
    for (const std::uint32_t label : ending) Finish(label, finished);
    endingAt_.erase(strip.strip);
    return Put(strip.finished) && Put(finished);
  }

  bool Close() {
    const auto flush = [](auto& spool) { return !spool || spool->Flush(); };
    return flush(spectral_) && flush(texture_) && flush(means_) && flush(entropy_);
  }

 private:
  std::size_t SlotOf(std::uint32_t label) {
    const auto [at, isNew] = slots_.try_emplace(label, 0);
    if (!isNew) return at->second;
    endingAt_[census_.Of(label).last].push_back(label);
    if (free_.empty()) {
      at->second = made_++;
      if (wanted_.Sums()) totals_.resize(made_ * bands_);
      if (wanted_.Windows()) textures_.resize(made_ * bands_);
    } else {
      at->second = free_.back();
      free_.pop_back();
      if (wanted_.Sums()) std::fill_n(&totals_[at->second * bands_], bands_, RegionTotal<T>());
      if (wanted_.Windows()) std::fill_n(&textures_[at->second * bands_], bands_, TextureSums());
    }
    return at->second;
  }

  void Finish(std::uint32_t label, FinishedRegions& finished) {
    const auto at = slots_.find(label);
    finished.labels.push_back(label);
    for (std::size_t i = at->second * bands_; i < (at->second + 1) * bands_; ++i) {
      if (wanted_.Sums()) finished.AddSpectral(ValuesOf<T>(totals_[i]), wanted_);
      if (wanted_.Windows()) finished.AddTexture(textures_[i], wanted_);
    }
    free_.push_back(at->second);
    slots_.erase(at);
  }

  bool Put(const FinishedRegions& regions) {
    const auto put = [&](std::optional<RecordSpool>& spool, const std::vector<float>& values) {
      if (!spool) return true;
      const float* record = values.data();
      for (const std::uint32_t label : regions.labels) {
        if (!spool->Add(label, record)) return false;
        record += spool->RecordLength();
      }
      return true;
    };
    return put(spectral_, regions.spectral) && put(texture_, regions.texture) &&
           put(means_, regions.means) && put(entropy_, regions.entropy);
  }

  const Wanted& wanted_;
  const LabelCensus& census_;
  std::size_t bands_;
  std::optional<RecordSpool> spectral_, texture_, means_, entropy_;
  std::unordered_map<std::uint32_t, std::size_t> slots_;  // of regions that are not complete
  std::unordered_map<std::uint32_t, std::vector<std::uint32_t>> endingAt_;  // by strip
  std::vector<std::size_t> free_;
  std::size_t made_ = 0;
  std::vector<RegionTotal<T>> totals_;  // slots by bands
  std::vector<TextureSums> textures_;
};

/// Sums up the strips of a tile, several at the same time.
template <typename T, typename L>
std::vector<StripValues<T>> SumTile(const StripWork<T, L>& work, unsigned lines,
                                    ScratchPool<Scratch<T>>& pool, unsigned reach,
                                    bool findsOverN) {
  std::vector<StripValues<T>> strips((lines + kStripLines - 1) / kStripLines);
  ParallelFor(static_cast<unsigned>(strips.size()), nullptr, [&](unsigned i) {
    const auto scratch = pool.Borrow(reach, findsOverN);
    strips[i] = work.Sum(i * kStripLines, *scratch);
  });
  return strips;
}

/// Reads an image and its labels in tiles of strips, and hands the sums of each tile to `take`.
template <typename T, typename L, typename Take>
bool SumTiles(const RasterPtr<T>& image, const RasterPtr<L>& labels, const LabelCensus& census,
              const Wanted& wanted, unsigned kernel, const Take& take, const IPC& ipc) {
  const unsigned reach = wanted.Windows() ? kernel / 2 : 0;
  TileDimensions tiles =
      StripTiles(*image, std::size_t{image->Samples()} * image->Bands() * sizeof(T));
  const RasterIteratorPtr<L> labelTiles = LabelTiles(labels, tiles);
  tiles.borderLeft = tiles.borderRight = tiles.borderTop = tiles.borderBottom = reach;
  const RasterIteratorPtr<T> imageTiles(new RasterIterator<T>(image, tiles));
  const ShareScope* const shares = ShareScope::Current();
  const Share share = shares != nullptr ? shares->GetShare() : Share();
  std::vector<TilePlace> places;
  for (auto row = share.Begin(imageTiles->Rows()); row < share.End(imageTiles->Rows()); ++row) {
    places.push_back({0, static_cast<unsigned>(row)});
  }
  if (places.empty()) return true;

  ScratchPool<Scratch<T>> pool;
  ChosenBlocks process("RegionPass", places, ipc);
  const auto imageSlot = process.ReadChosen(imageTiles);
  const auto labelSlot = process.ReadChosen(labelTiles);
  const auto sums = process.template TakeSlot<ValueSlot<std::vector<StripValues<T>>>>();
  process.Add("RegionPass", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<T> tile = imageSlot.In(token);
    const TilePtr<L> label = labelSlot.In(token);
    if (!tile || !tile->IsValid() || !label || !label->IsValid()) return false;
    const StripWork<T, L> work(*tile, *label, wanted, census);
    return sums.Put(token, SumTile<T, L>(work, tile->Height(), pool, reach, wanted.entropy));
  });
  process.Add("RegionPass", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag*) {
    auto* const strips = sums.In(token);
    return strips != nullptr && std::all_of(strips->begin(), strips->end(), take);
  });
  process.Close();
  const bool hasRun = process.RunProcess(process.kHere);
  if (ipc.abort->IsSet()) {
    SetFault("the work was aborted");
    return false;
  }
  if (!hasRun) SetFault(process.GetFault());
  return hasRun;
}

/// Hands the sums in the files of all shares to `take`, in their order.
template <typename T, typename Take>
bool TakeStrips(ShareScope& shares, const Take& take) {
  for (unsigned i = 0; i < shares.Count(); ++i) {
    ShareReader* const in = shares.In(i);
    if (in == nullptr) return false;
    while (!in->IsAtEnd()) {
      StripValues<T> strip;
      if (Restore(strip, *in) && take(strip)) continue;
      SetFault("the files of the shares don't hold the sums of these regions");
      return false;
    }
  }
  return true;
}

}  // namespace

template <typename T>
bool RegionPass<T>::Run(const IPC& ipc) {
  bool isDone = false;
  const bool isKnown = DispatchType(LabelTypes{}, labels_->DataType(), [&]<typename L>() {
    isDone = RunTyped(RasterPtr<L>(labels_), ipc);
    return true;
  });
  if (!isKnown) SetFault("LabelURI: the raster is of neither type Int nor UInt");
  return isDone;
}

template <typename T>
template <typename L>
bool RegionPass<T>::RunTyped(const RasterPtr<L>& labels, const IPC& ipc) {
  ShareScope* const shares = ShareScope::Current();
  if (shares != nullptr && shares->IsShare()) {
    const auto save = [&](StripValues<T>& strip) {
      Save(strip, shares->Out());
      return true;
    };
    return SumTiles<T, L>(image_, labels, census_, plan_.ofShare, plan_.kernel, save, ipc);
  }
  const Wanted wanted{bool(plan_.spectral), bool(plan_.texture), bool(plan_.means),
                      bool(plan_.entropy)};
  StripJoin<T> join(plan_, wanted, census_, image_->Bands());
  const auto add = [&](const StripValues<T>& strip) { return join.Add(strip); };
  const bool isDone = shares != nullptr
                          ? TakeStrips<T>(*shares, add)
                          : SumTiles<T, L>(image_, labels, census_, wanted, plan_.kernel, add, ipc);
  return isDone && join.Close();
}

VEXG_INSTANCES(EIGHT, RegionPass);

}  // namespace lumo
