// Blocks through chains of views. The bytes choose a pixel type, sources, views on them and blocks
// that are read and written in every interleave; what comes out is compared with a plain model that
// knows each pixel by itself. No block reaches over its memory, whatever is asked for.

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <memory>
#include <vector>

#include "foundation/thread_roll.h"
#include "georef/std_georef.h"
#include "mosaic/overlap_raster.h"
#include "mosaic/pvs_raster.h"
#include "raster/interleave.h"
#include "support/test_rasters.h"
#include "views/band_stack_raster.h"
#include "views/complex_raster.h"
#include "views/skip_raster.h"
#include "views/sources/memory_raster.h"
#include "views/sources/temp_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"
#include "views/virtual_raster.h"
#include "warp/projected_raster.h"

namespace {

using lumo::Array;
using lumo::ArrayDims;
using lumo::Interleave;
using lumo::RasterPtr;
using lumo::SubRect;

/// Takes choices off the input; zeros behind its end.
class Choices {
 public:
  Choices(const std::uint8_t* data, std::size_t size) : next_(data), end_(data + size) {}

  bool AtEnd() const { return next_ == end_; }
  unsigned Next() { return next_ != end_ ? *next_++ : 0; }
  /// From 0 to count - 1.
  unsigned Below(unsigned count) { return Next() % count; }

 private:
  const std::uint8_t* next_;
  const std::uint8_t* end_;
};

void Expect(bool holds, const char* what) {
  if (holds) return;
  std::fprintf(stderr, "not so: %s\n", what);
  std::abort();
}

/// One pixel value, wherever it is kept: read, and written where that is possible.
template <typename T>
struct Model {
  unsigned samples = 0, lines = 0, bands = 0;
  bool exact = true;  // the pixels can be predicted; else only that nothing breaks
  bool writable = false;
  bool takesNone = true;  // has blocks without an interleave
  bool noneKnown = true;  // else some bands may have them, others not
  std::function<T(unsigned x, unsigned y, unsigned band)> get;
  std::function<void(unsigned x, unsigned y, unsigned band, T value)> set;
};

template <typename T>
struct Entry {
  RasterPtr<T> raster;
  std::shared_ptr<Model<T>> model;
};

/// The model of a view each of whose pixels is one of a parent.
template <typename T, typename Where>
std::shared_ptr<Model<T>> Mapped(const std::shared_ptr<Model<T>>& parent, unsigned samples,
                                 unsigned lines, unsigned bands, const Where& where) {
  auto model = std::make_shared<Model<T>>(*parent);
  model->samples = samples;
  model->lines = lines;
  model->bands = bands;
  model->get = [=](unsigned x, unsigned y, unsigned band) {
    const auto [px, py, pb] = where(x, y, band);
    return parent->get(px, py, pb);
  };
  model->set = [=](unsigned x, unsigned y, unsigned band, T value) {
    const auto [px, py, pb] = where(x, y, band);
    parent->set(px, py, pb, value);
  };
  return model;
}

using Place = std::array<unsigned, 3>;

/// Where the element of a pixel stands in a block, from the table of interleaves.
std::size_t PlaceIn(Interleave order, std::size_t w, std::size_t h, std::size_t n, std::size_t x,
                    std::size_t y, std::size_t i) {
  switch (order) {
    case Interleave::BIP:
      return (y * w + x) * n + i;
    case Interleave::BIL:
      return (y * n + i) * w + x;
    case Interleave::BSQ:
      return (i * h + y) * w + x;
    default:
      return y * w + x;
  }
}

lumo::GeoRefPtr Grid(unsigned samples, unsigned lines, double west, double north) {
  auto* const geoRef = new lumo::StdGeoRef;
  const lumo::GeoRefPtr owner(geoRef);
  geoRef->SetDimensions(samples, lines);
  geoRef->SetPixelSize(1.0, 1.0);
  geoRef->SetTieMap(west, north);
  return owner;
}

/// A block with memory to its right that must stay as it is.
template <typename E>
struct FencedBlock {
  static constexpr unsigned kFence = 64;
  std::vector<E> memory;
  Array<E> array;

