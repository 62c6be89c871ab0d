#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Finds the nearest of some points by squared Euclidean distance, as if all were sorted: of equal
/// distances the point of the lower number comes first. In few dimensions it looks into a k-d tree
/// (Friedman, Bentley and Finkel, An algorithm for finding best matches in logarithmic expected
/// time, 1977), else at all points. Threads: any may ask, with results of their own.
class VEXG_EXPORT NearestExamples {
 public:
  struct Found {
    double distance = 0;  ///< squared
    std::uint32_t number = 0;

    bool operator<(const Found& other) const {
      return distance != other.distance ? distance < other.distance : number < other.number;
    }
  };

  /// @param points      row by row.
  /// @param dimensions  of a point, 1 or more.
  NearestExamples(std::vector<double> points, std::size_t dimensions);
  ~NearestExamples();
  NearestExamples(const NearestExamples&) = delete;
  NearestExamples& operator=(const NearestExamples&) = delete;

  std::size_t Count() const { return points_.size() / dimensions_; }

  /// Finds the nearest points, the nearest first.
  /// @param count  how many at most.
  void Find(const double* point, std::size_t count, std::vector<Found>& found) const;

 private:
  struct Tree;

  double DistanceTo(const double* point, std::size_t number) const;

  std::vector<double> points_;
  std::size_t dimensions_;
  std::unique_ptr<Tree> tree_;  // null: all points are looked at
};

}  // namespace lumo
