#include "stats/raster_percentiles.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>

#include <fmt/format.h>

#include "commands/share_file.h"
#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/raster_iterator.h"
#include "raster/raster_lines.h"
#include "raster/tile_process.h"
#include "stats/quantile_rank.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

constexpr std::size_t kTableBudget = std::size_t{128} << 20;  // bytes

/// Unsigned numbers in the order of the values of a pixel type.
template <typename T>
struct OrderedKey {
  using Key = std::conditional_t<
      sizeof(T) == 1, std::uint8_t,
      std::conditional_t<sizeof(T) == 2, std::uint16_t,
                         std::conditional_t<sizeof(T) == 4, std::uint32_t, std::uint64_t>>>;
  static constexpr unsigned kBits = 8 * sizeof(T);
  static constexpr Key kTop = static_cast<Key>(Key{1} << (kBits - 1));

  static Key Of(T value) {
    if constexpr (std::is_floating_point_v<T>) {
      const auto bits = std::bit_cast<Key>(value == 0 ? T(0) : value);  // -0 is 0
      return (bits & kTop) != 0 ? ~bits : bits | kTop;
    } else {
      const auto bits = static_cast<Key>(value);
      return std::is_signed_v<T> ? static_cast<Key>(bits ^ kTop) : bits;
    }
  }
  static T ValueOf(Key key) {
    if constexpr (std::is_floating_point_v<T>) {
      return std::bit_cast<T>((key & kTop) != 0 ? static_cast<Key>(key ^ kTop)
                                                : static_cast<Key>(~key));
    } else {
      return static_cast<T>(std::is_signed_v<T> ? static_cast<Key>(key ^ kTop) : key);
    }
  }
};

/// Finds the values at some ranks of one band, a digit in each pass.
template <typename T>
class RankSearch {
 public:
  using Ordered = OrderedKey<T>;
  using Key = typename Ordered::Key;
  static constexpr unsigned kDigitBits = std::min(16U, Ordered::kBits);
  static constexpr unsigned kPasses = Ordered::kBits / kDigitBits;
  static constexpr std::size_t kDigits = std::size_t{1} << kDigitBits;

  explicit RankSearch(const std::vector<double>& percents) : percents_(percents) {}

  /// Makes the tables of a pass, from 0.
  void BeginPass(unsigned pass) {
    shift_ = Ordered::kBits - (pass + 1) * kDigitBits;
    isFirst_ = pass == 0;
    counts_.assign((isFirst_ ? 1 : prefixes_.size()) * kDigits, 0);
  }

  /// Counts the valid values of a line.
  void Count(const T* values, const unsigned char* states, std::size_t step, std::size_t count) {
    for (std::size_t i = 0; i < count; ++i) {
      const T value = values[i * step];
      if ((states[i * step] & PixelValueState::NotValid) != 0) continue;
      if constexpr (std::is_floating_point_v<T>) {
        if (!std::isfinite(value)) continue;
      }
      Add(Ordered::Of(value));
    }
  }

  /// Writes the tables of a pass, without what is 0.
  void Store(ShareWriter& out) const {
    for (std::size_t first = 0; first < counts_.size(); first += kDigits) {
      const std::uint64_t* const table = &counts_[first];
      out.Put(kDigits - static_cast<std::size_t>(std::count(table, table + kDigits, 0U)));
      for (std::uint32_t digit = 0; digit < kDigits; ++digit) {
        if (table[digit] == 0) continue;
        out.Put(digit);
        out.Put(table[digit]);
      }
    }
  }

  /// Adds tables that were written. False when there are none.
  bool Restore(ShareReader& in) {
    for (std::size_t first = 0; first < counts_.size(); first += kDigits) {
      std::size_t entries = 0;
      if (!in.Get(entries)) return false;
      for (std::size_t i = 0; i < entries; ++i) {
        std::uint32_t digit = 0;
        std::uint64_t count = 0;
        if (!in.Get(digit) || !in.Get(count) || digit >= kDigits) return false;
        counts_[first + digit] += count;
      }
    }
    return true;
  }

  /// Finds the digit of each rank that is wanted.
  void EndPass() {
    if (isFirst_) ChooseRanks();
    for (Wanted& wanted : wanted_) {
      const std::uint64_t* const table = &counts_[isFirst_ ? 0 : TableOf(wanted.prefix) * kDigits];
      std::size_t digit = 0;
      while (digit + 1 < kDigits && wanted.rank >= table[digit]) wanted.rank -= table[digit++];
      wanted.prefix = static_cast<Key>(wanted.prefix | static_cast<Key>(digit << shift_));
    }
    prefixes_.clear();
    for (const Wanted& wanted : wanted_) {
      prefixes_.push_back(static_cast<Key>(wanted.prefix >> shift_));
    }
    std::sort(prefixes_.begin(), prefixes_.end());
    prefixes_.erase(std::unique(prefixes_.begin(), prefixes_.end()), prefixes_.end());
    shiftOfPrefixes_ = shift_;
    counts_.clear();
  }

