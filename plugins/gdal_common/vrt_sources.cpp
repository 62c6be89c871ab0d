#include "gdal_common/vrt_sources.h"

#include <algorithm>
#include <cpl_minixml.h>
#include <cpl_string.h>
#include <filesystem>
#include <gdal.h>
#include <memory>

#include "data/access_policy.h"
#include "gdal_common/hdf5_files.h"
#include "gdal_common/messages.h"

namespace lumo::gdal {
namespace {

namespace fs = std::filesystem;

/// Virtual rasters inside one another at most.
constexpr unsigned kMostDepth = 8;

/// Formats of one file each, which holds all pixels.
constexpr const char* kPlainDrivers[] = {"GTiff",       "COG",  "JPEG", "PNG",     "BMP",
                                         "GIF",         "HFA",  "GRIB", "NITF",    "DTED",
                                         "JP2OpenJPEG", "ENVI", "EHdr", "AAIGrid", "RRASTER"};

struct TreeDeleter {
  void operator()(CPLXMLNode* tree) const { CPLDestroyXMLNode(tree); }
};

bool IsOpenProcess() {
  const AccessPolicy policy = GetAccessPolicy();
  return policy.roots.empty() && policy.network && policy.virtualFiles && policy.memory &&
         policy.indirect;
}

/// Judges the virtual rasters of one file.
class VrtJudge {
 public:
  explicit VrtJudge(unsigned depth) : depth_(depth) {}

  bool MayUse(const std::string& file) {
    if (depth_ > kMostDepth) return FailWith(file, "virtual rasters that name one another");
    std::error_code missing;
    if (!fs::is_regular_file(file, missing)) {
      return FailWith(file, "only files of virtual rasters are allowed here");
    }
    if (!MayReachFile(file, false)) return false;
    const Messages messages;
    const std::unique_ptr<CPLXMLNode, TreeDeleter> tree(CPLParseXMLFile(file.c_str()));
    if (tree == nullptr) return messages.Fail(file, "it can't be read");
    folder_ = fs::path(file).parent_path();
    return MayUseAll(tree.get());
  }

 private:
  /// Looks at a node, those behind it, and all within.
  bool MayUseAll(const CPLXMLNode* node) const {
    for (; node != nullptr; node = node->psNext) {
      if (node->eType == CXT_Element && !MayUseElement(node)) return false;
      if (!MayUseAll(node->psChild)) return false;
    }
    return true;
  }

  bool MayUseElement(const CPLXMLNode* element) const {
    const std::string name = CPLString(element->pszValue).tolower();
    // Of bands, overviews, masks, arrays and warps.
    const bool isSource =
        name == "sourcefilename" || name == "sourcedataset" || name == "sourceraster";
    if (isSource) return MayUseSource(element);
    // Further names that the library would open by itself, and programs.
    const std::string key = CPLString(CPLGetXMLValue(element, "key", "")).tolower();
    const bool leadsOn = name == "dempath" || name.starts_with("pixelfunctionlang") ||
                         name == "pixelfunctioncode" || key.ends_with("_dataset") ||
                         key == "overview_file";
    return !leadsOn || FailWith(name, "in a virtual raster it is not allowed here");
  }

  bool MayUseSource(const CPLXMLNode* element) const {
    const std::string text = CPLGetXMLValue(element, nullptr, "");
    const std::string relative = CPLGetXMLValue(element, "relativeToVRT", "0");
    const bool isPlain = (relative == "0" || relative == "1") && text.find(':') == text.npos &&
                         !text.starts_with("/vsi");
    const fs::path path = relative == "1" ? folder_ / text : fs::path(text);
    const char* const kWhy = "only files are allowed here as sources of a virtual raster";
    if (!isPlain) return FailWith(text, kWhy);
    if (!MayReachFile(path.string(), false)) return false;
    std::error_code missing;
    if (!fs::is_regular_file(path, missing)) return FailWith(text, kWhy);
    return MayUseFormatOf(path.string());
  }

  bool MayUseFormatOf(const std::string& file) const {
    GDALDriverH driver = nullptr;
    {
      const Messages messages;
      driver = GDALIdentifyDriverEx(file.c_str(), GDAL_OF_RASTER, nullptr, nullptr);
    }
    // A raw band has a file of no format.
    const std::string name = driver != nullptr ? GDALGetDriverShortName(driver) : "";
    if (name == "VRT") return VrtJudge(depth_ + 1).MayUse(file);
    if (name.starts_with("HDF5") || name == "netCDF") return MayReachHdf5Files(file);
    const bool isPlain =
        name.empty() || std::find(std::begin(kPlainDrivers), std::end(kPlainDrivers), name) !=
                            std::end(kPlainDrivers);
    return isPlain || GetAccessPolicy().indirect ||
           FailWith(file, "sources of the format " + name + " are not allowed here");
  }

  const unsigned depth_;
  fs::path folder_;  // of the file
};

}  // namespace

bool MayUseVrtSources(const std::string& name) {
  return IsOpenProcess() || VrtJudge(0).MayUse(name);
}

}  // namespace lumo::gdal
