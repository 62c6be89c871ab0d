#pragma once

#include <functional>
#include <map>
#include <memory>

#include "gdal_common/source.h"
#include "gdal_levels.h"
#include "raster/raster_def.h"
#include "tiff_writer/block_layout.h"

namespace lumo::gdal {

class NewRaster;
class Twins;

/// A raster that GDAL holds open: all that does not depend on the pixel type.
///
/// An existing one is opened for reading. The first operation that changes its pixels opens it
/// again for writing, so that a file which is only read is neither changed nor asked for rights
/// that it doesn't give.
/// Failure: false or null, with the fault set.
class OpenRaster {
 public:
  static std::unique_ptr<OpenRaster> Open(const Format& format, const Source& source);
  static std::unique_ptr<OpenRaster> Create(const Format& format, const Source& source,
                                            const RasterDef& def);
  /// Opens one more handle of a raster that is open already. It warns of nothing.
  static std::unique_ptr<OpenRaster> OpenTwin(const Format& format, const Source& source);
  ~OpenRaster();
  OpenRaster(const OpenRaster&) = delete;
  OpenRaster& operator=(const OpenRaster&) = delete;

  /// Lets go of the raster; a new one gets its name then. False when something of it is lost.
  bool Close();

  GDALDatasetH Dataset() const { return dataset_.get(); }
  GDALRasterBandH Band(unsigned band) const { return levels_.at(0).bands[band]; }
  const std::string& Name() const { return source_.name; }
  const std::string& FormatKey() const { return format_.key; }
  unsigned DataType() const { return dataType_; }  ///< code
  unsigned Bands() const {
    return levels_.empty() ? 0 : static_cast<unsigned>(levels_.at(0).bands.size());
  }
  bool IsNew() const { return newRaster_ != nullptr; }
  /// The no-data values that a new raster keeps.
  std::map<unsigned, double> KeptNoData() const;
  /// True for a new raster that has its pixels out of files already.
  bool HasRows() const;
  /// True for a new raster whose last band will be alpha.
  bool KeepsAlpha() const;
  lumo::Interleave Interleave() const { return interleave_; }

  /// The levels that can be read, by number: 0, and a range without gaps of those reductions by
  /// powers of two that the source holds. None when the source has gone since it was opened.
  const std::map<unsigned, RasterLevel>& Levels() const { return levels_; }
  const RasterLevel* FindLevel(unsigned level) const;
  bool HasBand(unsigned band) const { return band < Bands(); }

  /// The description that the source itself gives, without no-data values and metadata.
  RasterDef Describe(bool hasSystem = true) const;

  /// True when the format and the file let pixels be changed. Opens nothing with GDAL.
  bool CanWrite();
  /// Opens the raster for writing unless it is.
  bool OpenForUpdate();

  /// Carries a block to the caller's memory, in the raster's interleave.
  bool Read(const BlockPlace& place, void* pixels);
  /// Carries a part of a block to its place in the memory of the whole, by this handle alone.
  /// @param band  the band of the whole at which those of the part begin.
  bool ReadInto(const BlockPlace& part, const BlockPlace& whole, unsigned band, void* pixels) const;
  /// True for a raster of the same size, levels, bands, type and interleave.
  bool IsAlike(const OpenRaster& other) const;
  bool Write(const BlockPlace& place, const void* pixels);
  /// Lets `change` change values that the raster, or the file beside it, stores of its bands, and
  /// stores them. It sees what others have stored by now, and nobody else stores anything
  /// meanwhile; when it fails nothing has changed.
  bool ChangeStored(const std::function<bool()>& change);
  /// Says that statistics are being stored, those between bands perhaps among them.
  void NoteStatistics() { mayHavePairs_ = true; }
  /// Lets the mask of a raster that is being made exclude pixels of a block; see NewMask::Take.
  bool ExcludeFromNew(const BlockPlace& place, const std::vector<unsigned char>& excluded);

  /// Sets state bits where a mask or an alpha band of the source excludes pixels.
  bool ReadMasks(const BlockPlace& place, unsigned char* state);

  bool BuildOverviews(const char* method, unsigned levelMin, unsigned levelMax);
  bool DeleteOverviews();
  /// Looks for levels that another connection has made, or taken away.
  bool FindLevelsAnew();

 private:
  OpenRaster(const Format& format, const Source& source);
  bool TakeDataset(DatasetPtr dataset);
  bool TakeAgain(DatasetPtr dataset);
  bool Reopen();
  struct Strides;
  bool Transfer(GDALRWFlag direction, const BlockPlace& place, void* pixels) const;
  bool Transfer(GDALRWFlag direction, const BlockPlace& place, const Strides& strides,
                void* pixels) const;
  const RasterLevel* CheckPlace(const BlockPlace& place) const;
  bool ReadNewAlpha(const BlockPlace& place, unsigned char* state) const;
  void ForgetStatistics(const Array<unsigned>& bands);

  Format format_;
  Source source_;
  DatasetPtr dataset_;
  std::unique_ptr<Twins> twins_;  // none for a raster that may be written
  std::unique_ptr<NewRaster> newRaster_;
  unsigned dataType_ = 0;
  lumo::Interleave interleave_ = lumo::Interleave::BSQ;
  std::map<unsigned, RasterLevel> levels_;
  bool isUpdated_ = false;    // open for writing
  bool isPlain_ = false;      // opened without what makes reads faster, as one has failed
  bool isDamaged_ = false;    // the last read failed
  bool mayHavePairs_ = true;  // stored statistics between bands
  enum class Answer { kUnknown, kNo, kYes } canWrite_ = Answer::kUnknown;
};

}  // namespace lumo::gdal
