#pragma once

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Labels the minima of an image that were found strip by strip, where a minimum may be cut into
/// parts: from 1 on, in the order of their first pixels. A minimum or a part has a number: its
/// place among those of all strips, from 0.
///
/// Memory: 8 bytes for each part that is not the first of its minimum. Threads: one at a time;
/// behind Connect any number may ask.
///
///     for (...) if (!numbers.AddStrip(minimaOf(strip))) return false;
///     numbers.Connect(joins);
///     numbers.LabelOf(strip, 0);
class VEXG_EXPORT MinimumNumbers {
 public:
  /// The numbers of two parts of one minimum.
  using Join = std::pair<std::uint32_t, std::uint32_t>;
  /// Labels are those above `first`, `count` of them, of the minima whose first pixel a strip has.
  struct Labels {
    std::uint32_t first = 0;
    std::uint32_t count = 0;
  };

  /// Forgets all strips.
  void Clear() { *this = {}; }
  /// Takes how many minima and parts the next strip has. False, with the fault set, where they are
  /// more than labels have numbers.
  bool AddStrip(std::uint32_t minima);
  /// The number of the first minimum of a strip, behind AddStrip of it.
  std::uint32_t FirstNumberOf(unsigned strip) const { return strips_[strip].firstNumber; }
  /// Finds which parts are one minimum, and gives labels. Behind all strips.
  void Connect(const std::vector<Join>& joins);

  /// How many minima there are.
  std::uint32_t Count() const { return count_; }
  Labels LabelsOf(unsigned strip) const;
  /// The label of a minimum of a strip, counted there from 0.
  std::uint32_t LabelOf(unsigned strip, std::uint32_t minimum) const;

  /// Gives the labels of the minima of a strip one after the other.
  class Walk {
   public:
    Walk(const MinimumNumbers& numbers, unsigned strip);
    std::uint32_t Next();

   private:
    const MinimumNumbers& numbers_;
    std::size_t part_;
    std::uint32_t number_;
    std::uint32_t label_;
  };

  /// Ranks minima by levels, and by first pixels where these are equal.
  class Ranking {
   public:
    explicit Ranking(const MinimumNumbers& numbers);
    /// Takes the level of the next minimum or part, of all strips in their order.
    void Add(std::int32_t level);
    /// Gives for each label its rank, from 1.
    std::vector<std::uint32_t> Finish();

   private:
    const MinimumNumbers& numbers_;
    std::size_t part_ = 0;
    std::uint32_t number_ = 0;
    std::vector<std::uint64_t> keys_;
  };

 private:
  struct Strip {
    std::uint32_t minima = 0;
    std::uint32_t firstNumber = 0;
    std::size_t firstPart = 0;     // of its parts, among those of all
    std::uint32_t firstLabel = 0;  // less 1: that of its first minimum
  };

  /// A minimum of a strip that is part of one that began before.
  struct Part {
    std::uint32_t number;
    std::uint32_t label;  // in front of GiveLabels the number of the whole
  };

  void FindParts(const std::vector<Join>& joins);
  void GiveLabels();
  bool IsPart(std::size_t part, std::uint32_t number) const {
    return part < parts_.size() && parts_[part].number == number;
  }

  std::vector<Strip> strips_;
  std::vector<Part> parts_;  // by number
  std::uint32_t count_ = 0;
};

}  // namespace lumo