  /// The percentiles, behind the last pass.
  void Write(double* result) const {
    for (std::size_t i = 0; i < percents_.size(); ++i) {
      if (wanted_.empty()) {
        result[i] = std::nan("");
      } else {
        result[i] = QuantileRank(static_cast<double>(total_), percents_[i])
                        .Between(ValueOf(wanted_[2 * i]), ValueOf(wanted_[2 * i + 1]));
      }
    }
  }

 private:
  /// A rank among the values that share the digits found so far.
  struct Wanted {
    std::uint64_t rank;
    Key prefix;  // the digits found so far, at their places; the rest is 0
  };

  static double ValueOf(const Wanted& wanted) {
    return static_cast<double>(Ordered::ValueOf(wanted.prefix));
  }

  void Add(Key key) {
    const auto digit = static_cast<std::size_t>(key >> shift_) % kDigits;
    if (isFirst_) {
      ++counts_[digit];
      return;
    }
    if constexpr (kPasses > 1) {
      const auto prefix = static_cast<Key>(key >> shiftOfPrefixes_);
      const auto at = std::lower_bound(prefixes_.begin(), prefixes_.end(), prefix);
      if (at == prefixes_.end() || *at != prefix) return;
      ++counts_[static_cast<std::size_t>(at - prefixes_.begin()) * kDigits + digit];
    }
  }

  std::size_t TableOf(Key key) const {
    const auto prefix = static_cast<Key>(key >> shiftOfPrefixes_);
    return static_cast<std::size_t>(std::lower_bound(prefixes_.begin(), prefixes_.end(), prefix) -
                                    prefixes_.begin());
  }

  /// The two ranks of each percentage, known with the number of values.
  void ChooseRanks() {
    total_ = 0;
    for (const std::uint64_t count : counts_) total_ += count;
    if (total_ == 0) return;
    for (const double percent : percents_) {
      const QuantileRank place(static_cast<double>(total_), percent);
      const std::uint64_t last = total_ - 1;
      wanted_.push_back({std::min(place.rank, last), 0});
      wanted_.push_back({std::min(place.NextRank(), last), 0});
    }
  }

  const std::vector<double>& percents_;
  std::vector<Wanted> wanted_;  // two for each percentage; none without a valid value
  std::vector<Key> prefixes_;   // of wanted_, shifted down, in order, each once
  unsigned shift_ = 0;          // of the digit of this pass
  unsigned shiftOfPrefixes_ = 0;
  bool isFirst_ = true;
  std::uint64_t total_ = 0;
  std::vector<std::uint64_t> counts_;  // tables of digits, one for each prefix
};

/// Reads bands once, and counts each on one thread at a time.
/// @param share  of the raster that is read; null for all of it.
template <typename T>
bool ReadPass(const RasterPtr<T>& raster, const Array<unsigned>& bands,
              std::vector<RankSearch<T>>& searches, const IPC& ipc, const Share* share) {
  const RasterIteratorStream<T> whole(raster, bands);
  if (share != nullptr && RasterIteratorShare<T>::IsEmpty(whole, *share)) return true;
  const RasterIteratorPtr<T> iterator(
      share != nullptr ? static_cast<RasterIterator<T>*>(new RasterIteratorShare<T>(whole, *share))
                       : new RasterIteratorStream<T>(raster, bands));
  TileProcess<> process("Percentiles", ipc);
  const auto slot = process.Read(iterator);
  process.Add("Percentiles", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag* abort) {
    const TilePtr<T> tile = slot.In(token);
    if (!tile || !tile->IsValid()) return false;
    const BlockStrides strides(tile->Order(), tile->Width(), tile->Height(), tile->Bands());
    const T* const pixels = tile->PixelArray().GetData();
    const unsigned char* const states = std::as_const(*tile).StateArray().GetData();
    ParallelFor(static_cast<unsigned>(searches.size()), abort, [&](unsigned band) {
      for (std::size_t line = 0; line < tile->Height(); ++line) {
        const std::size_t first = band * strides.band + line * strides.line;
        searches[band].Count(pixels + first, states + first, strides.pixel, tile->Width());
      }
    });
    return true;
  });
  process.Close();
  const bool hasRun = process.RunProcess(process.kHere);
  if (hasRun && !ipc.abort->IsSet()) return true;
  SetFault(hasRun ? String("the computation was aborted") : process.GetFault());
  return false;
}

