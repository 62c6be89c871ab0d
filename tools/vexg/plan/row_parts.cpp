#include "plan/row_parts.h"

#include <algorithm>
#include <filesystem>

#include <fmt/format.h>

#include "commands/division.h"
#include "raster/creation_options.h"
#include "raster/pixel_types.h"
#include "raster/strip_lines.h"

namespace lumo::host {
namespace {

/// True for a file whose blocks lose nothing when they are packed, and are packed at all.
bool PacksWithoutLoss(const JobCommand& create) {
  const std::string* const format = create.Find("Format");
  const std::string* const compress = create.Find("Compress");
  if (format == nullptr || *format != "TIFF" || compress == nullptr) return false;
  CreationOptions options;
  options.compression = ParseValue<BlockCompression>(String(*compress));
  if (create.Find("Level") != nullptr) options.level = 1;  // what it is doesn't matter
  return options.IsPacked() && !options.LosesValues();
}

bool IsCog(const JobCommand& create) {
  const std::string* const layout = create.Find("Layout");
  return layout != nullptr && *layout == "COG";
}

/// True when the bands of a pixel will lie together in the file.
bool IsByPixel(const RowParts& parts) {
  const std::string* const wanted = parts.create.Find("Interleave");
  const Interleave order =
      wanted != nullptr ? ParseValue<Interleave>(String(*wanted)) : parts.raster.interleave;
  return order == Interleave::BIP || order == Interleave::BIL;
}

void SetUsualPacking(JobCommand& create) {
  create.Set("Compress", "ZSTD");
  create.Set("Level", "1");
  create.Set("Predictor", "Auto");
  create.Set("Tile", "512");
}

/// The command that makes the file of a part.
JobCommand CreateOfPart(const RowParts& parts) {
  JobCommand create = parts.create;
  const bool keepsPacking =
      PacksWithoutLoss(create) || (parts.join == Join::kVrt && create.Find("Compress") != nullptr);
  for (const char* const input :
       {"Categories", "Samples", "Lines", "GeoRef", "Layout", "Overviews", "WorldFile"}) {
    create.Remove(input);
  }
  if (!keepsPacking) {
    for (const CreationValue& value : CreationValues()) create.Remove(value.input);
    create.Remove("Interleave");
    SetUsualPacking(create);
  } else if (IsCog(parts.create)) {
    create.Set("Interleave", "BIP");  // as such files have it
    if (create.Find("Tile") == nullptr) create.Set("Tile", "512");
  }
  create.Set("Format", "TIFF");
  create.Set("BigTIFF", "Auto");
  return create;
}

/// The file among the pieces of a connection string.
std::string FileOfCreate(const JobCommand& create) {
  const JobFiles files = FindFiles({create});
  return files.made.empty() ? std::string() : files.made.front();
}

}  // namespace

unsigned BlockLinesOf(const RowParts& parts) {
  if (parts.join == Join::kVrt || !PacksWithoutLoss(parts.create)) return 0;
  constexpr unsigned kUsualTile = 512;
  const std::string* const tile = parts.create.Find("Tile");
  if (tile != nullptr && *tile != "strip") return static_cast<unsigned>(std::stoul(*tile));
  if (IsCog(parts.create)) return kUsualTile;
  const bool isTiled =
      parts.raster.tiles.height > 1 && parts.raster.tiles.width < parts.raster.samples;
  if (tile == nullptr && isTiled) return parts.raster.tiles.height;
  const std::uint64_t lineBytes = std::uint64_t{parts.raster.samples} *
                                  (IsByPixel(parts) ? parts.raster.bands : 1) *
                                  DataTypeBytes(parts.raster.dataType);
  return StripLines(parts.raster.lines, lineBytes);
}

void AddRows(const RowParts& parts, unsigned first, unsigned end, const std::string& file,
             const std::string& counts, const std::vector<unsigned>& share, JobCommands& job) {
  const std::string tag = parts.copy.name;
  const std::string rows = "$" + tag + ".rows", target = "$" + tag + ".part";
  JobCommand subset{tag + ".rows", "CreateSpatialSubsetRasterCommand"};
  subset.Set("SrcURI", *parts.copy.Find(parts.source));
  subset.Set("SubRect", fmt::format("0 {} {} {}", first, parts.raster.samples - 1, end - 1));
  subset.Set("Placing", "Exact");
  subset.outputs.push_back({"URI", rows});
  job.commands.push_back(subset);

  JobCommand create = CreateOfPart(parts);
  create.name = tag + ".part";
  create.outputs = {{"URI", target}};
  create.Set("ConnStr", file);
  create.Set("SrcURI", rows);
  job.commands.push_back(create);

  JobCommand copy = parts.copy;
  copy.outputs.clear();
  copy.Set(parts.source, rows);
  copy.Set(parts.target, target);
  if (!counts.empty()) {
    copy.Set(kShareInput, NumberArray(share));
    copy.Set(kShareFileInput, counts);
  }
  job.commands.push_back(copy);
  job.AddCloses({rows, target});
}

JoinedRows JoinRows(const RowParts& parts, const std::vector<unsigned>& lines,
                    const std::vector<std::string>& files, const std::vector<std::string>& counts,
                    Taking taking) {
  namespace fs = std::filesystem;
  const std::string joined = "$" + parts.copy.name + ".joined";
  const bool takes = taking != Taking::kNone;
  JobCommand join{parts.copy.name + ".joined", "CreateJoinedRowsRasterCommand"};
  join.Set("SrcURI", *parts.copy.Find(parts.source));
  join.Set("Files", JoinedByBars(files));
  join.Set("Lines", NumberArray(lines));
  join.outputs.push_back({"URI", joined});
  JoinedRows made;
  JobCommand create = parts.create, copy = parts.copy;
  if (takes) {
    const std::string* const blocks = copy.Find("Blocks");
    if (blocks != nullptr) join.Set("Blocks", *blocks);
    create.Set("RowsURI", joined);
    if (!counts.empty()) copy.Set(kShareFilesInput, JoinedByBars(counts));
  }
  if (parts.join == Join::kVrt) {
    const std::string file = FileOfJoin(FileOfCreate(create), parts.join);
    std::vector<std::string> names;
    for (const std::string& name : files) {
      names.push_back(fs::path(name).lexically_relative(fs::absolute(file).parent_path()).string());
    }
    join.Set("Names", JoinedByBars(names));
    for (const CreationValue& value : CreationValues()) create.Remove(value.input);
    create.Remove("Interleave");
    create.Set("Format", "VRT");
    create.Set("ConnStr", file);
  }
  copy.Set(parts.source, joined);
  std::vector<JobCommand>& early = taking == Taking::kAtCopy ? made.copy : made.create;
  if (takes) early.push_back(join);
  early.push_back(create);
  if (!takes) made.copy.push_back(join);
  made.copy.push_back(copy);
  made.copy.push_back({"close." + joined.substr(1), "CloseRasterCommand", {{"URI", joined}}});
  return made;
}

std::string FileOfJoin(const std::string& file, Join join) {
  if (join == Join::kFile) return file;
  return std::filesystem::path(file).replace_extension(".vrt").string();
}

}  // namespace lumo::host
