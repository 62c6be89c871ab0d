#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "gdal_band_values.h"
#include "gdal_common/source.h"
#include "gdal_new_mask.h"
#include "platform/file_identity.h"
#include "platform/file_swap.h"
#include "raster/raster_def.h"
#include "tiff_writer/packed_pixels.h"

namespace lumo::gdal {

/// A raster that is being made.
///
/// It lies beside its place under a temporary name and takes the place, of an older file if there
/// is one, when it is finished: what breaks before leaves nothing, and the older file as it was.
/// Formats that are written in one go, from the first pixel to the last, are first made as
/// something else: in memory, or as a TIFF file beside the place. Failure: false or null, with the
/// fault set.
///
/// The pixels of a TIFF file are written past GDAL (plugins/tiff_writer). Of one whose blocks are
/// packed, or in an order of its own, GDAL makes a file without pixels beside the place, whose tags
/// the file gets. Packed blocks may come out of files that hold the lines of the raster; a VRT file
/// is made on such files alone.
class NewRaster {
 public:
  /// Whether the format can hold such a raster is found out here.
  /// @param path     absolute.
  /// @param dataset  [out] takes the pixels.
  static std::unique_ptr<NewRaster> Begin(const Format& format, const std::string& path,
                                          const RasterDef& def, DatasetPtr& dataset);

  /// Deletes what lies beside the place.
  ~NewRaster();
  NewRaster(const NewRaster&) = delete;
  NewRaster& operator=(const NewRaster&) = delete;

  /// True when the pixels go past the dataset, by the operations that follow.
  bool HasPixels() const { return pixels_ != nullptr; }
  bool ReadPixels(const BlockPlace& place, void* pixels) const;
  bool WritePixels(const BlockPlace& place, const void* pixels);

  /// The definition as far as the format keeps it.
  const RasterDef& Definition() const { return def_; }

  /// True when the last band will mark which pixels of the others are valid.
  bool KeepsAlpha() const { return keepsAlpha_; }

  /// True when the raster has its pixels from the files of CreationOptions::rows.
  bool HasRows() const { return hasRows_; }

  /// True when what GDAL has open is not the file with the pixels.
  bool IsDescribedBeside() const { return isPacked_ && pixels_ != nullptr; }

  /// Takes the pixels that are not valid and don't say so themselves.
  NewMask& Mask() { return mask_; }

  /// From now on the raster can't be finished: something of it is lost.
  void Doom() { isDoomed_ = true; }

  /// Closes the dataset and puts the raster at its place.
  bool Finish(DatasetPtr dataset);

 private:
  NewRaster(std::string driver, const std::string& path, const RasterDef& def);
  bool CheckTarget() const;
  bool TryTheFormat();
  bool TrySample(std::string& fault);
  DatasetPtr MakeDirectly();
  DatasetPtr BeginPixels(DatasetPtr dataset);
  bool BeginPacked(const tiff::BlockLayout& layout);
  bool TakeRows(tiff::PackedPixels& packed);
  bool NameRows() const;
  DatasetPtr MakeForCopy();
  bool Describe(GDALDatasetH dataset) const;
  bool CopyToFormat(DatasetPtr dataset);
  DatasetPtr CopyTo(const std::string& name, GDALDatasetH dataset) const;
  bool WriteBeside() const;
  bool WriteMask();
  bool IsWhole() const;
  bool TakePlace() const;
  bool MoveFiles(platform::FileSwap& swap, std::string& why) const;
  bool MoveImagine(platform::FileSwap& swap, std::string& why) const;
  std::string Shown(const std::string& text) const;
  bool Fail(const std::string& what) const;
  bool ShowFault() const;

  const std::string driver_;
  const std::string path_;
  const RasterDef def_;
  const platform::FileIdentity older_;  // that stands at the place
  const std::string temporary_;         // of the format, beside the place
  std::unique_ptr<tiff::NewPixels> pixels_;
  const bool isPacked_;  // a TIFF file that is no plain one
  NewMask mask_;

  std::string scratch_;  // the TIFF file that the copy is made from, or that has the tags
  std::vector<std::optional<StoredHistogram>> histograms_;  // which a copy leaves behind
  /// The part that the format is given to keep; the rest goes beside the file.
  enum class Given { kNothing, kBands, kAll } given_ = Given::kAll;
  bool keepsAlpha_ = false;
  bool hasRows_ = false;
  bool isDoomed_ = false;
};

}  // namespace lumo::gdal
