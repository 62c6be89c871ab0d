#include "foundation/type_code.h"
#include "stats/extended_raster_stats_body.h"

namespace lumo {

template <typename T>
const unsigned ExtendedRasterStats<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("ExtendedRasterStats<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

VEXG_INSTANCES(TEN, ExtendedRasterStats);

}  // namespace lumo
