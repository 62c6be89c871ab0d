#pragma once

#include <memory>
#include <vector>

#include "raster/raster.h"
#include "views/expression.h"

namespace lumo {

class ExpressionSource;

/// Reads what expressions need of their rasters for one rectangle, and computes it line by line.
///
///     ExpressionBlock block(rasters, {&expression});
///     if (!block.Read(rect)) return false;
///     ExpressionBlock::Line line(block);  // one for each thread
///     line.Fetch(y, first, count);        // up to Expression::kMostPixels pixels
///     line.Compute(0);
///     Use(line.Values(), line.States());
///
/// Threads: once it is read, any may compute, each with a Line of its own.
class ExpressionBlock {
 public:
  /// @param rasters      that the bands of the expressions are of.
  /// @param expressions  outlive the block.
  ExpressionBlock(const std::vector<BasicRasterPtr>& rasters,
                  std::vector<const Expression*> expressions);
  ~ExpressionBlock();

  /// Reads each band once. False when a raster does not give the whole block.
  bool Read(const SubRect& rect);

  /// Computes pixels of a line.
  class Line {
   public:
    explicit Line(const ExpressionBlock& block);

    /// Takes pixels of a line of the block, both from 0.
    void Fetch(std::size_t line, std::size_t first, std::size_t count);
    /// Computes an expression for them.
    void Compute(std::size_t expression);

    /// The results of the expression; a pixel that is not valid has any number.
    const double* Values() const { return values_.data(); }
    /// The states of all bands that it uses, joined; null where all are valid.
    const unsigned char* States() const { return areAllValid_ ? nullptr : states_.data(); }

   private:
    const ExpressionBlock& block_;
    std::size_t line_ = 0, first_ = 0, count_ = 0;
    std::vector<double> planes_;  // rows of kMostPixels
    std::vector<Expression::Scratch> scratch_;
    std::vector<double> values_;
    std::vector<unsigned char> states_;
    bool areAllValid_ = true;
  };

 private:
  /// A band that is read, and where it stands in the block of its source.
  struct Plane {
    BandNames::Band band;
    unsigned place;
  };

  std::vector<const Expression*> expressions_;
  std::vector<Plane> planes_;
  std::vector<std::vector<unsigned>> planesOf_;  // of each expression, in the order of its inputs
  std::vector<std::unique_ptr<ExpressionSource>> sources_;  // by raster; null where none is needed
};

}  // namespace lumo
