#pragma once

namespace lumo {

class DataConnectionFactory;
struct FormatRecord;

/// The factory of a row that GDAL serves; it lives until the process ends. Null, with the fault
/// set, when this GDAL hasn't got the row's driver.
DataConnectionFactory* MakeGdalFactory(const FormatRecord& record);

}  // namespace lumo
