#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "rasters/raster_target.h"

namespace lumo::host {

/// The losses of a raster file that is made, against what was put in.
class Losses {
 public:
  /// @param shown   what the user calls the file.
  /// @param strict  whether a loss is a failure.
  Losses(std::string shown, std::string format, bool strict)
      : shown_(std::move(shown)), format_(std::move(format)), strict_(strict) {}

  /// @param what  the words behind "does not keep".
  void Add(const std::string& what) { lost_.push_back(what); }

  /// Says a line for each loss. Throws HostError instead where a loss is a failure.
  void Settle() const;

  const std::string& GetShownName() const { return shown_; }

 private:
  const std::string shown_;
  const std::string format_;
  const bool strict_;
  std::vector<std::string> lost_;
};

/// The contents of a raster that a format may lose.
struct RasterContents {
  RasterInfo info;
  std::vector<std::uint64_t> valid;  ///< valid pixels of each band; empty: not counted
  std::vector<std::string> details;  ///< "name=value", see raster_details.h
};

/// No-data values of the first bands, of all that are not valid otherwise.
using FillValues = std::vector<double>;

/// Adds the command that asks for the details of a raster.
/// @param raster  a variable or URI.
void AddDetailsQuery(JobDraft& draft, const std::string& name, const String& raster);
/// Adds the command that counts the valid pixels of a raster.
/// @param withValues  also looks for values that none of them has.
void AddValidityQuery(JobDraft& draft, const std::string& name, const String& raster,
                      bool withValues = false);

/// The answers of AddQuery and AddDetailsQuery about a raster.
RasterContents ReadContents(const JobResults& results, const std::string& name);
/// The counts of a command of AddValidityQuery, or of one that copies.
std::vector<std::uint64_t> ReadValidPixels(const JobResults& results, const std::string& step);

/// The contents of a file that was made, with those that were put in.
struct MadeRaster {
  RasterContents put;
  RasterContents made;
  bool isFilled = false;  ///< by a no-data value that was chosen here
};

/// Makes a raster file, and looks at it: throws HostError where it is another raster than was put
/// in.
///
/// Pixels that are not valid stay so by the format's own means: no-data values, an alpha band, a
/// mask. Where the file has more or fewer valid pixels than were put in, it is made once more with
/// a no-data value that no valid pixel has in the place of all others, and the user hears of it.
/// @param make    makes the file, with these no-data values where there are some, and gives what
///                was put in.
/// @param mayFill whether a no-data value may be chosen.
/// @return what the file holds, with what was put in.
MadeRaster MakeKept(JobSession& session, const TargetPlace& place, Losses& losses, bool mayFill,
                    const std::function<RasterContents(const FillValues& noData)>& make);

/// Compares all but the pixels, and adds what differs to the losses.
void CompareKept(const MadeRaster& raster, Losses& losses);

}  // namespace lumo::host