  explicit FencedBlock(unsigned count)
      : memory(count + kFence, E(77)), array(memory.data(), ArrayDims(count)) {}
  bool IsUnhurt() const {
    for (unsigned i = 0; i < kFence; ++i) {
      if (memory[memory.size() - 1 - i] != E(77)) return false;
    }
    return true;
  }
};

template <typename T>
class Run {
 public:
  explicit Run(Choices& choices) : choices_(choices) {}

  void Go() {
    AddMemory();
    for (unsigned views = 1 + choices_.Below(7); views > 0; --views) AddSomething();
    for (unsigned blocks = 1 + choices_.Below(12); blocks > 0; --blocks) {
      MoveBlock(pool_[choices_.Below(Count())]);
    }
    for (const Entry<T>& entry : pool_) ReadAll(entry);
  }

 private:
  unsigned Count() const { return static_cast<unsigned>(pool_.size()); }
  const Entry<T>& Any() { return pool_[choices_.Below(Count())]; }

  void Add(const RasterPtr<T>& raster, const std::shared_ptr<Model<T>>& model) {
    Expect(bool(raster), "a view is made");
    Expect(raster->Samples() == model->samples && raster->Lines() == model->lines &&
               raster->Bands() == model->bands,
           "a view has its size");
    pool_.push_back({raster, model});
  }

  /// A block in memory, whose layout is written down here once more.
  void AddMemory() {
    auto model = std::make_shared<Model<T>>();
    const unsigned w = model->samples = 1 + choices_.Below(23);
    const unsigned h = model->lines = 1 + choices_.Below(11);
    const unsigned n = model->bands = 1 + choices_.Below(9);
    const auto order = static_cast<Interleave>(choices_.Below(3));
    auto block = std::make_shared<std::vector<T>>(std::size_t{w} * h * n);
    model->writable = true;
    model->get = [=](unsigned x, unsigned y, unsigned b) {
      return (*block)[PlaceIn(order, w, h, n, x, y, b)];
    };
    auto own = std::make_shared<std::vector<T>>(block->size());
    for (std::size_t i = 0; i < own->size(); ++i) {
      (*own)[i] = (*block)[i] = static_cast<T>((i * 7 + 3) % 101);
    }
    // The raster has memory of its own: the model must not see what the raster does.
    model->set = [=](unsigned x, unsigned y, unsigned b, T value) {
      (*block)[PlaceIn(order, w, h, n, x, y, b)] = value;
    };
    memory_.push_back(own);
    Add(RasterPtr<T>(
            new lumo::MemoryRaster<T>("fuzz", own->data(), w, h, n, order, Grid(w, h, 0.0, 100.0))),
        model);
  }

  void AddSomething() {
    switch (choices_.Below(10)) {
      case 0:
        return AddMemory();
      case 1:
        return AddTemp();
      case 2:
        return AddSpatial(Any());
      case 3:
        return AddSpectral(Any());
      case 4:
        return AddSkip(Any());
      case 5:
      case 6:
        return AddStack();
      case 7: {
        const Entry<T> parent = Any();
        return Add(RasterPtr<T>(new lumo::VirtualRaster<T>(parent.raster)), parent.model);
      }
      case 8:
        return AddComputed();
      default:
        if constexpr (std::is_floating_point_v<T>) return AddComplex();
        return AddMemory();
    }
  }

  void AddTemp() {
    auto model = std::make_shared<Model<T>>();
    const unsigned w = model->samples = 1 + choices_.Below(9);
    const unsigned h = model->lines = 1 + choices_.Below(5);
    const unsigned n = model->bands = 1 + choices_.Below(4);
    auto block = std::make_shared<std::vector<T>>(std::size_t{w} * h * n);
    model->writable = true;
    model->get = [=](unsigned x, unsigned y, unsigned b) { return (*block)[(y * w + x) * n + b]; };
    model->set = [=](unsigned x, unsigned y, unsigned b, T value) {
      (*block)[(y * w + x) * n + b] = value;
    };
    Add(RasterPtr<T>(new lumo::TempRaster<T>(w, h, n, lumo::GeoRefPtr())), model);
  }

