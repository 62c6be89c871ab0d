#pragma once

#include <cstddef>

namespace lumo {

/// The steps of which expressions are made. Comparisons and logic give 1 or 0, and take every
/// number but 0 as true.
///
/// NaN goes through every step, comparisons, logic, kMin and kMax among them: what can't be
/// computed never turns into a number. kWhere alone leaves out the branch that is not taken.
enum class ExpressionOp : unsigned char {
  kAdd,
  kSubtract,
  kMultiply,
  kDivide,
  kNegate,
  kLess,
  kLessEqual,
  kEqual,
  kNotEqual,
  kAnd,
  kOr,
  kNot,
  kMin,
  kMax,
  kWhere,  ///< the second operand where the first is true, else the third
  kAbs,
  kSqrt,
  kFloor,
  kCeil,
  kRound,  ///< halves away from 0
  kPow,
  kExp,
  kLog,
  kLog2,
  kLog10,
  kSin,
  kCos,
  kTan,
  kAsin,
  kAcos,
  kAtan,
  kAtan2,
};

/// Computes one step for many numbers at once. Each result depends on its own operands alone and
/// has the same bits wherever it stands in the arrays.
/// @param a,b,c   operands of `count` numbers; those that the step doesn't take may be null.
/// @param result  overlaps none of them.
void ComputeStep(ExpressionOp op, const double* a, const double* b, const double* c,
                 std::size_t count, double* result);

}  // namespace lumo
