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
    : DerivedRaster<T>({raster}), constants_(constants) {
  SetUp();
}

template <typename T>
CalibratedRaster<T>::~CalibratedRaster() {
  this->StopComputing();
}

template <typename T>
void CalibratedRaster<T>::SetUp() {
  const BasicRasterPtr& raster = this->GetRasters().front();
  if (!raster || !raster->IsValid() || !constants_.Fit(raster->Bands())) return;
  if (!DispatchType(EightTypes{}, raster->DataType(), []<typename S>() { return true; })) {
    SetFault("the raster has a pixel type that can't be calibrated");
    return;
  }
  const RasterDef def = raster->GetRasterDef();
  std::vector<std::string> names;
  Array<unsigned> all{ArrayDims(def.bands)};
  for (unsigned band = 0; band < def.bands; ++band) {
    names.push_back(FindDetail(def.metadata, BandDetailPath(band, "Description")));
    all[band] = band;
  }
  this->Describe(names);
  formula_ = MakeFormula(all);
}

template <typename T>
std::unique_ptr<CalibrationFormula> CalibratedRaster<T>::MakeFormula(
    const Array<unsigned>& bands) const {
  return constants_.MakeFormula(bands, static_cast<double>(FromDouble<T>(constants_.scale)));
}

template <typename T>
bool CalibratedRaster<T>::IsAllBands(const Array<unsigned>& bands) const {
  if (bands.GetCount() != this->Bands()) return false;
  for (unsigned band = 0; band < this->Bands(); ++band) {
    if (bands[band] != band) return false;
  }
  return true;
}

template <typename T>
bool CalibratedRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                     Interleave interleave, Array<T>& pixels,
                                     Array<unsigned char>& state) {
  const BlockShape shape(rect, bands, interleave);
  if (rect.right >= this->Samples() || rect.bottom >= this->Lines() || !shape.Size(pixels, state)) {
    return false;
  }
  for (const unsigned band : shape.bands) {
    if (band >= this->Bands()) return false;
  }
  const auto borrowed = blocks_.Borrow();
  std::unique_ptr<NumberBlock>& block = *borrowed;
  const BasicRasterPtr& raster = this->GetRasters().front();
  if (!block) block = MakeBlock(raster->DataType());
  if (!block || !block->Read(raster, rect, shape.bands)) return false;
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
