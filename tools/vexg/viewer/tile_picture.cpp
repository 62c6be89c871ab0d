#include "viewer/tile_picture.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>

#include "pictures/png_writer.h"
#include "raster/pixel_types.h"

namespace lumo::host {
namespace {

constexpr unsigned kChannels = 4;

double Bend(double at, const TileStretch& stretch) {
  switch (stretch.curve) {
    case TileStretch::Curve::kSquareRoot:
      return std::sqrt(at);
    case TileStretch::Curve::kGamma:
      return std::pow(at, 1 / stretch.gamma);
    case TileStretch::Curve::kLogarithm:
      return std::log1p(99 * at) / std::log(100.0);
    default:
      return at;
  }
}

/// The values of a tile one after the other, as numbers.
class TileValues {
 public:
  TileValues(const ViewedTile& tile, unsigned code)
      : tile_(tile), plane_(std::size_t{tile.width} * tile.height) {
    DispatchType(TenTypes{}, code, [&]<typename T>() {
      read_ = [](const char* bytes) {
        T value;
        std::memcpy(&value, bytes, sizeof value);
        return static_cast<double>(value);
      };
      bytes_ = sizeof(T);
      return true;
    });
    states_ = tile.bytes.data() + tile.bytes.size() / (bytes_ + 1) * bytes_;
  }
  std::size_t Pixels() const { return plane_; }
  double At(std::size_t band, std::size_t pixel) const {
    return read_(tile_.bytes.data() + (band * plane_ + pixel) * bytes_);
  }
  bool Counts(std::size_t band, std::size_t pixel) const {
    return states_[band * plane_ + pixel] == 0;
  }

 private:
  const ViewedTile& tile_;
  const std::size_t plane_;
  std::size_t bytes_ = 1;
  double (*read_)(const char*) = nullptr;
  const char* states_;
};

}  // namespace

std::string DrawTile(const ViewedTile& tile, unsigned code, const TileStretch& stretch) {
  const TileValues values(tile, code);
  std::vector<unsigned char> rgba(values.Pixels() * kChannels);
  const std::size_t bands = stretch.ends.size();
  for (std::size_t pixel = 0; pixel < values.Pixels(); ++pixel) {
    unsigned char* const color = &rgba[pixel * kChannels];
    bool isShown = true;
    for (std::size_t band = 0; band < bands; ++band) {
      const double value = values.At(band, pixel);
      isShown = isShown && values.Counts(band, pixel) && std::isfinite(value);
      if (!isShown) break;
      const auto [low, high] = stretch.ends[band];
      const double at = std::clamp((value - low) / (high - low), 0.0, 1.0);
      color[band] = static_cast<unsigned char>(std::lround(255 * Bend(at, stretch)));
    }
    if (!isShown) {
      std::fill_n(color, kChannels, static_cast<unsigned char>(0));
      continue;
    }
    if (bands == 1) color[1] = color[2] = color[0];
    color[3] = 255;
  }
  return EncodePng(rgba.data(), tile.width, tile.height, kChannels);
}

std::string DrawTile(const ViewedTile& tile, unsigned code, const Json& legend) {
  std::vector<std::array<unsigned char, kChannels>> colors;
  for (const Json& row : legend) {
    colors.push_back(row["color"].get<std::array<unsigned char, kChannels>>());
  }
  const TileValues values(tile, code);
  std::vector<unsigned char> rgba(values.Pixels() * kChannels);
  for (std::size_t pixel = 0; pixel < values.Pixels(); ++pixel) {
    const double value = values.At(0, pixel);
    const bool isShown =
        values.Counts(0, pixel) && value >= 0 && value < static_cast<double>(colors.size());
    if (!isShown) continue;
    std::copy_n(colors[static_cast<std::size_t>(value)].begin(), kChannels,
                &rgba[pixel * kChannels]);
  }
  return EncodePng(rgba.data(), tile.width, tile.height, kChannels);
}

}  // namespace lumo::host
