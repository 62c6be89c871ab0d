#include "geometry/polygon_clip.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <polyclipping/clipper.hpp>

#include "foundation/errors.h"

namespace lumo {
namespace {

namespace cl = ClipperLib;

// Steps of the integers in a unit. Up to 262,144 units from the middle of the shapes, products of
// the library stay within 64 bits, which is several times as fast.
constexpr double kSteps = 4096;

constexpr double kFarthest = 1e12;

// Of a ring that is kept, in steps.
constexpr double kLeastArea = 2;

/// Where the integers of an operation have their origin: a whole number, so that the steps lie
/// alike in all operations.
struct Origin {
  double x = 0;
  double y = 0;
};

struct Box {
  double minX = 0, minY = 0, maxX = 0, maxY = 0;
};

Box BoxOf(const Polygon2D<double>& shape) {
  return {shape.Measure(PolygonMeasure::kMinX), shape.Measure(PolygonMeasure::kMinY),
          shape.Measure(PolygonMeasure::kMaxX), shape.Measure(PolygonMeasure::kMaxY)};
}

bool AreApart(const Box& a, const Box& b) {
  return a.maxX < b.minX || b.maxX < a.minX || a.maxY < b.minY || b.maxY < a.minY;
}

bool IsInReach(const Polygon2D<double>& shape) {
  const auto isInReach = [](double value) { return std::abs(value) <= kFarthest; };
  return std::all_of(shape.Rings().begin(), shape.Rings().end(), [&](const auto& ring) {
    return std::all_of(ring.points.begin(), ring.points.end(),
                       [&](const auto& p) { return isInReach(p.x) && isInReach(p.y); });
  });
}

/// The rings of a shape in steps.
cl::Paths ToPaths(const Polygon2D<double>& shape, const Origin& origin) {
  cl::Paths paths;
  for (const Contour2D<double>& ring : shape.Rings()) {
    cl::Path& path = paths.emplace_back();
    path.reserve(ring.points.size());
    for (const Point2D<double>& point : ring.points) {
      path.emplace_back(std::llround((point.x - origin.x) * kSteps),
                        std::llround((point.y - origin.y) * kSteps));
    }
  }
  return paths;
}

Contour2D<double> ToRing(const cl::Path& path, bool isHole, const Origin& origin) {
  Contour2D<double> ring;
  ring.hole = isHole;
  ring.points.reserve(path.size() + 1);
  for (const cl::IntPoint& point : path) {
    ring.points.push_back({static_cast<double>(point.X) / kSteps + origin.x,
                           static_cast<double>(point.Y) / kSteps + origin.y});
  }
  ring.points.push_back(ring.points.front());
  return ring;
}

/// The rings of a result, the largest outer ring first.
Contour2DArray<double> ToRings(const cl::PolyTree& tree, const Origin& origin) {
  struct Part {
    double area;
    const cl::PolyNode* node;
  };
  std::vector<Part> parts;
  for (const cl::PolyNode* node = tree.GetFirst(); node != nullptr; node = node->GetNext()) {
    const double area = std::abs(cl::Area(node->Contour));
    if (!node->IsHole() && area >= kLeastArea) parts.push_back({area, node});
  }
  std::stable_sort(parts.begin(), parts.end(),
                   [](const Part& a, const Part& b) { return a.area > b.area; });
  Contour2DArray<double> rings;
  for (const Part& part : parts) {
    rings.push_back(ToRing(part.node->Contour, false, origin));
    for (const cl::PolyNode* hole : part.node->Childs) {
      if (std::abs(cl::Area(hole->Contour)) < kLeastArea) continue;
      rings.push_back(ToRing(hole->Contour, true, origin));
    }
  }
  return rings;
}

Polygon2D<double> Failed(const ObjectErrorState& error) {
  Polygon2D<double> none;
  none.SetErrorState(error);
  return none;
}

/// Runs an operation of the library, whose exceptions end here.
Polygon2D<double> Run(cl::ClipType type, const cl::Paths& subjects, const cl::Paths& clips,
                      cl::PolyFillType fill, const Origin& origin, double label) {
  try {
    cl::Clipper clipper;
    clipper.AddPaths(subjects, cl::ptSubject, true);
    clipper.AddPaths(clips, cl::ptClip, true);
    cl::PolyTree tree;
    if (!clipper.Execute(type, tree, fill, fill)) return Failed(ObjectErrorNotConstructed());
    return Polygon2D<double>(ToRings(tree, origin), label);
  } catch (const std::bad_alloc&) {
    return Failed(ObjectErrorOutOfMemory());
  } catch (const std::exception&) {
    return Failed(ObjectErrorNotConstructed());
  }
}

cl::ClipType TypeOf(ClipOperation operation) {
  return operation == ClipOperation::kDifference     ? cl::ctDifference
         : operation == ClipOperation::kIntersection ? cl::ctIntersection
                                                     : cl::ctUnion;
}

Origin MiddleOf(const Box& box) {
  return {std::floor((box.minX + box.maxX) / 2), std::floor((box.minY + box.maxY) / 2)};
}

Box Around(const Box& a, const Box& b) {
  return {std::min(a.minX, b.minX), std::min(a.minY, b.minY), std::max(a.maxX, b.maxX),
          std::max(a.maxY, b.maxY)};
}

}  // namespace

Polygon2D<double> Clip(ClipOperation operation, const Polygon2D<double>& a,
                       const Polygon2D<double>& b) {
  if (!IsInReach(a) || !IsInReach(b)) return Failed(ObjectErrorNotConstructed());
  const Box boxA = BoxOf(a), boxB = BoxOf(b);
  const bool isEither = a.Rings().empty() || b.Rings().empty();
  if (operation == ClipOperation::kIntersection && (isEither || AreApart(boxA, boxB))) {
    return Polygon2D<double>({}, a.Label());
  }
  const Origin origin = MiddleOf(a.Rings().empty()   ? boxB
                                 : b.Rings().empty() ? boxA
                                                     : Around(boxA, boxB));
  return Run(TypeOf(operation), ToPaths(a, origin), ToPaths(b, origin), cl::pftEvenOdd, origin,
             a.Label());
}

Polygon2D<double> UnionOf(std::span<const Polygon2D<double>> shapes) {
  std::optional<Box> box;
  for (const Polygon2D<double>& shape : shapes) {
    if (!IsInReach(shape)) return Failed(ObjectErrorNotConstructed());
    if (shape.Rings().empty()) continue;
    box = box ? Around(*box, BoxOf(shape)) : BoxOf(shape);
  }
  if (!box) return {};
  const Origin origin = MiddleOf(*box);
  cl::Paths all;
  try {
    // With outer rings turned one way and holes the other, shapes can be counted together.
    for (const Polygon2D<double>& shape : shapes) {
      cl::Clipper clipper;
      clipper.AddPaths(ToPaths(shape, origin), cl::ptSubject, true);
      cl::Paths turned;
      if (!clipper.Execute(cl::ctUnion, turned, cl::pftEvenOdd, cl::pftEvenOdd)) {
        return Failed(ObjectErrorNotConstructed());
      }
      std::move(turned.begin(), turned.end(), std::back_inserter(all));
    }
  } catch (const std::exception&) {
    return Failed(ObjectErrorOutOfMemory());
  }
  return Run(cl::ctUnion, all, {}, cl::pftNonZero, origin, 0);
}

}  // namespace lumo
