#include "warp/warp_positions.h"

#include <algorithm>
#include <cmath>

#include "georef/affine_link.h"
#include "platform/vector_clones.h"

namespace lumo {
namespace {

/// Points that are transformed in one call: enough to forget the call.
constexpr unsigned kPointsAtOnce = 8192;

/// Room for points, kept from tile to tile by each thread.
std::vector<double>& Scratch() {
  thread_local std::vector<double> scratch;
  return scratch;
}

/// Fills all of a chunk, whatever part of it is needed, so that a position has the same bits in
/// whichever place of a chunk it comes.
VEXG_VECTOR_CLONES
void FillPolynomial(const double* k, double y, double firstX, double* out) {
  const double onLine = k[0] + k[1] * y;
  for (unsigned i = 0; i < WarpChunk::kPixels; ++i) {
    const double x = firstX + i;
    out[i] = onLine + k[2] * x + k[3] * x * y;
  }
}

VEXG_VECTOR_CLONES
void Snap(double* positions, double noise) {
  for (unsigned i = 0; i < WarpChunk::kPixels; ++i) {
    const double near = std::floor(positions[i] * 2 + 0.5) / 2;
    positions[i] = std::abs(positions[i] - near) < noise ? near : positions[i];
  }
}

VEXG_VECTOR_CLONES
bool TakeAxisApart(const double* positions, unsigned count, double low, double high, double shift,
                   std::int32_t* whole, double* rest, std::uint8_t* inside) {
  double outside = 0;  // counted as the positions are, which makes it one vector
  for (unsigned i = 0; i < count; ++i) {
    const double position = positions[i];
    const double shifted = position - shift;
    // Without a NaN: of two numbers that don't compare, the limit is taken.
    const double cut = std::min(high, std::max(low - 1, shifted));
    const double down = std::floor(cut);
    whole[i] = static_cast<std::int32_t>(down);
    rest[i] = cut - down;
    outside += position >= low && position < high ? 0.0 : 1.0;
  }
  if (outside == 0) {
    std::fill_n(inside, count, std::uint8_t{1});
    return true;
  }
  for (unsigned i = 0; i < count; ++i) {
    inside[i] = positions[i] >= low && positions[i] < high ? 1 : 0;
  }
  return false;
}

}  // namespace

void WarpPositions::Reader::Read(unsigned line, unsigned x, unsigned count, double* positionX,
                                 double* positionY) {
  const double* points = positions_.points_;
  if (points == nullptr && positions_.grid_ == nullptr) {
    const double y = line + positions_.firstY_, firstX = x + positions_.firstX_;
    FillPolynomial(positions_.fit_.u.data(), y, firstX, positionX);
    FillPolynomial(positions_.fit_.v.data(), y, firstX, positionY);
    return;
  }
  if (points == nullptr) {
    if (line - first_ >= lines_) Transform(line);
    points = Scratch().data();
  }
  points += 2 * (std::size_t{line - first_} * positions_.width_ + x);
  for (unsigned i = 0; i < count; ++i) {
    positionX[i] = points[2 * i];
    positionY[i] = points[2 * i + 1];
  }
}

/// Carries as many lines as are worth a call.
void WarpPositions::Reader::Transform(unsigned line) {
  const unsigned width = positions_.width_;
  first_ = line;
  lines_ = std::clamp(kPointsAtOnce / width, 1U, end_ - line);
  std::vector<double>& scratch = Scratch();
  scratch.resize(std::max(scratch.size(), 2 * std::size_t{lines_} * width));
  double* at = scratch.data();
  for (unsigned i = 0; i < lines_; ++i) {
    const double y = positions_.firstY_ + static_cast<double>(line + i);
    for (unsigned x = 0; x < width; ++x) {
      *at++ = positions_.firstX_ + static_cast<double>(x);
      *at++ = y;
    }
  }
  Array<double> points(scratch.data(), ArrayDims(lines_ * width, 2));
  CarryPixels(*positions_.grid_, *positions_.source_, points);
}

void TakeApart(double* positionX, double* positionY, const WarpLimits& limits, WarpChunk& chunk) {
  if (limits.noise > 0) {
    Snap(positionX, limits.noise);
    Snap(positionY, limits.noise);
  }
  std::uint8_t insideY[WarpChunk::kPixels];
  const bool allX = TakeAxisApart(positionX, chunk.count, limits.lowX, limits.highX, limits.shift,
                                  chunk.x, chunk.a, chunk.inside);
  const bool allY = TakeAxisApart(positionY, chunk.count, limits.lowY, limits.highY, limits.shift,
                                  chunk.y, chunk.b, insideY);
  for (unsigned i = 0; i < chunk.count; ++i) chunk.inside[i] &= insideY[i];
  chunk.allInside = allX && allY;
}

}  // namespace lumo
