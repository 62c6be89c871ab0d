#include "metadata/metadata_source.h"

#include <filesystem>
#include <map>

#include "commands/command.h"
#include "foundation/fault.h"
#include "foundation/text_case.h"
#include "metadata/metadata_formats.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using platform::RandomAccessFile;

constexpr const char* kHeaderEnding = ".hdr";

/// The ending of a name in lower case, with its dot.
std::string EndingOf(const std::string& file) {
  return LowerCase(fs::path(file).extension().string());
}

/// Says whether there is a file that this process may read.
bool IsReadable(const std::string& file) {
  return RandomAccessFile::Open(file, RandomAccessFile::Access::kRead) != nullptr;
}

/// The format of an XML file by the words near its beginning; empty for others.
std::string FormatOfXml(const std::string& file) {
  std::string start(1U << 16U, '\0');
  const auto opened = RandomAccessFile::Open(file, RandomAccessFile::Access::kRead);
  std::size_t got = 0;
  if (opened == nullptr || !opened->ReadUpTo(0, start.data(), start.size(), got)) return {};
  start.resize(got);
  const auto holds = [&](const char* word) { return start.find(word) != start.npos; };
  if (holds("<Rational_Function_Model")) return "PLEIADESRPC";
  if (holds("<Dimap_Document")) return "PLEIADESDIM";
  if (holds("<LANDSAT_METADATA_FILE")) return "LANDSAT";
  for (const char* const word :
       {"Level-1C_User_Product", "Level-2A_User_Product", "Level-1C_Tile_ID", "Level-2A_Tile_ID"}) {
    if (holds(word)) return "SENTINEL2";
  }
  return holds("FeatureCollection") ? "GML" : "";
}

std::string DetectFormat(const std::string& file) {
  static const std::map<std::string, const char*> kFormats = {
      {".imd", "DGIMD"}, {".rpb", "DGRPB"},  {".til", "DGTIL"}, {".tif", "TIFF"},
      {".tiff", "TIFF"}, {".img", "Erdas"},  {".grb", "GRIB"},  {".grb2", "GRIB"},
      {".grib", "GRIB"}, {".grib2", "GRIB"}, {".hdr", "ORVA"}};
  const std::string ending = EndingOf(file);
  const std::string name = LowerCase(fs::path(file).filename().string());
  for (const char* const end : {"mtl.txt", "mtl.json"}) {
    if (name.ends_with(end)) return "LANDSAT";
  }
  const auto known = kFormats.find(ending);
  if (known != kFormats.end()) return known->second;
  if (ending == ".xml" || ending == ".gml") {
    const std::string format = FormatOfXml(file);
    if (!format.empty()) return format;
  }
  return IsReadable(file + kHeaderEnding) ? "ORVA" : "";
}

std::string FormatWords() {
  std::string words;
  for (const MetadataFormat& format : GetMetadataFormats()) {
    words.append(words.empty() ? "" : ", ").append(format.word);
  }
  return words;
}

const CommandDeclaration kFind{
    "FindMetadataSourceCommand",
    "Metadata",
    "Finds the format of a file of metadata by its name and, of XML files, by what stands in it.",
    {{"Name", Presence::kRequired, ValueKind::kText, "FILE, or FORMAT:FILE"},
     {"Folder", Presence::kOptional, ValueKind::kText,
      "where a relative name begins; the folder of the process when absent"}},
    {{"ConnStr", ValueKind::kTextList, "what CreateMetadataCommand takes: format and file"}}};

class FindMetadataSourceCommand final : public Command {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const std::string folder = HasInput("Folder") ? Read<String>("Folder").ToUTF8() : "";
    const auto source = FindMetadataSource(Read<String>("Name").ToUTF8(), folder);
    if (!source) return Fail(TakeFault());
    Array<String> strings{ArrayDims(2)};
    strings[0] = String(source->format);
    strings[1] = String(source->file);
    Write("ConnStr", strings);
    return Succeed();
  }
};

const CommandFactoryT<FindMetadataSourceCommand> findMetadataSourceFactory(kFind);

}  // namespace

std::optional<MetadataSource> FindMetadataSource(const std::string& text,
                                                 const std::string& folder) {
  const std::size_t colon = text.find(':');
  const bool isNamed =
      colon != text.npos && FindMetadataFormat(String(text.substr(0, colon))) != nullptr;
  std::string file = isNamed ? text.substr(colon + 1) : text;
  if (!folder.empty()) file = (fs::path(folder) / file).string();
  std::string format = isNamed ? text.substr(0, colon) : DetectFormat(file);
  if (format.empty()) {
    SetFault(text +
             ": the name doesn't tell what metadata these are; write FORMAT:FILE, where FORMAT is "
             "one of " +
             FormatWords());
    return std::nullopt;
  }
  const bool namesPixels = format == "ORVA" && EndingOf(file) != kHeaderEnding;
  if (namesPixels && IsReadable(file + kHeaderEnding)) file += kHeaderEnding;
  return MetadataSource{std::move(format), std::move(file)};
}

}  // namespace lumo
