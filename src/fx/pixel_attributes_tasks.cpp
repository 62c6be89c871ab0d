#include "fx/pixel_attributes_tasks.h"

#include <algorithm>
#include <cmath>

#include "fx/usable_pixels.h"
#include "fx/window_entropy.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace {

constexpr unsigned kMapValues = 1U << 20;  // regions by bands of a map

/// The labels of a tile of either type; null for another object.
const std::uint32_t* LabelsOf(const ObjectPtr& tile) {
  if (const TilePtr<std::int32_t> whole(tile); whole && whole->IsValid()) {
    return reinterpret_cast<const std::uint32_t*>(whole->PixelArray().GetData());
  }
  const TilePtr<std::uint32_t> natural(tile);
  return natural && natural->IsValid() ? natural->PixelArray().GetData() : nullptr;
}

void Raise(float& to, float value) {
  if (value > to) to = value;
}

void Lower(float& to, float value) {
  if (value < to) to = value;
}

}  // namespace

template <typename T, typename File>
RegionComputeTask<T, File>::RegionComputeTask(const char* name, ArgList& setup)
    : SequentialTask(name),
      held_(setup.Get(0)),
      setup_(dynamic_cast<RegionComputeSetup<File>*>(held_.Get())) {
  if (setup_ == nullptr || setup_->file.IsNull() || !setup_->file->IsValid()) {
    SetErrorState(TaskErrorBadParams());
    return;
  }
  map_ = std::make_unique<RegionAttributesMap<float>>(GetFile().Bands(), GetFile().Attributes());
}

template <typename T, typename File>
bool RegionComputeTask<T, File>::Execute(ArgList& args) {
  if (HasError()) return false;
  const TilePtr<T> image(args.Get(0));
  const ObjectPtr labelObject = args.Get(1);
  const auto* const labelTile = dynamic_cast<BasicTile*>(labelObject.Get());
  const std::uint32_t* const labels = LabelsOf(labelObject);
  const bool fits = image && image->IsValid() && labels != nullptr &&
                    image->Bands() == GetFile().Bands() && labelTile->Width() == image->Width() &&
                    labelTile->Height() == image->Height() && image->BorderLeft() >= Reach() &&
                    image->BorderRight() >= Reach() && image->BorderTop() >= Reach() &&
                    image->BorderBottom() >= Reach();
  if (!fits) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  for (int y = 0; y < static_cast<int>(image->Height()) && !IsAborted(); ++y) {
    for (int x = 0; x < static_cast<int>(image->Width()); ++x) {
      if (!IsUsable(*labelTile, x, y) || !IsUsable(*image, x, y)) continue;
      AddPixel(*image, x, y, labels[labelTile->Offset(x, y)]);
    }
  }
  if (map_->HasError()) {
    SetErrorState(*map_);
    return false;
  }
  if (map_->RegionCount() > kMapValues / std::max(GetFile().Bands(), 1U)) Flush();
  return true;
}

template <typename T, typename File>
void RegionComputeTask<T, File>::Flush() {
  const Array<unsigned> regions = map_->GetRegions();
  for (const unsigned region : regions) {
    if (IsAborted()) break;
    for (unsigned band = 0; band < GetFile().Bands(); ++band) AddToFile(region, band);
  }
  const auto old = static_cast<std::ptrdiff_t>(touched_.size());
  touched_.insert(touched_.end(), regions.begin(), regions.end());
  std::inplace_merge(touched_.begin(), touched_.begin() + old, touched_.end());
  touched_.erase(std::unique(touched_.begin(), touched_.end()), touched_.end());
  map_->Clear();
}

template <typename T, typename File>
void RegionComputeTask<T, File>::Complete() {
  if (HasError()) return;
  try {
    Flush();
    // Records of other regions are zeros, and stay so.
    for (const unsigned region : touched_) {
      if (IsAborted()) break;
      for (unsigned band = 0; band < GetFile().Bands(); ++band) Finish(region, band);
    }
  } catch (const std::bad_alloc&) {
    GetFile().SetErrorState(ObjectErrorOutOfMemory());
  }
}

using Spectral = SpectralRegionAttributes;

template <typename T, typename File>
void SpectralRegionAttributesComputeTask<T, File>::AddPixel(const Tile<T>& image, int x, int y,
                                                            unsigned label) {
  RegionAttributesMap<float>& map = this->Map();
  for (unsigned band = 0; band < image.Bands(); ++band) {
    const auto value = static_cast<double>(image.Pixel(x, y, band));
    float& count = map.Value(label, band, Spectral::kPixelCount);
    float& min = map.Value(label, band, Spectral::kMin);
    float& max = map.Value(label, band, Spectral::kMax);
    if (!(count > 0)) {
      min = max = static_cast<float>(value);
    } else {
      if (value < min) min = static_cast<float>(value);
      if (value > max) max = static_cast<float>(value);
    }
    ++count;
    float& sum = map.Value(label, band, Spectral::kMean);
    float& squares = map.Value(label, band, Spectral::kStdDev);
    sum = static_cast<float>(sum + value);
    squares = static_cast<float>(squares + value * value);
  }
}

