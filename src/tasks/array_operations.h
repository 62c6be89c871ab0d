#pragma once

#include <cmath>
#include <utility>

#include "foundation/array.h"
#include "foundation/errors.h"
#include "foundation/point.h"
#include "tasks/parallel_ranges.h"

// Operations on whole arrays as parallel loops. Each is a body for a runner of parallel.h; the
// functions at the end of a group make the body, run it and give the result.

namespace lumo {

// One operand and a constant ----------------------------------------------------------------------

/// Rounds down, then to an integer. A value outside the range of int has no defined result.
struct UnOpClassFloor {
  int operator()(double value) const { return static_cast<int>(std::floor(value)); }
};

/// Sets the bits of a code in a byte, as a state bit is set in the states of a tile.
struct BinOpASClassOr {
  unsigned char code;
  /// The byte with the bits of `code` set as well.
  unsigned char operator()(unsigned char value) const { return value | code; }
};

/// Keeps the bits of a mask in a byte, and clears the others.
struct BinOpASClassAnd {
  int mask;
  unsigned char operator()(unsigned char value) const {
    return static_cast<unsigned char>(value & mask);
  }
};

/// Applies an operation to each element: result[i] = operation(a[i]), over the smaller of the two
/// counts. Both arrays outlive the loop, and are not resized.
template <typename R, typename T, typename Op>
class UnaryOperationArray final : public ArrayParallelFor {
 public:
  UnaryOperationArray(const Array<T>& a, const Op& operation, Array<R>& result)
      : ArrayParallelFor(std::min(a.GetCount(), result.GetCount())),
        a_(a),
        operation_(operation),
        result_(result) {}

  void Body(unsigned begin, unsigned end) override {
    if (Failed()) return;
    for (unsigned i = begin; i < end; ++i) result_[i] = operation_(a_[i]);
  }

 private:
  const Array<T>& a_;
  Op operation_;
  Array<R>& result_;
};

/// Makes an array of the shape of `a` with `operation` of each element.
///
///     const Array<int> whole = ApplyToArray<int>(heights, UnOpClassFloor());
///
/// @param operation  is called on many threads at once, on a copy that the loop keeps.
/// @param grain      elements of a part at least; 0 leaves it to the engine.
/// @return an array with ObjectErrorOutOfMemory stored when it could not be sized.
template <typename R, typename T, typename Op>
Array<R> ApplyToArray(const Array<T>& a, const Op& operation, unsigned grain = 0) {
  Array<R> result(a.GetDims());
  UnaryOperationArray<R, T, Op> loop(a, operation, result);
  RunParallelFor(loop, grain);
  return result;
}

// Matrices ----------------------------------------------------------------------------------------

/// result = A times B, for matrices of GetExtent(0) rows by GetExtent(1) columns, either of which
/// may be taken transposed. Products are added in the order of the inner index.
/// Failure: dimensions that do not fit set ParallelError here and MatirxErrorBadDims on `result`,
/// and nothing is computed.
template <typename T, typename U, typename V, bool kTransposeA, bool kTransposeB>
class ParallelMatrixProduct final : public ArrayParallelFor2 {
 public:
  ParallelMatrixProduct(const Array<T>& a, const Array<U>& b, Array<V>& result)
      : ArrayParallelFor2(a.GetExtent(kTransposeA ? 1 : 0), b.GetExtent(kTransposeB ? 0 : 1)),
        a_(a),
        b_(b),
        result_(result),
        inner_(a.GetExtent(kTransposeA ? 0 : 1)) {
    const bool filled = a.GetCount() != 0 && b.GetCount() != 0 && result.GetCount() != 0;
    if (filled && inner_ == b.GetExtent(kTransposeB ? 1 : 0) && result.GetExtent(0) == End0() &&
        result.GetExtent(1) == End1()) {
      return;
    }
    Fail();
    result.SetErrorState(MatirxErrorBadDims());
  }

  void Body(unsigned begin0, unsigned end0, unsigned begin1, unsigned end1) override {
    if (Failed()) return;
    for (unsigned i = begin0; i < end0; ++i) {
      for (unsigned j = begin1; j < end1; ++j) {
        V& element = result_[std::size_t{i} * result_.GetExtent(1) + j];
        element = V();
        for (unsigned k = 0; k < inner_; ++k) {
          element += static_cast<double>(At<kTransposeA>(a_, i, k)) *
                     static_cast<double>(At<kTransposeB>(b_, k, j));
        }
      }
    }
  }

