#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "views/band_names.h"
#include "views/expression_kernels.h"

namespace lumo {

/// A formula on the bands of a pixel, such as "(b3 - b2) / (b3 + b2)", ready to be computed for
/// many pixels at once.
///
/// It knows numbers, bands by their names, and from the weakest to the strongest
/// "||", "&&", one of "<", "<=", ">", ">=", "==" and "!=", "+" and "-", "*" and "/", a sign or "!",
/// "^" (a power, grouped from the right: -2^2 is -4). Functions are abs, acos, asin, atan, atan2,
/// ceil, cos, exp, floor, log (natural), log10, log2, max and min (of two or more), pow, round
/// (halves away from 0), sin, sqrt, tan and where(condition, then, else). "nan" is what makes a
/// pixel invalid.
///
/// An index is a function of bands, or without parentheses one of the bands with the roles that it
/// takes:
///
///     ndvi(nir, red)       (nir - red) / (nir + red)                    Rouse and others 1974
///     ndwi(green, nir)     (green - nir) / (green + nir)                McFeeters 1996
///     savi(nir, red)       1.5 (nir - red) / (nir + red + 0.5)          Huete 1988
///     evi(nir, red, blue)  2.5 (nir - red) / (nir + 6 red - 7.5 blue + 1)  Huete and others 2002
///
/// The last two are made for reflectance, from 0 to 1. Numbers are doubles throughout, so integers
/// of up to 53 bits are exact; ExpressionOp says what becomes of NaN. What is constant is computed
/// once.
///
///     const BandNames names({{"", raster->Bands()}});
///     const std::optional<Expression> ratio = Expression::Parse("b0 / b1", names);
///     if (!ratio) return Fail();  // with a line that names the position and the token
///     Expression::Scratch scratch(*ratio);
///     const double* bands[] = {first, second};  // in the order of ratio->Inputs()
///     ratio->Evaluate(bands, count, scratch, result);
///
/// Cost: a step takes about 0.2 ns a pixel, a function of the mathematical library 3 to 10.
/// Threads: any may use one, each with a Scratch of its own.
class VEXG_EXPORT Expression {
 public:
  /// Reads a formula. Nothing, with a line as the fault text that names position, from 1, and
  /// token, for one that can't be read, names what isn't there, or divides by a constant 0.
  static std::optional<Expression> Parse(const std::string& text, const BandNames& names);

  /// The bands that it uses, each once.
  const std::vector<BandNames::Band>& Inputs() const { return inputs_; }

  /// How many pixels are computed at once at most.
  static constexpr std::size_t kMostPixels = 1024;

  /// Holds the numbers between the steps.
  class VEXG_EXPORT Scratch {
   public:
    explicit Scratch(const Expression& expression);

   private:
    friend class Expression;
    std::vector<double> numbers_;  // rows of kMostPixels: the constants, then what steps give
  };

  /// Computes the formula for up to kMostPixels pixels.
  /// @param inputs   for each of Inputs() its values.
  /// @param result   overlaps none of them.
  void Evaluate(std::span<const double* const> inputs, std::size_t count, Scratch& scratch,
                double* result) const;

 private:
  friend class ExpressionParser;

  /// Where the number of a step lies.
  struct Operand {
    enum class Kind : unsigned char { kNone, kInput, kConstant, kStep };
    Kind kind = Kind::kNone;
    unsigned index = 0;
  };
  struct Step {
    ExpressionOp op;
    Operand operands[3];
    unsigned row;  // that it writes
  };

  Expression() = default;

  std::vector<BandNames::Band> inputs_;
  std::vector<double> constants_;
  std::vector<Step> steps_;  // in order; the last one gives the result
  Operand result_;
  unsigned rows_ = 0;  // that steps write
};

/// An expression and the name of the band that it makes; without one the name is empty.
struct NamedExpression {
  std::string name;
  Expression expression;
};

/// Reads expressions with ";" between them, each perhaps with "NAME=" in front: "NDVI=ndvi; b0 /
/// 2". None, with a fault text as of Expression::Parse, when one of them can't be read.
VEXG_EXPORT std::vector<NamedExpression> ParseExpressions(const std::string& text,
                                                          const BandNames& names);

/// How many expressions stand in such a text.
VEXG_EXPORT unsigned CountExpressions(const std::string& text);

}  // namespace lumo
