#pragma once

#include "data/vector_records.h"

namespace lumo {

/// The endings of the files of records that GDAL makes here, each with its dot.
std::vector<std::string> VectorSinkEndings();

/// Makes a file of records in the format of its ending; see VectorRecordFactory::Create.
VectorRecordSinkPtr CreateVectorSink(const std::string& path, const VectorLayer& layer);

}  // namespace lumo
