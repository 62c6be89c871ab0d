#pragma once

#include <algorithm>
#include <cstdint>
#include <string>
#include <vector>

#include "commands/share_file.h"

namespace lumo {

// A seamless segmentation is done in shares of whole lines, in three rounds:
//
// 1. each share finds the drains of its lines as they are without the others, and its SeamStrip;
// 2. each settles the edges of all shares, and finds the final drains of its own lines, its minima,
//    and where the pixels at its edges drain to;
// 3. each connects the edges of all, labels its lines, and adds up their basins and neighbours.
//
// The files of the second and the third round are what merging needs.

/// The rounds of shares.
inline constexpr unsigned kSegmentRounds = 3;

/// How the lines of a raster are cut into shares: all have as many, but for the last ones, which
/// may have fewer, or none. The lines of a share are read in strips.
struct ShareCut {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint32_t shareLines = 1;
  std::uint32_t stripLines = 1;  ///< a part of shareLines without a rest

  /// @param mostLines  of a strip.
  static ShareCut Of(std::uint32_t width, std::uint32_t height, std::uint32_t shares,
                     std::uint32_t mostLines) {
    const auto parts = [](std::uint32_t lines, std::uint32_t of) { return (lines - 1) / of + 1; };
    const std::uint32_t lines = parts(height, shares);
    const std::uint32_t strips = parts(lines, std::max(mostLines, 1U));
    const std::uint32_t stripLines = parts(lines, strips);
    return {width, height, stripLines * strips, stripLines};
  }

  /// How many shares have lines.
  unsigned Shares() const { return (height - 1) / shareLines + 1; }
  std::uint32_t FirstLineOf(unsigned share) const {
    return static_cast<std::uint32_t>(
        std::min<std::uint64_t>(std::uint64_t{share} * shareLines, height));
  }
  std::uint32_t LinesOf(unsigned share) const {
    return FirstLineOf(share + 1) - FirstLineOf(share);
  }
  std::size_t PixelsOf(unsigned share) const { return std::size_t{width} * LinesOf(share); }
};

/// The files of the shares of a segmentation, as far as they are there.
///
/// Failure: false, with the fault set.
class VEXG_EXPORT SegmentShares {
 public:
  /// @param key    says of what rasters and inputs the shares are.
  /// @param count  how many shares there are.
  /// @param files  those of all shares of the first round, of the second one, ...
  SegmentShares(std::string key, unsigned count, std::vector<std::string> files)
      : key_(std::move(key)), count_(count), files_(std::move(files)) {}

  unsigned Count() const { return count_; }
  /// The rounds whose files are there.
  unsigned Rounds() const { return static_cast<unsigned>(files_.size()) / count_; }

  /// Opens a section of the file of a share.
  bool Open(unsigned round, unsigned share, std::uint64_t section, ShareReader& reader) const {
    return reader.Open(PathOf(round, share), KeyOf(round), {share, count_}, section);
  }
  /// Sets the fault for a file that doesn't hold what it should. @return false.
  bool Refuse(unsigned round, unsigned share) const {
    SetShareFault(PathOf(round, share));
    return false;
  }
  /// Makes the file of a share of the next round.
  bool Write(ShareWriter& made, const std::string& path, unsigned share) const {
    return made.Write(path, KeyOf(Rounds()), {share, count_});
  }

 private:
  std::string KeyOf(unsigned round) const { return key_ + " round " + std::to_string(round); }
  const std::string& PathOf(unsigned round, unsigned share) const {
    return files_[std::size_t{round} * count_ + share];
  }

  std::string key_;
  unsigned count_;
  std::vector<std::string> files_;
};

/// Puts numbers with how many they are in front, and reads them again. Of the latter false where
/// they aren't there.
template <typename T>
void PutList(ShareWriter& to, const std::vector<T>& numbers) {
  to.Put(std::uint64_t{numbers.size()});
  to.PutAll(numbers.data(), numbers.size());
}
template <typename T>
bool GetList(ShareReader& from, std::vector<T>& numbers) {
  std::uint64_t count = 0;
  if (!from.Get(count) || count > from.Left() / sizeof(T)) return false;
  numbers.resize(count);
  return from.GetAll(numbers.data(), count);
}

}  // namespace lumo