 private:
  template <bool kTransposed, typename E>
  static E At(const Array<E>& matrix, std::size_t row, std::size_t column) {
    return kTransposed ? matrix[column * matrix.GetExtent(1) + row]
                       : matrix[row * matrix.GetExtent(1) + column];
  }

  const Array<T>& a_;
  const Array<U>& b_;
  Array<V>& result_;
  unsigned inner_;
};

/// A times B.
template <typename T, typename U, typename V>
using ParallelMatrixMultiply = ParallelMatrixProduct<T, U, V, false, false>;
/// A transposed, times B.
template <typename T, typename U, typename V>
using ParallelMatrixMultiplyTA = ParallelMatrixProduct<T, U, V, true, false>;
/// A times B transposed.
template <typename T, typename U, typename V>
using ParallelMatrixMultiplyTB = ParallelMatrixProduct<T, U, V, false, true>;
/// A transposed, times B transposed.
template <typename T, typename U, typename V>
using ParallelMatrixMultiplyTAB = ParallelMatrixProduct<T, U, V, true, true>;

/// Which operands of a product are taken transposed.
enum class MatrixMode : unsigned { kPlain = 0, kTA = 1, kTB = 2, kTAB = 3 };

/// Makes the product of two matrices, of rows of A by columns of B, each as `mode` takes it. Its
/// cost is rows times columns times the inner extent.
/// @param grain  rows and columns of a part at least; 0 leaves it to the engine.
/// @return an array that holds MatirxErrorBadDims when the inner extents differ.
VEXG_EXPORT Array<double> MultiplyMatrices(const Array<double>& a, const Array<double>& b,
                                           MatrixMode mode = MatrixMode::kPlain,
                                           unsigned grain = 0);

// Extremes, sums and distinct values --------------------------------------------------------------

/// Finds the index of the largest element; of equal ones the lowest, and 0 for an empty array.
///
///     ParallelArrayMax<double> loop(values);
///     unsigned largest = 0;
///     RunParallelReduce(loop, largest);
template <typename T>
class ParallelArrayMax final : public ArrayParallelReduce<unsigned> {
 public:
  explicit ParallelArrayMax(const Array<T>& values)
      : ArrayParallelReduce<unsigned>(values.GetCount()), values_(values) {}

  unsigned Identity() override { return 0; }
  void Join(unsigned& left, const unsigned& right) override {
    if (values_[right] > values_[left]) left = right;
  }
  unsigned Accumulate(unsigned begin, unsigned end) override {
    unsigned best = 0;
    for (unsigned i = begin; i < end; ++i) Join(best, i);
    return best;
  }

 private:
  const Array<T>& values_;
};

/// Finds the indices of the smallest and of the largest element, in this order; of equal ones the
/// lowest, and 0 for an empty array.
template <typename T>
class ParallelArrayMinMax final : public ArrayParallelReduce<std::pair<unsigned, unsigned>> {
 public:
  using Indices = std::pair<unsigned, unsigned>;
  explicit ParallelArrayMinMax(const Array<T>& values)
      : ArrayParallelReduce<Indices>(values.GetCount()), values_(values) {}

  Indices Identity() override { return {0, 0}; }
  void Join(Indices& left, const Indices& right) override {
    if (values_[right.first] < values_[left.first]) left.first = right.first;
    if (values_[right.second] > values_[left.second]) left.second = right.second;
  }
  Indices Accumulate(unsigned begin, unsigned end) override {
    Indices best = Identity();
    for (unsigned i = begin; i < end; ++i) Join(best, {i, i});
    return best;
  }

 private:
  const Array<T>& values_;
};

/// Adds up all elements as values of U. The joins follow a fixed cut, so a sum of floating-point
/// numbers has the same bits for any number of threads.
template <typename T, typename U>
class ParallelArrayTotal final : public ArrayParallelReduce<U> {
 public:
  explicit ParallelArrayTotal(const Array<T>& values)
      : ArrayParallelReduce<U>(values.GetCount()), values_(values) {}

  U Identity() override { return U(); }
  void Join(U& left, const U& right) override { left += right; }
  U Accumulate(unsigned begin, unsigned end) override {
    U sum = U();
    for (unsigned i = begin; i < end; ++i) sum += values_[i];
    return sum;
  }

