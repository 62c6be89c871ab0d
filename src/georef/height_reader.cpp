#include "georef/height_reader.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace lumo {
namespace {

bool Accept(double read, double& height) {
  if (std::isnan(read)) return false;
  height = read;
  return true;
}

}  // namespace

bool HeightReader::Nearest(double x, double y, double& height) {
  const double column = std::floor(x + 0.5);
  const double row = std::floor(y + 0.5);
  const bool inside = column >= 1 && row >= 1 && column < samples_ && row < lines_;
  return inside && Accept(At(static_cast<unsigned>(column), static_cast<unsigned>(row)), height);
}

bool HeightReader::Bilinear(double x, double y, double& height) {
  const double column = std::trunc(x);
  const double row = std::trunc(y);
  if (!(column >= 0 && row >= 0 && column < samples_ && row < lines_)) return false;
  const auto c = static_cast<unsigned>(column);
  const auto r = static_cast<unsigned>(row);
  if (c + 1 == samples_ || r + 1 == lines_) return Accept(At(c, r), height);
  const double a = x - column;
  const double b = y - row;
  const double upper = At(c, r) * (1 - a) + At(c + 1, r) * a;
  const double lower = At(c, r + 1) * (1 - a) + At(c + 1, r + 1) * a;
  return Accept(upper * (1 - b) + lower * b, height);
}

double HeightReader::At(unsigned column, unsigned row) {
  const Array<double>& tile = Tile(column / kTile, row / kTile);
  if (tile.GetCount() == 0) return std::numeric_limits<double>::quiet_NaN();
  const unsigned width = std::min(kTile, samples_ - column / kTile * kTile);
  return tile[row % kTile * width + column % kTile];
}

const Array<double>& HeightReader::Tile(unsigned column, unsigned row) {
  const auto [at, isNew] = tiles_.try_emplace(std::uint64_t{row} << 32U | column);
  if (!isNew) return at->second;
  const unsigned left = column * kTile;
  const unsigned top = row * kTile;
  const SubRect rect(left, top, left + std::min(kTile, samples_ - left) - 1,
                     top + std::min(kTile, lines_ - top) - 1);
  const bool read = model_.ReadHeights(rect, at->second);
  if (!read || at->second.GetCount() != rect.Width() * rect.Height()) at->second = Array<double>();
  return at->second;
}

}  // namespace lumo
