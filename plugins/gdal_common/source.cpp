#include "gdal_common/source.h"

#include <algorithm>
#include <cctype>
#include <cpl_string.h>
#include <filesystem>
#include <string_view>
#include <utility>

#include "data/access_policy.h"
#include "data/file_uri.h"
#include "foundation/warnings.h"
#include "gdal_common/file_guard.h"
#include "gdal_common/hdf5_files.h"
#include "gdal_common/messages.h"
#include "gdal_common/vrt_sources.h"

namespace lumo::gdal {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kSubdataset = "SUBDATASET=";

/// The form in which GDAL takes lists of names; it ends with a null.
std::vector<const char*> ListOf(const std::vector<std::string>& texts) {
  std::vector<const char*> list;
  for (const std::string& text : texts) list.push_back(text.c_str());
  list.push_back(nullptr);
  return list;
}

bool IsOption(std::string_view piece) {
  const auto equals = piece.find('=');
  return equals != piece.npos && equals != 0 &&
         std::all_of(piece.begin(), piece.begin() + static_cast<std::ptrdiff_t>(equals),
                     [](unsigned char c) { return std::isalnum(c) || c == '_'; });
}

/// True when a file, or a directory, has the name.
bool FileExists(const std::string& name) {
  std::error_code fault;
  return fs::exists(name, fault);
}

/// The strings of a source in one text, the file's path resolved.
URI MakeURI(const Source& source, const std::vector<std::string>& pieces) {
  if (pieces.size() == 1 && source.isFile) return FileURI(source.name);
  std::string text = source.isFile ? PathOfFileURI(FileURI(source.name)) : source.name;
  for (std::size_t i = 1; i < pieces.size(); ++i) text.append("|").append(pieces[i]);
  for (std::size_t at = 0; (at = text.find(']', at)) != text.npos;) text.replace(at, 1, "%5D");
  return URI(String(text));
}

/// GDAL's name of a raster inside an open file, which for a file of one raster is that of the file;
/// empty, with the fault set, when it holds no such.
std::string FindSubdataset(GDALDatasetH dataset, const Source& source) {
  const std::string& wanted = source.subdataset;
  const bool isNumber = std::all_of(wanted.begin(), wanted.end(),
                                    [](unsigned char c) { return std::isdigit(c) != 0; });
  // Some drivers know the list as a whole alone.
  CSLConstList const list = GDALGetMetadata(dataset, "SUBDATASETS");
  int count = 0;
  for (;; ++count) {
    const std::string number = std::to_string(count + 1);
    const char* const name = CSLFetchNameValue(list, ("SUBDATASET_" + number + "_NAME").c_str());
    if (name == nullptr) break;
    if (isNumber ? number == wanted : std::string(name).ends_with(wanted)) return name;
  }
  if (count == 0 && GDALGetRasterCount(dataset) != 0) {
    if (wanted == "1") return GDALGetDescription(dataset);
    FailWith(source.name, "is one raster, and holds no " + wanted);
    return {};
  }
  std::string what = "holds " + std::to_string(count) + " rasters in the file, none of them ";
  FailWith(source.name, what.append(wanted));
  return {};
}

/// True for a format whose files the HDF5 library may open.
bool IsHdf5(const Format& format) {
  return std::any_of(format.drivers.begin(), format.drivers.end(), [](const std::string& driver) {
    return driver.starts_with("HDF5") || driver == "netCDF";
  });
}

bool IsVirtual(const Format& format) {
  return format.drivers == std::vector<std::string>{"VRT"};
}

/// The file behind a source's name, which may have the form HDF5:"file"://place.
std::string FileOf(const Source& source) {
  if (source.isFile) return source.name;
  const std::size_t open = source.name.find('"');
  const std::size_t close = open != std::string::npos ? source.name.find('"', open + 1) : open;
  if (close != std::string::npos) return source.name.substr(open + 1, close - open - 1);
  const std::size_t first = source.name.find(':');
  const std::size_t place = source.name.find("://");
  return first < place ? source.name.substr(first + 1, place - first - 1) : source.name;
}

DatasetPtr OpenName(const std::string& name, const Source& source, const Format& format,
                    unsigned openFlags) {
  const Messages messages;
  ForgetRefusals();
  const auto drivers = ListOf(format.drivers);
  const auto options = ListOf(source.openOptions);
  DatasetPtr dataset(GDALOpenEx(name.c_str(), openFlags | GDAL_OF_VERBOSE_ERROR, drivers.data(),
                                options.data(), nullptr));
  if (dataset == nullptr) messages.Fail(source.name, "GDAL can't open it");
  if (dataset != nullptr && !IsWithoutFault(messages, source)) return nullptr;
  if (!WasRefusedNothing()) return nullptr;
  if (dataset != nullptr && !MayReachAllFiles(dataset.get())) return nullptr;
  return dataset;
}

}  // namespace

