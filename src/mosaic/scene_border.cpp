#include "mosaic/scene_border.h"

#include <bit>
#include <cmath>
#include <vector>

#include "foundation/fault.h"
#include "raster/tile_functions.h"

namespace lumo {
namespace {

/// A bit for each pixel of a raster. Lines have words of their own.
class PixelBits {
 public:
  PixelBits(unsigned width, unsigned lines)
      : words_((std::size_t{width} + 63) / 64), bits_(words_ * lines) {}

  std::size_t WordsOfLine() const { return words_; }
  std::uint64_t* Line(std::size_t y) { return &bits_[y * words_]; }
  const std::uint64_t* Line(std::size_t y) const { return &bits_[y * words_]; }

 private:
  std::size_t words_;
  std::vector<std::uint64_t> bits_;
};

bool TestBit(const std::uint64_t* line, std::size_t x) {
  return (line[x / 64] >> (x % 64) & 1U) != 0;
}
void SetBit(std::uint64_t* line, std::size_t x) {
  line[x / 64] |= std::uint64_t{1} << (x % 64);
}

/// The first place from `x` on where a bit is `value`; `width` when there is none.
std::size_t FindBit(const std::uint64_t* line, std::size_t x, std::size_t width, bool value) {
  while (x < width) {
    const std::uint64_t word = (value ? line[x / 64] : ~line[x / 64]) >> (x % 64);
    if (word != 0) return std::min(x + static_cast<std::size_t>(std::countr_zero(word)), width);
    x = (x / 64 + 1) * 64;
  }
  return width;
}

/// Sets bits from..to - 1. @return true when one of them was 0.
bool SetBits(std::uint64_t* line, std::size_t from, std::size_t to) {
  bool isChanged = false;
  while (from < to) {
    const std::size_t end = std::min((from / 64 + 1) * 64, to), count = end - from;
    const std::uint64_t ones = count == 64 ? ~std::uint64_t{0} : (std::uint64_t{1} << count) - 1;
    const std::uint64_t mask = ones << (from % 64);
    isChanged = isChanged || (line[from / 64] & mask) != mask;
    line[from / 64] |= mask;
    from = end;
  }
  return isChanged;
}

/// Grows what is reached into a line: each run of `open` pixels that a reached pixel of the line or
/// of `beside` touches. @return true when a pixel was added.
bool GrowInto(const std::uint64_t* open, const std::uint64_t* beside, std::size_t width,
              std::uint64_t* reached) {
  bool isChanged = false;
  for (std::size_t x = FindBit(open, 0, width, true); x < width;
       x = FindBit(open, x, width, true)) {
    const std::size_t end = FindBit(open, x, width, false);
    const bool isTouched =
        FindBit(reached, x, end, true) < end || FindBit(beside, x, end, true) < end;
    if (isTouched) isChanged = SetBits(reached, x, end) || isChanged;
    x = end;
  }
  return isChanged;
}

/// The open pixels that are connected with the edge of the raster.
PixelBits ReachFromEdge(const PixelBits& open, unsigned width, unsigned lines, const IPC& ipc) {
  PixelBits reached(width, lines);
  const auto seed = [&](std::size_t x, std::size_t y) {
    if (TestBit(open.Line(y), x)) SetBit(reached.Line(y), x);
  };
  for (std::size_t x = 0; x < width; ++x) {
    seed(x, 0);
    seed(x, lines - 1);
  }
  for (std::size_t y = 0; y < lines; ++y) {
    seed(0, y);
    seed(width - 1, y);
  }
  const auto grow = [&](std::size_t y, std::size_t beside) {
    return GrowInto(open.Line(y), reached.Line(beside), width, reached.Line(y));
  };
  // Down and up again, until nothing comes of it: borders of scenes take two rounds.
  for (bool isChanged = true; isChanged && !ipc.abort->IsSet();) {
    isChanged = false;
    for (std::size_t y = 0; y < lines; ++y) isChanged = grow(y, y == 0 ? 0 : y - 1) || isChanged;
    for (std::size_t y = lines - 1; y-- > 0;) isChanged = grow(y, y + 1) || isChanged;
  }
  return reached;
}

/// Leaves out the pixels whose bit is set.
class BitMask final : public LabelMask {
 public:
  BitMask(PixelBits&& outside, unsigned width, const LabelMaskPtr& also)
      : outside_(std::move(outside)), width_(width), also_(also) {}

