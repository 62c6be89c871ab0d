#include "pictures/palette_reading.h"

#include "verb.h"

namespace lumo::host {

Palette ReadPalette(JobSession& session, const String& raster, unsigned band) {
  Array<unsigned> bands{ArrayDims(1)};
  bands[0] = band;
  JobDraft draft;
  JobWriterCommand& command = draft.Step("palette", "GetRasterPaletteCommand");
  command.AddInput("URI", raster);
  command.AddInput("Bands", bands);
  const JobResults results = session.Run(draft);
  const auto palettes =
      ParseValue<Array<Palette>>(results.Find("palette").returns.Find("Palettes"));
  if (palettes.GetCount() == 1) return palettes[0];
  throw HostError(kExitFailed, "the palette of band " + std::to_string(band) + " can't be read");
}

}  // namespace lumo::host
