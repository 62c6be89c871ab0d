#pragma once

#include <algorithm>
#include <cmath>

#include "foundation/fault.h"
#include "georef/derived_georef.h"
#include "pyramid/exact_levels.h"
#include "raster/interleave.h"
#include "views/pyramid_raster_impl.h"

namespace lumo {

template <typename T>
PyramidRasterImpl<T>::PyramidRasterImpl(const Raster<T>& raster, const RasterReaderPtr<T>& reader,
                                        const RasterDataConnectionPtr& connection, unsigned level)
    : connection_(connection), reader_(reader), level_(level) {
  if (!reader_) return;
  def_ = reader_->RasterDef();
  def_.samples = reader_->Samples(level_);
  def_.lines = reader_->Lines(level_);
  def_.geoRef = LevelGeoRef(raster);
}

/// The geo-reference of the raster for the pixels of the level. A pixel of it is the raster's pixel
/// 2^level times as far; a store that holds levels of other sizes has spread the raster over them.
/// In the told form the sizes of a grid's pixels grow by the whole part of the factor, and the tie
/// pixel lies where it lay, as a fraction. A camera always goes by the exact factor.
template <typename T>
GeoRefPtr PyramidRasterImpl<T>::LevelGeoRef(const Raster<T>& raster) const {
  const RasterDef full = raster.GetRasterDef();
  if (!full.geoRef) return {};
  const GeoRef& model = *full.geoRef;
  const auto factor = [&](unsigned whole, unsigned part) {
    if (part == 0 || (level_ < 32 && part == whole >> level_)) {
      return std::ldexp(1.0, static_cast<int>(level_));
    }
    return whole / static_cast<double>(part);
  };
  const GeoRefPtr reduced =
      ReducedGeoRef(model, factor(raster.Samples(), def_.samples),
                    factor(raster.Lines(), def_.lines), def_.samples, def_.lines);
  if (ExactLevels::AreWanted() || model.GetType() == GeoRef::kRpc) return reduced;
  const auto atLeast1 = [](unsigned size) { return std::max(size, 1U); };
  const auto fraction = [&](unsigned part, unsigned whole) {
    return part / static_cast<double>(atLeast1(whole));
  };
  reduced->SetPixelSize(model.PixelSizeX() * (raster.Samples() / atLeast1(def_.samples)),
                        model.PixelSizeY() * (raster.Lines() / atLeast1(def_.lines)));
  reduced->SetTiePixel(model.TiePixelX() * fraction(def_.samples, raster.Samples()),
                       model.TiePixelY() * fraction(def_.lines, raster.Lines()));
  return reduced;
}

template <typename T>
PyramidDef PyramidRasterImpl<T>::GetPyramidDef() const {
  PyramidDef def;
  def.level = level_;
  return def;
}

template <typename T>
bool PyramidRasterImpl<T>::WriteStats() {
  if (!reader_ || !reader_->CanWriteStats()) return false;
  Array<RasterBandStats<T>> all{ArrayDims(Bands())};
  for (unsigned band = 0; band < all.GetCount(); ++band) all[band] = this->BandStats(band);
  return reader_->WriteStats(all);
}

template <typename T>
bool PyramidRasterImpl<T>::WriteHistogram() {
  if (!reader_ || !reader_->CanWriteHistogram()) return false;
  Array<RasterBandHistogram<T>> all;
  for (unsigned band = 0; band < Bands(); ++band) {
    for (const RasterBandHistogram<T>& histogram : this->BandHistogram(band)) {
      const unsigned at = all.GetCount();
      if (all.Resize(ArrayDims(at + 1))) all[at] = histogram;
    }
  }
  return reader_->WriteHistogram(all);
}

template <typename T>
bool PyramidRasterImpl<T>::HasNoDataValue(unsigned band) const {
  return reader_ && reader_->HasNoDataValue(band);
}

template <typename T>
T PyramidRasterImpl<T>::NoDataValue(unsigned band) const {
  return reader_ ? reader_->NoDataValue(band) : T();
}

template <typename T>
bool PyramidRasterImpl<T>::HasPalette(unsigned band) const {
  return reader_ && reader_->HasPalette(band);
}

template <typename T>
PalettePtr PyramidRasterImpl<T>::Palette(unsigned band) const {
  if (!HasPalette(band)) return {};
  return PalettePtr(new lumo::Palette(reader_->Palette(band)));
}

template <typename T>
bool PyramidRasterImpl<T>::WritePalette(unsigned band, const PalettePtr& palette) {
  return reader_ && palette && reader_->WritePalette(band, *palette);
}

template <typename T>
bool PyramidRasterImpl<T>::DeletePalette(unsigned band) {
  return reader_ && reader_->DeletePalette(band);
}

/// True when a block lies inside the level.
template <typename T>
bool PyramidRasterImpl<T>::Holds(const SubRect& rect, const Array<unsigned>& bands) const {
  const bool inside =
      rect.left <= rect.right && rect.top <= rect.bottom && rect.right < def_.samples &&
      rect.bottom < def_.lines &&
      std::all_of(bands.begin(), bands.end(), [&](unsigned band) { return band < def_.bands; });
  if (!inside) {
    SetFault("the block asked for isn't inside level " + std::to_string(level_) +
             " of the pyramid");
  }
  return inside;
}

template <typename T>
bool PyramidRasterImpl<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                      Interleave interleave, Array<T>& pixels,
                                      Array<unsigned char>& state) {
  if (!reader_ || !Holds(rect, bands)) return false;
  {
    const std::lock_guard lock(readLock_);
    if (reader_->ReadBlock(rect, bands, level_, interleave, pixels, state)) return true;
  }
  constexpr std::int32_t kLevelsPerhaps[] = {5, 8};
  if (level_ == 0 || std::ranges::count(kLevelsPerhaps, reader_->ReaderType()) == 0) return false;
  return Sample(rect, bands, interleave, pixels, state);
}

