#include "data/data_connection.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned DataConnection::TypeCode = GloballyUniqueObjectTypeCode("DataConnection");
const unsigned RasterDataConnection::TypeCode =
    GloballyUniqueObjectTypeCode("RasterDataConnection");
const unsigned VectorDataConnection::TypeCode =
    GloballyUniqueObjectTypeCode("VectorDataConnection");

bool DataConnection::IsA(unsigned typeCode) const {
  return typeCode == TypeCode ||
         (typeCode == RasterDataConnection::TypeCode &&
          dynamic_cast<const RasterDataConnection*>(this) != nullptr) ||
         (typeCode == VectorDataConnection::TypeCode &&
          dynamic_cast<const VectorDataConnection*>(this) != nullptr);
}

}  // namespace lumo
