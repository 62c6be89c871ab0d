#pragma once

#include <memory>
#include <vector>

#include "mosaic/scene_raster.h"
#include "raster/copy_blocks.h"
#include "raster/rows_files.h"

namespace lumo {

/// Shows its parent, with the pixels and states out of files that hold its lines already: so work
/// that was done in pieces becomes one raster, whose description is that of the parent. No pixel of
/// the parent is read. A new raster may take the packed blocks of the files as they are, see
/// CreationOptions::rows.
///
/// Few files are open at a time. Nothing can be written. Exists for EightTypes.
///
///     const RasterPtr<float> whole(new JoinedRowsRaster<float>(view, {{"a.tif", 512}, {"b.tif",
///     88}}));
///
/// Ownership: shares the parent.
/// Threads:   every operation may run on many threads at once.
/// Failure:   over an empty parent, or with files of other lines than the parent's in all,
/// IsValid()
///            is false. A file that can't be opened, or is of another size or pixel type, makes
///            blocks fail, with the fault set.
template <typename T>
class JoinedRowsRaster final : public ComputedRaster<T>, public RowsSource {
 public:
  /// @param files  from the first line to the last.
  /// @param walk   how a copy of this raster will go through it.
  JoinedRowsRaster(const RasterPtr<T>& parent, const std::vector<RowsFile>& files,
                   CopyBlocks walk = CopyBlocks::kTold);
  ~JoinedRowsRaster() override { this->StopComputing(); }

  bool IsValid() const override { return isWhole_ && ComputedRaster<T>::IsValid(); }
  URI GetURI() const override { return this->DefaultURI("JoinedRowsRaster"); }
  bool CanWrite() const override { return false; }
  std::shared_ptr<const RowsFiles> GetRows() const override { return rows_; }
  RasterPtr<T> StoredPyramidLevel(unsigned) override { return {}; }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }

 private:
  RasterPtr<T> Open(std::size_t file);
  std::size_t FileOf(unsigned line) const;

  std::shared_ptr<const RowsFiles> rows_;
  std::vector<unsigned> firsts_;  // first line of each file, and behind the last
  bool isWhole_ = false;
  RecentScenes<BasicRasterPtr> open_;
};

VEXG_EXTERN(EIGHT, JoinedRowsRaster);

}  // namespace lumo
