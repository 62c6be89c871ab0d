#include "mosaic/footprint_file.h"

#include "foundation/fault.h"
#include "mosaic/ring_simplifier.h"

namespace lumo {
namespace {

constexpr PolygonFileKind kFootprintFile{"MOSAIC51", "footprint file"};

// A ring of so many vertices or fewer is not thinned.
constexpr std::size_t kFewestVertices = 4;

/// A polygon as the vectorizer gives it.
Polygon2D<std::int32_t> MakePolygon(std::size_t rings, const unsigned char* holes,
                                    const std::uint32_t* starts, std::size_t coordinateCount,
                                    const std::uint32_t* coordinates) {
  Contour2DArray<std::int32_t> contours(rings);
  for (std::size_t ring = 0; ring < rings; ++ring) {
    const std::size_t vertices = coordinateCount / 2;
    const std::size_t end =
        ring + 1 < rings ? std::min<std::size_t>(starts[ring + 1], vertices) : vertices;
    contours[ring].hole = holes[ring] != 0;
    for (std::size_t at = starts[ring]; at < end; ++at) {
      contours[ring].points.push_back({static_cast<std::int32_t>(coordinates[2 * at]),
                                       static_cast<std::int32_t>(coordinates[2 * at + 1])});
    }
  }
  return Polygon2D<std::int32_t>(std::move(contours));
}

double AreaOf(const Contour2D<std::int32_t>& ring) {
  return Polygon2D<std::int32_t>({ring}).Measure(PolygonMeasure::kArea);
}

/// The rings of a polygon in plain memory.
struct FlatRings {
  std::vector<unsigned char> holes;
  std::vector<std::uint32_t> starts;
  std::vector<std::uint32_t> coordinates;

  void Add(const std::vector<Point2D<std::int32_t>>& points, bool isHole) {
    holes.push_back(isHole ? 1 : 0);
    starts.push_back(static_cast<std::uint32_t>(coordinates.size() / 2));
    for (const Point2D<std::int32_t>& point : points) {
      coordinates.push_back(static_cast<std::uint32_t>(point.x));
      coordinates.push_back(static_cast<std::uint32_t>(point.y));
    }
  }
};

}  // namespace

template <typename T, typename C>
MosaicFootPrintPolygonWriter<T, C>::MosaicFootPrintPolygonWriter(const URI& uri,
                                                                 unsigned bufferSize,
                                                                 float tolerance,
                                                                 double minimumArea)
    : PolygonFileWriter<T>(kFootprintFile, uri, bufferSize, PolygonFileGrowth::kBeside),
      tolerance_(tolerance),
      minimumArea_(minimumArea) {}

template <typename T, typename C>
bool MosaicFootPrintPolygonWriter<T, C>::Write(const T& label, const Array<bool>& holes,
                                               const Array<unsigned>& starts,
                                               const Array<C>& coordinates) {
  return this->IsOpen() &&
         (label == T() || PolygonFileWriter<T>::Write(label, holes, starts, coordinates));
}

template <typename T, typename C>
bool MosaicFootPrintPolygonWriter<T, C>::Write(const Polygon2D<C>& polygon) {
  if (polygon.Rings().empty()) return this->IsOpen();
  if (static_cast<T>(polygon.Label()) != T()) return PolygonFileWriter<T>::Write(polygon);
  Polygon2D<C> labelled(polygon);
  labelled.SetLabel(1);
  return PolygonFileWriter<T>::Write(labelled);
}

template <typename T, typename C>
bool MosaicFootPrintPolygonWriter<T, C>::WriteFlat(const T& label, std::size_t rings,
                                                   const unsigned char* holes,
                                                   const std::uint32_t* starts,
                                                   std::size_t coordinateCount,
                                                   const C* coordinates) {
  if (!this->IsOpen()) return false;
  if (label == T()) return true;
  const auto polygon = MakePolygon(rings, holes, starts, coordinateCount, coordinates);
  if (polygon.Measure(PolygonMeasure::kArea) < minimumArea_) return true;
  FlatRings thinned;
  for (const Contour2D<std::int32_t>& ring : polygon.Rings()) {
    if (ring.hole && AreaOf(ring) < minimumArea_) continue;
    thinned.Add(SimplifyRing(ring.points, tolerance_, kFewestVertices), ring.hole);
  }
  return this->PutRecord(label, thinned.holes.size(), thinned.holes.data(), thinned.starts.data(),
                         thinned.coordinates.size(), thinned.coordinates.data());
}

template <typename T, typename C>
MosaicFootPrintPolygonReader<T, C>::MosaicFootPrintPolygonReader(const URI& uri,
                                                                 unsigned bufferSize)
    : PolygonFileReader<T>(kFootprintFile, uri, bufferSize) {
  if (this->HasError() || this->Count() != 0) return;
  SetFault(uri.ToUTF8() + ": the footprint has no polygon");
  this->SetErrorState(PolygonErrorBadPolygon());
  this->CloseFile();
}

VEXG_INSTANCES(EIGHT, MosaicFootPrintPolygonWriter);
VEXG_INSTANCES(EIGHT, MosaicFootPrintPolygonReader);

template <typename T>
Polygon2D<std::uint32_t> ReadFootprint(const String& path) {
  MosaicFootPrintPolygonReader<T> reader{URI(path)};
  Contour2DArray<std::uint32_t> rings;
  double label = 1;
  for (unsigned i = 0; reader.IsValid() && i < reader.Count(); ++i) {
    Polygon2D<std::uint32_t> polygon;
    if (!reader.Read(polygon)) {
      if (reader.IsValid()) {
        SetFault(path.ToUTF8() + ": polygon " + std::to_string(i + 1) + " of " +
                 std::to_string(reader.Count()) + " can't be read");
        reader.SetErrorState(ObjectErrorIO());
      }
      break;
    }
    if (i == 0) label = polygon.Label();
    rings.insert(rings.end(), polygon.Rings().begin(), polygon.Rings().end());
  }
  if (reader.IsValid()) return Polygon2D<std::uint32_t>(std::move(rings), label);
  Polygon2D<std::uint32_t> none;
  none.SetErrorState(reader);
  return none;
}

#define VEXG_READ_FOOTPRINT(T) \
  template VEXG_EXPORT Polygon2D<std::uint32_t> ReadFootprint<T>(const String&);
VEXG_FOR_ALL(EIGHT, VEXG_READ_FOOTPRINT);
#undef VEXG_READ_FOOTPRINT

}  // namespace lumo
