#pragma once

#include <string>
#include <vector>

#include "georef/georef.h"
#include "jobs/raster_job.h"
#include "options/option.h"
#include "raster/raster_enums.h"
#include "raster/tile_dimensions.h"

namespace lumo::host {

/// A raster source as the command line names it.
struct SourceOptions {
  std::string file;          ///< "FILE", or "FILE|NAME=VALUE" with pieces of a connection string
  std::string format;        ///< key; empty: to be detected
  std::string subdataset{};  ///< number or name of one of the rasters in the file; empty for none

  void AddTo(OptionSet& line);
  void AddFormatTo(OptionSet& line);
};

/// `file` as a server with another working directory finds it. Names that aren't paths, such as
/// addresses, stay as they are. Throws HostError for one that a job document can't carry.
std::string AbsoluteName(const std::string& file);

/// The file of a source, without the pieces behind it.
std::string FileOf(const SourceOptions& source);

/// The connection strings of a source.
Array<String> ConnStringsOf(const SourceOptions& source);

/// The description of a raster, as its commands give it.
struct RasterInfo {
  unsigned samples = 0;
  unsigned lines = 0;
  unsigned bands = 0;
  unsigned dataType = 0;  ///< code
  String format;
  Interleave interleave = Interleave::None;
  TileDimensions tiles;  ///< blocks of the source; 0 where it has none
  bool canWrite = false;
  bool hasPyramid = false;
  String pyramidType;     ///< the word
  unsigned levelMin = 0;  ///< of the pyramid
  unsigned levelMax = 0;
  Array<bool> hasNoData;  ///< for each band
  String noData;          ///< text of an array of the pixel type, for each band
  Array<bool> hasPalette;
  GeoRefPtr geoRef;  ///< with its size set; empty when there is none
  String geoRefText;

  SubRect GetRect() const { return {0, 0, samples - 1, lines - 1}; }
};

/// Adds the command that opens a source, into the variable "$" name.
void AddOpen(JobDraft& draft, const std::string& name, const SourceOptions& source);

/// Where the pyramid file of a raster lies unless the user says otherwise: beside it.
std::string PyramidPathOf(const std::string& file);

/// The files in which statistics and histograms that are saved with a raster may be: its own, its
/// header, its side file, its pyramid.
std::vector<std::string> FilesOfSavedValues(const SourceOptions& source);

/// AddOpen, with the pyramid file beside the raster where there is one. One that was not built from
/// the raster as it is belongs to other pixels: it is left out, and the user hears of it.
/// @param levels  which are shown of a raster that has levels of its own as well: Best or Told, see
///                OpenRasterCommand.
void AddOpenWithPyramid(JobDraft& draft, const std::string& name, const SourceOptions& source,
                        const char* levels = "Best");

/// Adds the command that shows a level of the pyramid of a raster, into the variable "$" name.
/// @param raster  a variable or URI.
void AddLevel(JobDraft& draft, const std::string& name, const String& raster, unsigned level);

/// Adds the command that chooses bands of a raster, into the variable "$" name.
/// @param raster  a variable or URI.
void AddBandView(JobDraft& draft, const std::string& name, const String& raster,
                 const Array<unsigned>& bands);

/// The file behind an open raster.
/// @param uri  as a command gives it.
std::string PathOf(const String& uri);

/// Adds the commands that ask a raster what it is.
/// @param name    stands in front of the names of the commands.
/// @param raster  a variable or URI.
void AddQuery(JobDraft& draft, const std::string& name, const String& raster);

/// Reads the results of the commands of AddQuery. Throws HostError for values that can't be.
RasterInfo ReadInfo(const JobResults& results, const std::string& name);

/// True where the values of a band are codes, as far as its type and palette tell: those of a band
/// with a palette, and whole numbers of 32 bits and more. They have no mean.
bool HoldsCodes(const RasterInfo& info, const Array<unsigned>& bands);

/// The order that "bip", "bil" or "bsq" names.
Interleave ParseInterleave(const std::string& word);

/// The rectangle "left,top,right,bottom", all of the raster for no text. Throws HostError for one
/// that isn't inside.
SubRect ParseRect(const std::string& text, const RasterInfo& info);

/// The bands "0,2,1", all for no text. Throws HostError for one that the raster lacks.
Array<unsigned> ParseBands(const std::string& text, const RasterInfo& info);

}  // namespace lumo::host
