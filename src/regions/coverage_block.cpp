#include "regions/coverage_block.h"

#include <algorithm>
#include <cmath>

namespace lumo {

CoverageBlock::CoverageBlock(const RegionWindow& window)
    : window_(window), edges_((std::size_t{window.width} + 2) * window.height) {}

void CoverageBlock::AddRing(const ScanVertices& ring, bool isHole) {
  if (ring.size() < 3) return;
  double doubleArea = 0;  // above 0 for a clockwise ring, as y grows downward
  for (std::size_t i = 0; i < ring.size(); ++i) {
    const Point2D<double>& a = ring[i];
    const Point2D<double>& b = ring[i + 1 < ring.size() ? i + 1 : 0];
    doubleArea += (a.x - ring[0].x) * (b.y - ring[0].y) - (b.x - ring[0].x) * (a.y - ring[0].y);
  }
  const double sign = (doubleArea > 0) == isHole ? 1 : -1;
  for (std::size_t i = 0; i < ring.size(); ++i) {
    AddEdge(ring[i], ring[i + 1 < ring.size() ? i + 1 : 0], sign);
  }
}

/// Gives what lies right of an edge that runs down the sign, of one that runs up its opposite.
void CoverageBlock::AddEdge(const Point2D<double>& a, const Point2D<double>& b, double sign) {
  if (b.y < a.y) return AddEdge(b, a, -sign);
  const double top = a.y - static_cast<double>(window_.top);
  const double bottom = b.y - static_cast<double>(window_.top);
  if (bottom <= 0 || top >= window_.height || top == bottom) return;
  const double slope = (b.x - a.x) / (bottom - top);
  const double left = a.x - static_cast<double>(window_.left);
  const auto last =
      static_cast<std::size_t>(std::ceil(std::min<double>(bottom, window_.height))) - 1;
  for (auto row = static_cast<std::size_t>(std::max(0.0, std::floor(top))); row <= last; ++row) {
    const double from = std::max(top, static_cast<double>(row));
    const double to = std::min(bottom, static_cast<double>(row) + 1);
    if (from >= to) continue;
    AddPiece(row, left + (from - top) * slope, left + (to - top) * slope, sign * (to - from));
  }
}

/// Adds what a piece of an edge within a row cuts off, pixel by pixel.
void CoverageBlock::AddPiece(std::size_t row, double fromX, double toX, double area) {
  double* const changes = edges_.data() + row * (std::size_t{window_.width} + 2);
  const double left = std::min(fromX, toX);
  const double right = std::max(fromX, toX);
  const double width = window_.width;
  if (left >= width) return;
  if (right <= 0) {
    changes[0] += area;
    return;
  }
  const auto put = [&](double begin, double end) {
    const double share = right > left ? area * (end - begin) / (right - left) : area;
    const double column = std::min(std::floor(begin), width - 1);
    const double part = (begin + end) / 2 - column;
    changes[static_cast<std::size_t>(column)] += share * (1 - part);
    changes[static_cast<std::size_t>(column) + 1] += share * part;
  };
  if (left < 0) changes[0] += area * (0 - left) / (right - left);
  double begin = std::max(left, 0.0);
  const double stop = std::min(right, width);
  if (begin >= stop) {
    if (right == left) put(begin, begin);
    return;
  }
  while (begin < stop) {
    const double end = std::min(stop, std::floor(begin) + 1);
    put(begin, end);
    begin = end;
  }
}

void CoverageBlock::GetLine(unsigned line, std::vector<double>& shares) const {
  constexpr double kNoise = 1e-12;
  shares.resize(window_.width);
  const double* const changes = edges_.data() + line * (std::size_t{window_.width} + 2);
  double share = 0;
  for (unsigned x = 0; x < window_.width; ++x) {
    share += changes[x];
    shares[x] = share < kNoise ? 0 : share > 1 - kNoise ? 1 : share;
  }
}

}  // namespace lumo
