#include <filesystem>

#include <fmt/format.h>

#include "commands/division.h"
#include "foundation/fault.h"
#include "geometry/area_share.h"
#include "geometry/fxv_file.h"
#include "geometry/raster_to_vector.h"
#include "geometry/record_writer.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

const CommandDeclaration kPolygonize{
    "PolygonizeCommand",
    "Vectors",
    "Turns areas of equal value of a raster into polygons of a vector file. A command of this "
    "library's own.",
    WithShareInputs(
        {RasterURIInput(),
         {"Vectors", Presence::kRequired, ValueKind::kText,
          "the file to make, in the format of its ending: .fxv, or one of a vector plug-in"},
         {"Band", Presence::kOptional, ValueKind::kInteger, "from 0; 0 when absent"},
         {"MaskURI", Presence::kOptional, ValueKind::kURI,
          "a raster of the same size; where its first band is 0 or not valid, pixels do not count"},
         {"Layer", Presence::kOptional, ValueKind::kText,
          "name of the layer; the file's name without its ending when absent"},
         {"Field", Presence::kOptional, ValueKind::kText,
          "name of the column of values; label when absent"},
         {"MinSize", Presence::kOptional, ValueKind::kNumber,
          "smaller polygons are left out, which leaves their places empty; none when absent",
          "pixels"}}),
    {{"Polygons", ValueKind::kInteger, "how many were written"},
     {"LeftOut", ValueKind::kInteger, "how many were too small"},
     {"Warning", ValueKind::kText,
      "what the user should know of the result; absent when there is nothing"}}};

using FxvWriter = FxvPolygonWriter<std::int32_t, std::uint32_t>;

class PolygonizeCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    path_ = Read<String>("Vectors").ToUTF8();
    band_ = HasInput("Band") ? Read<unsigned>("Band") : 0;
    if (band_ >= raster->Bands()) {
      return Fail("Band: the raster has " + std::to_string(raster->Bands()) + " bands");
    }
    if (HasInput("MaskURI") && !FindMask(*raster)) return Fail();
    bool isDone = false;
    const bool isKnown = DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      isDone = HasInput(kShareInput) ? MakeShare(source) : Polygonize(source);
      return true;
    });
    if (!isKnown) return Fail("URI: a raster of this pixel type can't be vectorized");
    if (!isDone) return Fail(TakeFaultOr("the raster could not be vectorized"));
    if (HasInput(kShareInput)) return Succeed();
    Write("Polygons", written_);
    Write("LeftOut", leftOut_);
    if (changed_ != 0) {
      Write("Warning", String(std::to_string(changed_) +
                              " polygons have a value that the file can't hold; they stand there "
                              "under another"));
    }
    return Succeed();
  }

  bool FindMask(const BasicRaster& raster) {
    const BasicRasterPtr mask = FindRaster("MaskURI");
    if (!mask) return false;
    const bool fits = mask->Samples() == raster.Samples() && mask->Lines() == raster.Lines();
    mask_ = fits ? MakeLabelMask(mask) : LabelMaskPtr();
    if (!mask_) {
      SetFault(fits ? "MaskURI: a raster of this pixel type can't be a mask"
                    : "MaskURI: the mask has another size than the raster");
    }
    return bool(mask_);
  }

  template <typename T>
  bool Polygonize(const RasterPtr<T>& raster) {
    return IsFxvName(path_) ? ToFxv<T>(raster) : ToRecords<T>(raster);
  }

  /// True where the polygons come out of the files of shares.
  bool Joins() const { return Read<Array<String>>(kShareFilesInput).GetCount() != 0; }

  std::string KeyOfShares(const BasicRaster& raster) const {
    return fmt::format("polygons {} {} {} {} {}", raster.DataType(), raster.Samples(),
                       raster.Lines(), band_, bool(mask_));
  }

  template <typename T>
  bool MakeShare(const RasterPtr<T>& raster) {
    Share share;
    if (!ReadShare(Read<Array<unsigned>>(kShareInput), share)) return false;
    const std::string file = Read<String>(kShareFileInput).ToUTF8();
    if (file.empty() || Joins()) {
      SetFault("Share goes with ShareFile, and not with ShareFiles");
      return false;
    }
    ShareWriter out;
    return PutAreas<T>(raster, band_, mask_, share, out, GetIPC()) &&
           out.Write(file, KeyOfShares(*raster), share);
  }

  /// Writes the polygons of all shares.
  template <typename T>
  bool TakeShares(const BasicRaster& raster, const ObjectPtr& writer) {
    constexpr unsigned kAtOnce = 1024;
    std::vector<std::string> files;
    for (const String& file : Read<Array<String>>(kShareFilesInput)) {
      files.push_back(file.ToUTF8());
    }
    JoinedAreas areas(files, KeyOfShares(raster), raster.Lines());
    LabelCounts counts;
    TracedPolygon polygon;
    double label = 0;
    PolygonBatch batch;
    bool isThere = true;
    while (isThere) {
      batch.Clear();
      for (unsigned i = 0; i < kAtOnce && isThere; ++i) {
        isThere = areas.Next(label, polygon);
        if (isThere) batch.Take(label, polygon);
      }
      if (areas.HasFailed() || !batch.WriteTo<T>(*writer, counts)) return false;
      if (!GetIPC().abort->IsSet()) continue;
      SetFault("the vectorizing was aborted");
      return false;
    }
    changed_ = counts.changed;
    written_ = counts.polygons;
    return true;
  }

  /// Runs the process into a writer. False, with the fault set, when not all polygons are written.
  template <typename T>
  bool Run(const RasterPtr<T>& raster, const ObjectPtr& writer) {
    if (Joins()) return TakeShares<T>(*raster, writer);
    RasterToVectorProcess<T> process(raster, band_, writer, GetIPC());
    process.SetMask(mask_);
    const bool hasRun = process.RunProcess(process.kHere);
    changed_ = process.Counts().changed;
    written_ = process.Counts().polygons;
    const bool isAborted = GetIPC().abort->IsSet();
    if (hasRun && !isAborted) return true;
    SetFault(isAborted ? String("the vectorizing was aborted") : process.GetFault());
    return false;
  }

  template <typename T>
  bool ToFxv(const RasterPtr<T>& raster) {
    if (HasInput("MinSize")) {
      SetFault("MinSize: an FXV file holds all polygons");
      return false;
    }
    const Pointer<FxvWriter> writer(new FxvWriter(URI(String(path_))));
    if (!writer->IsValid()) return false;
    if (Run<T>(raster, writer)) return writer->Close();
    writer->Abandon();
    return false;
  }

  template <typename T>
  bool ToRecords(const RasterPtr<T>& raster) {
    VectorRecordFactory* const factory = GetVectorRecordFactory();
    if (factory == nullptr) return false;
    PolygonRecordOptions options;
    options.geoRef = raster->GetRasterDef().geoRef;
    options.leastPixels = HasInput("MinSize") ? Read<double>("MinSize") : 0;
    const VectorRecordSinkPtr sink = factory->Create(path_, Describe<T>(options.geoRef));
    if (!sink) return false;
    auto* const records = new RecordPolygonWriter<T>(sink, options);
    const ObjectPtr writer(records);
    if (!Run<T>(raster, writer)) return false;
    written_ = records->Written();
    leftOut_ = records->LeftOut();
    return sink->Close();
  }

  template <typename T>
  VectorLayer Describe(const GeoRefPtr& geoRef) {
    VectorLayer layer;
    layer.name = HasInput("Layer") ? Read<String>("Layer").ToUTF8()
                                   : std::filesystem::path(path_).stem().string();
    layer.geometry = VectorGeometry::kPolygon;
    if (geoRef) layer.coordSys = geoRef->CoordinateSystem();
    const std::string field = HasInput("Field") ? Read<String>("Field").ToUTF8() : "label";
    layer.fields = {
        {field, std::is_integral_v<T> ? VectorFieldType::kInteger : VectorFieldType::kReal}};
    return layer;
  }

  std::string path_;
  LabelMaskPtr mask_;
  unsigned band_ = 0;
  std::uint64_t written_ = 0;
  std::uint64_t leftOut_ = 0;
  std::uint64_t changed_ = 0;
};

const CommandFactoryT<PolygonizeCommand> polygonizeFactory(kPolygonize);
const DivisionRegistration polygonizeDivision({.command = "PolygonizeCommand",
                                               .kind = DivisionKind::kShares,
                                               .source = "URI",
                                               .makes = {"Vectors"}});

}  // namespace
}  // namespace lumo