 private:
  const Array<T>& values_;
};

/// Finds where distinct values begin: `order` lists positions of `values` in sorted order, and
/// `out`, at least as long, receives those of its entries at which a new value starts. The scan's
/// sum is how many there are. An `out` that is too short sets ParallelError, and nothing is
/// written.
template <typename T>
class ParallelArrayUnsortedUnique final : public ArrayParallelScan<unsigned> {
 public:
  ParallelArrayUnsortedUnique(const Array<T>& values, const Array<unsigned>& order,
                              Array<unsigned>& out)
      : ArrayParallelScan<unsigned>(order.GetCount()), values_(values), order_(order), out_(out) {
    if (out.GetCount() < order.GetCount()) Fail();
  }

  unsigned Identity() override { return 0; }
  void Join(unsigned& sum, const unsigned& right) override { sum += right; }
  void Assign(unsigned& sum, const unsigned& value) override { sum = value; }

  unsigned PreScan(unsigned begin, unsigned end, const unsigned& sum) override {
    unsigned count = sum;
    if (Failed()) return count;
    for (unsigned i = begin; i < end; ++i) count += IsNew(i);
    return count;
  }
  unsigned FinalScan(unsigned begin, unsigned end, const unsigned& sum) override {
    unsigned count = sum;
    if (Failed()) return count;
    for (unsigned i = begin; i < end; ++i) {
      if (IsNew(i)) out_[count++] = order_[i];
    }
    return count;
  }

 private:
  bool IsNew(unsigned i) const { return i == 0 || !(values_[order_[i - 1]] == values_[order_[i]]); }

  const Array<T>& values_;
  const Array<unsigned>& order_;
  Array<unsigned>& out_;
};

// Interpolation -----------------------------------------------------------------------------------

/// Interpolates bilinearly in a table of rows by columns at positions (x[i] along the rows, y[i]
/// along the columns), in elements from the first, clamped to the table. A NaN position reads at 0.
/// @param out  sized to the positions.
/// Failure: a table that is not of rank 2, or positions of different counts, set ParallelError here
///          and ArrayErrorInvalidArray on `out`.
template <typename T>
class ParallelLinearInterpolate2 final : public ArrayParallelFor {
 public:
  ParallelLinearInterpolate2(const Array<T>& table, const Array<double>& x, const Array<double>& y,
                             Array<double>& out)
      : ArrayParallelFor(x.GetCount()), table_(table), x_(x), y_(y), out_(out) {
    if (table.GetRank() == 2 && x.GetCount() == y.GetCount() &&
        out.Resize(ArrayDims(x.GetCount()))) {
      return;
    }
    Fail();
    out.SetErrorState(ArrayErrorInvalidArray());
  }

  void Body(unsigned begin, unsigned end) override {
    if (Failed()) return;
    for (unsigned i = begin; i < end; ++i) {
      const Place row = Clamp(x_[i], table_.GetExtent(0));
      const Place column = Clamp(y_[i], table_.GetExtent(1));
      const unsigned nextRow = Clamp(x_[i] + 1, table_.GetExtent(0)).index;
      const unsigned nextColumn = Clamp(y_[i] + 1, table_.GetExtent(1)).index;
      const double a = row.fraction;
      const double b = column.fraction;
      const double p00 = At(row.index, column.index);
      const double p01 = At(row.index, nextColumn);
      const double p10 = At(nextRow, column.index);
      const double p11 = At(nextRow, nextColumn);
      out_[i] = (p00 + p11 - p01 - p10) * a * b + (p10 - p00) * a + (p01 - p00) * b + p00;
    }
  }

 private:
  struct Place {
    unsigned index;
    double fraction;
  };
  static Place Clamp(double position, unsigned count) {
    if (!(position >= 0)) return {0, 0.0};
    if (position > count - 1) return {count - 1, 0.0};
    const auto index = static_cast<unsigned>(position);
    return {index, position - index};
  }
  double At(std::size_t row, std::size_t column) const {
    return static_cast<double>(table_[row * table_.GetExtent(1) + column]);
  }

  const Array<T>& table_;
  const Array<double>& x_;
  const Array<double>& y_;
  Array<double>& out_;
};

}  // namespace lumo
