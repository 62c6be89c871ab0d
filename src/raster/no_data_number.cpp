#include "raster/no_data_number.h"

#include "raster/raster_details.h"

namespace lumo {

bool NoDataNumber::IsSame(const NoDataNumber& other) const {
  const bool bothWhole = !whole.empty() && !other.whole.empty();
  if (bothWhole) return whole == other.whole;
  return number == other.number || (number != number && other.number != other.number);
}

std::optional<NoDataNumber> NoDataOf(const RasterDef& def, unsigned band) {
  const auto found = def.noData.find(band);
  if (found == def.noData.end()) return std::nullopt;
  NoDataNumber value{found->second, {}};
  const bool isWhole =
      def.dataType == kDataTypeOf<std::int64_t> || def.dataType == kDataTypeOf<std::uint64_t>;
  if (!isWhole) return value;
  const std::string whole = FindDetail(def.metadata, BandDetailPath(band, "NoDataValue"));
  // A detail of another number is of a value that was replaced since.
  const bool stands =
      DispatchType(TypeList<std::int64_t, std::uint64_t>{}, def.dataType, [&]<typename T>() {
        const auto exact = ToPixel<T>(whole);
        return exact && static_cast<double>(*exact) == value.number;
      });
  if (stands) value.whole = whole;
  return value;
}

}  // namespace lumo
