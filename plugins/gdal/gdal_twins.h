#pragma once

#include "gdal_raster.h"
#include "platform/file_identity.h"

namespace lumo::gdal {

/// Further handles of a raster whose blocks take long to decode, so that several threads can do it
/// at once: GDAL lets no two threads use a handle together.
///
/// Each block is always read by the same handle, which finds it in GDAL's cache when a part of it
/// is asked for again. Where one large block after another is asked for, the next ones are decoded
/// beside it. The handles are opened at the first read that has several blocks.
/// Threads: those of its OpenRaster; the crew works for it (tasks/crew.h).
class Twins {
 public:
  /// @param dataset  the raster's own handle.
  Twins(const Format& format, const Source& source, GDALDatasetH dataset);
  ~Twins();

  /// Reads a block as OpenRaster::Read does. False, without a fault, where that is for one handle
  /// to do, or a part of it can't be read: then `raster` reads all of it, and says why.
  bool Read(OpenRaster& raster, const BlockPlace& place, void* pixels);

 private:
  struct Part;

  bool Open(const OpenRaster& raster);
  std::vector<std::vector<Part>> Cut(const OpenRaster& raster, const BlockPlace& place);
  struct Size {
    unsigned width, height;
  };
  void LookAhead(std::uint64_t block, const Size& size, const RasterLevel& level,
                 std::vector<std::vector<Part>>& parts);
  static bool ReadPart(const OpenRaster& own, const BlockPlace& place, const Part& part,
                       void* pixels);

  const Format format_;
  const Source source_;
  platform::FileIdentity file_;  // as it was opened
  bool isUsed_ = false;          // there is something to gain, and nothing has failed
  std::vector<std::unique_ptr<OpenRaster>> others_;
  std::uint64_t nextBlock_ = 0;   // behind those that were asked for
  std::uint64_t aheadBlock_ = 0;  // behind those that are decoded
};

}  // namespace lumo::gdal
