#pragma once

#include "data/data_connection.h"
#include "data/format_table.h"

namespace lumo {

/// Makes the factory of TIFF files, which opens those of the usual kinds itself and hands the
/// others, and all that is made or changed, to GDAL's.
/// @param findGdal  gives GDAL's factory of the format; null, with the fault set, without it.
DataConnectionFactory* MakeTiffFactory(const FormatRecord& record,
                                       DataConnectionFactory* (*findGdal)());

}  // namespace lumo