  bool Apply(unsigned line, unsigned lines, unsigned char* states) override {
    for (unsigned y = line; y < line + lines; ++y) {
      const std::uint64_t* const bits = outside_.Line(y);
      unsigned char* const of = states + std::size_t{y - line} * width_;
      for (std::size_t x = FindBit(bits, 0, width_, true); x < width_;
           x = FindBit(bits, x + 1, width_, true)) {
        of[x] |= PixelValueState::Masked;
      }
    }
    return !also_ || also_->Apply(line, lines, states);
  }

 private:
  const PixelBits outside_;
  const unsigned width_;
  const LabelMaskPtr also_;
};

/// The no-data value of each band; none, with the fault set, where a band has none.
template <typename T>
std::vector<double> NoDataValues(const Raster<T>& scene, const SceneBorder& border) {
  std::vector<double> values;
  for (unsigned band = 0; band < scene.Bands(); ++band) {
    if (!border.noData && !scene.HasNoDataValue(band)) {
      SetFault("Tolerance: the scene has no no-data value, and none is given");
      return {};
    }
    values.push_back(border.noData.value_or(static_cast<double>(scene.NoDataValue(band))));
  }
  return values;
}

/// How far the bands of a pixel are from no data: 0 at it, 1 within the tolerance, else 2. A band
/// whose state alone is no data is at it; one that is masked besides is not.
template <typename T>
int Distance(const T* values, const unsigned char* states, const std::vector<double>& noData,
             double tolerance) {
  int farthest = 0;
  for (std::size_t band = 0; band < noData.size() && farthest < 2; ++band) {
    const unsigned state = states[band] & PixelValueState::NotValid;
    if (state == PixelValueState::NoData) continue;
    const double value = static_cast<double>(values[band]);
    const bool isAt = value == noData[band] || (std::isnan(value) && std::isnan(noData[band]));
    const bool isNear = std::abs(value - noData[band]) <= tolerance;
    farthest = std::max(farthest, state != 0 ? 2 : isAt ? 0 : isNear ? 1 : 2);
  }
  return farthest;
}

}  // namespace

template <typename T>
LabelMaskPtr MakeBorderMask(const RasterPtr<T>& scene, const SceneBorder& border,
                            const LabelMaskPtr& also, const IPC& ipc) {
  const std::vector<double> noData = NoDataValues(*scene, border);
  if (noData.empty()) return {};
  const unsigned width = scene->Samples(), lines = scene->Lines();
  PixelBits outside(width, lines), near(width, lines);
  const RasterIteratorPtr<T> wholeLines(
      new RasterIterator<T>(scene, WideTiles(scene.Get(), sizeof(T), kComputedTile, 0)));
  const bool isRead = ForEachTile(
      "SceneBorder", TilesBy(wholeLines),
      [&](const Tile<T>& tile) {
        const T* values = tile.PixelArray().GetData();
        const unsigned char* states = tile.StateArray().GetData();
        for (unsigned y = tile.Origin().second; y < tile.Origin().second + tile.Height(); ++y) {
          for (unsigned x = tile.Origin().first; x < tile.Origin().first + tile.Width(); ++x) {
            const int distance = Distance(values, states, noData, border.tolerance);
            if (distance == 0) SetBit(outside.Line(y), x);
            if (distance < 2) SetBit(near.Line(y), x);
            values += noData.size();
            states += noData.size();
          }
        }
      },
      ipc);
  if (!isRead) return {};
  if (border.tolerance > 0) {
    const PixelBits reached = ReachFromEdge(near, width, lines, ipc);
    for (std::size_t y = 0; y < lines; ++y) {
      for (std::size_t i = 0; i < outside.WordsOfLine(); ++i) {
        outside.Line(y)[i] |= reached.Line(y)[i];
      }
    }
  }
  return LabelMaskPtr(new BitMask(std::move(outside), width, also));
}

#define VEXG_MAKE_BORDER_MASK(T)                                                               \
  template VEXG_EXPORT LabelMaskPtr MakeBorderMask<T>(const RasterPtr<T>&, const SceneBorder&, \
                                                      const LabelMaskPtr&, const IPC&);
VEXG_FOR_ALL(EIGHT, VEXG_MAKE_BORDER_MASK);
#undef VEXG_MAKE_BORDER_MASK

}  // namespace lumo
