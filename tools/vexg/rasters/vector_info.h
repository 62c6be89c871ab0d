#pragma once

#include <string>
#include <vector>

#include "jobs/raster_job.h"
#include "output/json_number.h"

namespace lumo::host {

/// A layer of a vector file.
struct VectorLayerInfo {
  std::string name;
  std::string geometry;
  std::int64_t records = 0;
  Array<double> bounds;  ///< min x, min y, max x, max y; empty without a record
  std::string coordSys;
  Array<String> fields;
  Array<String> fieldTypes;
};

/// True for a name that ends as those of vector files do.
bool IsVectorName(const std::string& file);

/// The job that asks for a layer of a file.
JobDraft MakeVectorQuery(const std::string& file, unsigned layer);

/// All layers of a file. Throws HostError.
std::vector<VectorLayerInfo> ReadVectorLayers(JobSession& session, const std::string& file);

Json VectorAsJson(const std::string& file, const std::vector<VectorLayerInfo>& layers);
std::string VectorAsText(const std::string& file, const std::vector<VectorLayerInfo>& layers);

}  // namespace lumo::host
