#pragma once

#include "tasks/parallel.h"

// Loops whose range is known when they are made. Each is a ParallelResult too.

namespace lumo {

/// The range 0 to count, for a loop, a reduction or a scan of one dimension.
template <typename Interface>
class CountedRange : public Interface, public ParallelResult {
 public:
  /// @param count  the end of the range; 0 for a loop that does nothing.
  explicit CountedRange(unsigned count) : count_(count) {}
  unsigned Begin() const override { return 0; }
  unsigned End() const override { return count_; }

 private:
  unsigned count_;
};

/// A loop over the elements of an array.
using ArrayParallelFor = CountedRange<IParallelFor<unsigned>>;
/// A reduction over the elements of an array to an R.
template <typename R>
using ArrayParallelReduce = CountedRange<IParallelReduce<R, unsigned>>;
/// A scan over the elements of an array with sums of R.
template <typename R>
using ArrayParallelScan = CountedRange<IParallelScan<R, unsigned>>;

/// The ranges 0 to each count, for a loop or a reduction of two dimensions.
template <typename Interface>
class CountedRange2 : public Interface, public ParallelResult {
 public:
  /// @param count0,count1  the ends of the dimensions; of pixels samples, then lines.
  CountedRange2(unsigned count0, unsigned count1) : count0_(count0), count1_(count1) {}
  unsigned Begin0() const override { return 0; }
  unsigned Begin1() const override { return 0; }
  unsigned End0() const override { return count0_; }
  unsigned End1() const override { return count1_; }

 private:
  unsigned count0_;
  unsigned count1_;
};

/// A loop over a rectangle.
using ArrayParallelFor2 = CountedRange2<IParallelFor2<unsigned>>;
/// A reduction over a rectangle to an R.
template <typename R>
using ArrayParallelReduce2 = CountedRange2<IParallelReduce2<R, unsigned>>;

/// A loop over 0 to each count.
class ArrayParallelFor3 : public IParallelFor3<unsigned>, public ParallelResult {
 public:
  /// @param count0,count1,count2  the ends of the dimensions; of pixels samples, lines, bands.
  ArrayParallelFor3(unsigned count0, unsigned count1, unsigned count2)
      : count0_(count0), count1_(count1), count2_(count2) {}
  unsigned Begin0() const override { return 0; }
  unsigned Begin1() const override { return 0; }
  unsigned Begin2() const override { return 0; }
  unsigned End0() const override { return count0_; }
  unsigned End1() const override { return count1_; }
  unsigned End2() const override { return count2_; }

 private:
  unsigned count0_;
  unsigned count1_;
  unsigned count2_;
};

/// A loop over a rectangle that may begin below 0, as a tile with borders does.
class RangeParallelFor2 : public IParallelFor2<int>, public ParallelResult {
 public:
  /// @param begin0,end0,begin1,end1  the range of each dimension, the ends excluded.
  RangeParallelFor2(int begin0, int end0, int begin1, int end1)
      : begin0_(begin0), end0_(end0), begin1_(begin1), end1_(end1) {}
  int Begin0() const override { return begin0_; }
  int Begin1() const override { return begin1_; }
  int End0() const override { return end0_; }
  int End1() const override { return end1_; }

 private:
  int begin0_;
  int end0_;
  int begin1_;
  int end1_;
};

}  // namespace lumo
