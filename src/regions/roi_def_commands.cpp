#include "commands/command.h"
#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"
#include "regions/pixel_address_roi_def.h"
#include "regions/region_states.h"
#include "regions/shape_file.h"

// The commands that make regions of interest, and describe them.

namespace lumo {
namespace {

const OutputDeclaration kRegion{"URI", ValueKind::kURI, "the region"};

const CommandDeclaration kCreatePixelAddress{"CreatePixelAddressROIDefCommand",
                                             "Regions",
                                             "Makes a region of interest of single pixels, "
                                             "without any.",
                                             {},
                                             {kRegion}};

class CreatePixelAddressROIDefCommand final : public Command {
  CommandResult Execute() override {
    const ROIDefPtr region(new PixelAddressROIDef);
    CatalogAdd(region);
    Write("URI", region->GetURI());
    return Succeed();
  }
};

const CommandFactoryT<CreatePixelAddressROIDefCommand> createPixelAddressFactory(
    kCreatePixelAddress);

const CommandDeclaration kSetPixelAddress{
    "SetPixelAddressCommand",
    "Regions",
    "Replaces the pixels of a region of interest.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the region"},
     {"Addrs", Presence::kRequired, ValueKind::kIntegerArray,
      "x, y of each pixel, from 0; an odd last number is left out"}},
    {}};

class SetPixelAddressCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const PixelAddressROIDefPtr region(CatalogFind(Read<URI>("SrcURI")));
    if (!region) return Fail("SrcURI: there is no such region of pixels");
    const auto numbers = Read<Array<unsigned long long>>("Addrs");
    const bool isArray = Read<String>("Addrs").ToUTF8().find('[') != std::string::npos;
    if (!isArray || !numbers.IsValid())
      return Fail("Addrs: the text isn't an array of whole numbers");
    Array<Point2D<unsigned>> points;
    if (!points.Resize(ArrayDims(numbers.GetCount() / 2))) {
      return Fail("Addrs: there is no memory for the pixels");
    }
    for (unsigned i = 0; i < points.GetCount(); ++i) {
      points[i] = {static_cast<unsigned>(numbers[2 * i]),
                   static_cast<unsigned>(numbers[2 * i + 1])};
    }
    return region->SetAddresses(points) ? Succeed()
                                        : Fail("Addrs: the pixels lie too far apart for a region");
  }
};

const CommandFactoryT<SetPixelAddressCommand> setPixelAddressFactory(kSetPixelAddress);

const CommandDeclaration kCreateGeometry{
    "CreateGeometryROIDefCommand",
    "Regions",
    "Makes a region of interest of the shapes of vector files. A command of this library's own.",
    {{"Vectors", Presence::kRequired, ValueKind::kTextList, "the files"},
     {"Layer", Presence::kOptional, ValueKind::kText,
      "a layer of each file, by its name or its number from 0; all layers when absent"},
     {"Where", Presence::kOptional, ValueKind::kText,
      "FIELD=VALUE: only records with that value; all when absent"},
     {"ScanRules", Presence::kOptional, ValueKind::kWord,
      "Told: columns compare as they come out; Steady: equal neighbours among the vertices are "
      "dropped, and columns compare with a tolerance, so that a polygon moved by whole pixels "
      "keeps its mask",
      "", &WordsIn<ScanRules>},
     {"Coordinates", Presence::kOptional, ValueKind::kWord,
      "Told: coordinates are pixels unless the shapes have a coordinate system and the raster a "
      "geo-reference; Map: they are the map's wherever the raster has a geo-reference; Pixel: "
      "pixels",
      "", &WordsIn<ShapeCoordinates>}},
    {kRegion, {"Shapes", ValueKind::kInteger, "how many records it has"}}};

class CreateGeometryROIDefCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    layer_ = Read<String>("Layer").ToUTF8();
    where_ = Read<String>("Where").ToUTF8();
    if (HasInput("ScanRules")) options_.rules = Read<ScanRules>("ScanRules");
    if (HasInput("Coordinates")) options_.coordinates = Read<ShapeCoordinates>("Coordinates");
    std::string files;
    for (const String& path : Read<Array<String>>("Vectors")) {
      files += (files.empty() ? "" : ", ") + path.ToUTF8();
      if (!AddFile(path.ToUTF8())) return Fail(FaultOfShapes(path.ToUTF8()));
    }
    if (shapes_ == 0) {
      return Fail(files +
                  (where_.empty() ? ": there is no shape in it" : ": no shape has " + where_));
    }
    const ROIDefPtr region = MakeRegion();
    CatalogAdd(region);
    Write("URI", region->GetURI());
    Write("Shapes", shapes_);
    return Succeed();
  }

  bool AddFile(const std::string& path) {
    const VectorRecordSourcePtr source = OpenShapes(path);
    if (!source) return false;
    const std::vector<std::uint32_t> layers = FindLayers(*source, layer_);
    for (const std::uint32_t layer : layers) {
      const GeometryPtr shapes = ReadShapes(*source, {layer, where_, {}}, GetIPC());
      if (!shapes) return false;
      if (shapes->RecordCount() == 0) continue;
      shapes_ += shapes->RecordCount();
      children_.emplace_back(new GeometryROIDef(shapes, options_));
    }
    return !layers.empty();
  }

  /// The region of the only layer with shapes, or a group.
  ROIDefPtr MakeRegion() const {
    if (children_.size() == 1) return children_.front();
    Array<ROIDefPtr> children{ArrayDims(static_cast<unsigned>(children_.size()))};
    std::copy(children_.begin(), children_.end(), children.begin());
    return ROIDefPtr(new GroupROIDef(children));
  }

  std::string layer_;
  std::string where_;
  ScanOptions options_;
  std::vector<ROIDefPtr> children_;
  std::uint64_t shapes_ = 0;
};

const CommandFactoryT<CreateGeometryROIDefCommand> createGeometryFactory(kCreateGeometry);

const CommandDeclaration kMeasure{
    "MeasureROICommand",
    "Regions",
    "Tells which pixels of a raster a region of interest covers. A command of this library's own.",
    {RasterURIInput(),
     {"ROIDefURI", Presence::kRequired, ValueKind::kURI, "the region"},
     {"SubRect", Presence::kOptional, ValueKind::kRectangle,
      "of the raster, where alone it is looked for; all when absent"}},
    {{"Pixels", ValueKind::kInteger, "how many of the raster are in the region"},
     {"SubRect", ValueKind::kRectangle,
      "the smallest rectangle with all of them; absent without any"}}};

class MeasureROICommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    if (raster->Samples() == 0 || raster->Lines() == 0) return Fail("URI: the raster has no pixel");
    const ROIDefPtr definition(CatalogFind(Read<URI>("ROIDefURI")));
    if (!definition) return Fail("ROIDefURI: there is no such region");
    const RasterizedROIPtr region =
        RasterizeOn(definition, raster->Samples(), raster->Lines(), raster->GetRasterDef().geoRef);
    const SubRect all(0, 0, raster->Samples() - 1, raster->Lines() - 1);
    const SubRect rect =
        HasInput("SubRect") ? Read<SubRect>("SubRect").Clip(all.right, all.bottom) : all;
    RegionExtent extent;
    if (!region || !MeasureRegion(*region, rect, GetIPC(), extent)) {
      return Fail(TakeFaultOr("the region can't be put on the raster"));
    }
    Write("Pixels", extent.pixels);
    if (extent.pixels != 0) Write("SubRect", extent.bounds);
    return Succeed();
  }
};

const CommandFactoryT<MeasureROICommand> measureFactory(kMeasure);

}  // namespace
}  // namespace lumo
