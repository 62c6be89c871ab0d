#include <algorithm>
#include <charconv>
#include <cmath>
#include <filesystem>

#include "commands/division.h"
#include "data/vector_records.h"
#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/attribute_csv.h"
#include "fx/attribute_inputs.h"
#include "fx/attribute_names.h"
#include "fx/region_kinds.h"
#include "fx/region_shapes.h"
#include "geometry/ring_touches.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

const CommandDeclaration kAttributeTable{
    "CreateAttributeTableCommand",
    "Feature extraction",
    "Makes a table of the regions of files, a row each. A command of this library's own.",
    {{"Table", Presence::kRequired, ValueKind::kText,
      "the file to make, in the format of its ending; .csv has no shapes"},
     {"SpectralFXA", Presence::kOptional, ValueKind::kText, "columns mean_b0, std_b0 and so on"},
     {"TextureFXA", Presence::kOptional, ValueKind::kText, "columns texture_range_b0 and so on"},
     {"EntropyFXA", Presence::kOptional, ValueKind::kText,
      "columns texture_entropy_n_b0 and so on"},
     {"MeansFXA", Presence::kOptional, ValueKind::kText,
      "columns mean_b0 and count_b0; not beside SpectralFXA"},
     {"IndexFXA", Presence::kOptional, ValueKind::kText,
      "spectral values of named bands: columns mean_NAME, std_NAME and so on"},
     {"IndexNames", Presence::kOptional, ValueKind::kTextList, "the names of these bands"},
     {"SpatialFXA", Presence::kOptional, ValueKind::kText, "columns area, perimeter and so on"},
     {"LabelURI", Presence::kOptional, ValueKind::kURI,
      "the labels, from which the regions get their polygons; none when absent"},
     {"Bands", Presence::kOptional, ValueKind::kIntegerArray,
      "the numbers by which the bands of the files are called; from 0 when absent"}},
    {{"Regions", ValueKind::kInteger, "how many rows there are"}}};

/// One of the stores of a table.
struct TableStore {
  AttributeKind kind;
  Pointer<RegionAttributesFile<float>> file;
  Array<String> names;  ///< of its bands; none where they have numbers
};

/// The double that is written as the float is, with the fewest digits that tell it from others.
double Shortest(float value) {
  char text[32];
  const auto end = std::to_chars(text, text + sizeof text, value).ptr;
  double number = static_cast<double>(value);
  std::from_chars(text, end, number);
  return number;
}

class CreateAttributeTableCommand final : public RegionCommand {
  CommandResult Execute() override {
    URI table;
    if (!CheckInputs() || !TakeOutput("Table", table) || !OpenStores()) return Fail();
    path_ = table.ToUTF8();
    const bool hasShapes = HasInput("LabelURI") && !IsCsv(path_);
    const BasicRasterPtr labels = hasShapes ? FindLabels(nullptr) : BasicRasterPtr();
    if (hasShapes && !labels) return Fail();
    if (labels) geoRef_ = labels->GetRasterDef().geoRef;
    const bool isDone = hasShapes ? WriteShapes(labels) : WriteRows();
    if (!isDone) return Fail(TakeFaultOr("the table can't be written"));
    Write("Regions", rows_);
    return Succeed();
  }

  static bool IsCsv(const std::string& path) {
    return std::filesystem::path(path).extension() == ".csv";
  }

  bool OpenStores() {
    constexpr struct {
      const char* input;
      AttributeKind kind;
    } kStores[] = {{"SpectralFXA", AttributeKind::kSpectral},
                   {"MeansFXA", AttributeKind::kMeans},
                   {"TextureFXA", AttributeKind::kTexture},
                   {"EntropyFXA", AttributeKind::kEntropy},
                   {"SpatialFXA", AttributeKind::kShape}};
    if (HasInput("SpectralFXA") && HasInput("MeansFXA")) {
      SetFault("MeansFXA: the means are columns of SpectralFXA already");
      return false;
    }
    for (const auto& [input, kind] : kStores) {
      if (HasInput(input) && !OpenStore(input, kind)) return false;
      const bool isBeforeShapes = kind == AttributeKind::kEntropy;
      if (isBeforeShapes && HasInput("IndexFXA") && !OpenIndexStore()) return false;
    }
    if (!stores_.empty()) return true;
    SetFault("there is no file of regions");
    return false;
  }

