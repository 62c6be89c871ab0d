#include "regions/record_index.h"

#include <algorithm>
#include <boost/geometry.hpp>
#include <boost/geometry/geometries/box.hpp>
#include <boost/geometry/geometries/point.hpp>
#include <boost/geometry/index/rtree.hpp>
#include <iterator>

namespace lumo {
namespace {

namespace bg = boost::geometry;
using Corner = bg::model::point<double, 2, bg::cs::cartesian>;
using Box = bg::model::box<Corner>;
using Entry = std::pair<Box, std::int32_t>;

constexpr double kMargin = 2;  // by which the pixels of a shape may lie outside of its vertices

}  // namespace

struct RecordIndex::Tree {
  explicit Tree(const std::vector<Entry>& boxes) : entries(boxes) {}
  bg::index::rtree<Entry, bg::index::quadratic<32>> entries;
};

RecordIndex::RecordIndex(const std::vector<RecordBox>& boxes) {
  std::vector<Entry> entries;
  entries.reserve(boxes.size());
  for (const auto& [record, bounds] : boxes) {
    entries.emplace_back(Box(Corner(bounds.minX, bounds.minY), Corner(bounds.maxX, bounds.maxY)),
                         record);
  }
  tree_ = std::make_unique<Tree>(entries);
}

RecordIndex::~RecordIndex() = default;

std::vector<std::int32_t> RecordIndex::Find(const RegionWindow& window) const {
  const Box wanted(
      Corner(static_cast<double>(window.left) - kMargin, static_cast<double>(window.top) - kMargin),
      Corner(static_cast<double>(window.Right()) + kMargin,
             static_cast<double>(window.Bottom()) + kMargin));
  std::vector<std::int32_t> found;
  for (auto entry = tree_->entries.qbegin(bg::index::intersects(wanted));
       entry != tree_->entries.qend(); ++entry) {
    found.push_back(entry->second);
  }
  std::sort(found.begin(), found.end());
  return found;
}

}  // namespace lumo
