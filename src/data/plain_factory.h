#pragma once

#include <string>

#include "data/data_connection.h"

namespace lumo {

/// A factory of a format that is there on every machine, and whose sources are connections of one
/// class. A plug-in's own derives from it, and has to recognise its sources and to make a
/// connection; the connection opens or makes the source.
///
/// Rasters or vectors can't be made where a format doesn't hold them: the fault says so.
class VEXG_EXPORT PlainFactory : public DataConnectionFactory {
 public:
  /// True.
  bool IsAvailable() override;
  DataConnectionPtr Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                            const MetadataPtr& metadata) override;
  DataConnectionPtr CreateRaster(const Array<String>& connStrings, const RasterDef& def) override;
  DataConnectionPtr CreateVector(const Array<String>& connStrings, const VectorDef& def) override;

 protected:
  /// @param name  begins the texts of faults, such as the key of the format.
  explicit PlainFactory(std::string name);
  /// Gives a connection that is not open yet, which the caller owns: `new Connection`.
  virtual DataConnection* Make() = 0;
  /// Sets the fault "name: what", and gives what a failed call gives.
  DataConnectionPtr FailWith(const std::string& what) const;

 private:
  template <typename Kind, typename Start>
  DataConnectionPtr Open(const char* what, const Start& start);

  const std::string name_;
};

}  // namespace lumo
