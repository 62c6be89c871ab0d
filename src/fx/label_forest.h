#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <vector>

#include "platform/random_access_file.h"

namespace lumo {

/// Says which labels have become one, and numbers what they have become, from 1 in the order in
/// which it is asked for. Four bytes a label, of which only so many stay in memory as are wanted,
/// and the others in a file without a name: labels that are near each other in an image are near
/// each other here.
///
/// Cost: a look into memory, where the labels asked for lie near those of before.
/// Threads: one at a time. Failure: the file that can't be made, written or read makes it not well,
///          with the fault set; answers are then of no use.
///
///     forest.Begin(labelCount, bytes);
///     forest.Join(7, 3);                        // 7 has become part of 3
///     if (forest.NumberOf(7) == 1 && forest.IsWell()) ...
class VEXG_EXPORT LabelForest {
 public:
  /// The bytes that stay in memory where nobody says how many.
  static constexpr std::uint64_t kBytes = std::uint64_t{64} << 20U;

  /// Makes each label below `labelCount` one by itself. At most 2^31 of them.
  void Begin(std::uint64_t labelCount, std::uint64_t bytes = kBytes);

  /// Makes a label part of another one; both stand for themselves until then, and have no number.
  void Join(std::uint32_t label, std::uint32_t other) {
    At(label) = other;
    ++joins_;
  }
  /// How many joins there were, each of which makes one fewer.
  std::uint64_t Joins() const { return joins_; }

  /// The label that stands for what a label has become. Not 0, and not one that has a number.
  std::uint32_t RootOf(std::uint32_t label);
  /// The number of what a label has become; 0 for 0.
  std::uint32_t NumberOf(std::uint32_t label) {
    if (label == 0) return 0;
    const std::uint32_t held = At(label);
    return (held & kNumbered) != 0 ? held & ~kNumbered : FindNumber(label);
  }

  bool IsWell() const { return isWell_; }

 private:
  static constexpr unsigned kPageBits = 14;
  static constexpr std::uint32_t kPageLabels = 1U << kPageBits;
  static constexpr std::uint32_t kNumbered = 1U << 31U;  // of what is held: a number, not a label

  /// The label that a label has become part of, 0 where that is itself, or its number.
  std::uint32_t& At(std::uint32_t label) {
    std::uint32_t* const page = pages_[label >> kPageBits];
    return page != nullptr ? page[label & (kPageLabels - 1)] : Fetch(label);
  }
  std::uint32_t& Fetch(std::uint32_t label);
  std::unique_ptr<std::uint32_t[]> MakeRoom();
  std::uint32_t FindNumber(std::uint32_t label);
  void Fail(const std::string& fault);

  std::vector<std::uint32_t*> pages_;  // those in memory
  std::vector<bool> isInFile_;         // by page
  std::size_t mostPages_ = 0;          // in memory at once
  struct Frame {
    std::size_t page;
    std::unique_ptr<std::uint32_t[]> labels;
  };
  std::deque<Frame> frames_;  // as they came
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::uint32_t numbers_ = 0;
  std::uint64_t joins_ = 0;
  bool isWell_ = true;
  std::uint32_t none_ = 0;  // what is held of labels that can't be fetched
};

}  // namespace lumo
