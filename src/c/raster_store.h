#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "commands/catalog_session.h"
#include "raster/raster.h"
#include "views/sources/source_raster.h"

namespace lumo {

/// Holds a raster open that a text names, with all the rasters of the catalog that it stands on.
class NamedRaster {
 public:
  /// Opens what the text names; see vexg.h. Raster() is empty, with the fault text set, when that
  /// can't be had.
  explicit NamedRaster(const std::string& text);
  /// Closes what was opened. Sets the fault text where a written source could not be finished.
  ~NamedRaster();
  NamedRaster(const NamedRaster&) = delete;
  NamedRaster& operator=(const NamedRaster&) = delete;

  /// The raster; empty when there is none.
  const BasicRasterPtr& Raster() const { return raster_; }
  /// True while the files of all sources below are the ones that were opened.
  bool IsUpToDate() const;

 private:
  catalog::Session session_;
  BasicRasterPtr raster_;
  std::vector<BasicRasterPtr> opened_;
};

/// Keeps rasters open that were asked for by their text, so that a second call costs a look-up. The
/// one that was used longest ago goes first; a caller that still works with it keeps it.
///
/// Threads: any; a raster that one thread is opening holds up those alone that ask for the same.
class RasterStore {
 public:
  /// @param capacity  rasters that are kept at most.
  explicit RasterStore(std::size_t capacity) : capacity_(capacity) {}

  /// The raster behind the text, opened where it is not at hand or not up to date. Null, with the
  /// fault text set, when it can't be had.
  std::shared_ptr<const NamedRaster> Get(const std::string& text);

  /// Lets go of one raster, or of all.
  void Close(const std::string& text);
  void CloseAll();

 private:
  struct Slot {
    std::mutex opening;
    std::shared_ptr<const NamedRaster> raster;  // under `opening`
    std::uint64_t used = 0;                     // under the lock of the store
  };
  using SlotPtr = std::shared_ptr<Slot>;

  SlotPtr FindSlot(const std::string& text, SlotPtr& dropped);

  const std::size_t capacity_;
  std::mutex mutex_;
  std::map<std::string, SlotPtr, std::less<>> slots_;
  std::uint64_t uses_ = 0;
};

}  // namespace lumo
