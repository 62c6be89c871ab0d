#include "gdal_rows.h"

#include <algorithm>
#include <cpl_conv.h>
#include <cpl_minixml.h>
#include <cpl_string.h>
#include <filesystem>
#include <memory>

#include <fmt/format.h>

#include "gdal_common/messages.h"

namespace lumo::gdal {
namespace {

/// Opens one of the files. Null, with the fault set, when it can't be.
DatasetPtr OpenRows(const RowsFile& file) {
  const Messages messages;
  const char* const drivers[] = {"GTiff", nullptr};
  const std::string path = file.file.ToUTF8();
  DatasetPtr dataset(GDALOpenEx(path.c_str(), GDAL_OF_RASTER, drivers, nullptr, nullptr));
  if (dataset == nullptr) messages.Fail(path, "can't be opened");
  return dataset;
}

/// True when the files are those of the lines of a dataset. They hold pixels of its type, as many
/// in a line and as many bands.
bool FitsRows(const RowsFiles& rows, GDALDatasetH dataset) {
  const Messages messages;
  const auto typeOf = [](GDALDatasetH of) {
    return GDALGetRasterDataType(GDALGetRasterBand(of, 1));
  };
  std::uint64_t lines = 0;
  for (const RowsFile& file : rows.files) {
    const DatasetPtr part = OpenRows(file);
    if (part == nullptr) return false;
    if (GDALGetRasterXSize(part.get()) != GDALGetRasterXSize(dataset) ||
        GDALGetRasterCount(part.get()) != GDALGetRasterCount(dataset) ||
        typeOf(part.get()) != typeOf(dataset) ||
        static_cast<unsigned>(GDALGetRasterYSize(part.get())) != file.lines) {
      return messages.Fail(file.file.ToUTF8(), "doesn't hold lines of the raster");
    }
    lines += file.lines;
  }
  return lines == static_cast<std::uint64_t>(GDALGetRasterYSize(dataset)) ||
         messages.Fail(GDALGetDescription(dataset), "has other lines than the files");
}

bool HasMask(GDALDatasetH dataset) {
  const int flags = GDALGetMaskFlags(GDALGetRasterBand(dataset, 1));
  return (flags & GMF_PER_DATASET) != 0 && (flags & GMF_ALPHA) == 0;
}

struct XmlDeleter {
  void operator()(CPLXMLNode* node) const { CPLDestroyXMLNode(node); }
};

std::string Escaped(const std::string& text) {
  char* const escaped = CPLEscapeString(text.c_str(), -1, CPLES_XML);
  const std::string copy = escaped;
  CPLFree(escaped);
  return copy;
}

/// Names the sources of each band below a node, which are in the order of the files.
void NameSources(const RowsFiles& rows, CPLXMLNode* node) {
  std::size_t number = 0;
  for (CPLXMLNode* child = node->psChild; child != nullptr; child = child->psNext) {
    if (child->eType != CXT_Element) continue;
    CPLXMLNode* const name = CPLGetXMLNode(child, "SourceFilename");
    if (name == nullptr || number >= rows.files.size()) {
      NameSources(rows, child);
      continue;
    }
    const std::string text = rows.files[number++].name.ToUTF8();
    const bool isRelative = std::filesystem::path(text).is_relative();
    CPLSetXMLValue(child, "SourceFilename", text.c_str());
    CPLSetXMLValue(name, "#relativeToVRT", isRelative ? "1" : "0");
  }
}

}  // namespace

bool FindRowsMask(const RowsFiles& rows, bool& hasMask) {
  hasMask = false;
  for (const RowsFile& file : rows.files) {
    const DatasetPtr dataset = OpenRows(file);
    if (dataset == nullptr) return false;
    hasMask = hasMask || HasMask(dataset.get());
  }
  return true;
}

bool TakeRowsMasks(const RowsFiles& rows, unsigned samples, NewMask& mask) {
  constexpr unsigned kLines = 64;  // at a time
  unsigned first = 0;
  for (const RowsFile& file : rows.files) {
    const DatasetPtr dataset = OpenRows(file);
    if (dataset == nullptr) return false;
    for (unsigned line = 0; HasMask(dataset.get()) && line < file.lines; line += kLines) {
      const Messages messages;
      const unsigned height = std::min(kLines, file.lines - line);
      std::vector<unsigned char> excluded(std::size_t{samples} * height);
      const auto at = [](unsigned number) { return static_cast<int>(number); };
      if (GDALRasterIO(GDALGetMaskBand(GDALGetRasterBand(dataset.get(), 1)), GF_Read, 0, at(line),
                       at(samples), at(height), excluded.data(), at(samples), at(height), GDT_Byte,
                       0, 0) != CE_None) {
        return messages.Fail(file.file.ToUTF8(), "the mask can't be read");
      }
      for (unsigned char& byte : excluded) byte = byte == 0 ? 1 : 0;
      const Array<unsigned> none;
      if (!mask.Take({0, first + line, samples, height, none, 0}, excluded, true)) return false;
    }
    first += file.lines;
  }
  return true;
}

bool AddRowsToVrt(const RowsFiles& rows, GDALDatasetH dataset) {
  const Messages messages;
  bool hasMask = false;
  if (!FitsRows(rows, dataset) || !FindRowsMask(rows, hasMask)) return false;
  const int samples = GDALGetRasterXSize(dataset), bands = GDALGetRasterCount(dataset);
  if (hasMask && GDALCreateDatasetMaskBand(dataset, GMF_PER_DATASET) != CE_None) {
    return messages.Fail(GDALGetDescription(dataset), "no mask can be made");
  }
  for (int band = 1; band <= bands + (hasMask ? 1 : 0); ++band) {
    GDALRasterBandH const first = GDALGetRasterBand(dataset, 1);
    GDALRasterBandH const target =
        band <= bands ? GDALGetRasterBand(dataset, band) : GDALGetMaskBand(first);
    unsigned line = 0;
    for (std::size_t i = 0; i < rows.files.size(); ++i) {
      const RowsFile& file = rows.files[i];
      int width = 0, height = 0;
      GDALGetBlockSize(first, &width, &height);
      const std::string source = fmt::format(
          "<SimpleSource><SourceFilename relativeToVRT=\"0\">{}</SourceFilename>"
          "<SourceBand>{}</SourceBand><SourceProperties RasterXSize=\"{}\" RasterYSize=\"{}\" "
          "DataType=\"{}\" BlockXSize=\"{}\" BlockYSize=\"{}\"/>"
          "<SrcRect xOff=\"0\" yOff=\"0\" xSize=\"{}\" ySize=\"{}\"/>"
          "<DstRect xOff=\"0\" yOff=\"{}\" xSize=\"{}\" ySize=\"{}\"/></SimpleSource>",
          Escaped(file.file.ToUTF8()), band <= bands ? std::to_string(band) : "mask,1", samples,
          file.lines, GDALGetDataTypeName(GDALGetRasterDataType(target)), width, height, samples,
          file.lines, line, samples, file.lines);
      if (GDALSetMetadataItem(target, fmt::format("source_{}", i).c_str(), source.c_str(),
                              "new_vrt_sources") != CE_None) {
        return messages.Fail(file.file.ToUTF8(), "can't be a source of a VRT file");
      }
      line += file.lines;
    }
  }
  return !messages.HasError() || messages.Fail(GDALGetDescription(dataset));
}

bool NameRowsOfVrt(const RowsFiles& rows, const std::string& path) {
  const Messages messages;
  const std::unique_ptr<CPLXMLNode, XmlDeleter> root(CPLParseXMLFile(path.c_str()));
  if (root == nullptr) return messages.Fail(path, "can't be read again");
  for (CPLXMLNode* node = root.get(); node != nullptr; node = node->psNext) {
    if (node->eType == CXT_Element) NameSources(rows, node);
  }
  return CPLSerializeXMLTreeToFile(root.get(), path.c_str()) != FALSE ||
         messages.Fail(path, "can't be written");
}

}  // namespace lumo::gdal