  /// Opens the store of spectral values of bands that have names.
  bool OpenIndexStore() {
    if (!OpenFile("IndexFXA", AttributeKind::kSpectral)) return false;
    stores_.back().names = Read<Array<String>>("IndexNames");
    if (stores_.back().names.GetCount() == stores_.back().file->Bands()) return true;
    SetFault("IndexNames: there are other bands in the file");
    return false;
  }

  bool OpenStore(const char* input, AttributeKind kind) {
    if (!OpenFile(input, kind)) return false;
    if (kind == AttributeKind::kShape || !HasInput("Bands")) return true;
    bands_ = Read<Array<unsigned>>("Bands");
    if (bands_.GetCount() == stores_.back().file->Bands()) return true;
    SetFault("Bands: there are other bands in the files");
    return false;
  }

  bool OpenFile(const char* input, AttributeKind kind) {
    URI uri;
    if (!TakeExisting(input, uri)) return false;
    const Pointer<RegionAttributesFile<float>> file(new RegionAttributesFile<float>(uri, false));
    AttributeKind found{};
    const bool isOfKind = file->IsValid() && FindKind({}, file->Attributes(), found) &&
                          AttributesOf(found) == AttributesOf(kind);
    if (!isOfKind) {
      SetFault(String(std::string(input) + ": " + uri.ToUTF8() + " is no such file of regions"));
      return false;
    }
    stores_.push_back({kind, file, {}});
    return true;
  }

  /// Attributes of a record, with the mark of presence.
  static std::size_t AttributesOf(AttributeKind kind) {
    return kind == AttributeKind::kShape ? std::size_t{SpatialRegionAttributes::kAttributes}
                                         : NamesOf(kind).size();
  }

  VectorLayer Describe(bool hasShapes) const {
    VectorLayer layer;
    layer.name = std::filesystem::path(path_).stem().string();
    layer.hasShapes = hasShapes;
    if (hasShapes) layer.geometry = VectorGeometry::kPolygon;
    layer.isMulti = hasShapes;
    if (geoRef_) layer.coordSys = geoRef_->CoordinateSystem();
    layer.fields = {{"label", VectorFieldType::kInteger}};
    for (const TableStore& store : stores_) {
      for (unsigned band = 0; band < store.file->Bands(); ++band) {
        for (const AttributeName& attribute : ColumnsOf(store.kind)) {
          layer.fields.push_back({NameOf(store, attribute, band), attribute.isWhole
                                                                      ? VectorFieldType::kInteger
                                                                      : VectorFieldType::kReal});
        }
      }
    }
    return layer;
  }

  std::string NameOf(const TableStore& store, const AttributeName& attribute, unsigned band) const {
    if (store.names.GetCount() != 0) {
      return std::string(attribute.name) + "_" + store.names[band].ToUTF8();
    }
    return ColumnName(store.kind, attribute, band < bands_.GetCount() ? bands_[band] : band);
  }

  /// The attributes that become columns; the entropy goes without a count of its own.
  static std::span<const AttributeName> ColumnsOf(AttributeKind kind) {
    const std::span<const AttributeName> names = NamesOf(kind);
    return kind == AttributeKind::kEntropy ? names.first(1) : names;
  }

  /// Fills the values of a region, NaN for those that it lacks. @return false when no store has it.
  bool FillValues(std::uint32_t label) {
    bool isThere = false;
    values_.clear();
    for (const TableStore& store : stores_) {
      const RegionAttributesFile<float>& file = *store.file;
      const auto columns = static_cast<unsigned>(ColumnsOf(store.kind).size());
      for (unsigned band = 0; band < file.Bands(); ++band) {
        const bool isInBand = file.RegionExists(label, band);
        isThere = isThere || isInBand;
        for (unsigned i = 0; i < columns; ++i) {
          values_.push_back(isInBand ? file.Value(label, band, i) : NAN);
        }
      }
    }
    return isThere;
  }

  /// Puts the values of a region into its record.
  void FillRecord(std::uint32_t label) {
    record_.values.assign(1, static_cast<std::int64_t>(label));
    for (std::size_t i = 0; i < values_.size(); ++i) {
      if (!std::isfinite(values_[i])) {
        record_.values.emplace_back();
      } else if (fields_[i + 1].type == VectorFieldType::kInteger) {
        record_.values.emplace_back(static_cast<std::int64_t>(values_[i]));
      } else {
        record_.values.emplace_back(Shortest(values_[i]));
      }
    }
  }

  bool AreSound() const {
    return std::all_of(stores_.begin(), stores_.end(),
                       [](const TableStore& store) { return store.file->IsValid(); });
  }

