#pragma once

#include <map>
#include <string>
#include <vector>

#include "options/option.h"
#include "output/output_file.h"
#include "rasters/raster_source.h"

namespace lumo::host {

/// A raster file to make, as the command line names it.
struct TargetOptions {
  std::string output;
  bool isRequired = true;             ///< else the verb may make something else
  std::string format;                 ///< key; empty: the one of the name's ending
  bool strict = false;                ///< what the format does not keep is a failure
  std::vector<std::string> creation;  ///< a text for each of CreationValues(); empty for none
  bool cog = false;                   ///< a cloud-optimised file
  bool compatible = false;            ///< what all programs can read
  bool worldFile = false;             ///< with the grid in a world file beside it

  /// @param meaning  what the file is, for the help.
  void AddTo(OptionSet& line, const std::string& meaning);
  /// Adds what is said of the file beside its name.
  void AddFormatTo(OptionSet& line);
};

/// Has outputs whose name ends with .vrt be TIFF files from now on: a plan makes a VRT file of that
/// name on those of its parts.
void TakeVrtNames();

/// The key of the format to make. Throws HostError for none that is known.
std::string ChooseFormat(const TargetOptions& target);

/// The texts of the creation options, by the names of the inputs.
using CreationTexts = std::map<std::string, std::string>;

/// Chooses how a raster lies in its file. A TIFF file is packed unless the command line says
/// otherwise: tiles of 512 pixels, ZSTD with differences; with --compatible DEFLATE.
/// @param overviews  how levels come about unless the command line says it: a word of
/// OverviewMethod. Throws HostError for options that don't go with the raster.
CreationTexts ChooseCreation(const TargetOptions& target, const std::string& format,
                             const RasterInfo& raster, const std::string& overviews);
/// Throws HostError for options that don't go with the format; the raster isn't known yet.
void CheckCreation(const TargetOptions& target, const std::string& format);

/// Bytes that a raster of this size, bands and pixel type takes at least in a file of this format;
/// 0 when the format compresses, so that the size is not known in advance.
std::uint64_t BytesInFile(const std::string& format, const RasterInfo& raster);

/// A format that a raster is made in, and where.
struct TargetPlace {
  std::string file;
  std::string format;
  CreationTexts creation = {};

  /// True when pixels come back as others than were written.
  bool LosesValues() const;
};

/// Adds the command that makes a raster, into the variable "$target". Further inputs are the
/// caller's.
/// @param like  a variable or URI: the raster whose description is the start.
/// @param details  which of its details the raster gets: a word of KeptDetails.
/// @param noData   of the first bands; others have that of the description.
JobWriterCommand& AddCreate(JobDraft& draft, const TargetPlace& place, const String& like,
                            const char* details, const std::vector<double>& noData);

/// Adds the command that ends the making of "$target".
void AddCloseTarget(JobDraft& draft);

constexpr const char* kCloseTargetStep = "close.target";

/// Throws HostError when the closing of a raster set a fault.
/// @param step  that closed it; what AddCloseTarget added by default.
void CheckClosed(const JobResults& results, const char* step = kCloseTargetStep);

/// Throws HostError when a raster that was made isn't of the size, bands and pixel type that were
/// wanted.
/// @param shown  what the user calls the file.
void CheckSame(const RasterInfo& made, const RasterInfo& wanted, const std::string& format,
               const std::string& shown);

/// Progress of the step of this name, of a draft whose steps run one after the other.
ProgressReportPtr ProgressOfStep(const JobSession& session, const JobDraft& draft,
                                 const std::string& name);
/// Progress of the steps from one to another.
ProgressReportPtr ProgressOfSteps(const JobSession& session, const JobDraft& draft,
                                  const std::string& first, const std::string& last);

}  // namespace lumo::host
