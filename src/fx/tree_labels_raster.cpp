#include "fx/tree_labels_raster.h"

#include <algorithm>

#include "raster/block_shape.h"

namespace lumo {

TreeLabelsRaster::TreeLabelsRaster(const SegmentTreePtr& tree, TreeCut&& cut)
    : tree_(tree), cut_(std::move(cut)) {
  def_.samples = tree->Scene().samples;
  def_.lines = tree->Scene().lines;
  def_.bands = 1;
  def_.dataType = kDataTypeOf<std::int32_t>;
  def_.interleave = tree->Scene().interleave;
  def_.tileWidth = tree->Scene().tileWidth;
  def_.tileHeight = tree->Scene().tileHeight;
  def_.noData[0] = 0;
  def_.SetGeoRef(tree->Scene().geoRef);
}

lumo::TileDimensions TreeLabelsRaster::TileDimensions() const {
  lumo::TileDimensions strips;
  strips.width = def_.samples;
  strips.height = tree_->StripLines();
  return strips;
}

bool TreeLabelsRaster::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                  Interleave interleave, Array<std::int32_t>& pixels,
                                  Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  const bool isHere =
      rect.right < Samples() && rect.bottom < Lines() && block.count == 1 && block.bands[0] == 0;
  if (!isHere || !block.Size(pixels, state)) return false;
  const std::uint32_t stripLines = tree_->StripLines();
  std::vector<std::uint32_t> basins;
  std::int32_t* to = pixels.GetData();
  unsigned char* toState = state.GetData();
  for (unsigned strip = rect.top / stripLines; strip <= rect.bottom / stripLines; ++strip) {
    if (!tree_->ReadStrip(strip, basins)) return false;
    const unsigned begin = strip * stripLines;
    const unsigned last = std::min(rect.bottom, begin + tree_->LinesOf(strip) - 1);
    for (unsigned line = std::max(rect.top, begin); line <= last; ++line) {
      const std::uint32_t* const from =
          basins.data() + std::size_t{line - begin} * Samples() + rect.left;
      for (unsigned x = 0; x < block.width; ++x) {
        const std::uint32_t number = cut_.numbers[from[x]];
        *to++ = static_cast<std::int32_t>(number);
        *toState++ = static_cast<unsigned char>(number == 0 ? PixelValueState::NoData
                                                            : PixelValueState::Valid);
      }
    }
  }
  return true;
}

}  // namespace lumo
