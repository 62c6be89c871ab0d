#include "views/expression_kernels.h"

#include <cmath>
#include <limits>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// Computes the steps that take one rounding or none, whose loops become vector code: they
/// have no branches, and no calls, not even of inline functions. a == a is false for NaN. False for
/// another step.
VEXG_CHOOSING_VECTOR_CLONES
bool ComputeSimple(ExpressionOp op, const double* __restrict a, const double* __restrict b,
                   const double* __restrict c, std::size_t count, double* __restrict r) {
  using enum ExpressionOp;
  switch (op) {
    case kAdd:
      for (std::size_t i = 0; i < count; ++i) r[i] = a[i] + b[i];
      return true;
    case kSubtract:
      for (std::size_t i = 0; i < count; ++i) r[i] = a[i] - b[i];
      return true;
    case kMultiply:
      for (std::size_t i = 0; i < count; ++i) r[i] = a[i] * b[i];
      return true;
    case kDivide:
      for (std::size_t i = 0; i < count; ++i) r[i] = a[i] / b[i];
      return true;
    case kNegate:
      for (std::size_t i = 0; i < count; ++i) r[i] = -a[i];
      return true;
    case kLess:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (a[i] < b[i] ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kLessEqual:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (a[i] <= b[i] ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kEqual:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (a[i] == b[i] ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kNotEqual:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (a[i] != b[i] ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kAnd:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (((a[i] != 0) & (b[i] != 0)) ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kOr:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (((a[i] != 0) | (b[i] != 0)) ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kNot:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = a[i] == a[i] ? (a[i] == 0 ? 1.0 : 0.0) : kNaN;
      }
      return true;
    case kMin:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (a[i] < b[i] ? a[i] : b[i]) : kNaN;
      }
      return true;
    case kMax:
      for (std::size_t i = 0; i < count; ++i) {
        r[i] = ((a[i] == a[i]) & (b[i] == b[i])) ? (a[i] > b[i] ? a[i] : b[i]) : kNaN;
      }
      return true;
    case kWhere:
      for (std::size_t i = 0; i < count; ++i) {
        const double then = b[i], otherwise = c[i];
        r[i] = a[i] == a[i] ? (a[i] != 0 ? then : otherwise) : kNaN;
      }
      return true;
    case kAbs:
      for (std::size_t i = 0; i < count; ++i) r[i] = std::fabs(a[i]);
      return true;
    case kFloor:
      for (std::size_t i = 0; i < count; ++i) r[i] = std::floor(a[i]);
      return true;
    case kCeil:
      for (std::size_t i = 0; i < count; ++i) r[i] = std::ceil(a[i]);
      return true;
    default:
      return false;
  }
}

/// Applies a function of the mathematical library to each number.
template <double (*kFunction)(double)>
void Each(const double* a, std::size_t count, double* r) {
  for (std::size_t i = 0; i < count; ++i) r[i] = kFunction(a[i]);
}
template <double (*kFunction)(double, double)>
void Each(const double* a, const double* b, std::size_t count, double* r) {
  for (std::size_t i = 0; i < count; ++i) r[i] = kFunction(a[i], b[i]);
}

}  // namespace

void ComputeStep(ExpressionOp op, const double* a, const double* b, const double* c,
                 std::size_t count, double* result) {
  using enum ExpressionOp;
  if (ComputeSimple(op, a, b, c, count, result)) return;
  switch (op) {
    case kSqrt:
      return Each<std::sqrt>(a, count, result);
    case kRound:
      return Each<std::round>(a, count, result);
    case kExp:
      return Each<std::exp>(a, count, result);
    case kLog:
      return Each<std::log>(a, count, result);
    case kLog2:
      return Each<std::log2>(a, count, result);
    case kLog10:
      return Each<std::log10>(a, count, result);
    case kSin:
      return Each<std::sin>(a, count, result);
    case kCos:
      return Each<std::cos>(a, count, result);
    case kTan:
      return Each<std::tan>(a, count, result);
    case kAsin:
      return Each<std::asin>(a, count, result);
    case kAcos:
      return Each<std::acos>(a, count, result);
    case kAtan:
      return Each<std::atan>(a, count, result);
    case kAtan2:
      return Each<std::atan2>(a, b, count, result);
    default:
      return Each<std::pow>(a, b, count, result);
  }
}

}  // namespace lumo
