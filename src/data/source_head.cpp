#include "data/source_head.h"

#include <algorithm>
#include <filesystem>
#include <string_view>

#include "foundation/text_case.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using namespace std::string_view_literals;

/// As much as the readers look at to recognise a file, and more.
constexpr std::size_t kHeadBytes = 4096;

/// Bytes that no file of another format begins with.
struct Mark {
  std::string_view bytes;
  const char* row;
};
constexpr Mark kMarks[] = {
    {"II*\0"sv, "TIFF"}, {"II+\0"sv, "TIFF"},        {"MM\0*"sv, "TIFF"},
    {"MM\0+"sv, "TIFF"}, {"\xFF\xD8\xFF"sv, "JPEG"}, {"\x89PNG\r\n\x1A\n"sv, "PNG"},
    {"GIF87a"sv, "GIF"}, {"GIF89a"sv, "GIF"},        {"EHFA_HEADER_TAG"sv, "Erdas"}};

}  // namespace

SourceHead::SourceHead(const Array<String>& connStrings) {
  if (connStrings.GetCount() != 1) return;
  const std::string path = connStrings[0].ToUTF8();
  std::error_code fault;
  if (!fs::is_regular_file(path, fault)) return;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead);
  std::string bytes(kHeadBytes, '\0');
  std::size_t got = 0;
  if (file == nullptr || !file->ReadUpTo(0, bytes.data(), bytes.size(), got)) return;
  bytes.resize(got);
  for (const Mark& mark : kMarks) {
    if (bytes.starts_with(mark.bytes)) row_ = mark.row;
  }
  ending_ = LowerCase(fs::path(path).extension().string());
  bytes_ = LowerCase(bytes);
  isRead_ = true;
}

bool SourceHead::Begins(const char* text) const {
  return std::string_view(bytes_.c_str()).find(text) != std::string_view::npos;
}

bool SourceHead::MayBeOf(const FormatRecord& row) const {
  const std::string name = row.name.ToUTF8();
  if (isRead_ && name == "Shapefile") return ending_ == ".shp";
  if (row_.empty() || row.name == row_.c_str()) return true;
  // Its mark lies in a file beside, so that nothing in this one rules it out.
  if (name == "ORVA") return true;
  if (name == "GRIB") {
    return bytes_.find("grib") != bytes_.npos || bytes_.find("tdlp") != bytes_.npos;
  }
  // These are looked for by words in front of the first null.
  if (name == "PDS") return Begins("_version_id");
  if (name == "Spot") return Begins("dimap");
  if (name == "WMS" || name == "WCS") return Begins("wms") || Begins("wmt") || Begins("<");
  // And these by bytes at a place of theirs, or by the name of the file.
  if (name == "CEOS") return bytes_.find("\x3f\xc0\x12\x12") == 4;
  if (name == "Esri") return ending_ == ".adf";
  if (name == "HDF5")
    return ending_ != ".tif" && ending_ != ".tiff" && ending_ != ".jpg" && ending_ != ".jpeg" &&
           ending_ != ".png" && ending_ != ".gif" && ending_ != ".img";
  if (name == "NITF" || name == "JPEG2000" || name == "DTED" || name == "MrSID" || name == "BMP" ||
      name == "MemoryRaster" || name == "Pyramid" || name == "VRT" || name == "netCDF" ||
      name == "Zarr") {
    return false;
  }
  return std::none_of(std::begin(kMarks), std::end(kMarks),
                      [&](const Mark& mark) { return name == mark.row; });
}

}  // namespace lumo
