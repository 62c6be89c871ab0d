// An FXV file: it opens or it doesn't; of one that opens all records are read, through deques and
// as polygons alike, and written again they give the same records.

#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <string>

#include "geometry/fxv_file.h"
#include "support/temporary_directory.h"

namespace {

using Reader = lumo::FxvPolygonReader<std::int32_t, std::uint32_t>;
using Writer = lumo::FxvPolygonWriter<std::int32_t, std::uint32_t>;
using lumo::URI;

void Check(bool condition) {
  if (!condition) std::abort();
}

struct Record {
  std::int32_t label = 0;
  lumo::Deque<bool> holes;
  lumo::Deque<unsigned> starts;
  lumo::Deque<std::uint32_t> coordinates;

  bool ReadFrom(Reader& reader) { return reader.Read(label, holes, starts, coordinates); }
};

template <typename T>
bool AreEqual(const lumo::Deque<T>& a, const lumo::Deque<T>& b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const lumo::test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "shapes.fxv").string();
  const std::string copy = (directory.Path() / "copy.fxv").string();
  std::ofstream(path, std::ios::binary)
      .write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(size));
  Reader reader{URI{lumo::String(path)}, 1024};
  if (!reader.IsValid()) return 0;
  unsigned records = 0;
  {
    Writer writer{URI{lumo::String(copy)}, 1024};
    for (Record record; record.ReadFrom(reader); ++records) {
      Check(writer.Write(record.label, record.holes, record.starts, record.coordinates));
    }
    Check(writer.Close());
  }
  Reader first{URI{lumo::String(path)}}, again{URI{lumo::String(copy)}};
  Check(again.IsValid() && again.Count() == records);
  for (unsigned i = 0; i < records; ++i) {
    Record one, other;
    Check(one.ReadFrom(first) && other.ReadFrom(again) && one.label == other.label &&
          AreEqual(one.holes, other.holes) && AreEqual(one.starts, other.starts) &&
          AreEqual(one.coordinates, other.coordinates));
  }
  Reader polygons{URI{lumo::String(path)}};
  for (lumo::Polygon2D<std::uint32_t> polygon; polygons.Read(polygon);) {
    polygon.Measure(lumo::PolygonMeasure::kSignedArea);
    Check(polygon.ConvexHull().Rings().size() <= 1);
  }
  return 0;
}
