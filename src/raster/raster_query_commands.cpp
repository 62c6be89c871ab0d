#include "raster/level_reduction.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"

namespace lumo {
namespace {

/// Writes the outputs of QueryRasterCommand.
class QueryCommand : public RasterCommand {
 protected:
  void WriteQuery(const BasicRaster& raster) {
    const RasterDef def = raster.GetRasterDef();
    Write("Samples", def.samples);
    Write("Lines", def.lines);
    Write("Bands", def.bands);
    Write("Interleave", def.interleave);
    Write("DataType", DataTypeName(def.dataType));
    Write("Format", def.format);
    Write("CanWrite", raster.CanWrite());
    Write("StatsMode", raster.StatsMode());
    Write("PyramidExists", raster.PyramidExists());
    Write("TileDimensions", raster.TileDimensions());
    const PyramidDef pyramid = raster.GetPyramidDef();
    Write("PyramidType", pyramid.pyramidType);
    Write("PyramidResamplingMethod", ToldMethodOf(pyramid.resamplingMethod));
    Write("PyramidLevelMin", pyramid.levelMin);
    Write("PyramidLevelMax", pyramid.levelMax);
    Write("PyramidCanBuild", pyramid.canBuild);
  }
};

const std::vector<OutputDeclaration> kQueryOutputs{
    {"Samples", ValueKind::kInteger, "pixels of a line"},
    {"Lines", ValueKind::kInteger, "lines"},
    {"Bands", ValueKind::kInteger, "bands"},
    {"Interleave", ValueKind::kWord, "BIP, BIL, BSQ, or Unknown: the order in the source"},
    {"DataType", ValueKind::kWord, "pixel type"},
    {"Format", ValueKind::kText, "key of the format"},
    {"CanWrite", ValueKind::kBoolean, "pixels can be written"},
    {"StatsMode", ValueKind::kWord, "which statistics are computed"},
    {"PyramidExists", ValueKind::kBoolean, "there are reduced levels to read"},
    {"TileDimensions", ValueKind::kTiles, "blocks of the source"},
    {"PyramidType", ValueKind::kWord, "who keeps the pyramid"},
    {"PyramidResamplingMethod", ValueKind::kWord, "how its pixels came about"},
    {"PyramidLevelMin", ValueKind::kInteger, "first level"},
    {"PyramidLevelMax", ValueKind::kInteger, "last level"},
    {"PyramidCanBuild", ValueKind::kBoolean, "a pyramid can be built"}};

const CommandDeclaration kQuery{
    "QueryRasterCommand", "Rasters", "Tells what a raster is.", {RasterURIInput()}, kQueryOutputs};

class QueryRasterCommand final : public QueryCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    WriteQuery(*raster);
    return Succeed();
  }
};

const CommandFactoryT<QueryRasterCommand> queryFactory(kQuery);

std::vector<OutputDeclaration> ExtendedOutputs() {
  std::vector<OutputDeclaration> outputs = kQueryOutputs;
  outputs.insert(outputs.end(),
                 {{"HasNoDataValue", ValueKind::kBooleanArray, "for each band"},
                  {"NoDataValue", ValueKind::kNumberArray, "for each band; 0 where it has none"},
                  {"HasPalette", ValueKind::kBooleanArray, "for each band"},
                  {"StatsExist", ValueKind::kIntegerArray,
                   "for each band, the statistics at hand: the sum of 1 min, 2 max, 4 mean, 8 "
                   "deviation, 16 sum, 32 sum of squares, 64 root mean square, 128 products, 256 "
                   "covariances"}});
  return outputs;
}

const CommandDeclaration kExtendedQuery{"ExtendedQueryRasterCommand",
                                        "Rasters",
                                        "Tells what a raster is, and what it knows of each band.",
                                        {RasterURIInput()},
                                        ExtendedOutputs()};

class ExtendedQueryRasterCommand final : public QueryCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const bool typed = DispatchType(TwelveTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterPtr<T> source(raster);
      if (!source) return false;
      WriteBands(*source);
      return true;
    });
    if (!typed) return Fail("the raster has no pixel type");
    WriteQuery(*raster);
    return Succeed();
  }

  template <typename T>
  void WriteBands(const Raster<T>& raster) {
    const ArrayDims dims(raster.Bands());
    Array<bool> hasNoData(dims), hasPalette(dims);
    Array<T> noData(dims);
    Array<unsigned> stats(dims);
    for (unsigned band = 0; band < dims.count; ++band) {
      hasNoData[band] = raster.HasNoDataValue(band);
      noData[band] = hasNoData[band] ? raster.NoDataValue(band) : T();
      hasPalette[band] = raster.HasPalette(band);
      stats[band] = StatsMask::None;
      // Of most bands nothing is at hand, and a source is asked for each answer on its thread.
      if (raster.BandStats(band).mask == StatsMask::None) continue;
      for (unsigned bit = StatsMask::Cov; bit != 0; bit >>= 1) {
        if (raster.StatsExist(band, bit)) stats[band] |= bit;
      }
    }
    Write("HasNoDataValue", hasNoData);
    Write("NoDataValue", noData);
    Write("HasPalette", hasPalette);
    Write("StatsExist", stats);
  }
};

const CommandFactoryT<ExtendedQueryRasterCommand> extendedQueryFactory(kExtendedQuery);

const CommandDeclaration kGetGeoRef{
    "GetRasterGeoRefCommand",
    "Rasters",
    "Tells where the pixels of a raster lie.",
    {RasterURIInput()},
    {{"GeoRef", ValueKind::kGeoRef, "the geo-reference; Unknown when it has none"}}};

class GetRasterGeoRefCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    Write("GeoRef", raster->GetRasterDef().geoRef);
    return Succeed();
  }
};

const CommandFactoryT<GetRasterGeoRefCommand> getGeoRefFactory(kGetGeoRef);

const CommandDeclaration kSetTiles{
    "SetDefaultTileSizeCommand",
    "Rasters",
    "Sets the blocks in which a raster is worked on, where it has a use for that.",
    {RasterURIInput(), {"TileDimensions", Presence::kRequired, ValueKind::kTiles, "the blocks"}},
    {}};

class SetDefaultTileSizeCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    raster->SetTileDimensions(Read<TileDimensions>("TileDimensions"));
    return Succeed();
  }
};

const CommandFactoryT<SetDefaultTileSizeCommand> setTilesFactory(kSetTiles);

}  // namespace
}  // namespace lumo
