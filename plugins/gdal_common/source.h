#pragma once

#include <gdal.h>
#include <memory>
#include <string>
#include <vector>

#include "foundation/string.h"
#include "gdal_common/library.h"

namespace lumo::gdal {

struct DatasetCloser {
  void operator()(GDALDatasetH dataset) const { GDALClose(dataset); }
};
using DatasetPtr = std::unique_ptr<void, DatasetCloser>;

/// The source that connection strings name: a file, or anything else that GDAL opens by a name.
///
/// Of the pieces that are no format's key the first is the name. Further ones are "NAME=VALUE", an
/// open option of GDAL's driver, or "SUBDATASET=…", one of the rasters in the file: its number,
/// from 1, or the end of its name.
struct Source {
  std::string name;  ///< absolute, for a file
  bool isFile = false;
  bool hasKey = false;  ///< the strings hold the format's key
  std::string subdataset;
  std::vector<std::string> openOptions;
  URI uri;  ///< the same for every way to name the source
};

/// Reads connection strings. False, with the fault set, when they don't name a source.
bool ParseSource(const Array<String>& connStrings, Source& source);

/// Makes of a source the file that is to be made: absolute, links resolved, so that a link stays
/// and what it leads to is replaced. False, with the fault set, when more than a path is named.
bool ParseTarget(Source& source);

/// Asks GDAL whether the source is of the format; opens nothing. Without the format's key a source
/// has to be a file or a directory: names that GDAL alone understands may reach over the network.
bool IsOfFormat(const Source& source, const Format& format, unsigned openFlags);

class Messages;

/// Judges the file operations that failed while GDAL looked at a source: those on files that lie
/// beside it, and that GDAL goes on without, become warnings. False, with the fault set, when the
/// source itself is meant.
bool IsWithoutFault(const Messages& messages, const Source& source);

/// Opens a source: the one place at which this library opens what somebody else names. Null, with
/// the fault set.
/// @param openFlags  GDAL_OF_RASTER or GDAL_OF_VECTOR, with GDAL_OF_UPDATE or not.
DatasetPtr OpenDataset(const Source& source, const Format& format, unsigned openFlags);

}  // namespace lumo::gdal
