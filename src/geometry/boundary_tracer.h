#pragma once

#include <cstdint>
#include <vector>

#include "foundation/point.h"
#include "geometry/label_edges.h"

namespace lumo {

/// The rings of one polygon without its label: the outer ring, then its holes. Each ring repeats
/// its first vertex as its last. Outer rings run clockwise on a grid whose y grows downward, holes
/// the other way.
struct TracedPolygon {
  std::vector<unsigned char> holes;        ///< for each ring, 1 for a hole
  std::vector<std::uint32_t> starts;       ///< for each ring, the index of its first vertex
  std::vector<std::uint32_t> coordinates;  ///< x, y of all vertices

  /// Empties the polygon; memory stays.
  void Clear() {
    holes.clear();
    starts.clear();
    coordinates.clear();
  }
};

/// Takes the polygons that a BoundaryTracer has completed.
class TracedPolygonSink {
 public:
  virtual ~TracedPolygonSink() = default;
  /// Says whether a polygon is wanted; one that isn't is dropped unseen.
  /// @param column  of a pixel of the polygon in the line above the nodes; one past the last for
  ///                the outside of the raster.
  virtual bool Wants(std::uint32_t column) = 0;
  /// Takes a polygon. It may be swapped for an empty one.
  /// @return false to stop the row.
  virtual bool Take(std::uint32_t column, TracedPolygon& polygon) = 0;
};

/// Follows the boundaries between the areas of a label raster from top to bottom, a row of nodes
/// (corners of pixels) at a time, and completes each polygon at the last node of its outer ring.
///
/// A boundary is a chain of vectors, one for each place where it began; a vector grows at both
/// ends. A union-find over the vectors finds a link that joins a chain to itself, which closes its
/// ring.
///
/// Cost: a row costs a few operations on words of 64 nodes, and constant time for each node where a
///       boundary turns, begins, ends or meets another. Memory follows the boundaries that are
///       open, and the holes of polygons that aren't complete.
/// Threads: one at a time.
/// Failure: std::bad_alloc; the tracer is of no use after it.
class BoundaryTracer {
 public:
  /// @param width  pixels in a line of the raster.
  explicit BoundaryTracer(std::uint32_t width);

  /// Walks the next row of nodes.
  /// @param up      edges in the line above: bit x between pixels x - 1 and x. Zeros at the top.
  /// @param down    the same of the line below. Zeros at the bottom.
  /// @param across  bit x where pixel x of the line above differs from the one below; all pixels at
  ///                the top and the bottom.
  /// @return false when the sink stopped the row.
  bool Walk(const ColumnBits& up, const ColumnBits& down, const ColumnBits& across,
            TracedPolygonSink& sink);

  /// The number of rows that were walked.
  std::uint32_t RowCount() const { return row_; }

 private:
  using Slot = std::uint32_t;  // of a vector; 0 for none
  using Point = Point2D<std::uint32_t>;

  // Which kind of corner an end of a vector is: convex ones of an area by number, the concave ones
  // of the area around it negative.
  enum Corner : signed char { kTopLeft = 1, kTopRight = 2, kBottomLeft = 3, kBottomRight = 4 };

  struct Vector {
    std::uint64_t id = 0;  // 0: free
    Slot next = 0;
    Slot above = 0;  // of the union-find; itself for the root of a chain
    // Of the root: the smallest of the vectors that enclose the chain, and whether it is a ring.
    Slot parent = 0;
    bool closed = false;
    signed char frontCorner = 0;
    signed char backCorner = 0;
    Point first;
    Point last;
    std::vector<Point> front;  // from the middle to the front end
    std::vector<Point> back;   // from the middle to the back end
    std::vector<Slot> holes;   // a vector of each ring that hangs here

    bool IsEmpty() const { return frontCorner == 0; }
    void AddFront(const Point& point, signed char corner);
    void AddBack(const Point& point, signed char corner);
  };

  /// The vectors that go on from a node into the row below.
  struct Below {
    Slot left = 0;
    Slot right = 0;
  };

  /// A node at which a ring may have closed.
  struct Ending {
    std::uint32_t x;
    Slot inside;   // of the area at the upper left
    Slot outside;  // of the area around it; 0 for a node that ends no such ring
  };

  /// The vectors that reach a node, and those that leave it to the right.
  struct Arriving {
    Slot a = 0;
    Slot b = 0;
  };

  Arriving Visit(std::uint32_t x, unsigned code, const Arriving& from);
  Slot New(Slot parent = 0);
  void Free(Slot slot);
  Slot RootOf(Slot slot);
  void Link(Slot from, Slot to);
  void HangHole(Slot slot);
  bool IsSmaller(Slot parent, Slot than) const;
  bool IsClosed(Slot slot);
  void Attach(Slot slot, signed char corner, const Point& point);
  bool Complete(const Ending& ending, TracedPolygonSink& sink);
  bool Emit(Slot start, std::uint32_t column, TracedPolygonSink& sink);
  void TakeRing(Slot start, bool isWanted, std::vector<Slot>& holes);

  std::uint32_t row_ = 0;
  std::uint64_t lastId_ = 0;
  std::vector<Vector> vectors_{1};
  std::vector<Slot> free_;
  std::vector<Below> below_;
  std::vector<Ending> endings_;
  TracedPolygon polygon_;
  std::vector<std::pair<Slot, bool>> pending_;  // rings to be emitted, and whether they are holes
};

}  // namespace lumo
