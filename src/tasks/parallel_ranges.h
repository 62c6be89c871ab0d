#pragma once

#include "tasks/parallel.h"

// Loops whose range is known when they are made. Each is a ParallelResult too.

namespace lumo {

/// The range 0 to count, for a loop, a reduction or a scan of one dimension.
template <typename Interface>
class CountedRange : public Interface, public ParallelResult {
 public:
  explicit CountedRange(unsigned count) : count_(count) {}
  unsigned Begin() const override { return 0; }
  unsigned End() const override { return count_; }

 private:
  unsigned count_;
};

using ArrayParallelFor = CountedRange<IParallelFor<unsigned>>;
template <typename R>
using ArrayParallelReduce = CountedRange<IParallelReduce<R, unsigned>>;
template <typename R>
using ArrayParallelScan = CountedRange<IParallelScan<R, unsigned>>;

/// The ranges 0 to each count, for a loop or a reduction of two dimensions.
template <typename Interface>
class CountedRange2 : public Interface, public ParallelResult {
 public:
  CountedRange2(unsigned count0, unsigned count1) : count0_(count0), count1_(count1) {}
  unsigned Begin0() const override { return 0; }
  unsigned Begin1() const override { return 0; }
  unsigned End0() const override { return count0_; }
  unsigned End1() const override { return count1_; }

 private:
  unsigned count0_;
  unsigned count1_;
};

using ArrayParallelFor2 = CountedRange2<IParallelFor2<unsigned>>;
template <typename R>
using ArrayParallelReduce2 = CountedRange2<IParallelReduce2<R, unsigned>>;

/// A loop over 0 to each count.
class ArrayParallelFor3 : public IParallelFor3<unsigned>, public ParallelResult {
 public:
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

/// A loop over a rectangle that may begin below 0.
class RangeParallelFor2 : public IParallelFor2<int>, public ParallelResult {
 public:
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