  bool CreateSink(bool hasShapes) {
    VectorRecordFactory* const factory = GetVectorRecordFactory();
    if (factory == nullptr) return false;
    const VectorLayer layer = Describe(hasShapes);
    fields_ = layer.fields;
    sink_ = factory->Create(path_, layer);
    return bool(sink_);
  }

  /// Writes a row for each region, by ascending label.
  bool WriteRows() {
    if (!IsCsv(path_)) {
      return CreateSink(false) && ForEachRow([this](std::uint32_t label) {
               FillRecord(label);
               return sink_->Write(record_);
             }) &&
             sink_->Close();
    }
    std::vector<std::string> names;
    for (const VectorField& field : Describe(false).fields) names.push_back(field.name);
    AttributeCsv table;
    return table.Begin(path_, names) &&
           ForEachRow([&](std::uint32_t label) { return table.Write(label, values_); }) &&
           table.Close();
  }

  template <typename WriteRow>
  bool ForEachRow(const WriteRow& write) {
    unsigned records = 0;
    for (const TableStore& store : stores_) records = std::max(records, store.file->RegionCount());
    for (unsigned label = 0; label < records; ++label) {
      if (label % 1024 == 0) {
        if (GetIPC().abort->IsSet()) {
          SetFault("the work was aborted");
          return false;
        }
        GetIPC().progress->Update(static_cast<double>(label) / records);
      }
      if (!FillValues(label)) continue;
      if (!write(label)) return false;
      ++rows_;
    }
    return AreSound();
  }

  bool WriteShapes(const BasicRasterPtr& labels) {
    const IPC first(GetIPC().abort,
                    ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, 8)));
    LabelCensus census;
    if (!census.Run(labels, first) || !CreateSink(true)) return false;
    const IPC second(GetIPC().abort,
                     ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, 8, 7)));
    record_.geometry = VectorGeometry::kPolygon;
    const bool isDone = DispatchType(LabelTypes{}, labels->DataType(), [&]<typename L>() {
      return ForEachRegion(
          RasterPtr<L>(labels), census, RegionParts::kTogether, &Split, &Append,
          [this](std::uint32_t label, const TracedPolygon& polygon) {
            return WriteRegion(label, polygon);
          },
          second);
    });
    return isDone && AreSound() && sink_->Close();
  }

  /// Takes a polygon, its rings split where they touch themselves.
  static TracedPolygon Split(TracedPolygon& polygon) {
    TracedPolygon split;
    return SplitAtTouches(polygon, split) ? std::move(split) : std::move(polygon);
  }

  static void Append(TracedPolygon& to, const TracedPolygon& from) {
    const auto vertices = static_cast<std::uint32_t>(to.coordinates.size() / 2);
    to.holes.insert(to.holes.end(), from.holes.begin(), from.holes.end());
    for (const std::uint32_t start : from.starts) to.starts.push_back(start + vertices);
    to.coordinates.insert(to.coordinates.end(), from.coordinates.begin(), from.coordinates.end());
  }

  bool WriteRegion(std::uint32_t label, const TracedPolygon& polygon) {
    if (!FillValues(label)) return true;
    FillRecord(label);
    record_.partEnds.assign(polygon.starts.begin() + 1, polygon.starts.end());
    record_.partEnds.push_back(static_cast<std::uint32_t>(polygon.coordinates.size() / 2));
    record_.holes = polygon.holes;
    record_.coordinates.assign(polygon.coordinates.begin(), polygon.coordinates.end());
    if (geoRef_) {
      // The vertices are carried where they lie.
      Array<double> points(record_.coordinates.data(),
                           ArrayDims(static_cast<unsigned>(polygon.coordinates.size() / 2), 2));
      if (!geoRef_->PixelToMap(points)) {
        SetFault("a polygon has points that the raster's geo-reference can't carry to its map");
        return false;
      }
    }
    ++rows_;
    return sink_->Write(record_);
  }

  std::string path_;
  std::vector<TableStore> stores_;
  Array<unsigned> bands_;
  GeoRefPtr geoRef_;
  VectorRecordSinkPtr sink_;
  std::vector<VectorField> fields_;
  std::vector<float> values_;  // of a region, for each field behind the label
  VectorRecord record_;
  std::uint64_t rows_ = 0;
};

const CommandFactoryT<CreateAttributeTableCommand> createAttributeTableFactory(kAttributeTable);
const DivisionRegistration createAttributeTableDivision({.command = "CreateAttributeTableCommand",
                                                         .makes = {"Table"}});

}  // namespace
}  // namespace lumo
