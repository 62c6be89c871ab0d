#pragma once

#include <string>

#include "foundation/environment.h"
#include "views/computed_raster.h"

namespace lumo {

/// Takes the first file name that isn't in use: directory, prefix, a number of four digits from
/// 0000, extension. The file is made, empty, so that nobody else takes the name.
/// @param directory  the system's directory of temporary files when it is empty or doesn't exist.
/// @param prefix     "cdftmp" when empty.
/// @param extension  ".tmp" when empty; gets a "." in front when it has none.
/// @return no text, with the fault set, when all 10,000 names are in use, or none can be made.
VEXG_EXPORT String TempFileName(const String& directory, const String& prefix,
                                const String& extension);

/// A raster in a temporary file of the library's own format, which is deleted with the raster. A
/// crash leaves the file behind. Exists for EightTypes.
///
/// Threads: as the reader raster underneath.
/// Failure: IsValid() is false when the file could not be made, with the fault set.
///
///     const RasterPtr<float> scratch(new TempRaster<float>(samples, lines, bands, {}));
///     if (!scratch->IsValid()) return false;  // TakeFault() says why
template <typename T>
class TempRaster final : public ComputedRaster<T> {
 public:
  /// @param context  its WorkingDirectory() is where the file lies.
  /// @param def      the raster's size, bands, no-data values and geo-reference; pixels lie BIP.
  TempRaster(const Context& context, const RasterDef& def);
  /// A raster without no-data values.
  TempRaster(const Context& context, unsigned samples, unsigned lines, unsigned bands,
             const GeoRefPtr& geoRef);
  /// The file lies in the system's directory of temporary files.
  TempRaster(unsigned samples, unsigned lines, unsigned bands, const GeoRefPtr& geoRef);
  ~TempRaster() override;

  URI GetURI() const override;
  bool IsValid() const override { return valid_ && Object::IsValid(); }

  /// Has the file outlive the raster; it doesn't unless this is set.
  void SetKeepFile(bool keep) { keepFile_ = keep; }
  /// The file; no text when it could not be made.
  const String& FileName() const { return fileName_; }

 private:
  struct Made {
    String fileName;
    RasterPtr<T> raster;
  };
  static Made Make(const Context& context, RasterDef def);
  explicit TempRaster(const Made& made);

  String fileName_;
  bool valid_ = false;
  bool keepFile_ = false;
};

VEXG_EXTERN(EIGHT, TempRaster);

}  // namespace lumo
