#include "raster/band_order.h"

#include <algorithm>
#include <vector>

#include "raster/raster_def.h"
#include "raster/raster_details.h"

namespace lumo {

Array<unsigned> BandsIn(const Array<unsigned>& order, const Array<unsigned>& bands) {
  Array<unsigned> mapped(bands.GetDims());
  for (unsigned i = 0; i < mapped.GetCount(); ++i) mapped[i] = BandIn(&order, bands[i]);
  return mapped;
}

void ChooseBands(RasterDef& def, const Array<unsigned>& order) {
  const auto noData = def.noData;
  def.noData.clear();
  def.bands = order.GetCount();
  for (unsigned band = 0; band < def.bands; ++band) {
    const auto value = noData.find(order[band]);
    if (value != noData.end()) def.noData[band] = value->second;
  }
  ChooseBandDetails(def.metadata, order);
}

namespace detail {
namespace {

/// Takes a statistic between bands out of `mask` and empties its array.
void DropPairs(Array<double>& values, unsigned& mask, unsigned bit) {
  values = Array<double>();
  mask &= ~bit;
}

}  // namespace

void PairsOfView(Array<double>& values, unsigned& mask, unsigned bit,
                 const Array<unsigned>& order) {
  if ((mask & bit) == 0) return;
  Array<double> ofView{ArrayDims(order.GetCount())};
  for (unsigned band = 0; band < order.GetCount(); ++band) {
    if (order[band] >= values.GetCount()) return DropPairs(values, mask, bit);
    ofView[band] = values[order[band]];
  }
  values = ofView;
}

void PairsOfParent(Array<double>& values, unsigned& mask, unsigned bit,
                   const Array<unsigned>& order, const Array<double>& known, unsigned bands) {
  if ((mask & bit) == 0) return;
  Array<double> ofParent{ArrayDims(bands)};
  std::vector<bool> isThere(bands);
  for (unsigned band = 0; band < bands; ++band) {
    isThere[band] = band < known.GetCount();
    ofParent[band] = isThere[band] ? known[band] : 0.0;
  }
  for (unsigned i = 0; i < std::min(values.GetCount(), order.GetCount()); ++i) {
    if (order[i] >= bands) continue;
    ofParent[order[i]] = values[i];
    isThere[order[i]] = true;
  }
  if (std::ranges::count(isThere, false) != 0) return DropPairs(values, mask, bit);
  values = ofParent;
}

}  // namespace detail
}  // namespace lumo
