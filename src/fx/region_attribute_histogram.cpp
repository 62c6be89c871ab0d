#include "fx/region_attribute_histogram.h"

#include "foundation/fault.h"
#include "foundation/type_code.h"

namespace lumo {
namespace {

constexpr std::string_view kHistogramMark = "FXAH50";
constexpr std::size_t kLimitsAt = 12;  // in the header

/// True when the header has room for the limits. Else the fault names the file.
bool HasRoom(const URI& uri, unsigned bands, unsigned attributes, unsigned most) {
  const std::uint64_t pairs = std::uint64_t{bands} * attributes;
  if (pairs <= most) return true;
  SetFault(String(uri.ToUTF8() + ": a file holds histograms of " + std::to_string(most) +
                  " pairs of band and attribute, not of " + std::to_string(pairs)));
  return false;
}

}  // namespace

template <typename T>
const unsigned RegionAttributeHistogram<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeHistogram<Single>");
template <typename T>
const unsigned RegionAttributeHistogramMap<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeHistogramMap<Single>");
template <typename T>
const unsigned RegionAttributeHistogramFile<T>::TypeCode =
    GloballyUniqueObjectTypeCode("RegionAttributeHistogramFile<Single>");

template <typename T>
T RegionAttributeHistogram<T>::BinSize(unsigned band, unsigned attribute) const {
  const T range = UpperLimit(band, attribute) - LowerLimit(band, attribute);
  return bins_ >= 2 ? range / static_cast<T>(bins_ - 1) : range + T{1};
}

template <typename T>
void RegionAttributeHistogram<T>::OwnLimits() {
  if (!limits_.Resize(ShapeOf(kLimits))) return;
  std::fill(limits_.begin(), limits_.end(), T());
}

template <typename T>
RegionAttributeHistogramMap<T>::RegionAttributeHistogramMap(unsigned bands, unsigned attributes,
                                                            unsigned bins)
    : Base(bands, attributes, bins) {
  Base::OwnLimits();
  if (!counts_.Resize(Base::ShapeOf(bins))) return;
  std::fill(counts_.begin(), counts_.end(), 0U);
}

template <typename T>
RegionAttributeHistogramFile<T>::RegionAttributeHistogramFile(const URI& uri, unsigned bands,
                                                              unsigned attributes)
    : Base(bands, attributes, kBins),
      file_(uri, kHistogramMark, {bands, attributes, kBins}, ArrayDims(bands, attributes, kBins),
            BasicBuffer::kPageSize, HasRoom(uri, bands, attributes, kMostPairs)) {
  const std::span<unsigned char> header = file_.Elements().Header();
  if (!header.empty()) Base::PutLimits(reinterpret_cast<T*>(&header[kLimitsAt]));
}

template class RegionAttributeHistogram<float>;
template class RegionAttributeHistogramMap<float>;
template class RegionAttributeHistogramFile<float>;

}  // namespace lumo
