#include "data/data_connection.h"
#include "gdal_factory.h"
#include "orva_factory.h"

/// The entry point of the plug-in.
extern "C" VEXG_EXPORT lumo::DataConnectionFactory* CreateDataConnectionFactory(
    lumo::FormatRecord* record) {
  return record->driver == "ORVA" ? lumo::MakeOrvaFactory(*record) : lumo::MakeGdalFactory(*record);
}
