#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "foundation/run_controls.h"
#include "fx/seam_lines.h"
#include "fx/strip_drains.h"
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
class VEXG_EXPORT SeamlessWatershed {
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

  /// How many strips there are.
  unsigned Strips() const { return static_cast<unsigned>(strips_.size()); }
  /// The lines of a strip.
  std::uint32_t LinesOf(unsigned strip) const;
  std::uint32_t Width() const { return cut_.width; }

  /// Takes the levels of a strip; each strip once.
  bool AddStrip(unsigned strip, const StripLevels& from);

  /// Connects the strips, behind all of them. After an abort nothing may be asked any more.
  bool Connect(const AbortFlag* abort);

  /// How many minima there are. Labels go from 1 to this, in the order of their first pixels.
  std::uint32_t Count() const { return count_; }
  /// Labels are those above `first`, `count` of them, of the minima whose first pixel a strip has.
  struct Labels {
    std::uint32_t first = 0;
    std::uint32_t count = 0;
  };
  Labels LabelsOf(unsigned strip) const;
  /// For each label its number in the order of levels, and of first pixels where these are equal,
  /// which is the label that Watershed gives. Empties the list.
  std::vector<std::uint32_t> TakeRanks() { return std::move(ranks_); }

  /// Marks the basins, by label, that have pixels in the first line of a strip, but for the first
  /// strip. The edges of every other basin are those of one strip: ForEachStripEdge.
  bool MarkSeamBasins(std::vector<bool>& marks) const;

  /// Labels a strip: 0 for excluded pixels.
  bool Label(unsigned strip, std::int32_t* labels) const;
  /// Reads the labels of the line above a strip, or below it. @param line  [out] empty where there
  /// is none.
  bool ReadLabelsAbove(unsigned strip, std::vector<std::int32_t>& line) const;
  bool ReadLabelsBelow(unsigned strip, std::vector<std::int32_t>& line) const;

 private:
  /// A plateau, or the part of one in a strip, without a way down inside.
  struct Minimum {
    std::uint32_t first;  // pixel of the strip
    std::int32_t level;
  };

  struct Strip {
    std::vector<Minimum> minima;  // where they are ranked
    // The distances of the line above or below have become others since they were looked at.
    bool isAboveNew = true, isBelowNew = true;
    std::uint32_t minimumCount = 0;
    std::uint32_t firstNumber = 0;  // of its minima, among those of all strips
    std::size_t firstPart = 0;      // of its parts, among those of all
    std::uint32_t firstLabel = 0;   // less 1: that of its first minimum
  };

  /// A minimum of a strip that is part of one that began before.
  struct Part {
    std::uint32_t number;  // among the minima of all strips
    std::uint32_t label;   // in front of NumberMinima the number of the whole
  };

  using Join = std::pair<std::uint32_t, std::uint32_t>;  // numbers of parts of one minimum

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
  void FindParts(const std::vector<Join>& joins);
  void NumberMinima();
  void RankMinima();
  std::uint32_t LabelOf(unsigned strip, std::uint32_t minimum) const;
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
  std::vector<Part> parts_;           // by number
  std::vector<std::uint32_t> ranks_;  // by label
  std::uint32_t count_ = 0;
  mutable ScratchPool<StripDrains> drains_;
};

}  // namespace lumo
