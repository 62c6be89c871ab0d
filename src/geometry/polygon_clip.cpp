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
// the library stay within 64 bits, which is several times as fast. Where edges meet so unluckily
// that it gives up, which is seldom, other steps are tried.
constexpr double kSteps[] = {4096, 16384, 65536};

constexpr double kFarthest = 1e12;

// A ring that is kept has this area, in units, at least.
constexpr double kLeastArea = 2 / (kSteps[0] * kSteps[0]);

/// How the integers of an operation lie: from a whole number on, so that the steps lie alike in all
/// operations.
struct Origin {
  double x = 0;
  double y = 0;
  double steps = kSteps[0];  // in a unit
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
      path.emplace_back(std::llround((point.x - origin.x) * origin.steps),
                        std::llround((point.y - origin.y) * origin.steps));
    }
  }
  return paths;
}

Contour2D<double> ToRing(const cl::Path& path, bool isHole, const Origin& origin) {
  Contour2D<double> ring;
  ring.hole = isHole;
  ring.points.reserve(path.size() + 1);
  for (const cl::IntPoint& point : path) {
    ring.points.push_back({static_cast<double>(point.X) / origin.steps + origin.x,
                           static_cast<double>(point.Y) / origin.steps + origin.y});
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
  const double least = kLeastArea * origin.steps * origin.steps;
  for (const cl::PolyNode* node = tree.GetFirst(); node != nullptr; node = node->GetNext()) {
    const double area = std::abs(cl::Area(node->Contour));
    if (!node->IsHole() && area >= least) parts.push_back({area, node});
  }
  std::stable_sort(parts.begin(), parts.end(),
                   [](const Part& a, const Part& b) { return a.area > b.area; });
  Contour2DArray<double> rings;
  for (const Part& part : parts) {
    rings.push_back(ToRing(part.node->Contour, false, origin));
    for (const cl::PolyNode* hole : part.node->Childs) {
      if (std::abs(cl::Area(hole->Contour)) < least) continue;
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

/// Runs `work(origin)`, which gives a shape or nothing, with one number of steps after the other
/// until it gives one. Exceptions of the library end here.
template <typename Work>
Polygon2D<double> Try(Origin origin, const Work& work) {
  for (const double steps : kSteps) {
    origin.steps = steps;
    try {
      if (std::optional<Polygon2D<double>> shape = work(origin)) return *std::move(shape);
    } catch (const std::bad_alloc&) {
      return Failed(ObjectErrorOutOfMemory());
    } catch (const std::exception&) {
      continue;
    }
  }
  return Failed(ObjectErrorNotConstructed());
}

/// The rings of a shape with outer ones turned one way and holes the other, so that shapes can be
/// counted together; nothing where the library gives up.
std::optional<cl::Paths> TurnedPaths(const Polygon2D<double>& shape, const Origin& origin) {
  cl::Clipper clipper;
  clipper.AddPaths(ToPaths(shape, origin), cl::ptSubject, true);
  cl::PolyTree tree;
  if (!clipper.Execute(cl::ctUnion, tree, cl::pftEvenOdd, cl::pftEvenOdd)) return {};
  cl::Paths paths;
  for (cl::PolyNode* node = tree.GetFirst(); node != nullptr; node = node->GetNext()) {
    if (cl::Orientation(node->Contour) == node->IsHole()) cl::ReversePath(node->Contour);
    paths.push_back(std::move(node->Contour));
  }
  return paths;
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
  return Try(origin, [&](const Origin& of) -> std::optional<Polygon2D<double>> {
    cl::Clipper clipper;
    clipper.AddPaths(ToPaths(a, of), cl::ptSubject, true);
    clipper.AddPaths(ToPaths(b, of), cl::ptClip, true);
    cl::PolyTree tree;
    if (!clipper.Execute(TypeOf(operation), tree, cl::pftEvenOdd, cl::pftEvenOdd)) return {};
    return Polygon2D<double>(ToRings(tree, of), a.Label());
  });
}

Polygon2D<double> UnionOf(std::span<const Polygon2D<double>> shapes) {
  std::optional<Box> box;
  for (const Polygon2D<double>& shape : shapes) {
    if (!IsInReach(shape)) return Failed(ObjectErrorNotConstructed());
    if (shape.Rings().empty()) continue;
    box = box ? Around(*box, BoxOf(shape)) : BoxOf(shape);
  }
  if (!box) return {};
  Polygon2D<double> all =
      Try(MiddleOf(*box), [&](const Origin& of) -> std::optional<Polygon2D<double>> {
        cl::Clipper clipper;
        for (const Polygon2D<double>& shape : shapes) {
          const std::optional<cl::Paths> paths = TurnedPaths(shape, of);
          if (!paths) return {};
          clipper.AddPaths(*paths, cl::ptSubject, true);
        }
        cl::PolyTree tree;
        if (!clipper.Execute(cl::ctUnion, tree, cl::pftNonZero, cl::pftNonZero)) return {};
        return Polygon2D<double>(ToRings(tree, of));
      });
  if (all.GetErrorState().code != ObjectErrorNotConstructed::Code) return all;
  // One after the other there is less that meets at once.
  all = {};
  for (const Polygon2D<double>& shape : shapes) all = Clip(ClipOperation::kUnion, all, shape);
  return all;
}

}  // namespace lumo
