#include <algorithm>
#include <cmath>
#include <map>

#include <fmt/format.h>

#include "commands/division.h"
#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/attribute_inputs.h"
#include "fx/region_shapes.h"
#include "fx/vector_attributes_process.h"
#include "geometry/area_share.h"
#include "geometry/fxv_file.h"

namespace lumo {
namespace {

const CommandDeclaration kVectorAttributes{
    "FxComputeVectorAttributesCommand",
    "Feature extraction",
    "Computes the shapes of regions from their polygons.",
    WithShareInputs(
        {{"VectorFXV", Presence::kOptional, ValueKind::kText,
          "the file of polygons; required unless LabelURI is there"},
         {"SpatialFXA", Presence::kRequired, ValueKind::kText, "the file to create of shapes"},
         {"PixelXSize", Presence::kOptional, ValueKind::kNumber,
          "width of a pixel, whose sign does not count; 1 when absent", "map units"},
         {"PixelYSize", Presence::kOptional, ValueKind::kNumber,
          "height of a pixel, whose sign does not count; 1 when absent", "map units"},
         {"Parts", Presence::kOptional, ValueKind::kWord,
          "of several polygons of one label, as those that touch at a corner alone. Told: the "
          "values "
          "of the last one stay; Together: all their rings are one shape, and its hole count "
          "counts "
          "holes",
          "", &WordsIn<RegionParts>},
         {"LabelURI", Presence::kOptional, ValueKind::kURI,
          "the labels, of type Int or UInt, whose polygons are taken as they are found, in place "
          "of a "
          "file; shares are of these alone"}}),
    {}};

using FxvReader = FxvPolygonReader<std::int32_t, std::uint32_t>;
using Setup = SpatialSetup<SpatialRegionAttributesFile>;

class FxComputeVectorAttributesCommand final : public RegionCommand {
  CommandResult Execute() override {
    if (!CheckInputs() || !ReadSize()) return Fail();
    if (HasInput("Parts")) setup_->parts = Read<RegionParts>("Parts");
    if (HasInput(kShareInput)) {
      return MakeShare() ? Succeed() : Fail(TakeFaultOr("the shapes could not be computed"));
    }
    const bool isFile = HasInput("VectorFXV") || !HasInput("LabelURI");
    const bool isDone = isFile ? FromFile() : FromLabels();
    if (isDone) return Succeed();
    return FailWithout("the shapes could not be computed", Form::kExact);
  }

  bool ReadSize() {
    const auto read = [this](const char* name, double& size) {
      if (!HasInput(name)) return true;
      size = std::abs(Read<double>(name));
      if (std::isfinite(size) && size > 0) return true;
      SetFault(String(std::string(name) + ": a pixel has a size"));
      return false;
    };
    return read("PixelXSize", setup_->size.x) && read("PixelYSize", setup_->size.y);
  }

  bool CreateFile() {
    URI uri;
    if (!TakeOutput("SpatialFXA", uri)) return false;
    return CreateFileAt(uri);
  }

  bool CreateFileAt(const URI& uri) {
    setup_->file.Reset(new SpatialRegionAttributesFile(uri));
    if (!setup_->file->IsValid()) return false;
    NoteCreated(uri);
    return true;
  }

  IPC Share(double parts) const {
    return {GetIPC().abort,
            ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, 4, parts))};
  }

  bool FromFile() {
    URI from, to;
    if (!CheckRequired("VectorFXV") || !TakeOutput("SpatialFXA", to) ||
        !TakeExisting("VectorFXV", from)) {
      return false;
    }
    if (!CountLabels(from)) return false;
    const PolygonReaderPtr<std::int32_t, std::uint32_t> reader(new FxvReader(from));
    if (!reader->IsValid() || !CreateFileAt(to)) return false;
    SpatialRegionAttributesComputeProcess<std::int32_t, std::uint32_t, SpatialRegionAttributesFile>
        process(reader, setup_, Share(3));
    return HasRun(process) && setup_->file->Close();
  }

  /// Notes which labels come more than once, where that matters, and that the file is sound.
  bool CountLabels(const URI& from) {
    FxvReader reader(from);
    if (!reader.IsValid()) {
      SetFault(String("VectorFXV: " + from.ToUTF8() + " is no file of polygons"));
      return false;
    }
    if (setup_->parts == RegionParts::kTold) return true;
    std::int32_t label = 0;
    Array<bool> holes;
    Array<unsigned> starts;
    Array<std::uint32_t> coordinates;
    const IPC share = Share(1);
    for (unsigned i = 0; i < reader.Count(); ++i) {
      if (i % 1024 == 0) {
        if (share.abort->IsSet()) break;
        share.progress->Update(static_cast<double>(i) / reader.Count());
      }
      if (!reader.Read(label, holes, starts, coordinates)) break;  // as the process will find
      if (label < 0) break;
      unsigned char& count = setup_->counts[static_cast<std::uint32_t>(label)];
      if (count < 2) ++count;
    }
    return true;
  }

