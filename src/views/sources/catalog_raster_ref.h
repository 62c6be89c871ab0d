#pragma once

#include <span>

#include "commands/value_text.h"
#include "data/data_connection.h"
#include "raster/raster.h"

namespace lumo {

/// The effect of a second open of a source that is open already.
enum class SourceCheck {
  kTold,      ///< it shares the raster that stands on the source
  kCompared,  ///< as long as the files of the source have not changed
};

/// "Told", "Compared".
VEXG_EXPORT std::span<const EnumWord<SourceCheck>> WordsOf(SourceCheck);

/// The effect of a pyramid file that can't be used with its raster.
enum class PyramidCheck {
  kTold,     ///< it is one that can't be read, or is of a raster of another size or pixel type:
             ///< the raster is not opened
  kFitting,  ///< it is any that was not built from the raster as it is: it is left out
};

/// "Told", "Fitting".
VEXG_EXPORT std::span<const EnumWord<PyramidCheck>> WordsOf(PyramidCheck);

/// Holds an open raster while code works with it, and its place in the catalog: making one adds 1
/// to the raster's count there.
///
///     const CatalogRasterRef ref(ConnStrings({path}), {}, {}, true, true);
///     if (ref.Raster().IsNull()) return TakeFault();
///     const double mean = ref.Raster()->Mean(0, ipc);  // closed again with `ref`
class VEXG_EXPORT CatalogRasterRef {
 public:
  /// Adds `raster` to the catalog, unless it is empty.
  /// @param releaseOnDestroy  take the count back when this goes.
  CatalogRasterRef(const BasicRasterPtr& raster, bool releaseOnDestroy);

  /// Opens a source. One that the catalog knows already gives the raster that stands there, and
  /// `geoRef` and `metadata` have no effect then.
  /// @param useProxy  open it on a thread of its own, as all code does whose raster outlives the
  ///                  call; else on this thread.
  CatalogRasterRef(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                   const MetadataPtr& metadata, bool useProxy, bool releaseOnDestroy);

  /// The raster of a source that is open, as `check` says: one that the catalog knows already, or a
  /// new one. Where the files of the source are not those any more that a raster of the catalog was
  /// opened on, it is a new one, whose URI has a counter behind it.
  CatalogRasterRef(const DataConnectionPtr& connection, const DataConnectionPtr& pyramid,
                   SourceCheck check);

  ~CatalogRasterRef();
  CatalogRasterRef(const CatalogRasterRef&) = delete;
  CatalogRasterRef& operator=(const CatalogRasterRef&) = delete;

  /// The raster; empty when there is none, with the fault set.
  const BasicRasterPtr& Raster() const { return raster_; }
  /// Code of its pixel type; 0 when there is no raster.
  unsigned DataType() const { return dataType_; }

 private:
  void Enter(const BasicRasterPtr& raster);

  bool releaseOnDestroy_;
  unsigned dataType_ = 0;
  BasicRasterPtr raster_;
};

/// The raster on an open source, and on the pyramid file of that source when there is one. Empty,
/// with the fault set, when a source is no raster or the pixel types differ.
/// @param uri  in place of the source's, unless empty.
VEXG_EXPORT BasicRasterPtr MakeReaderRaster(const DataConnectionPtr& connection,
                                            const DataConnectionPtr& pyramidConnection = {},
                                            const URI& uri = {});

}  // namespace lumo
