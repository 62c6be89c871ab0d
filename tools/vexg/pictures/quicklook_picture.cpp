#include "pictures/quicklook_picture.h"

#include <algorithm>
#include <cmath>

#include "raster/pixel_types.h"

namespace lumo::host {
namespace {

/// The pixels in the middle of `count` equal parts of `extent` pixels.
std::vector<unsigned> Middles(unsigned extent, unsigned count) {
  std::vector<unsigned> middles(count);
  for (std::uint64_t i = 0; i < count; ++i) {
    middles[i] = static_cast<unsigned>((2 * i + 1) * extent / (2 * std::uint64_t{count}));
  }
  return middles;
}

struct Span {
  unsigned first;
  unsigned last;
};

/// Groups rising positions into spans of `longest` at most, which leave out every block of the
/// source that has no position.
std::vector<Span> GroupPositions(const std::vector<unsigned>& positions, unsigned block,
                                 std::uint64_t longest) {
  std::vector<Span> spans;
  for (const unsigned at : positions) {
    const bool goesOn = !spans.empty() && at / block <= spans.back().last / block + 1 &&
                        std::uint64_t{at} - spans.back().first < longest;
    if (goesOn) {
      spans.back().last = at;
    } else {
      spans.push_back({at, at});
    }
  }
  return spans;
}

struct IndexRange {
  std::size_t first;
  std::size_t end;
};

/// Which of rising positions lie from `first` to `last`.
IndexRange FindPositions(const std::vector<unsigned>& positions, unsigned first, unsigned last) {
  const auto low = std::lower_bound(positions.begin(), positions.end(), first);
  const auto high = std::upper_bound(low, positions.end(), last);
  return {static_cast<std::size_t>(low - positions.begin()),
          static_cast<std::size_t>(high - positions.begin())};
}

template <typename T>
double AsDouble(T value) {
  return static_cast<double>(value);
}
template <typename T>
double AsDouble(const Complex<T>& value) {
  return std::hypot(static_cast<double>(value.real), static_cast<double>(value.imag));
}

unsigned char AsByte(double value) {
  return static_cast<unsigned char>(std::clamp(std::round(value), 0.0, 255.0));
}

/// The value below which `percent` of the values lie.
double Percentile(std::vector<double>& values, double percent) {
  const auto last = static_cast<double>(values.size() - 1);
  const auto at = static_cast<std::ptrdiff_t>(std::lround(last * percent / 100.0));
  std::nth_element(values.begin(), values.begin() + at, values.end());
  return values[static_cast<std::size_t>(at)];
}

/// A straight line from values to 0 to 255.
struct Line {
  double low = 0.0;
  double high = 255.0;

