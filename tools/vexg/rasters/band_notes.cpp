#include "rasters/band_notes.h"

#include <fmt/format.h>

namespace lumo::host {

std::string BandNotes::GetScaling() const {
  return fmt::format("pixel * {} + {}", scale.empty() ? "1" : scale, offset.empty() ? "0" : offset);
}

void AddNotesQuery(JobDraft& draft, const String& raster) {
  draft.Step("notes", "DescribeRasterCommand").AddInput("URI", raster);
}

RasterNotes ReadNotes(const JobResults& results, unsigned bands) {
  const Json all = Json::parse(results.Find("notes").returns.Find("Description").ToUTF8());
  const Json& details = all["details"];
  RasterNotes notes;
  for (unsigned band = 0; band < bands; ++band) {
    const auto text = [&](const char* name) {
      return details.value(fmt::format("Bands/{}/{}", band, name), std::string());
    };
    notes.bands.push_back(
        {text("Description"), text("Meaning"), text("Unit"), text("Scale"), text("Offset")});
    if (notes.bands.back().meaning == "Alpha") notes.alpha = band;
  }
  if (const Json& storage = all["storage"]; storage.is_object()) {
    notes.blocks = {storage["blocks"][0].get<unsigned>(), storage["blocks"][1].get<unsigned>()};
    if (const Json& word = storage["compression"]; word.is_string()) notes.compression = word;
  }
  if (const Json& pyramid = all["pyramid"]; pyramid.is_object()) {
    notes.pyramidMethod = pyramid["method"];
  }
  const Json& place = all["geoRef"];
  if (place.is_object()) notes.epsg = place["epsg"].get<long>();
  return notes;
}

}  // namespace lumo::host
