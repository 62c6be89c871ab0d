#pragma once

#include "data/vector_records.h"

namespace lumo {

/// Opens a file of records with whichever of GDAL's drivers knows it; see
/// VectorRecordFactory::Open.
VectorRecordSourcePtr OpenVectorSource(const std::string& path);

}  // namespace lumo
