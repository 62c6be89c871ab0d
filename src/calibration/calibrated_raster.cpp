#include "calibration/calibrated_raster.h"

#include <algorithm>

#include "calibration/value_conversion.h"
#include "foundation/fault.h"
#include "raster/block_shape.h"
#include "raster/raster_details.h"
#include "tasks/parallel.h"
#include "tasks/scratch_pool.h"

namespace lumo {

namespace detail {

/// A block of digital numbers of some type, pixel-interleaved.
class NumberBlock {
 public:
  virtual ~NumberBlock() = default;
  virtual bool Read(const BasicRasterPtr& raster, const SubRect& rect,
                    const Array<unsigned>& bands) = 0;
  /// Gives `count` numbers from position `at` on.
  virtual void Get(std::size_t at, std::size_t count, double* values) const = 0;
  const Array<unsigned char>& States() const { return states_; }

 protected:
  Array<unsigned char> states_;
};

}  // namespace detail

namespace {

using detail::NumberBlock;

// A larger block of digital numbers doesn't wait for the next read.
constexpr std::uint64_t kMostKept = std::uint64_t{1} << 23U;

template <typename S>
class NumberBlockOf final : public NumberBlock {
 public:
  bool Read(const BasicRasterPtr& raster, const SubRect& rect,
            const Array<unsigned>& bands) override {
    return RasterPtr<S>(raster)->GetSubRect(rect, bands, Interleave::BIP, pixels_, states_);
  }
  void Get(std::size_t at, std::size_t count, double* values) const override {
    ToDoubles(pixels_.GetData() + at, values, count);
  }

