#include "views/expression_block.h"

#include <algorithm>

#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "raster/pixel_states.h"
#include "raster/raster_def.h"

namespace lumo {

/// Holds the bands of one raster for one block, as numbers whatever their type.
class ExpressionSource {
 public:
  virtual ~ExpressionSource() = default;

  /// Reads the bands in the order in which they are asked for.
  virtual bool Read(const SubRect& rect, const Array<unsigned>& bands) = 0;
  /// Gives the pixels of a line as numbers.
  /// @param place  of the band among those that were read.
  virtual void Fetch(unsigned place, std::size_t line, std::size_t first, std::size_t count,
                     double* numbers) const = 0;
  /// Adds the states of the pixels of a line to what stands there.
  void Join(unsigned place, std::size_t line, std::size_t first, std::size_t count,
            unsigned char* states) const {
    const unsigned char* from = state_.GetData() + At(place, line, first);
    for (std::size_t i = 0; i < count; ++i) states[i] |= from[i * strides_.pixel];
  }
  /// True when every pixel that was read counts.
  bool AreAllValid() const { return areAllValid_; }

  Array<unsigned> bands;  ///< that are needed

 protected:
  std::size_t At(unsigned place, std::size_t line, std::size_t first) const {
    return place * strides_.band + line * strides_.line + first * strides_.pixel;
  }

  BlockStrides strides_;
  Array<unsigned char> state_;
  bool areAllValid_ = true;
};

namespace {

template <typename S>
class TypedSource final : public ExpressionSource {
 public:
  explicit TypedSource(const RasterPtr<S>& raster) : raster_(raster) {
    // The order of the source itself, so that nothing is converted on the way.
    const Interleave order = raster->GetRasterDef().interleave;
    if (order != Interleave::None) order_ = order;
  }

  bool Read(const SubRect& rect, const Array<unsigned>& wanted) override {
    const BlockShape shape(rect, wanted, order_);
    if (!raster_->GetSubRect(rect, wanted, order_, pixels_, state_) ||
        pixels_.GetCount() < shape.dims.count || state_.GetCount() < shape.dims.count) {
      return false;
    }
    strides_ = BlockStrides(order_, shape.width, shape.height, shape.count);
    areAllValid_ = AllValid(state_.GetData(), state_.GetCount());
    return true;
  }

  void Fetch(unsigned place, std::size_t line, std::size_t first, std::size_t count,
             double* numbers) const override {
    const S* const from = pixels_.GetData() + At(place, line, first);
    if (strides_.pixel == 1) {
      for (std::size_t i = 0; i < count; ++i) numbers[i] = static_cast<double>(from[i]);
    } else {
      const std::size_t step = strides_.pixel;
      for (std::size_t i = 0; i < count; ++i) numbers[i] = static_cast<double>(from[i * step]);
    }
  }

 private:
  RasterPtr<S> raster_;
  Interleave order_ = Interleave::BIP;
  Array<S> pixels_;
};

std::unique_ptr<ExpressionSource> MakeSource(const BasicRasterPtr& raster) {
  std::unique_ptr<ExpressionSource> source;
  DispatchType(TenTypes{}, raster->DataType(), [&]<typename S>() {
    source = std::make_unique<TypedSource<S>>(RasterPtr<S>(raster));
    return true;
  });
  return source;
}

}  // namespace

ExpressionBlock::ExpressionBlock(const std::vector<BasicRasterPtr>& rasters,
                                 std::vector<const Expression*> expressions)
    : expressions_(std::move(expressions)), sources_(rasters.size()) {
  std::vector<std::vector<unsigned>> bands(rasters.size());
  for (const Expression* expression : expressions_) {
    std::vector<unsigned>& planes = planesOf_.emplace_back();
    for (const BandNames::Band& band : expression->Inputs()) {
      auto found = std::find_if(planes_.begin(), planes_.end(),
                                [&](const Plane& plane) { return plane.band == band; });
      if (found == planes_.end()) {
        std::vector<unsigned>& own = bands[band.source];
        found = planes_.insert(planes_.end(), {band, static_cast<unsigned>(own.size())});
        own.push_back(band.band);
      }
      planes.push_back(static_cast<unsigned>(found - planes_.begin()));
    }
  }
  for (std::size_t i = 0; i < rasters.size(); ++i) {
    if (bands[i].empty()) continue;
    sources_[i] = MakeSource(rasters[i]);
    sources_[i]->bands = Array<unsigned>(ArrayDims(static_cast<unsigned>(bands[i].size())));
    std::copy(bands[i].begin(), bands[i].end(), sources_[i]->bands.begin());
  }
}

ExpressionBlock::~ExpressionBlock() = default;

bool ExpressionBlock::Read(const SubRect& rect) {
  return std::all_of(sources_.begin(), sources_.end(), [&](const auto& source) {
    return !source || source->Read(rect, source->bands);
  });
}

ExpressionBlock::Line::Line(const ExpressionBlock& block)
    : block_(block),
      planes_(block.planes_.size() * Expression::kMostPixels),
      values_(Expression::kMostPixels),
      states_(Expression::kMostPixels) {
  for (const Expression* expression : block.expressions_) scratch_.emplace_back(*expression);
}

void ExpressionBlock::Line::Fetch(std::size_t line, std::size_t first, std::size_t count) {
  line_ = line;
  first_ = first;
  count_ = count;
  double* row = planes_.data();
  for (const Plane& plane : block_.planes_) {
    block_.sources_[plane.band.source]->Fetch(plane.place, line, first, count, row);
    row += Expression::kMostPixels;
  }
}

void ExpressionBlock::Line::Compute(std::size_t expression) {
  const std::vector<unsigned>& planes = block_.planesOf_[expression];
  std::vector<const double*> inputs(planes.size());
  areAllValid_ = true;
  for (std::size_t i = 0; i < planes.size(); ++i) {
    inputs[i] = planes_.data() + planes[i] * Expression::kMostPixels;
    const Plane& plane = block_.planes_[planes[i]];
    const ExpressionSource& source = *block_.sources_[plane.band.source];
    if (source.AreAllValid()) continue;
    if (areAllValid_) std::fill_n(states_.begin(), count_, static_cast<unsigned char>(0));
    areAllValid_ = false;
    source.Join(plane.place, line_, first_, count_, states_.data());
  }
  block_.expressions_[expression]->Evaluate(inputs, count_, scratch_[expression], values_.data());
}

}  // namespace lumo
