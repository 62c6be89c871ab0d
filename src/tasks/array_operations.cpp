#include "tasks/array_operations.h"

namespace lumo {
namespace {

template <bool kTransposeA, bool kTransposeB>
Array<double> Multiply(const Array<double>& a, const Array<double>& b, unsigned grain) {
  Array<double> result(
      ArrayDims(a.GetExtent(kTransposeA ? 1 : 0), b.GetExtent(kTransposeB ? 0 : 1)));
  if (!result.IsValid()) return result;
  ParallelMatrixProduct<double, double, double, kTransposeA, kTransposeB> product(a, b, result);
  RunParallelFor2(product, grain);
  return result;
}

}  // namespace

Array<double> MultiplyMatrices(const Array<double>& a, const Array<double>& b, MatrixMode mode,
                               unsigned grain) {
  switch (mode) {
    case MatrixMode::kTA:
      return Multiply<true, false>(a, b, grain);
    case MatrixMode::kTB:
      return Multiply<false, true>(a, b, grain);
    case MatrixMode::kTAB:
      return Multiply<true, true>(a, b, grain);
    case MatrixMode::kPlain:
      break;
  }
  return Multiply<false, false>(a, b, grain);
}

}  // namespace lumo
