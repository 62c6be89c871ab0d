#include "foundation/type_code.h"
#include "stats/raster_histogram_body.h"

namespace lumo {

template <typename T>
const unsigned RasterHistogram<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("RasterHistogram<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

VEXG_INSTANCES(TEN, RasterHistogram);

}  // namespace lumo