template <typename T, typename File>
void SpectralRegionAttributesComputeTask<T, File>::AddToFile(unsigned region, unsigned band) {
  const RegionAttributesMap<float>& map = this->Map();
  File& file = this->GetFile();
  const float min = map.Value(region, band, Spectral::kMin);
  const float max = map.Value(region, band, Spectral::kMax);
  if (std::as_const(file).Value(region, band, Spectral::kPixelCount) > 0) {
    Lower(file.Value(region, band, Spectral::kMin), min);
    Raise(file.Value(region, band, Spectral::kMax), max);
  } else {
    file.Value(region, band, Spectral::kMin) = min;
    file.Value(region, band, Spectral::kMax) = max;
  }
  for (const unsigned attribute : {Spectral::kPixelCount, Spectral::kMean, Spectral::kStdDev}) {
    file.Value(region, band, attribute) += map.Value(region, band, attribute);
  }
}

template <typename T, typename File>
void SpectralRegionAttributesComputeTask<T, File>::Finish(unsigned region, unsigned band) {
  File& file = this->GetFile();
  const double n = std::as_const(file).Value(region, band, Spectral::kPixelCount);
  double mean = 0;
  double deviation = 0;
  if (n > 0) {
    mean = std::as_const(file).Value(region, band, Spectral::kMean) / n;
    const double variance =
        std::as_const(file).Value(region, band, Spectral::kStdDev) / n - mean * mean;
    if (variance > 0) deviation = std::sqrt(variance);
  }
  file.Value(region, band, Spectral::kMean) = static_cast<float>(mean);
  file.Value(region, band, Spectral::kStdDev) = static_cast<float>(deviation);
}

using Texture = TextureRegionAttributes;

template <typename T, typename File>
void TextureRegionAttributesComputeTask<T, File>::AddPixel(const Tile<T>& image, int x, int y,
                                                           unsigned label) {
  const int r = static_cast<int>(Reach());
  RegionAttributesMap<float>& map = this->Map();
  for (unsigned band = 0; band < image.Bands(); ++band) {
    values_.clear();
    double min = static_cast<double>(image.Pixel(x, y, band));
    double max = min, sum = 0, squares = 0;
    for (int dy = -r; dy <= r; ++dy) {
      for (int dx = -r; dx <= r; ++dx) {
        if (!IsValidState(image.PixelState(x + dx, y + dy, band))) continue;
        const auto value = static_cast<double>(image.Pixel(x + dx, y + dy, band));
        values_.push_back(value);
        sum += value;
        squares += value * value;
        if (value < min) min = value;
        if (value > max) max = value;
      }
    }
    double range = 0, mean = 0, variance = 0;
    const auto n = static_cast<double>(values_.size());
    if (n > 0) {
      range = max - min;
      mean = sum / n;
      if (n > 1) variance = (squares - mean * sum) / (n - 1);
    }
    const double figures[] = {range, mean, variance, WindowEntropy(values_, min, max)};
    for (unsigned i = 0; i < 4; ++i) {
      float& to = map.Value(label, band, i);
      to = static_cast<float>(to + figures[i]);
    }
    ++map.Value(label, band, Texture::kPixelCount);
  }
}

template <typename T, typename File>
void TextureRegionAttributesComputeTask<T, File>::AddToFile(unsigned region, unsigned band) {
  for (unsigned i = 0; i < Texture::kAttributes; ++i) {
    this->GetFile().Value(region, band, i) += std::as_const(this->Map()).Value(region, band, i);
  }
}

template <typename T, typename File>
void TextureRegionAttributesComputeTask<T, File>::Finish(unsigned region, unsigned band) {
  File& file = this->GetFile();
  const double n = std::as_const(file).Value(region, band, Texture::kPixelCount);
  for (unsigned i = 0; i < Texture::kPixelCount; ++i) {
    float& value = file.Value(region, band, i);
    value = n > 0 ? static_cast<float>(value / n) : 0;
  }
}

template <typename T, typename File>
void RegionMeansComputeTask<T, File>::AddPixel(const Tile<T>& image, int x, int y, unsigned label) {
  for (unsigned band = 0; band < image.Bands(); ++band) {
    ++this->Map().Value(label, band, RegionMeans::kPixelCount);
    float& sum = this->Map().Value(label, band, RegionMeans::kMean);
    sum = static_cast<float>(sum + static_cast<double>(image.Pixel(x, y, band)));
  }
}

template <typename T, typename File>
void RegionMeansComputeTask<T, File>::AddToFile(unsigned region, unsigned band) {
  for (unsigned i = 0; i < RegionMeans::kAttributes; ++i) {
    this->GetFile().Value(region, band, i) += std::as_const(this->Map()).Value(region, band, i);
  }
}

template <typename T, typename File>
void RegionMeansComputeTask<T, File>::Finish(unsigned region, unsigned band) {
  File& file = this->GetFile();
  const double n = std::as_const(file).Value(region, band, RegionMeans::kPixelCount);
  float& mean = file.Value(region, band, RegionMeans::kMean);
  mean = n > 0 ? static_cast<float>(mean / n) : 0;
}

#define VEXG_COMPUTE_TASKS(T)                                        \
  template class RegionComputeTask<T, SpectralRegionAttributesFile>; \
  template class RegionComputeTask<T, TextureRegionAttributesFile>;  \
  template class RegionComputeTask<T, RegionMeansFile>;
VEXG_FOR_ALL(EIGHT, VEXG_COMPUTE_TASKS);
#undef VEXG_COMPUTE_TASKS

VEXG_INSTANCES(EIGHT, SpectralRegionAttributesComputeTask);
VEXG_INSTANCES(EIGHT, TextureRegionAttributesComputeTask);
VEXG_INSTANCES(EIGHT, RegionMeansComputeTask);

}  // namespace lumo
