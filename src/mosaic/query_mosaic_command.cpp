#include "mosaic/match_mode.h"
#include "mosaic/mosaic_command.h"

namespace lumo {
namespace {

const CommandDeclaration kQuery{
    "QueryMosaicCommand",
    "Mosaics",
    "Tells what a mosaic is made of. A command of this library's own.",
    {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic"}},
    {{"Scenes", ValueKind::kURIArray, "identifiers of the scenes, in their order"},
     {"Sizes", ValueKind::kIntegerArray, "samples and lines of each scene"},
     {"OnGrid", ValueKind::kBooleanArray, "for each scene, whether it lies on the mosaic's grid"},
     {"Matched", ValueKind::kBooleanArray, "for each scene, whether it takes part in matching"},
     {"Footprints", ValueKind::kURIArray, "for each scene, its footprint file; empty for none"},
     {"Seams", ValueKind::kURIArray, "for each scene, its seam file; empty for none"},
     {"Reference", ValueKind::kInteger, "number of the scene that others are matched to"},
     {"MatchMode", ValueKind::kWord, "Overlaps or Scenes"},
     {"Bins", ValueKind::kWord, "Told or Exact"},
     {"ResamplingMethod", ValueKind::kWord, "of scenes that don't lie on the grid"},
     {"FeatherWidth", ValueKind::kNumber, "across seams", "pixels"},
     {"Tables", ValueKind::kText, "base of the names of the table files; empty for none"},
     {"WorkingDirectory", ValueKind::kText, "where side files are made"}}};

class QueryMosaicCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const bool isDone = OnMosaic(
        [&]<typename T>(const MosaicRasterPtr<T>& mosaic) {
          Tell(*mosaic);
          return true;
        },
        Storing::kNothing);
    return isDone ? Succeed() : Fail();
  }

  template <typename T>
  void Tell(const MosaicRaster<T>& mosaic) {
    MosaicRasterDef<T>& definition = *mosaic.Definition();
    const unsigned count = definition.SceneCount();
    Array<URI> scenes{ArrayDims(count)}, footprints{ArrayDims(count)}, seams{ArrayDims(count)};
    Array<unsigned> sizes{ArrayDims(count, 2)};
    Array<bool> onGrid{ArrayDims(count)}, matched{ArrayDims(count)};
    for (unsigned i = 0; i < count; ++i) {
      const String key = definition.SceneKey(i);
      scenes[i] = URI(key);
      sizes[2 * i] = definition.Scenes()[i]->Samples();
      sizes[2 * i + 1] = definition.Scenes()[i]->Lines();
      onGrid[i] = mosaic.IsOnGrid(i);
      matched[i] = definition.MatchFlags()[i] != 0;
      footprints[i] = URI(definition.Footprints().Find(key));
      seams[i] = URI(definition.SeamFiles().Find(key));
    }
    Write("Scenes", scenes);
    Write("Sizes", sizes);
    Write("OnGrid", onGrid);
    Write("Matched", matched);
    Write("Footprints", footprints);
    Write("Seams", seams);
    Write("Reference", definition.ReferenceIndex());
    Write("MatchMode", static_cast<MatchMode>(definition.ColourMatchMode()));
    Write("Bins", definition.Bins());
    Write("ResamplingMethod", definition.Settings().resampling);
    Write("FeatherWidth", definition.Settings().featherWidth);
    Write("Tables", definition.TablesInUse());
    Write("WorkingDirectory", definition.WorkingDirectory());
  }
};

const CommandFactoryT<QueryMosaicCommand> queryMosaicFactory(kQuery);

}  // namespace
}  // namespace lumo
