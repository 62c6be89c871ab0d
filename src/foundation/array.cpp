#include "foundation/array.h"

#include <algorithm>
#include <cmath>
#include <vector>

#include "foundation/errors.h"
#include "foundation/type_code.h"

namespace lumo {
namespace {

/// Rows and columns of a matrix in decomposition, row after row.
class SquareMatrix {
 public:
  SquareMatrix(const Array<double>& source, unsigned order)
      : order_(order), elements_(std::size_t{order} * order) {
    for (unsigned i = 0; i < order; ++i) {
      for (unsigned j = 0; j < order; ++j) {
        (*this)(i, j) = source[std::size_t{i} * source.GetExtent(1) + j];
      }
    }
  }

  double& operator()(unsigned row, unsigned column) {
    return elements_[std::size_t{row} * order_ + column];
  }
  unsigned Order() const { return order_; }

 private:
  unsigned order_;
  std::vector<double> elements_;
};

/// Reciprocals of the largest magnitude of each row; false when a row is all zeros.
bool RowScales(SquareMatrix& a, std::vector<double>& scales) {
  for (unsigned i = 0; i < a.Order(); ++i) {
    double largest = 0.0;
    for (unsigned j = 0; j < a.Order(); ++j) largest = std::max(largest, std::fabs(a(i, j)));
    if (largest == 0.0) return false;
    scales[i] = 1.0 / largest;
  }
  return true;
}

/// Replaces `a` by its LU decomposition; `permutation` records the row swapped at each column.
bool Decompose(SquareMatrix& a, std::vector<unsigned>& permutation) {
  constexpr double kTinyPivot = 1e-20;
  const unsigned n = a.Order();
  std::vector<double> scales(n);
  if (!RowScales(a, scales)) return false;

  for (unsigned j = 0; j < n; ++j) {
    unsigned best = j;
    double bestWeight = 0.0;
    for (unsigned i = 0; i < n; ++i) {
      double sum = a(i, j);
      for (unsigned k = 0; k < std::min(i, j); ++k) sum -= a(i, k) * a(k, j);
      a(i, j) = sum;
      if (i >= j && scales[i] * std::fabs(sum) >= bestWeight) {
        bestWeight = scales[i] * std::fabs(sum);
        best = i;
      }
    }
    if (best != j) {
      for (unsigned k = 0; k < n; ++k) std::swap(a(best, k), a(j, k));
      scales[best] = scales[j];
    }
    permutation[j] = best;
    if (a(j, j) == 0.0) a(j, j) = kTinyPivot;
    for (unsigned i = j + 1; i < n; ++i) a(i, j) /= a(j, j);
  }
  return true;
}

/// Solves in place for the right side `b`.
void Solve(SquareMatrix& lu, const std::vector<unsigned>& permutation, std::vector<double>& b) {
  const unsigned n = lu.Order();
  for (unsigned i = 0; i < n; ++i) std::swap(b[i], b[permutation[i]]);
  for (unsigned i = 0; i < n; ++i) {
    for (unsigned j = 0; j < i; ++j) b[i] -= lu(i, j) * b[j];
  }
  for (unsigned i = n; i-- > 0;) {
    for (unsigned j = i + 1; j < n; ++j) b[i] -= lu(i, j) * b[j];
    b[i] /= lu(i, i);
  }
}

}  // namespace

const unsigned ArrayObject::TypeCode = GloballyUniqueObjectTypeCode("Array");

bool ArrayObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

const unsigned JaggedArrayObject::TypeCode = GloballyUniqueObjectTypeCode("JaggedArray2D");

bool JaggedArrayObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

ArrayDims::ArrayDims(unsigned e0, unsigned e1, unsigned e2, unsigned e3, unsigned e4, unsigned e5,
                     unsigned e6, unsigned e7)
    : ArrayDims({e0, e1, e2, e3, e4, e5, e6, e7}) {}

ArrayDims::ArrayDims(const unsigned (&extents)[kMaxRank]) {
  for (unsigned i = 0; i < kMaxRank; ++i) {
    if (extents[i] != 0) rank = i + 1;
    extent[i] = std::max(extents[i], 1U);
  }
  if (rank == 0) return;
  std::uint64_t product = 1;
  for (const unsigned e : extent) product = std::min<std::uint64_t>(product * e, kTooMany);
  count = static_cast<unsigned>(product);
}

bool detail::ReadArrayDims(std::istream& in, ArrayDims& dims) {
  unsigned rank = 0;
  ReadNumber(in, rank);
  SkipPast(in, ':');
  unsigned extents[ArrayDims::kMaxRank] = {};
  for (unsigned i = 0; i < std::min(rank, ArrayDims::kMaxRank); ++i) ReadNumber(in, extents[i]);
  SkipPast(in, '[');
  dims = ArrayDims(extents);
  // Each element takes a character at least, so a shape that asks for more than the text has left
  // is refused before anything is allocated for it.
  const std::streamsize left = in.good() ? in.rdbuf()->in_avail() : 0;
  return left >= 0 && dims.count <= static_cast<std::uint64_t>(left);
}

Array<double> Inverse(const Array<double>& matrix) {
  Array<double> result(matrix.GetDims());
  if (!matrix.IsValid() || !result.IsValid()) {
    result.SetErrorState(ArrayErrorInvalidArray());
    return result;
  }
  std::fill(result.begin(), result.end(), 0.0);
  const unsigned order = std::min(matrix.GetExtent(0), matrix.GetExtent(1));
  if (matrix.GetCount() == 0) return result;
  try {
    SquareMatrix lu(matrix, order);
    std::vector<unsigned> permutation(order);
    if (!Decompose(lu, permutation)) {
      result.SetErrorState(MatrixErrorSingular());
      return result;
    }
    std::vector<double> column(order);
    for (unsigned j = 0; j < order; ++j) {
      std::fill(column.begin(), column.end(), 0.0);
      column[j] = 1.0;
      Solve(lu, permutation, column);
      for (unsigned i = 0; i < order; ++i) {
        result[std::size_t{i} * matrix.GetExtent(1) + j] = column[i];
      }
    }
  } catch (...) {
    result.SetErrorState(ObjectErrorOutOfMemory());
  }
  return result;
}

}  // namespace lumo
