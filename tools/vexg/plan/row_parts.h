#pragma once

#include <string>
#include <vector>

#include "plan/job_commands.h"
#include "rasters/raster_source.h"

namespace lumo::host {

/// Says how the lines of a raster that parts have made become one.
enum class Join {
  kFile,  ///< a file as the single run makes it
  kVrt    ///< a VRT file on those of the parts, which stay
};

/// The lines of a raster, cut into files of their own.
struct RowParts {
  const JobCommand& create;  ///< makes the raster that is written
  const JobCommand& copy;    ///< writes it
  std::string source;        ///< input of `copy` that names the raster which is read
  std::string target;        ///< and the one which is written
  const RasterInfo& raster;  ///< that is read
  Join join = Join::kFile;
};

/// Lines of the blocks of the file that is made, where the blocks of parts can become those of the
/// file as they are packed: parts that begin at multiples of it are joined without packing. 0 where
/// they can't.
unsigned BlockLinesOf(const RowParts& parts);

/// Adds the making of some lines to a job.
/// @param end     the line behind the last.
/// @param file    the TIFF file to make of them.
/// @param counts  the file to make of their numbers of valid pixels; empty for none.
/// @param share   which part it is, and of how many.
void AddRows(const RowParts& parts, unsigned first, unsigned end, const std::string& file,
             const std::string& counts, const std::vector<unsigned>& share, JobCommands& job);

/// Holds the commands that take the place of `create` and `copy` in a job that joins the parts.
struct JoinedRows {
  std::vector<JobCommand> create;
  std::vector<JobCommand> copy;
};

/// Says where the file that is made takes the pixels of those of the parts.
enum class Taking {
  kNone,      ///< it doesn't: they are copied
  kAtCreate,  ///< where it was created
  kAtCopy     ///< where pixels were copied into it; it is created there
};

/// Makes the commands that join parts.
/// @param lines   of each part.
/// @param files   of each part.
/// @param counts  of each part; empty for none.
JoinedRows JoinRows(const RowParts& parts, const std::vector<unsigned>& lines,
                    const std::vector<std::string>& files, const std::vector<std::string>& counts,
                    Taking taking);

/// The file that is made in the place of `file`.
std::string FileOfJoin(const std::string& file, Join join);

}  // namespace lumo::host
