// A plug-in as small as one can be: it brings a format of its own, "Plane". Its sources are no
// files but formulas, "plane:<samples>x<lines>", whose pixel is sample + 2 * line. Build it as a
// shared library against vexg under a name that begins with libvexgformat_, and put it into the
// folder vexg/plugins-<version> beside libvexg.so or into the environment's binary directory.

#include <cstdio>

#include "data/plain_factory.h"
#include "data/plain_raster_reader.h"
#include "foundation/fault.h"

namespace {

using lumo::Array;
using lumo::String;

class PlaneReader final : public lumo::PlainRasterReader<float> {
 public:
  PlaneReader(lumo::RasterDataConnection* connection, unsigned samples, unsigned lines)
      : PlainRasterReader(connection), samples_(samples), lines_(lines) {}

  lumo::RasterDef RasterDef() override {
    lumo::RasterDef def;
    def.samples = samples_;
    def.lines = lines_;
    def.bands = 1;
    def.interleave = lumo::Interleave::BSQ;
    def.dataType = lumo::kDataTypeOf<float>;
    def.format = "Plane";
    return def;
  }

  bool ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                  const Array<unsigned>& bands, unsigned level, float* pixels,
                  unsigned char*) override {
    if (level != 0) return false;
    for (unsigned i = 0; i < bands.GetCount(); ++i)
      for (unsigned y = top; y < top + height; ++y)
        for (unsigned x = left; x < left + width; ++x)
          *pixels++ = static_cast<float>(x) + 2 * static_cast<float>(y);
    return true;
  }

 private:
  const unsigned samples_;
  const unsigned lines_;
};

/// The size in a source's name; false for a name of another kind.
bool ReadSize(const Array<String>& connStrings, unsigned& samples, unsigned& lines) {
  Array<String> rest;
  lumo::RemoveFormatNames(connStrings, rest);
  char after = 0;
  return rest.GetCount() == 1 &&
         std::sscanf(rest[0].ToUTF8().c_str(), "plane:%ux%u%c", &samples, &lines, &after) == 2 &&
         samples > 0 && lines > 0;
}

class PlaneConnection final : public lumo::PlainRasterConnection {
 public:
  bool Connect(const Array<String>& connStrings, const lumo::GeoRefPtr&,
               const lumo::MetadataPtr&) override {
    unsigned samples = 0, lines = 0;
    if (!ReadSize(connStrings, samples, lines)) {
      lumo::SetFault("a plane is named \"plane:<samples>x<lines>\"");
      return false;
    }
    const lumo::RasterReaderPtr<float> reader(new PlaneReader(this, samples, lines));
    SetOpened(connStrings,
              lumo::URI(String("plane:" + std::to_string(samples) + "x" + std::to_string(lines))),
              reader);
    return true;
  }
};

class PlaneFactory final : public lumo::PlainFactory {
 public:
  PlaneFactory() : PlainFactory("Plane") {}

  bool CanConnect(const Array<String>& connStrings) override {
    unsigned samples = 0, lines = 0;
    return ReadSize(connStrings, samples, lines);
  }
  lumo::DataConnectionPtr CreateRaster(const Array<String>&, const lumo::RasterDef&) override {
    return FailWith("a plane can't be made");
  }

 private:
  lumo::DataConnection* Make() override { return new PlaneConnection; }
};

}  // namespace

/// The entry point of every plug-in.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  static PlaneFactory factory;
  return record->name == "Plane" ? &factory : nullptr;
}

/// The formats that this plug-in brings.
extern "C" VEXG_EXPORT const lumo::FormatDescription* DescribeFormats(std::uint32_t* count) {
  static const lumo::FormatDescription plane{"Plane", "", lumo::DataSourceKind::kRaster};
  *count = 1;
  return &plane;
}
