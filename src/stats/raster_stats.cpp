#include "foundation/type_code.h"
#include "stats/raster_stats_body.h"

namespace lumo {

template <typename T>
const unsigned RasterStats<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("RasterStats<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

VEXG_INSTANCES(TEN, RasterStats);

}  // namespace lumo
