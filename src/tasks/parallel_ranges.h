#pragma once

#include "tasks/parallel.h"

// Loops whose range is known when they are made. Each is a ParallelResult too.

namespace lumo {

/// A loop over 0 to count.
class ArrayParallelFor : public IParallelFor<unsigned>, public ParallelResult {
 public:
  explicit ArrayParallelFor(unsigned count) : count_(count) {}
  unsigned Begin() const override { return 0; }
  unsigned End() const override { return count_; }

 private:
  unsigned count_;
};

/// A loop over 0 to each count.
class ArrayParallelFor2 : public IParallelFor2<unsigned>, public ParallelResult {
 public:
  ArrayParallelFor2(unsigned count0, unsigned count1) : count0_(count0), count1_(count1) {}
  unsigned Begin0() const override { return 0; }
  unsigned Begin1() const override { return 0; }
  unsigned End0() const override { return count0_; }
  unsigned End1() const override { return count1_; }

 private:
  unsigned count0_;
  unsigned count1_;
};

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

/// A reduction over 0 to count.
template <typename R>
class ArrayParallelReduce : public IParallelReduce<R, unsigned>, public ParallelResult {
 public:
  explicit ArrayParallelReduce(unsigned count) : count_(count) {}
  unsigned Begin() const override { return 0; }
  unsigned End() const override { return count_; }

 private:
  unsigned count_;
};

/// A reduction over 0 to each count.
template <typename R>
class ArrayParallelReduce2 : public IParallelReduce2<R, unsigned>, public ParallelResult {
 public:
  ArrayParallelReduce2(unsigned count0, unsigned count1) : count0_(count0), count1_(count1) {}
  unsigned Begin0() const override { return 0; }
  unsigned Begin1() const override { return 0; }
  unsigned End0() const override { return count0_; }
  unsigned End1() const override { return count1_; }

 private:
  unsigned count0_;
  unsigned count1_;
};

/// A scan over 0 to count.
template <typename R>
class ArrayParallelScan : public IParallelScan<R, unsigned>, public ParallelResult {
 public:
  explicit ArrayParallelScan(unsigned count) : count_(count) {}
  unsigned Begin() const override { return 0; }
  unsigned End() const override { return count_; }

 private:
  unsigned count_;
};

}  // namespace lumo
