#include "raster/pixel_types.h"

#include <string>

namespace lumo {
namespace {

struct DataTypeRow {
  unsigned code;
  const char* name;
};

constexpr DataTypeRow kDataTypes[] = {
    {0, "Unknown"}, {1, "Byte"},         {2, "Int16"},         {3, "Int32"},
    {4, "Single"},  {5, "Double"},       {6, "ComplexSingle"}, {9, "ComplexDouble"},
    {12, "UInt16"}, {13, "UInt32"},      {14, "Int64"},        {15, "UInt64"},
    {95, "Quad"},   {96, "ComplexQuad"}, {98, "Bool"},         {99, "Char"},
};

}  // namespace

String DataTypeName(unsigned code) {
  for (const DataTypeRow& row : kDataTypes) {
    if (row.code == code) return row.name;
  }
  return kDataTypes[0].name;
}

unsigned ParseDataType(const String& name) {
  const std::string text = name.ToUTF8();
  for (const DataTypeRow& row : kDataTypes) {
    if (text == row.name) return row.code;
  }
  return text.find("USHORT") != std::string::npos ? kDataTypeOf<std::uint16_t> : 0;
}

unsigned DataTypeBytes(unsigned code) {
  unsigned bytes = 0;
  DispatchType(TwelveTypes{}, code, [&]<typename T>() {
    bytes = sizeof(T);
    return true;
  });
  return bytes;
}

}  // namespace lumo
