#pragma once

#include <gtest/gtest.h>

#include "data/data_manager.h"
#include "data/raster_reader.h"
#include "foundation/fault.h"

namespace lumo::test {

inline Array<String> Strings(const std::vector<std::string>& pieces) {
  Array<String> strings{ArrayDims(static_cast<unsigned>(pieces.size()))};
  for (unsigned i = 0; i < strings.GetCount(); ++i) strings[i] = String(pieces[i]);
  return strings;
}

/// Opens a raster through the global data manager, on a thread of its own; empty when that fails.
inline RasterDataConnectionPtr OpenSource(const std::vector<std::string>& pieces) {
  return RasterDataConnectionPtr(
      GetGlobalDataManager().Connect(Strings(pieces), GeoRefPtr(), MetadataPtr()));
}

inline RasterDataConnectionPtr CreateSource(const std::vector<std::string>& pieces,
                                            const RasterDef& def) {
  return RasterDataConnectionPtr(GetGlobalDataManager().CreateRaster(Strings(pieces), def));
}

template <typename T>
RasterReaderPtr<T> ReaderOf(const RasterDataConnectionPtr& source) {
  if (!source) return {};
  return source->RasterReaderDispatch()->template Get<T>();
}

/// Lets go of a connection, and gives the fault that this set; empty when there was none.
inline std::string Release(RasterDataConnectionPtr& source) {
  TakeFault();
  DataConnectionPtr connection(source);
  source = RasterDataConnectionPtr();
  GetGlobalDataManager().ReleaseConnection(connection);
  return TakeFault().ToUTF8();
}

/// A block in memory: what a reader is to give, or is given.
template <typename T>
struct Block {
  SubRect rect;
  std::vector<unsigned> bands;
  std::vector<T> pixels;
  std::vector<unsigned char> state;

  bool Read(RasterReader<T>& reader) {
    const std::size_t count = std::size_t{rect.Width()} * rect.Height() * bands.size();
    pixels.assign(count, T{});
    state.assign(count, 0);
    return reader.ReadPixels(rect.left, rect.top, rect.Width(), rect.Height(), BandArray(), 0,
                             pixels.data(), state.data());
  }
  bool Write(RasterReader<T>& reader) const {
    return reader.WritePixels(rect.left, rect.top, rect.Width(), rect.Height(), BandArray(), 0,
                              pixels.data(), state.data());
  }
  Array<unsigned> BandArray() const {
    Array<unsigned> array{ArrayDims(static_cast<unsigned>(bands.size()))};
    std::copy(bands.begin(), bands.end(), array.begin());
    return array;
  }
};

/// Calls `visit(sample, line, band)` for the elements of a block in the order of an interleave; of
/// `bands` the entries are visited in their order.
template <typename Visit>
void VisitBlock(Interleave interleave, const SubRect& rect, const std::vector<unsigned>& bands,
                Visit&& visit) {
  if (interleave == Interleave::BIP) {
    for (unsigned line = rect.top; line <= rect.bottom; ++line)
      for (unsigned sample = rect.left; sample <= rect.right; ++sample)
        for (const unsigned band : bands) visit(sample, line, band);
  } else if (interleave == Interleave::BIL) {
    for (unsigned line = rect.top; line <= rect.bottom; ++line)
      for (const unsigned band : bands)
        for (unsigned sample = rect.left; sample <= rect.right; ++sample) visit(sample, line, band);
  } else {
    for (const unsigned band : bands)
      for (unsigned line = rect.top; line <= rect.bottom; ++line)
        for (unsigned sample = rect.left; sample <= rect.right; ++sample) visit(sample, line, band);
  }
}

}  // namespace lumo::test
