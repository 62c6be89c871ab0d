#include <filesystem>
#include <numeric>

#include <fmt/format.h>

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"
#include "regions/shape_file.h"
#include "regions/zonal_pass.h"

namespace lumo {
namespace {

const CommandDeclaration kZonal{
    "ZonalStatisticsCommand",
    "Regions",
    "Makes a table of what the pixels inside each shape of a vector file add up to. A command of "
    "this library's own.",
    WithShareInputs(
        {RasterURIInput(),
         {"Vectors", Presence::kRequired, ValueKind::kText, "the file of shapes, one zone each"},
         {"Table", Presence::kRequired, ValueKind::kText,
          "the file to make, in the format of its ending: a row for each record with its own "
          "fields "
          "and, for each band, its figures; .csv has no shapes"},
         {"Layer", Presence::kOptional, ValueKind::kText,
          "a layer of the file, by its name or its number from 0; the first when absent"},
         {"Where", Presence::kOptional, ValueKind::kText,
          "FIELD=VALUE: only records with that value; all when absent"},
         {"Bands", Presence::kOptional, ValueKind::kIntegerArray, "from 0; all when absent"},
         {"Figures", Presence::kOptional, ValueKind::kTextList,
          "of count, min, max, mean, std, sum, median, majority, minority, variety, and p with a "
          "percentage, as p10; the first six when absent"},
         {"Weights", Presence::kOptional, ValueKind::kWord,
          "None: each pixel of a zone counts 1; Coverage: the share of it that lies inside", "",
          &WordsIn<ZonalWeights>},
         {"Pixels", Presence::kOptional, ValueKind::kWord,
          "of zones without weights; see RasterizeCommand", "", &WordsIn<PixelRule>},
         {"ScanRules", Presence::kOptional, ValueKind::kWord, "see CreateGeometryROIDefCommand", "",
          &WordsIn<ScanRules>},
         {"Coordinates", Presence::kOptional, ValueKind::kWord, "see CreateGeometryROIDefCommand",
          "", &WordsIn<ShapeCoordinates>}}),
    {{"Zones", ValueKind::kInteger, "how many rows there are"},
     {"Empty", ValueKind::kInteger, "how many of them have no valid pixel in any band"}}};

class ZonalStatisticsCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster || !ReadPlan(*raster)) return Fail();
    path_ = Read<String>("Vectors").ToUTF8();
    source_ = OpenShapes(path_);
    if (!source_ || !ReadZones()) return Fail(FaultOfShapes(path_));
    ShareScope shares;
    if (!shares.Begin({HasInput(kShareInput), Read<Array<unsigned>>(kShareInput),
                       Read<String>(kShareFileInput), Read<Array<String>>(kShareFilesInput)},
                      KeyOfShares(*raster))) {
      return Fail();
    }
    bool isDone = false;
    const bool isKnown = DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      isDone = shares.Joins() ? TakeFigures(shares) : Compute<T>(RasterPtr<T>(raster), shares);
      return true;
    });
    if (!isKnown) return Fail("URI: there are no zones on this pixel type");
    if (!isDone) return Fail(TakeFaultOr("the raster can't be read"));
    if (!shares.End()) return Fail();
    if (shares.IsShare()) return Succeed();
    if (!WriteTable()) return Fail(TakeFaultOr("the table can't be written"));
    Write("Zones", rows_);
    Write("Empty", empty_);
    return Succeed();
  }

  std::string KeyOfShares(const BasicRaster& raster) const {
    std::string figures;
    for (const ZonalRequest& request : plan_.requests) figures += request.name + "|";
    return fmt::format("zones {} {} {} {} {} {} {}", raster.DataType(), raster.Samples(),
                       raster.Lines(), FormatValue(plan_.bands).ToUTF8(), figures,
                       static_cast<int>(plan_.weights), plan_.geometry->RecordCount());
  }

  /// Computes the figures of all zones, or of those of a share.
  template <typename T>
  bool Compute(const RasterPtr<T>& raster, ShareScope& shares) {
    ZonalPass<T> pass(raster, plan_);
    if (!shares.IsShare()) {
      const bool isDone = pass.Run(GetIPC());
      figures_ = pass.GetFigures();
      return isDone;
    }
    if (!pass.RunShare(shares.GetShare(), GetIPC())) return false;
    for (const std::uint32_t zone : pass.GetZones()) {
      shares.Out().Put(zone);
      shares.Out().PutAll(pass.GetFigures().data() + zone * FigureCount(), FigureCount());
    }
    return true;
  }

  /// Takes the figures of all zones out of the files of the shares.
  bool TakeFigures(ShareScope& shares) {
    const std::uint32_t zones = plan_.geometry->RecordCount();
    figures_.resize(zones * FigureCount());
    std::uint32_t taken = 0;
    for (unsigned i = 0; i < shares.Count(); ++i) {
      ShareReader* const in = shares.In(i);
      if (in == nullptr) return false;
      for (std::uint32_t zone = 0; !in->IsAtEnd(); ++taken) {
        if (!in->Get(zone) || zone >= zones ||
            !in->GetAll(figures_.data() + zone * FigureCount(), FigureCount())) {
          SetFault("the files of the shares don't hold the figures of these zones");
          return false;
        }
      }
    }
    if (taken == zones) return true;
    SetFault("the files of the shares don't hold the figures of all zones");
    return false;
  }

  bool ReadPlan(const BasicRaster& raster) {
    plan_.bands = Read<Array<unsigned>>("Bands");
    if (!HasInput("Bands")) {
      plan_.bands.Resize(ArrayDims(raster.Bands()));
      std::iota(plan_.bands.begin(), plan_.bands.end(), 0U);
    }
    if (!CheckBands(raster, plan_.bands)) return false;
    auto names = Read<Array<String>>("Figures");
    if (!HasInput("Figures")) names = ParseValue<Array<String>>("count|min|max|mean|std|sum");
    for (const String& name : names) {
      plan_.requests.emplace_back();
      if (!ParseZonalRequest(name.ToUTF8(), plan_.requests.back())) return false;
    }
    if (HasInput("Weights")) plan_.weights = Read<ZonalWeights>("Weights");
    if (HasInput("Pixels")) plan_.options.pixels = Read<PixelRule>("Pixels");
    if (HasInput("ScanRules")) plan_.options.rules = Read<ScanRules>("ScanRules");
    if (HasInput("Coordinates")) plan_.options.coordinates = Read<ShapeCoordinates>("Coordinates");
    return true;
  }

  bool ReadZones() {
    const std::vector<std::uint32_t> layers = FindLayers(*source_, Read<String>("Layer").ToUTF8());
    if (layers.empty()) return false;
    selection_ = {layers.front(), Read<String>("Where").ToUTF8(), {}};
    plan_.geometry = ReadShapes(*source_, selection_, GetIPC());
    if (!plan_.geometry) return false;
    if (plan_.weights == ZonalWeights::kNone) return true;
    for (std::uint32_t zone = 0; zone < plan_.geometry->RecordCount(); ++zone) {
      if (plan_.geometry->RecordKind(zone) == kPolygonRecord) continue;
      SetFault("only polygons cover shares of pixels; there are points or lines");
      return false;
    }
    return true;
  }

  /// A name for a column that no other one has, in letters of whichever case.
  static std::string FreeName(const std::string& name, const std::vector<VectorField>& fields) {
    std::string free = name;
    const auto isTaken = [&](const VectorField& field) { return AreSameName(field.name, free); };
    for (int number = 2; std::any_of(fields.begin(), fields.end(), isTaken); ++number) {
      free = std::string(name).append("_").append(std::to_string(number));
    }
    return free;
  }

  static std::string NameOfBand(unsigned band) {
    return std::string("b").append(std::to_string(band));
  }

  /// The layer of the table: the shapes' own fields, then the figures.
  VectorLayer Describe(const std::string& table) const {
    VectorLayer layer = source_->Layer(selection_.layer);
    layer.name = std::filesystem::path(table).stem().string();
    layer.hasShapes = std::filesystem::path(table).extension() != ".csv";
    for (const unsigned band : plan_.bands) {
      for (const ZonalRequest& request : plan_.requests) {
        std::string name = request.name;
        if (plan_.bands.GetCount() != 1) name = NameOfBand(band).append("_").append(name);
        const bool isWhole =
            request.figure == ZonalFigure::kVariety ||
            (request.figure == ZonalFigure::kCount && plan_.weights == ZonalWeights::kNone);
        layer.fields.push_back({FreeName(name, layer.fields),
                                isWhole ? VectorFieldType::kInteger : VectorFieldType::kReal});
      }
    }
    return layer;
  }

  bool WriteTable() {
    VectorRecordFactory* const factory = GetVectorRecordFactory();
    const std::string table = Read<String>("Table").ToUTF8();
    const VectorLayer own = source_->Layer(selection_.layer);
    const VectorLayer layer = Describe(table);
    RecordFilter filter;
    if (!filter.Set(own, selection_.where) || !source_->Begin(selection_.layer, nullptr)) {
      return false;
    }
    const VectorRecordSinkPtr sink = factory->Create(table, layer);
    if (!sink) return false;
    VectorRecord record;
    std::size_t zone = 0;
    TakeFault();
    while (source_->Next(record)) {
      if (!filter.Accepts(record)) continue;
      const bool isZone = !record.partEnds.empty();
      record.values.resize(own.fields.size());
      AddFigures(isZone ? figures_.data() + zone * FigureCount() : nullptr, layer, record);
      if (isZone) ++zone;
      if (zone > plan_.geometry->RecordCount() || !sink->Write(record)) return false;
      if (rows_++ % 1024 == 0 && GetIPC().abort->IsSet()) return false;
    }
    const String fault = TakeFault();
    if (fault.GetLength() == 0) return sink->Close();
    SetFault(fault);
    return false;
  }

  std::size_t FigureCount() const { return plan_.bands.GetCount() * plan_.requests.size(); }

  /// Puts the figures of a zone behind the values of its record; of one without a shape null.
  void AddFigures(const double* figures, const VectorLayer& layer, VectorRecord& record) {
    bool isEmpty = true;
    for (std::size_t i = 0; i < FigureCount(); ++i) {
      const ZonalFigure figure = plan_.requests[i % plan_.requests.size()].figure;
      const bool isCount = figure == ZonalFigure::kCount || figure == ZonalFigure::kVariety;
      const double value = figures != nullptr ? figures[i] : isCount ? 0 : std::nan("");
      isEmpty = isEmpty && (std::isnan(value) || (isCount && value == 0));
      const bool isWhole = layer.fields[record.values.size()].type == VectorFieldType::kInteger;
      if (std::isnan(value)) {
        record.values.emplace_back();
      } else if (isWhole) {
        record.values.emplace_back(static_cast<std::int64_t>(value));
      } else {
        record.values.emplace_back(value);
      }
    }
    empty_ += isEmpty;
  }

  std::string path_;
  VectorRecordSourcePtr source_;
  ShapeSelection selection_;
  ZonalPlan plan_;
  std::vector<double> figures_;
  std::uint64_t rows_ = 0;
  std::uint64_t empty_ = 0;
};

const CommandFactoryT<ZonalStatisticsCommand> zonalStatisticsFactory(kZonal);
const DivisionRegistration zonalStatisticsDivision({.command = "ZonalStatisticsCommand",
                                                    .kind = DivisionKind::kShares,
                                                    .source = "URI",
                                                    .makes = {"Table"}});

}  // namespace
}  // namespace lumo