bool ParseSource(const Array<String>& connStrings, Source& source) {
  Array<String> rest;
  source.hasKey = SplitConnStr(connStrings, rest).GetLength() != 0;
  std::vector<std::string> pieces;
  for (const String& piece : rest) pieces.push_back(piece.ToUTF8());
  if (pieces.empty() || pieces[0].empty()) return FailWith("GDAL", "no source named");
  source.isFile = FileExists(pieces[0]);
  source.name = pieces[0];
  for (std::size_t i = 1; i < pieces.size(); ++i) {
    if (pieces[i].starts_with(kSubdataset)) {
      source.subdataset = pieces[i].substr(kSubdataset.size());
    } else if (IsOption(pieces[i])) {
      source.openOptions.push_back(pieces[i]);
    } else {
      return FailWith(pieces[i], "neither an option NAME=VALUE nor a format");
    }
  }
  std::error_code fault;
  if (source.isFile) source.name = fs::absolute(source.name, fault).string();
  source.uri = MakeURI(source, pieces);
  return true;
}

bool ParseTarget(Source& source) {
  if (!source.subdataset.empty() || !source.openOptions.empty()) {
    return FailWith(source.name, "a new file is named by its path alone");
  }
  std::error_code fault;
  const fs::path resolved = fs::weakly_canonical(fs::absolute(source.name), fault);
  if (fault) return FailWith(source.name, fault.message());
  if (!source.name.starts_with("/vsi")) source.name = resolved.string();
  source.uri = FileURI(source.name);
  return true;
}

bool IsWithoutFault(const Messages& messages, const Source& source) {
  const FileFault* const first = messages.Files().First();
  if (first == nullptr) return true;
  const std::string file = FileOf(source);
  std::error_code ignored;
  if (messages.Files().FirstOf(file) != nullptr || !fs::is_regular_file(file, ignored) ||
      fs::path(first->path).parent_path() != fs::path(file).parent_path()) {
    return messages.Fail(source.name);
  }
  AddWarning(first->path + ": " + first->Text() + "; it is left out");
  return true;
}

bool IsOfFormat(const Source& source, const Format& format, unsigned openFlags) {
  if (!source.isFile && !source.hasKey) return false;
  const Messages messages;
  const auto drivers = ListOf(format.drivers);
  return GDALIdentifyDriverEx(source.name.c_str(), openFlags, drivers.data(), nullptr) != nullptr;
}

DatasetPtr OpenDataset(const Source& source, const Format& format, unsigned openFlags) {
  if (AreFilesLimited() && IsHdf5(format) && !MayReachHdf5Files(FileOf(source))) return nullptr;
  if (IsVirtual(format) && !MayUseVrtSources(source.name)) return nullptr;
  DatasetPtr dataset = OpenName(source.name, source, format, openFlags);
  if (dataset == nullptr || source.subdataset.empty()) return dataset;
  const std::string inner = FindSubdataset(dataset.get(), source);
  if (inner.empty()) return nullptr;
  return inner == source.name ? std::move(dataset) : OpenName(inner, source, format, openFlags);
}

}  // namespace lumo::gdal