  void AddSpatial(const Entry<T> parent) {
    const SubRect rect = Rect(*parent.model);
    Add(RasterPtr<T>(new lumo::SpatialSubsetRaster<T>(parent.raster, rect)),
        Mapped(parent.model, rect.Width(), rect.Height(), parent.model->bands,
               [=](unsigned x, unsigned y, unsigned b) {
                 return Place{x + rect.left, y + rect.top, b};
               }));
  }

  void AddSpectral(const Entry<T> parent) {
    const Array<unsigned> bands = Bands(*parent.model);
    Add(RasterPtr<T>(new lumo::SpectralSubsetRaster<T>(parent.raster, bands)),
        Mapped(parent.model, parent.model->samples, parent.model->lines, bands.GetCount(),
               [=](unsigned x, unsigned y, unsigned b) {
                 return Place{x, y, bands[b]};
               }));
  }

  void AddSkip(const Entry<T> parent) {
    const unsigned skipX = 1 + choices_.Below(parent.model->samples);
    const unsigned skipY = 1 + choices_.Below(parent.model->lines);
    const auto model =
        Mapped(parent.model, parent.model->samples / skipX, parent.model->lines / skipY,
               parent.model->bands, [=](unsigned x, unsigned y, unsigned b) {
                 return Place{x * skipX, y * skipY, b};
               });
    model->takesNone = model->noneKnown = true;  // it puts its blocks together by itself
    Add(RasterPtr<T>(new lumo::SkipRaster<T>(parent.raster, skipX, skipY, true)), model);
  }

  /// Members are cut to the size of the smallest first, as a stack wants them alike.
  void AddStack() {
    std::vector<Entry<T>> members(1 + choices_.Below(3));
    for (Entry<T>& member : members) member = Any();
    unsigned w = ~0U, h = ~0U;
    for (const Entry<T>& member : members) {
      w = std::min(w, member.model->samples);
      h = std::min(h, member.model->lines);
    }
    Array<RasterPtr<T>> rasters{ArrayDims(static_cast<unsigned>(members.size()))};
    std::vector<std::pair<std::shared_ptr<Model<T>>, unsigned>> sources;
    auto model = std::make_shared<Model<T>>();
    model->writable = true;
    for (unsigned i = 0; i < members.size(); ++i) {
      const Entry<T>& member = members[i];
      rasters[i] = member.raster;
      if (member.model->samples != w || member.model->lines != h) {
        rasters[i] = RasterPtr<T>(
            new lumo::SpatialSubsetRaster<T>(member.raster, SubRect(0, 0, w - 1, h - 1)));
      }
      for (unsigned b = 0; b < member.model->bands; ++b) sources.emplace_back(member.model, b);
      model->exact = model->exact && member.model->exact;
      model->writable = model->writable && member.model->writable;
      model->noneKnown = model->noneKnown && member.model->noneKnown && member.model->takesNone;
    }
    if (sources.size() > 60) return;
    model->samples = w;
    model->lines = h;
    model->bands = static_cast<unsigned>(sources.size());
    model->get = [=](unsigned x, unsigned y, unsigned b) {
      return sources[b].first->get(x, y, sources[b].second);
    };
    model->set = [=](unsigned x, unsigned y, unsigned b, T value) {
      sources[b].first->set(x, y, sources[b].second, value);
    };
    Add(RasterPtr<T>(new lumo::BandStackRaster<T>(rasters)), model);
  }