  double operator()(double value) const {
    if (low == high) return value < low ? 0.0 : value > low ? 255.0 : 128.0;
    return (value - low) / (high - low) * 255.0;
  }
};

Line LineOf(const std::vector<double>& values, const QuicklookPicture::Stretch& stretch) {
  if (!stretch.isPercentile) return {};
  std::vector<double> valid;
  std::copy_if(values.begin(), values.end(), std::back_inserter(valid),
               [](double value) { return std::isfinite(value); });
  if (valid.empty()) return {};
  return {Percentile(valid, stretch.low), Percentile(valid, stretch.high)};
}

}  // namespace

QuicklookPicture::QuicklookPicture(const RasterInfo& info, unsigned size,
                                   const Array<unsigned>& bands, PictureSampling sampling)
    : info_(info), bands_(bands) {
  const unsigned longer = std::max(info.samples, info.lines);
  const auto scaled = [&](unsigned extent) {
    if (longer <= size) return extent;
    const std::uint64_t scaledTwice = 2 * std::uint64_t{extent} * size / longer;
    return static_cast<unsigned>(std::max<std::uint64_t>((scaledTwice + 1) / 2, 1));
  };
  columns_ = Middles(info.samples, scaled(info.samples));
  lines_ = Middles(info.lines, scaled(info.lines));
  averages_ = sampling == PictureSampling::kAverage && longer > size;
  const std::size_t count = columns_.size() * lines_.size();
  values_.assign(bands.GetCount(), std::vector<double>(count, averages_ ? 0 : NAN));
  if (averages_) weights_.assign(bands.GetCount(), std::vector<double>(count, 0));
}

std::vector<SubRect> QuicklookPicture::GetBlocks() const {
  if (averages_) return CutIntoBlocks(info_, info_.GetRect(), bands_.GetCount(), false);
  const unsigned tileWidth = std::clamp(info_.tiles.width, 1U, info_.samples);
  const unsigned tileHeight = std::clamp(info_.tiles.height, 1U, info_.lines);
  const bool hasTiles = tileWidth > 1 && tileWidth < info_.samples;
  const std::uint64_t pixelBytes = std::uint64_t{bands_.GetCount()} * DataTypeBytes(info_.dataType);
  const std::uint64_t widest = std::max<std::uint64_t>(
      kBlockBudget / (pixelBytes * tileHeight), hasTiles ? tileWidth : kBlockBudget / pixelBytes);
  std::vector<SubRect> blocks;
  for (const Span columns :
       GroupPositions(columns_, hasTiles ? tileWidth : info_.samples, widest)) {
    const std::uint64_t width = columns.last - columns.first + 1;
    const std::uint64_t highest = std::max<std::uint64_t>(kBlockBudget / (pixelBytes * width), 1);
    for (const Span lines : GroupPositions(lines_, tileHeight, highest)) {
      blocks.emplace_back(columns.first, lines.first, columns.last, lines.last);
    }
  }
  return blocks;
}

template <typename T>
void QuicklookPicture::TakeTyped(const SubRect& block, const T* pixels,
                                 const unsigned char* states) {
  const unsigned bands = bands_.GetCount();
  const IndexRange rows = FindPositions(lines_, block.top, block.bottom);
  const IndexRange columns = FindPositions(columns_, block.left, block.right);
  for (std::size_t y = rows.first; y < rows.end; ++y) {
    for (std::size_t x = columns.first; x < columns.end; ++x) {
      const std::size_t line = lines_[y] - block.top;
      const std::size_t at = (line * block.Width() + columns_[x] - block.left) * bands;
      for (unsigned band = 0; band < bands; ++band) {
        if (!IsValidState(states[at + band])) continue;
        values_[band][y * columns_.size() + x] = AsDouble(pixels[at + band]);
      }
    }
  }
}

std::vector<QuicklookPicture::Shares> QuicklookPicture::ShareOut(unsigned extent, unsigned count) {
  std::vector<Shares> shares(extent);
  for (std::uint64_t x = 0; x < extent; ++x) {
    const std::uint64_t at = x * count / extent;
    const std::uint64_t end = (x + 1) * count, edge = (at + 1) * extent;
    const double rest = end > edge ? static_cast<double>(end - edge) / count : 0;
    shares[x] = {static_cast<unsigned>(at), 1 - rest, rest};
  }
  return shares;
}

/// Adds the pixels of a block to those of the picture that they lie in.
template <typename T>
void QuicklookPicture::AddTyped(const SubRect& block, const T* pixels,
                                const unsigned char* states) {
  const unsigned bands = bands_.GetCount();
  const std::size_t width = columns_.size();
  const std::vector<Shares> columns = ShareOut(info_.samples, GetWidth());
  const std::vector<Shares> rows = ShareOut(info_.lines, GetHeight());
  for (unsigned y = block.top; y <= block.bottom; ++y) {
    for (unsigned x = block.left; x <= block.right; ++x, pixels += bands, states += bands) {
      const Shares& row = rows[y];
      const Shares& column = columns[x];
      const std::size_t at = std::size_t{row.at} * width + column.at;
      for (unsigned band = 0; band < bands; ++band) {
        const double value = AsDouble(pixels[band]);
        if (!IsValidState(states[band]) || !std::isfinite(value)) continue;
        const auto add = [&](std::size_t to, double weight) {
          values_[band][to] += weight * value;
          weights_[band][to] += weight;
        };
        add(at, row.first * column.first);
        if (column.rest > 0) add(at + 1, row.first * column.rest);
        if (row.rest > 0) add(at + width, row.rest * column.first);
        if (row.rest > 0 && column.rest > 0) add(at + width + 1, row.rest * column.rest);
      }
    }
  }
}

void QuicklookPicture::Finish() {
  if (!averages_) return;
  for (std::size_t band = 0; band < values_.size(); ++band) {
    for (std::size_t i = 0; i < values_[band].size(); ++i) {
      const double weight = weights_[band][i];
      values_[band][i] = weight > 0 ? values_[band][i] / weight : NAN;
    }
  }
}

void QuicklookPicture::Take(const SubRect& block, const unsigned char* pixels,
                            const unsigned char* states) {
  DispatchType(TwelveTypes{}, info_.dataType, [&]<typename T>() {
    const auto* const typed = reinterpret_cast<const T*>(pixels);
    averages_ ? AddTyped(block, typed, states) : TakeTyped(block, typed, states);
    return true;
  });
}

bool QuicklookPicture::IsShown(std::size_t pixel) const {
  return std::any_of(values_.begin(), values_.end(),
                     [&](const std::vector<double>& band) { return std::isfinite(band[pixel]); });
}

/// A picture of the right size, transparent where no band is valid.
QuicklookPicture::Bytes QuicklookPicture::MakeBytes(unsigned colors) const {
  const std::size_t count = columns_.size() * lines_.size();
  std::vector<bool> shown(count);
  for (std::size_t i = 0; i < count; ++i) shown[i] = IsShown(i);
  const bool hasAlpha = std::find(shown.begin(), shown.end(), false) != shown.end();
  Bytes bytes;
  bytes.channels = colors + (hasAlpha ? 1 : 0);
  bytes.pixels.assign(count * bytes.channels, 0);
  for (std::size_t i = 0; hasAlpha && i < count; ++i) {
    bytes.pixels[i * bytes.channels + colors] = shown[i] ? 255 : 0;
  }
  return bytes;
}

QuicklookPicture::Bytes QuicklookPicture::Draw(const Stretch& stretch) const {
  Bytes bytes = MakeBytes(bands_.GetCount());
  for (unsigned band = 0; band < bands_.GetCount(); ++band) {
    const std::vector<double>& values = values_[band];
    const Line line = LineOf(values, stretch);
    for (std::size_t i = 0; i < values.size(); ++i) {
      if (!std::isnan(values[i])) bytes.pixels[i * bytes.channels + band] = AsByte(line(values[i]));
    }
  }
  return bytes;
}

QuicklookPicture::Bytes QuicklookPicture::Draw(const Palette& palette) const {
  constexpr unsigned kColors = 3;
  Palette colors = palette;
  Bytes bytes = MakeBytes(kColors);
  for (std::size_t i = 0; i < values_.front().size(); ++i) {
    const double value = values_.front()[i];
    if (!(value >= 0.0 && value < colors.GetCount())) continue;
    const ColorPtr color = colors.At(static_cast<unsigned>(value));
    unsigned char* const pixel = &bytes.pixels[i * bytes.channels];
    pixel[0] = color->r;
    pixel[1] = color->g;
    pixel[2] = color->b;
  }
  return bytes;
}

void QuicklookPicture::DrawOutlines(const std::array<unsigned char, 3>& colour,
                                    Bytes& picture) const {
  const bool isGrey = picture.channels < 3;
  const bool hasAlpha = picture.channels % 2 == 0;
  const std::size_t width = columns_.size(), height = lines_.size();
  Bytes drawn;
  drawn.channels = hasAlpha ? 4 : 3;
  drawn.pixels.resize(width * height * drawn.channels);
  const std::vector<double>& labels = values_.front();
  const auto differs = [&](std::size_t a, std::size_t b) {
    return labels[a] != labels[b] && !(std::isnan(labels[a]) && std::isnan(labels[b]));
  };
  for (std::size_t y = 0, at = 0; y < height; ++y) {
    for (std::size_t x = 0; x < width; ++x, ++at) {
      const unsigned char* const from = &picture.pixels[at * picture.channels];
      unsigned char* const to = &drawn.pixels[at * drawn.channels];
      const bool isLine =
          (x + 1 < width && differs(at, at + 1)) || (y + 1 < height && differs(at, at + width));
      for (unsigned i = 0; i < 3; ++i) to[i] = isLine ? colour[i] : from[isGrey ? 0 : i];
      if (hasAlpha) to[3] = isLine ? 255 : from[picture.channels - 1];
    }
  }
  picture = std::move(drawn);
}

}  // namespace lumo::host
