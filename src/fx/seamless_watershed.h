#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "foundation/run_controls.h"
#include "fx/basin_labels.h"
#include "fx/seam_lines.h"
#include "fx/strip_ways.h"
#include "platform/random_access_file.h"
#include "tasks/scratch_pool.h"

namespace lumo {

/// Labels the catchment basins of an image of any size, strip by strip: the same basins as
/// Watershed on the whole, for any height of the strips.
///
/// Which neighbour a pixel drains to depends on its own neighbours alone, but on plateaus also on
/// how far lower ground is. So every strip finds these distances from its own lower ground, and
/// from the distances in the lines that border on it; strips whose neighbours came nearer begin
/// again, until none does. Plateaus without a way down are joined where strips meet, and the pixels
/// there are followed to the minima that they drain to. Then every strip can be labelled on its
/// own.
///
/// Cost: in a file without a name a byte a pixel, read and written twice and read once for each
/// labelling, and 17 for a pixel of each strip's width; in memory 24 bytes a minimum that strips
/// meet in, a few bytes a pixel of the strips that are worked on, and where minima are ranked 20
/// bytes for each of them. Threads: AddStrip, Label and ReadLabels may be called for several strips
/// at once; Connect works on all threads. Failure: false, with the fault set.
///
///     SeamlessWatershed watershed;
///     if (!watershed.Begin({width, height, 64})) return false;
///     for (unsigned strip = 0; strip < watershed.Strips(); ++strip) {
///       if (!watershed.AddStrip(strip, LevelsOf(strip))) return false;
///     }
///     if (!watershed.Connect(nullptr) || !watershed.Label(0, labels.data())) return false;
class VEXG_EXPORT SeamlessWatershed final : public BasinLabels {
 public:
  /// How an image is cut: the last strip may be lower.
  struct Cut {
    std::uint32_t width = 0;
    std::uint32_t height = 0;
    std::uint32_t stripLines = 0;
    bool isRanked = true;  ///< there shall be TakeRanks
  };

  /// The levels of a strip, with one line above and one below it where the image has them.
  struct StripLevels {
    const std::int32_t* levels = nullptr;    ///< from the first line on, that above included
    const std::uint8_t* excluded = nullptr;  ///< like `levels`; null when no pixel is
  };

  /// Takes an image of one pixel or more, and forgets the last one.
  bool Begin(const Cut& cut);

  unsigned Strips() const override { return static_cast<unsigned>(strips_.size()); }
  std::uint32_t LinesOf(unsigned strip) const override;
  std::uint32_t Width() const override { return cut_.width; }

  /// Takes the levels of a strip; each strip once.
  bool AddStrip(unsigned strip, const StripLevels& from);

  /// Connects the strips, behind all of them. After an abort nothing may be asked any more.
  bool Connect(const AbortFlag* abort);

  std::uint32_t Count() const override { return numbers_.Count(); }
  using Labels = MinimumNumbers::Labels;
  /// The labels of the minima whose first pixel a strip has.
  Labels LabelsOf(unsigned strip) const { return numbers_.LabelsOf(strip); }
  std::vector<std::uint32_t> TakeRanks() override { return std::move(ranks_); }

  /// Marks the basins, by label, that have pixels in the first line of a strip, but for the first
  /// strip. The edges of every other basin are those of one strip: ForEachStripEdge.
  bool MarkSeamBasins(std::vector<bool>& marks) const override;

  bool Label(unsigned strip, std::int32_t* labels) const override;
  bool ReadLabelsAbove(unsigned strip, std::vector<std::int32_t>& line) const override;
  bool ReadLabelsBelow(unsigned strip, std::vector<std::int32_t>& line) const override;

 private:
  struct Strip {
    std::vector<StripMinimum> minima;  // where they are ranked
    // The distances of the line above or below have become others since they were looked at.
    bool isAboveNew = true, isBelowNew = true;
    std::uint32_t minimumCount = 0;
  };

  using Join = MinimumNumbers::Join;

  /// The distances in the lines beside a strip.
  struct Beside {
    std::vector<std::uint32_t> above, below;
    StripDrains::Beyond Distances() const {
      return {above.empty() ? nullptr : above.data(), below.empty() ? nullptr : below.data()};
    }
  };

  bool HasBelow(unsigned strip) const { return strip + 1 < strips_.size(); }
  std::vector<unsigned> AllStrips() const;
  bool ReadBeside(unsigned strip, Beside& beside) const;
  bool IsNearer(unsigned upper, bool isUpward, bool& isNearer) const;
  bool ComesNearer(unsigned strip, bool& comes);
  bool Settle(const AbortFlag* abort);
  bool Drain(unsigned strip);
  bool FindWays(unsigned strip);
  bool FindAllWays(const AbortFlag* abort, std::vector<Join>& joins);
  bool ListJoins(unsigned strip, std::vector<Join>& joins) const;
  void RankMinima();
  bool NameSeam(unsigned strip, bool& isOpen);
  bool FollowSeams(const AbortFlag* abort);
  bool ReadCells(unsigned strip, StripDrains& drains) const;
  bool WriteCells(unsigned strip, const std::vector<StripDrains::Cell>& cells);
  template <typename Work>
  bool ForEachStrip(const std::vector<unsigned>& strips, const AbortFlag* abort, const Work& work);

  Cut cut_;
  std::unique_ptr<platform::RandomAccessFile> file_;  // cells, and behind them the lines
  SeamLines lines_;
  std::vector<Strip> strips_;
  MinimumNumbers numbers_;
  std::vector<std::uint32_t> ranks_;  // by label
  mutable ScratchPool<StripDrains> drains_;
};

}  // namespace lumo