  /// Views that make their pixels; one block of them need not agree with another.
  void AddComputed() {
    const Entry<T> parent = Any();
    auto model = std::make_shared<Model<T>>(*parent.model);
    model->exact = model->writable = model->takesNone = false;
    RasterPtr<T> raster;
    switch (choices_.Below(3)) {
      case 0:
        raster.Reset(new lumo::PVSRaster<T>(parent.raster));
        break;
      case 1: {
        const Entry<T> other = Any();
        raster.Reset(new lumo::OverlapRaster<T, T>(parent.raster, other.raster));
        break;
      }
      default:
        raster.Reset(new lumo::ProjectedRaster<T>(
            parent.raster,
            Grid(1 + choices_.Below(20), 1 + choices_.Below(20), choices_.Below(9),
                 95.0 + choices_.Below(9)),
            lumo::ReprojectionMethod::kPolynomial,
            static_cast<lumo::PyramidResamplingMethod>(2 + choices_.Below(3))));
    }
    model->samples = raster->Samples();
    model->lines = raster->Lines();
    model->bands = raster->Bands();
    if (model->samples != 0 && model->lines != 0 && model->bands != 0) Add(raster, model);
  }

  void AddComplex() {
    auto model = std::make_shared<Model<T>>();
    const unsigned w = model->samples = 1 + choices_.Below(9);
    const unsigned h = model->lines = 1 + choices_.Below(9);
    const unsigned n = 1 + choices_.Below(3);
    model->bands = 3 * n;
    model->takesNone = false;
    model->get = [](unsigned x, unsigned y, unsigned b) {  // the part asked for, real, imaginary
      const auto value = lumo::RampValue<lumo::Complex<T>>(x, y, b / 3);
      return b % 3 == 2 ? value.imag : value.real;
    };
    Add(RasterPtr<T>(new lumo::ComplexRaster<T>(
            RasterPtr<lumo::Complex<T>>(new lumo::RampRaster<lumo::Complex<T>>(w, h, n)),
            lumo::ComplexPart::kReal)),
        model);
  }

  /// A rectangle inside a raster.
  SubRect Rect(const Model<T>& model) {
    return {choices_.Below(model.samples), choices_.Below(model.lines),
            choices_.Below(model.samples), choices_.Below(model.lines)};
  }

  /// Bands of a raster in any order, perhaps some twice.
  Array<unsigned> Bands(const Model<T>& model) {
    Array<unsigned> bands{ArrayDims(1 + choices_.Below(6))};
    for (unsigned& band : bands) band = choices_.Below(model.bands);
    return bands;
  }

  void MoveBlock(const Entry<T>& entry) {
    const Model<T>& model = *entry.model;
    const auto order = static_cast<Interleave>(static_cast<int>(choices_.Below(5)) - 1);
    SubRect rect = Rect(model);
    Array<unsigned> bands = Bands(model);
    const unsigned kind = choices_.Below(8);
    if (kind == 7) return ReadNonsense(entry, order, rect, bands);
    if (kind >= 4 && model.writable) return WriteBlock(entry, order, rect, bands);
    ReadBlock(entry, order, rect, bands, kind % 2 == 0);
  }

  /// True for an order in which the raster has blocks.
  static bool HasBlocks(const Model<T>& model, Interleave order) {
    return order <= Interleave::BSQ && (order != Interleave::None || model.takesNone);
  }

  /// @param foreign  into memory of the caller's, as large as a client has to make it.
  void ReadBlock(const Entry<T>& entry, Interleave order, const SubRect& rect,
                 const Array<unsigned>& bands, bool foreign) {
    const Model<T>& model = *entry.model;
    const unsigned w = rect.Width(), h = rect.Height(), all = bands.GetCount();
    FencedBlock<T> fencedPixels(w * h * all);
    FencedBlock<unsigned char> fencedState(w * h * all);
    Array<T> ownPixels;
    Array<unsigned char> ownState;
    Array<T>& pixels = foreign ? fencedPixels.array : ownPixels;
    Array<unsigned char>& state = foreign ? fencedState.array : ownState;
    const bool read = entry.raster->GetSubRect(rect, bands, order, pixels, state);
    Expect(fencedPixels.IsUnhurt() && fencedState.IsUnhurt(), "a read stays in its block");
    if (!model.exact || (order == Interleave::None && !model.noneKnown)) return;
    if (!HasBlocks(model, order)) {
      Expect(!read, "an order without blocks gives none");
      return;
    }
    Expect(read, "a block inside is read");
    const unsigned n = order == Interleave::None ? 1 : all;
    Expect(pixels.GetDims() == lumo::BlockDims(order, w, h, n) &&
               state.GetDims() == pixels.GetDims() && pixels.GetCount() == w * h * n,
           "a block has its shape");
    for (unsigned y = 0; y < h; ++y)
      for (unsigned x = 0; x < w; ++x)
        for (unsigned i = 0; i < n; ++i) {
          const std::size_t at = PlaceIn(order, w, h, n, x, y, i);
          Expect(pixels[at] == model.get(rect.left + x, rect.top + y, bands[i]) && state[at] == 0,
                 "a pixel has its value");
        }
  }