  /// True where the polygons come out of the files of shares.
  bool Joins() const { return Read<Array<String>>(kShareFilesInput).GetCount() != 0; }

  static std::string KeyOfShares(const BasicRaster& labels) {
    return fmt::format("shapes {} {} {}", labels.DataType(), labels.Samples(), labels.Lines());
  }

  /// Keeps the polygons of a share of the labels.
  bool MakeShare() {
    const BasicRasterPtr labels = FindLabels(nullptr);
    lumo::Share share;
    if (!labels || !ReadShare(Read<Array<unsigned>>(kShareInput), share)) return false;
    const std::string file = Read<String>(kShareFileInput).ToUTF8();
    if (file.empty() || Joins()) {
      SetFault("Share goes with ShareFile, and not with ShareFiles");
      return false;
    }
    ShareWriter out;
    const bool isDone = DispatchType(LabelTypes{}, labels->DataType(), [&]<typename L>() {
      return PutAreas<L>(RasterPtr<L>(labels), 0, {}, share, out, GetIPC());
    });
    return isDone && out.Write(file, KeyOfShares(*labels), share);
  }

  /// Finishes the shapes of the polygons of all shares.
  bool FromShares(const BasicRaster& labels, RecordSpool& spool) {
    std::vector<std::string> files;
    for (const String& file : Read<Array<String>>(kShareFilesInput)) {
      files.push_back(file.ToUTF8());
    }
    JoinedAreas areas(files, KeyOfShares(labels), labels.Lines());
    const bool isTogether = setup_->parts == RegionParts::kTogether;
    std::map<std::uint32_t, ShapeSums> shapes;
    const auto finish = [&](std::uint32_t label, const ShapeSums& shape) {
      return AddShape(spool, label, shape.GetValues(setup_->size, isTogether));
    };
    TracedPolygon polygon;
    double label = 0;
    for (std::uint64_t i = 0; areas.Next(label, polygon); ++i) {
      if (label < 0) {
        SetFault(String(fmt::format("there is a label below 0: {:.0f}", label)));
        return false;
      }
      ShapeSums shape;
      shape.Add(polygon, setup_->size);
      const auto region = static_cast<std::uint32_t>(label);
      if (isTogether) {
        const auto [at, isNew] = shapes.try_emplace(region, shape);
        if (!isNew) at->second.Merge(shape);
      } else if (!finish(region, shape)) {
        return false;
      }
      if (i % 1024 != 0 || !GetIPC().abort->IsSet()) continue;
      SetFault("the work was aborted");
      return false;
    }
    return !areas.HasFailed() && std::all_of(shapes.begin(), shapes.end(), [&](const auto& shape) {
      return finish(shape.first, shape.second);
    });
  }

  bool FromLabels() {
    const BasicRasterPtr labels = FindLabels(nullptr);
    if (!labels) return false;
    if (Joins()) {
      if (!CreateFile()) return false;
      RecordSpool joined(*setup_->file);
      return FromShares(*labels, joined) && joined.Flush() && setup_->file->Close();
    }
    LabelCensus census;
    if (!census.Run(labels, Share(1)) || !CreateFile()) return false;
    RecordSpool spool(*setup_->file);
    const bool isDone = DispatchType(LabelTypes{}, labels->DataType(), [&]<typename L>() {
      return ForEachRegion(
          RasterPtr<L>(labels), census, setup_->parts,
          [this](const TracedPolygon& polygon) {
            ShapeSums shape;
            shape.Add(polygon, setup_->size);
            return shape;
          },
          [](ShapeSums& to, const ShapeSums& from) { to.Merge(from); },
          [&](std::uint32_t label, const ShapeSums& shape) {
            const bool isTogether = setup_->parts == RegionParts::kTogether;
            return AddShape(spool, label, shape.GetValues(setup_->size, isTogether));
          },
          Share(3));
    });
    return isDone && spool.Flush() && setup_->file->Close();
  }

  Pointer<Setup> setup_{new Setup};
};

const CommandFactoryT<FxComputeVectorAttributesCommand> fxComputeVectorAttributesFactory(
    kVectorAttributes);
const DivisionRegistration fxComputeVectorAttributesDivision(
    {.command = "FxComputeVectorAttributesCommand",
     .kind = DivisionKind::kShares,
     .source = "LabelURI",
     .makes = {"SpatialFXA"}});

}  // namespace
}  // namespace lumo
