#include "geometry/polygon_errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned PolygonErrorBadPolygon::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