 private:
  Array<S> pixels_;
};

/// Calls `body(RasterPtr<S>)` for a raster of EightTypes.
template <typename Body>
bool VisitTyped(const BasicRasterPtr& raster, const Body& body) {
  return raster && DispatchType(EightTypes{}, raster->DataType(), [&]<typename S>() {
           body(RasterPtr<S>(raster));
           return true;
         });
}

std::unique_ptr<NumberBlock> MakeBlock(unsigned dataType) {
  std::unique_ptr<NumberBlock> block;
  DispatchType(EightTypes{}, dataType, [&]<typename S>() {
    block = std::make_unique<NumberBlockOf<S>>();
    return true;
  });
  return block;
}

/// Computes a block, pixel-interleaved.
template <typename T>
void Compute(const NumberBlock& block, const CalibrationFormula& formula, const BlockShape& shape,
             T* pixels) {
  const std::size_t perLine = std::size_t{shape.width} * shape.count;
  const std::size_t most = formula.PixelsAtOnce() * shape.count;
  const unsigned char* const states = block.States().GetData();
  ScratchPool<std::vector<double>> scratch;
  ParallelFor(shape.height, nullptr, [&](unsigned begin, unsigned end) {
    const auto values = scratch.Borrow(most);
    const std::size_t last = end * perLine;
    for (std::size_t at = begin * perLine; at < last;) {
      const std::size_t count = std::min(most, last - at);
      block.Get(at, count, values->data());
      formula.Apply(values->data(), count / shape.count);
      FromDoubles(values->data(), pixels + at, count);
      for (std::size_t i = at; i < at + count; ++i) {
        if (!IsValidState(states[i])) pixels[i] = T();
      }
      at += count;
    }
  });
}

}  // namespace

template <typename T>
CalibratedRaster<T>::CalibratedRaster(const BasicRasterPtr& raster,
                                      const CalibrationConstants& constants)
    : raster_(raster), constants_(constants) {
  if (!SetUp()) def_.Clear();
}

template <typename T>
CalibratedRaster<T>::~CalibratedRaster() {
  this->StopComputing();
}

template <typename T>
bool CalibratedRaster<T>::SetUp() {
  if (!raster_ || !raster_->IsValid() || !constants_.Fit(raster_->Bands())) return false;
  if (!VisitTyped(raster_, [](const auto&) {})) {
    SetFault("the raster has a pixel type that can't be calibrated");
    return false;
  }
  def_ = raster_->GetRasterDef();
  def_.dataType = kDataTypeOf<T>;
  def_.noData.clear();  // the states carry it
  std::vector<std::string> names;
  for (unsigned band = 0; band < def_.bands; ++band) {
    names.push_back(FindDetail(def_.metadata, BandDetailPath(band, "Description")));
  }
  for (const std::string& name : DetailNames(def_.metadata)) {
    if (name.starts_with("Bands/") || name.starts_with("Items/")) {
      def_.metadata.Remove(DetailPath(name));
    }
  }
  Array<unsigned> all{ArrayDims(def_.bands)};
  for (unsigned band = 0; band < def_.bands; ++band) {
    all[band] = band;
    if (names[band].empty()) continue;
    def_.metadata.Set(BandDetailPath(band, "Description"), String(names[band]));
  }
  formula_ = MakeFormula(all);
  return true;
}

template <typename T>
std::unique_ptr<CalibrationFormula> CalibratedRaster<T>::MakeFormula(
    const Array<unsigned>& bands) const {
  return constants_.MakeFormula(bands, static_cast<double>(FromDouble<T>(constants_.scale)));
}

template <typename T>
bool CalibratedRaster<T>::IsAllBands(const Array<unsigned>& bands) const {
  if (bands.GetCount() != def_.bands) return false;
  for (unsigned band = 0; band < def_.bands; ++band) {
    if (bands[band] != band) return false;
  }
  return true;
}

template <typename T>
bool CalibratedRaster<T>::IsValid() const {
  return def_.bands != 0 && raster_->IsValid();
}

template <typename T>
bool CalibratedRaster<T>::PyramidExists() const {
  return def_.bands != 0 && raster_->PyramidExists();
}

template <typename T>
PyramidDef CalibratedRaster<T>::GetPyramidDef() const {
  return PyramidExists() ? raster_->GetPyramidDef() : PyramidDef();
}

template <typename T>
RasterPtr<T> CalibratedRaster<T>::PyramidLevel(unsigned level) {
  BasicRasterPtr reduced;
  VisitTyped(raster_,
             [&](const auto& raster) { reduced = BasicRasterPtr(raster->PyramidLevel(level)); });
  if (!reduced || def_.bands == 0) return {};
  const RasterPtr<T> view(new CalibratedRaster(reduced, constants_));
  return view->IsValid() ? view : RasterPtr<T>();
}

template <typename T>
void CalibratedRaster<T>::SetTileDimensions(const lumo::TileDimensions& tiles) {
  if (raster_) raster_->SetTileDimensions(tiles);
}

template <typename T>
lumo::TileDimensions CalibratedRaster<T>::TileDimensions() const {
  return def_.bands != 0 ? raster_->TileDimensions() : lumo::TileDimensions();
}

template <typename T>
std::uint64_t CalibratedRaster<T>::WriteCount() const {
  std::uint64_t writes = 0;
  VisitTyped(raster_, [&](const auto& raster) { writes = raster->WriteCount(); });
  return writes;
}

template <typename T>
bool CalibratedRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                     Interleave interleave, Array<T>& pixels,
                                     Array<unsigned char>& state) {
  const BlockShape shape(rect, bands, interleave);
  if (rect.right >= def_.samples || rect.bottom >= def_.lines || !shape.Size(pixels, state)) {
    return false;
  }
  for (const unsigned band : shape.bands) {
    if (band >= def_.bands) return false;
  }
  const auto borrowed = blocks_.Borrow();
  std::unique_ptr<NumberBlock>& block = *borrowed;
  if (!block) block = MakeBlock(raster_->DataType());
  if (!block || !block->Read(raster_, rect, shape.bands)) return false;
  const auto some = IsAllBands(shape.bands) ? nullptr : MakeFormula(shape.bands);
  const CalibrationFormula& formula = some ? *some : *formula_;
  bool done = true;
  if (interleave == Interleave::BIP || shape.count == 1) {
    Compute(*block, formula, shape, pixels.GetData());
    std::copy_n(block->States().GetData(), shape.dims.count, state.GetData());
  } else {
    Array<T> computed;
    done = computed.Resize(ArrayDims(static_cast<unsigned>(shape.dims.count)));
    if (done) Compute(*block, formula, shape, computed.GetData());
    done = done &&
           shape.Convert(computed, block->States(), Interleave::BIP, pixels, state, interleave);
  }
  if (shape.dims.count > kMostKept) block.reset();
  return done;
}

VEXG_INSTANCES(EIGHT, CalibratedRaster);

}  // namespace lumo
