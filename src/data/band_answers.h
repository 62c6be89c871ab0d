#pragma once

#include <algorithm>
#include <mutex>
#include <vector>

namespace lumo {

/// Keeps the answers of a source to a question about each band. Where bands are asked about one
/// after another, many of them are asked ahead in one call, since each call crosses to the source's
/// thread and back. Until kPatience bands in a row every question is a call of its own.
///
/// Threads: any number of threads may ask; one waits while another asks the source.
template <typename Value>
class BandAnswers {
 public:
  /// Bands in a row after which answers are asked ahead.
  static constexpr unsigned kPatience = 64;
  static constexpr unsigned kAhead = 4096;  ///< bands of one call at most

  /// Gives the answer for a band.
  /// @param ask  ask(first, count) gives the answers for `count` bands from `first`, or for fewer
  ///             where there are no more; none when the source can't be asked.
  template <typename Ask>
  Value Get(unsigned band, const Ask& ask) {
    const std::lock_guard lock(mutex_);
    inRow_ = inRow_ != 0 && band == next_ ? inRow_ + 1 : 1;
    next_ = band + 1;
    const bool isHeld = band >= first_ && band - first_ < answers_.size();
    if (inRow_ <= kPatience) {
      answers_ = ask(band, 1);
      first_ = band;
    } else if (!isHeld) {
      answers_ = ask(band, kAhead);
      first_ = band;
    }
    return answers_.empty() ? Value() : Value(answers_[band - first_]);
  }

  /// Forgets what was asked ahead, after a change of the source.
  void Forget() {
    const std::lock_guard lock(mutex_);
    answers_.clear();
    inRow_ = 0;
  }

 private:
  std::mutex mutex_;
  unsigned next_ = 0;   // the band after the last one asked about
  unsigned inRow_ = 0;  // how many bands were asked about in a row
  unsigned first_ = 0;  // the band of the first answer
  std::vector<Value> answers_;
};

}  // namespace lumo
