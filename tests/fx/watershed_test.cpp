#include "fx/watershed.h"

#include <algorithm>
#include <deque>
#include <numeric>
#include <random>

#include <gtest/gtest.h>

namespace lumo {
namespace {

struct Image {
  unsigned width = 0;
  unsigned height = 0;
  std::vector<std::int32_t> gradient;
  std::vector<std::uint8_t> excluded;

  Image(unsigned w, unsigned h)
      : width(w), height(h), gradient(std::size_t{w} * h), excluded(gradient.size()) {}

  std::vector<std::size_t> Neighbours(std::size_t pixel) const {
    std::vector<std::size_t> all;
    const std::size_t x = pixel % width;
    if (pixel >= width) all.push_back(pixel - width);
    if (x > 0) all.push_back(pixel - 1);
    if (x + 1 < width) all.push_back(pixel + 1);
    if (pixel + width < gradient.size()) all.push_back(pixel + width);
    return all;
  }
};

/// Floods an image level by level with a queue, as Vincent and Soille do, with sorted pixels.
class Flood {
 public:
  explicit Flood(const Image& image) : image_(image), order_(image.gradient.size()) {
    std::iota(order_.begin(), order_.end(), std::size_t{0});
    const auto& gradient = image.gradient;
    std::stable_sort(order_.begin(), order_.end(),
                     [&](std::size_t a, std::size_t b) { return gradient[a] < gradient[b]; });
    labels.resize(order_.size());
    distance_.resize(order_.size());
    for (std::size_t pixel = 0; pixel < order_.size(); ++pixel) {
      labels[pixel] = image.excluded[pixel] != 0 ? kExcluded : kInitial;
    }
    for (std::size_t begin = 0, end = 0; begin < order_.size(); begin = end) {
      while (end < order_.size() && gradient[order_[end]] == gradient[order_[begin]]) ++end;
      const std::vector<std::size_t> level(order_.begin() + static_cast<long>(begin),
                                           order_.begin() + static_cast<long>(end));
      FloodLevel(level);
    }
    for (std::int32_t& label : labels) label = std::max(label, 0);
  }

  std::vector<std::int32_t> labels;
  std::int32_t count = 0;

 private:
  static constexpr std::int32_t kInitial = -1, kMask = -2, kExcluded = -3;
  static constexpr std::size_t kMarker = SIZE_MAX;

  void FloodLevel(const std::vector<std::size_t>& level) {
    for (const std::size_t pixel : level) {
      if (labels[pixel] == kExcluded) continue;
      labels[pixel] = kMask;
      for (const std::size_t neighbour : image_.Neighbours(pixel)) {
        if (labels[neighbour] < 0) continue;
        distance_[pixel] = 1;
        queue_.push_back(pixel);
      }
    }
    Spread();
    for (const std::size_t pixel : level) {
      if (labels[pixel] == kExcluded) continue;
      distance_[pixel] = 0;
      if (labels[pixel] == kMask) FillMinimum(pixel);
    }
  }

  void Spread() {
    std::int32_t distance = 1;
    queue_.push_back(kMarker);
    for (;;) {
      std::size_t pixel = Take();
      if (pixel == kMarker) {
        if (queue_.empty()) return;
        queue_.push_back(kMarker);
        ++distance;
        pixel = Take();
      }
      std::int32_t least = std::numeric_limits<std::int32_t>::max(), label = 0;
      for (const std::size_t neighbour : image_.Neighbours(pixel)) {
        if (labels[neighbour] > 0 && distance_[neighbour] <= least) {
          least = distance_[neighbour];
          label = labels[neighbour];
        } else if (labels[neighbour] == kMask && distance_[neighbour] == 0) {
          distance_[neighbour] = distance + 1;
          queue_.push_back(neighbour);
        }
      }
      ASSERT_TRUE(label > 0 && least < distance);  // else it were a watershed between basins
      labels[pixel] = label;
    }
  }

  void FillMinimum(std::size_t first) {
    labels[first] = ++count;
    std::deque<std::size_t> filled{first};
    while (!filled.empty()) {
      const std::size_t pixel = filled.front();
      filled.pop_front();
      for (const std::size_t neighbour : image_.Neighbours(pixel)) {
        if (labels[neighbour] != kMask) continue;
        labels[neighbour] = count;
        filled.push_back(neighbour);
      }
    }
  }

  std::size_t Take() {
    const std::size_t pixel = queue_.front();
    queue_.pop_front();
    return pixel;
  }

  const Image& image_;
  std::vector<std::size_t> order_;
  std::vector<std::int32_t> distance_;
  std::deque<std::size_t> queue_;
};

std::vector<std::int32_t> Label(Watershed& watershed, const Image& image, std::uint32_t& count) {
  std::vector<std::int32_t> labels(image.gradient.size(), 77);
  count = watershed.Label(image.gradient.data(), image.excluded.data(), image.width, image.height,
                          labels.data());
  return labels;
}

TEST(Watershed, FloodsRandomImagesAsAQueueDoes) {
  std::mt19937 random(1);
  Watershed watershed;  // keeps its arrays from image to image
  for (int round = 0; round < 4000; ++round) {
    Image image(1 + random() % 14, 1 + random() % 14);
    const unsigned levels = 1 + random() % 6;
    for (std::int32_t& value : image.gradient) value = static_cast<std::int32_t>(random() % levels);
    if (round % 2 != 0) {
      for (std::uint8_t& excluded : image.excluded) excluded = random() % 5 == 0 ? 1 : 0;
    }
    std::uint32_t count = 0;
    const std::vector<std::int32_t> labels = Label(watershed, image, count);
    const Flood flood(image);
    ASSERT_EQ(labels, flood.labels) << "round " << round;
    ASSERT_EQ(count, static_cast<std::uint32_t>(flood.count)) << "round " << round;
  }
}

TEST(Watershed, HandlesExtremesOfSizeAndValue) {
  Watershed watershed;
  std::uint32_t count = 0;
  Image flat(300, 200);
  EXPECT_EQ(Label(watershed, flat, count), std::vector<std::int32_t>(60'000, 1));
  std::fill(flat.excluded.begin(), flat.excluded.end(), 1);
  EXPECT_EQ(Label(watershed, flat, count), std::vector<std::int32_t>(60'000, 0));
  EXPECT_EQ(count, 0U);
  // Excluded pixels neither drain others nor carry plateaus, whatever value they have.
  Image row(5, 1);
  row.gradient = {std::numeric_limits<std::int32_t>::max(), 0,
                  std::numeric_limits<std::int32_t>::max(), 3,
                  std::numeric_limits<std::int32_t>::min()};
  row.excluded = {0, 1, 0, 0, 0};
  EXPECT_EQ(Label(watershed, row, count), (std::vector<std::int32_t>{2, 0, 1, 1, 1}));
  // A pixel as far from two basins goes to the neighbour that comes last: the right one.
  Image ridge(5, 1);
  ridge.gradient = {0, 4, 4, 4, 0};
  EXPECT_EQ(Label(watershed, ridge, count), (std::vector<std::int32_t>{1, 1, 2, 2, 2}));
}

}  // namespace
}  // namespace lumo