/// The tables of passes that were done in shares, and of the one that is being done.
class PassTables {
 public:
  /// @param passes  over the raster in all.
  PassTables(const PercentileShares& shares, unsigned passes)
      : shares_(shares),
        passes_(passes),
        parts_(shares.hasShare ? shares.share.count
                               : static_cast<unsigned>(shares.files.size() / passes)),
        done_(parts_ == 0 ? 0 : static_cast<unsigned>(shares.files.size() / parts_)) {}

  /// Opens all files.
  bool Open() {
    const bool fits = shares_.files.size() == std::size_t{done_} * parts_ &&
                      (shares_.hasShare ? done_ < passes_ : done_ == 0 || done_ == passes_);
    if (!fits) {
      SetFault("the files are not those of all shares of whole passes");
      return false;
    }
    readers_.resize(shares_.files.size());
    for (unsigned i = 0; i < readers_.size(); ++i) {
      if (!readers_[i].Open(shares_.files[i], KeyOf(i / parts_), {i % parts_, parts_}))
        return false;
    }
    return true;
  }

  bool Has(unsigned pass) const { return pass < done_; }
  /// The pass behind the last that is wanted.
  unsigned GetEnd() const { return shares_.hasShare ? done_ + 1 : passes_; }
  ShareWriter& Out() { return out_; }

  template <typename Search>
  bool Restore(unsigned pass, std::vector<Search>& searches) {
    for (std::size_t i = std::size_t{pass} * parts_; i < std::size_t{pass + 1} * parts_; ++i) {
      for (Search& search : searches) {
        if (search.Restore(readers_[i])) continue;
        SetShareFault(shares_.files[i]);
        return false;
      }
    }
    return true;
  }

  /// Writes the file of the share; looks whether all of the others was taken.
  bool Close() {
    for (std::size_t i = 0; i < readers_.size(); ++i) {
      if (readers_[i].IsAtEnd()) continue;
      SetShareFault(shares_.files[i]);
      return false;
    }
    return !shares_.hasShare || out_.Write(shares_.file, KeyOf(done_), shares_.share);
  }

 private:
  std::string KeyOf(unsigned pass) const { return fmt::format("{} pass {}", shares_.key, pass); }

  const PercentileShares& shares_;
  const unsigned passes_;
  const unsigned parts_;
  const unsigned done_;  // passes
  std::vector<ShareReader> readers_;
  ShareWriter out_;
};

}  // namespace

unsigned PercentilePasses(unsigned dataType) {
  unsigned passes = 1;
  DispatchType(TenTypes{}, dataType, [&]<typename T>() {
    passes = RankSearch<T>::kPasses;
    return true;
  });
  return passes;
}

template <typename T>
bool ComputePercentiles(const RasterPtr<T>& raster, const std::vector<unsigned>& bands,
                        const std::vector<double>& percents, const IPC& ipc,
                        std::vector<double>& result, const PercentileShares& shares) {
  using Search = RankSearch<T>;
  result.assign(bands.size() * percents.size(), std::nan(""));
  PassTables tables(shares, Search::kPasses);
  if (!tables.Open()) return false;
  const std::size_t tableCount = Search::kPasses == 1 ? 1 : 2 * percents.size();
  const std::size_t tableBytes = tableCount * Search::kDigits * sizeof(std::uint64_t);
  const std::size_t atOnce = std::max<std::size_t>(1, kTableBudget / tableBytes);
  for (std::size_t first = 0; first < bands.size(); first += atOnce) {
    const std::size_t count = std::min(atOnce, bands.size() - first);
    Array<unsigned> group{ArrayDims(static_cast<unsigned>(count))};
    std::copy_n(bands.begin() + static_cast<std::ptrdiff_t>(first), count, group.begin());
    std::vector<Search> searches(count, Search(percents));
    for (unsigned pass = 0; pass < tables.GetEnd(); ++pass) {
      for (Search& search : searches) search.BeginPass(pass);
      if (tables.Has(pass)) {
        if (!tables.Restore(pass, searches)) return false;
      } else if (!ReadPass(raster, group, searches, ipc,
                           shares.hasShare ? &shares.share : nullptr)) {
        return false;
      }
      if (shares.hasShare && !tables.Has(pass)) {
        for (const Search& search : searches) search.Store(tables.Out());
      } else {
        for (Search& search : searches) search.EndPass();
      }
    }
    for (std::size_t i = 0; !shares.hasShare && i < count; ++i) {
      searches[i].Write(&result[(first + i) * percents.size()]);
    }
  }
  return tables.Close();
}

#define VEXG_PERCENTILES_ONE(T)                                                          \
  template bool ComputePercentiles<T>(const RasterPtr<T>&, const std::vector<unsigned>&, \
                                      const std::vector<double>&, const IPC&,            \
                                      std::vector<double>&, const PercentileShares&);
VEXG_FOR(TEN, VEXG_PERCENTILES_ONE);
#undef VEXG_PERCENTILES_ONE

}  // namespace lumo
