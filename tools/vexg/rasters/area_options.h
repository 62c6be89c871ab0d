#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "rasters/raster_chain.h"
#include "rasters/raster_source.h"

namespace lumo::host {

/// Which pixels of a raster a verb works on, as the command line names them: a rectangle, a region,
/// and which of the pixels in there count. What is shown is cut to the rectangle around the area;
/// pixels of it outside the region, under a mask, or of a no-data value are not valid.
class AreaOptions {
 public:
  /// @param noDataOption  the name of the option of no-data values, where the verb has another
  ///                      --no-data.
  void AddTo(OptionSet& line, const char* noDataOption = "--no-data");

  /// Throws HostError for options that don't go together.
  void Check() const;
  bool IsGiven() const;
  /// The files that are read.
  std::vector<std::string> GetFiles() const;

  /// Finds the pixels. Throws HostError when there are none of the raster's.
  /// @param raster  URI of the open raster, which `info` describes.
  /// @param shown   what the user calls it.
  /// @return what AddViews shows.
  RasterInfo Plan(JobSession& session, const String& raster, const RasterInfo& info,
                  const std::string& shown);

  /// Says where the pixels lie and how many they are, after Plan; empty where all of the raster was
  /// asked for.
  /// @param info  of the raster of Plan.
  std::string Describe(const RasterInfo& info) const;

  /// Stands what shows the area on the raster of Plan, as the uppermost of a chain.
  void AddViews(RasterChain& chain) const;
  /// Stands them on a further raster of the size of that of Plan. No mask band is looked at.
  /// @param name  of the raster, which is the uppermost of the chain; stands in front of those of
  ///              the views.
  void AddViewsOfFurther(RasterChain& chain, const std::string& name, unsigned dataType) const;
  /// Whether a band tells which pixels do not count.
  bool HasMaskBand() const { return maskBand_.has_value(); }

  /// The rectangle of the raster around the area, after Plan.
  const SubRect& GetRect() const { return rect_; }
  /// Whether that is not all of the raster.
  bool IsPart() const { return isPart_; }

 private:
  enum class Masks { kAll, kNone };
  void AddViews(RasterChain& chain, Masks masks) const;
  void AddPlace(RasterChain& chain, Masks masks, const std::string& name) const;
  void AddRegion(JobDraft& draft, const std::string& name = "region") const;
  void AddNoData(RasterChain& chain, const std::string& name, const String& values) const;
  void AddMask(RasterChain& chain) const;
  SubRect FindRect(const RasterInfo& info, const std::string& shown) const;
  SubRect FindBox(const RasterInfo& info, const std::string& shown) const;
  void Measure(JobSession& session, const String& raster);
  void CheckValues(const RasterInfo& info);
  String ReadNoData(unsigned dataType) const;

  std::string rectText_;
  std::string box_;
  std::string boxSystem_;
  std::string region_;
  std::string where_;
  std::optional<unsigned> maskBand_;
  std::string maskValues_;
  bool isInversed_ = false;
  std::string noData_;
  std::string noDataOption_;

  SubRect rect_;
  bool isPart_ = false;
  std::uint64_t pixels_ = 0;
  String maskArray_;  // texts of the values as pixels
  String noDataArray_;
};

}  // namespace lumo::host