  void WriteBlock(const Entry<T>& entry, Interleave order, const SubRect& rect,
                  const Array<unsigned>& bands) {
    const Model<T>& model = *entry.model;
    const unsigned w = rect.Width(), h = rect.Height();
    const unsigned n = order == Interleave::None ? 1 : bands.GetCount();
    FencedBlock<T> pixels(w * h * bands.GetCount());
    FencedBlock<unsigned char> state(w * h * bands.GetCount());
    for (unsigned i = 0; i < w * h * n; ++i) {
      pixels.array[i] = static_cast<T>(++written_ % 113);
      state.array[i] = 0;
    }
    const bool put = entry.raster->PutSubRect(rect, bands, order, pixels.array, state.array);
    Expect(pixels.IsUnhurt() && state.IsUnhurt(), "a write leaves its block");
    Expect(put == HasBlocks(model, order), "a block inside is written");
    if (!put) return;
    // The last place of a band that comes twice stands.
    for (unsigned i = 0; i < n; ++i)
      for (unsigned y = 0; y < h; ++y)
        for (unsigned x = 0; x < w; ++x)
          model.set(rect.left + x, rect.top + y, bands[i],
                    pixels.array[PlaceIn(order, w, h, n, x, y, i)]);
  }

  /// Blocks that reach out of the raster, have bands that it hasn't, or none. What comes is free,
  /// as long as it stays in its memory.
  void ReadNonsense(const Entry<T>& entry, Interleave order, SubRect rect, Array<unsigned> bands) {
    constexpr unsigned kFarX[] = {1, 30, 1000}, kFarY[] = {1, 30, 60};  // far over all rasters
    rect.right += kFarX[choices_.Below(3)];
    if (choices_.Below(2) == 1) rect.bottom += kFarY[choices_.Below(3)];
    if (choices_.Below(4) == 1) bands[0] = 0xFFFFFFFF;
    if (choices_.Below(4) == 1) bands.Resize(ArrayDims());
    const unsigned count = rect.Width() * rect.Height() * std::max(bands.GetCount(), 1U);
    FencedBlock<T> pixels(count);
    FencedBlock<unsigned char> state(count);
    entry.raster->GetSubRect(rect, bands, order, pixels.array, state.array);
    Expect(pixels.IsUnhurt() && state.IsUnhurt(), "a read outside stays in its block");
  }

  void ReadAll(const Entry<T>& entry) {
    const Model<T>& model = *entry.model;
    Array<unsigned> bands{ArrayDims(model.bands)};
    for (unsigned i = 0; i < model.bands; ++i) bands[i] = i;
    ReadBlock(entry, Interleave::BIP, {0, 0, model.samples - 1, model.lines - 1}, bands, false);
  }

  Choices& choices_;
  std::vector<std::shared_ptr<std::vector<T>>> memory_;  // outlives the rasters
  std::vector<Entry<T>> pool_;
  unsigned written_ = 0;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Choices choices(data, size);
  static constexpr unsigned kTypes[] = {1, 99, 12, 2, 13, 3, 4, 5};
  lumo::DispatchType(lumo::EightTypes{}, kTypes[choices.Below(8)], [&]<typename T>() {
    Run<T>(choices).Go();
    return true;
  });
  lumo::JoinThreads(10.0);  // of the sources: half an end of one looks like a leak
  return 0;
}
