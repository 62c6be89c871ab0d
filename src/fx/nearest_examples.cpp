#include "fx/nearest_examples.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <nanoflann.hpp>

namespace lumo {
namespace {

constexpr std::size_t kMostTreeDimensions = 16;  // measured: above, a tree looks at most points too
constexpr std::size_t kLeastTreePoints = 64;

/// Shows points to the tree.
struct PointSet {
  const double* points;
  std::size_t dimensions;
  std::size_t count;

  std::size_t kdtree_get_point_count() const { return count; }
  double kdtree_get_pt(std::size_t number, std::size_t dimension) const {
    return points[number * dimensions + dimension];
  }
  template <typename Box>
  bool kdtree_get_bbox(Box&) const {
    return false;
  }
};

/// Collects the points of the tree that are no farther than the last of the nearest so many, and a
/// little, so that a rounding in another order loses none of equal distance.
class NearestSet {
 public:
  NearestSet(std::size_t count, std::vector<double>& worst, std::vector<std::uint32_t>& near)
      : count_(count), worst_(worst), near_(near) {
    worst_.clear();
    near_.clear();
  }

  std::size_t size() const { return near_.size(); }
  bool full() const { return worst_.size() == count_; }
  double worstDist() const {
    if (!full()) return std::numeric_limits<double>::infinity();
    return worst_.front() * (1 + 1e-9) + std::numeric_limits<double>::min();
  }
  bool addPoint(double distance, std::size_t number) {
    near_.push_back(static_cast<std::uint32_t>(number));
    if (full() && distance < worst_.front()) {
      std::pop_heap(worst_.begin(), worst_.end());
      worst_.back() = distance;
      std::push_heap(worst_.begin(), worst_.end());
    } else if (!full()) {
      worst_.push_back(distance);
      std::push_heap(worst_.begin(), worst_.end());
    }
    return true;
  }

 private:
  std::size_t count_;
  std::vector<double>& worst_;  // a heap of the distances of the nearest
  std::vector<std::uint32_t>& near_;
};

}  // namespace

struct NearestExamples::Tree {
  using Metric = nanoflann::L2_Simple_Adaptor<double, PointSet>;

  Tree(const double* points, std::size_t dimensions, std::size_t count)
      : set{points, dimensions, count}, index(static_cast<int>(dimensions), set) {
    index.buildIndex();
  }

  PointSet set;
  nanoflann::KDTreeSingleIndexAdaptor<Metric, PointSet> index;
};

NearestExamples::NearestExamples(std::vector<double> points, std::size_t dimensions)
    : points_(std::move(points)), dimensions_(dimensions) {
  const bool isFinite = std::all_of(points_.begin(), points_.end(),
                                    [](double value) { return std::isfinite(value); });
  if (isFinite && dimensions_ <= kMostTreeDimensions && Count() >= kLeastTreePoints) {
    tree_ = std::make_unique<Tree>(points_.data(), dimensions_, Count());
  }
}

NearestExamples::~NearestExamples() = default;

double NearestExamples::DistanceTo(const double* point, std::size_t number) const {
  const double* const other = points_.data() + number * dimensions_;
  double sum = 0;
  for (std::size_t i = 0; i < dimensions_; ++i) {
    const double difference = point[i] - other[i];
    sum += difference * difference;
  }
  return std::isnan(sum) ? std::numeric_limits<double>::infinity() : sum;
}

void NearestExamples::Find(const double* point, std::size_t count,
                           std::vector<Found>& found) const {
  found.clear();
  count = std::min(count, Count());
  if (count == 0) return;
  const bool isFinite =
      std::all_of(point, point + dimensions_, [](double value) { return std::isfinite(value); });
  if (tree_ && isFinite) {
    thread_local std::vector<double> worst;
    thread_local std::vector<std::uint32_t> near;
    NearestSet set(count, worst, near);
    tree_->index.findNeighbors(set, point, {});
    for (const std::uint32_t number : near) found.push_back({DistanceTo(point, number), number});
  } else {
    for (std::size_t number = 0; number < Count(); ++number) {
      found.push_back({DistanceTo(point, number), static_cast<std::uint32_t>(number)});
    }
  }
  const auto end = found.begin() + static_cast<std::ptrdiff_t>(count);
  std::partial_sort(found.begin(), end, found.end());
  found.erase(end, found.end());
}

}  // namespace lumo