namespace detail {

/// Copies every `scale`-th pixel of every `scale`-th line of a block into a part of another one;
/// both are pixel-interleaved.
/// @param into   where the part begins; its lines are `intoStride` elements apart.
template <typename E>
void PickEvery(std::size_t scale, const E* block, const SubRect& part, std::size_t blockWidth,
               unsigned bands, E* into, std::size_t intoStride) {
  for (std::size_t y = 0; y < part.Height(); ++y, into += intoStride) {
    const E* from = block + y * scale * blockWidth * bands;
    E* to = into;
    for (std::size_t x = 0; x < part.Width(); ++x, from += scale * bands) {
      to = std::copy_n(from, bands, to);
    }
  }
}

}  // namespace detail

/// Makes a block of the level from level 0, which is read in pieces of about as many pixels.
template <typename T>
bool PyramidRasterImpl<T>::Sample(const SubRect& rect, const Array<unsigned>& bands,
                                  Interleave interleave, Array<T>& pixels,
                                  Array<unsigned char>& state) {
  const unsigned width = rect.Width(), height = rect.Height();
  const Array<unsigned> wanted = BandsOfBlock(bands, interleave);
  const unsigned count = wanted.GetCount();
  const std::uint64_t scale = std::uint64_t{1} << level_;
  const auto pieceOf = [&](unsigned size) {
    return static_cast<unsigned>(std::max<std::uint64_t>(size / scale, 1));
  };
  const unsigned pieceWidth = pieceOf(width), pieceHeight = pieceOf(height);
  const unsigned fullSamples = reader_->Samples(0), fullLines = reader_->Lines(0);
  Array<T> bip{BlockDims(Interleave::BIP, width, height, count)}, piece;
  Array<unsigned char> bipState{BlockDims(Interleave::BIP, width, height, count)}, pieceState;
  if (!bip.IsValid() || !bipState.IsValid()) return false;

  for (unsigned top = rect.top; top <= rect.bottom; top += pieceHeight) {
    for (unsigned left = rect.left; left <= rect.right; left += pieceWidth) {
      const SubRect part(left, top, std::min(left + pieceWidth - 1, rect.right),
                         std::min(top + pieceHeight - 1, rect.bottom));
      if (part.right * scale >= fullSamples || part.bottom * scale >= fullLines) return false;
      const SubRect full(
          static_cast<unsigned>(part.left * scale), static_cast<unsigned>(part.top * scale),
          static_cast<unsigned>(part.right * scale), static_cast<unsigned>(part.bottom * scale));
      {
        const std::lock_guard lock(readLock_);
        if (!reader_->ReadBlock(full, wanted, 0, Interleave::BIP, piece, pieceState)) return false;
      }
      const std::size_t stride = std::size_t{width} * count;
      const std::size_t at = (top - rect.top) * stride + std::size_t{left - rect.left} * count;
      detail::PickEvery(scale, piece.GetData(), part, full.Width(), count, bip.GetData() + at,
                        stride);
      detail::PickEvery(scale, pieceState.GetData(), part, full.Width(), count,
                        bipState.GetData() + at, stride);
    }
  }
  const ArrayDims dims = BlockDims(interleave, width, height, count);
  return pixels.Resize(dims) && state.Resize(dims) &&
         ConvertInterleave(bip.GetData(), Interleave::BIP, pixels.GetData(), interleave, width,
                           height, count, sizeof(T)) &&
         ConvertInterleave(bipState.GetData(), Interleave::BIP, state.GetData(), interleave, width,
                           height, count, 1);
}

template <typename T>
bool PyramidRasterImpl<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                      Interleave interleave, Array<T>& pixels,
                                      Array<unsigned char>& state) {
  if (!reader_ || !Holds(rect, bands)) return false;
  const std::lock_guard lock(writeLock_);
  return reader_->WriteBlock(rect, bands, level_, interleave, pixels, state);
}

template <typename T>
std::uint64_t PyramidRasterImpl<T>::WriteCount() const {
  if (!reader_) return 0;
  return reader_->WriteCount(level_) + (level_ != 0 ? reader_->WriteCount(0) : 0);
}

}  // namespace lumo
