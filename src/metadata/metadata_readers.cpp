#include "metadata/metadata_readers.h"

#include <algorithm>

#include "foundation/fault.h"
#include "metadata/json_metadata_parser.h"
#include "metadata/mdf_file.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"
#include "metadata/text_metadata_parser.h"
#include "metadata/xml_metadata_parser.h"

namespace lumo {
namespace {

/// The text at the entry's path without its first "{" and its last "}", stored as one text.
bool TranslateBracedText(const MdfEntry& entry, MetadataContainer& source,
                         MetadataContainer& target) {
  String text;
  if (!FindText(source, entry.src, text)) return true;
  std::u16string bare(View(text));
  const std::size_t start = bare.find(u'{');
  if (start != bare.npos) bare.erase(start, 1);
  const std::size_t end = bare.rfind(u'}');
  if (end != bare.npos) bare.erase(end, 1);
  auto value = std::make_unique<MetadataString>(std::vector<String>{ToString(bare)});
  if (!target.Put(entry.dest, std::move(value))) return false;
  source.Remove(entry.src);
  return true;
}

/// Rows of sample, line, y, x that count from 1 become sample, line, x, y that count from 0.
bool TurnPoints(const String& path, MetadataContainer& target) {
  constexpr unsigned kShortestRow = 4;
  const MetadataObject* const found = target.Find(path);
  std::vector<double> numbers;
  if (found == nullptr || !found->Get(numbers)) return true;  // stayed a text, or is missing
  unsigned rows = 0, columns = 0;
  const bool is2D = found->Dims(rows, columns);
  if (!is2D) columns = static_cast<unsigned>(numbers.size());
  if (columns < kShortestRow) return false;
  for (auto row = numbers.begin(); row != numbers.end(); row += columns) {
    row[0] -= 1.0;
    row[1] -= 1.0;
    std::swap(row[2], row[3]);
  }
  auto value = std::make_unique<MetadataDouble>(std::move(numbers));
  if (is2D) value->SetDims(rows, columns);
  return target.Put(path, std::move(value));
}

/// The number behind the last ":" of a coordinate system's name, such as
/// urn:ogc:def:crs:EPSG::4326.
bool TranslateCode(const MdfEntry& entry, MetadataContainer& source, MetadataContainer& target) {
  String text;
  if (!FindText(source, entry.src, text)) return true;
  const std::u16string_view name = View(text);
  const std::size_t colon = name.rfind(u':');
  std::uint64_t code = 0;
  if (colon == name.npos || ReadUnsigned(name.substr(colon + 1), code) == 0) return false;
  auto value =
      std::make_unique<MetadataInt>(std::vector<std::int32_t>{static_cast<std::int32_t>(code)});
  if (!target.Put(entry.dest, std::move(value))) return false;
  source.Remove(entry.src);
  return true;
}

bool IsOneOf(const String& path, std::initializer_list<const char*> paths) {
  return std::any_of(paths.begin(), paths.end(),
                     [&](const char* known) { return path.CompareNoCase(known) == 0; });
}

bool HasInput(const Array<String>& connStrings) {
  if (connStrings.GetCount() >= 2) return true;
  SetFault("no metadata file is named");
  return false;
}

/// Puts the text of each element of an XML document to the path of the element.
void TakeTextsUp(MetadataContainer& collection, const MetadataContainer& inner,
                 const String& path) {
  std::vector<std::pair<String, String>> texts;
  for (const auto& [name, child] : inner.GetChildren()) {
    const auto* const element = dynamic_cast<const MetadataContainer*>(child.get());
    if (element == nullptr) continue;
    String text;
    if (element->Count() == 1 && FindText(*element, "__text__", text)) {
      texts.emplace_back(path + name + "/", text);
    } else {
      TakeTextsUp(collection, *element, path + name + "/");
    }
  }
  for (const auto& [place, text] : texts) {
    collection.Remove(place);
    collection.Put(place, std::make_unique<MetadataString>(std::vector<String>{text}));
  }
}

void TakeTextsUp(MetadataContainer& collection) {
  TakeTextsUp(collection, collection, "/");
}

MdfFormat MakeFormat(const Array<String>& connStrings) {
  MdfFormat format;
  format.input = connStrings[0];
  return format;
}

}  // namespace

bool MetadataReader::ReadText(const Array<String>& connStrings, const String& mdfPath,
                              MetadataContainer& target) {
  if (!HasInput(connStrings)) return false;
  MdfFormat format = MakeFormat(connStrings);
  std::vector<MdfEntry> entries;
  if (!ReadMdfFile(mdfPath, format, entries)) return false;
  MetadataContainer collection;
  TextMetadataParser parser(collection, format, connStrings[1]);
  return parser.Parse() && TranslateAll(entries, &collection, &target, &format);
}

bool MetadataReader::ReadXml(const Array<String>& connStrings, const String& mdfPath,
                             MetadataContainer& target) {
  if (!HasInput(connStrings)) return false;
  MdfFormat format = MakeFormat(connStrings);
  format.xmlInputType = connStrings.GetCount() > 2 ? connStrings[2] : String("XmlFile");
  std::vector<MdfEntry> entries;
  if (!ReadMdfFile(mdfPath, format, entries)) return false;
  MetadataContainer collection;
  if (!XmlMetadataParser(collection, format, connStrings[1]).Parse()) return false;
  format.blankLists = true;
  return TranslateAll(entries, &collection, &target, &format);
}

bool OrvaMetadataReader::Translate(const MdfEntry& entry, MetadataContainer& source,
                                   MetadataContainer& target, const MdfFormat& format) {
  if (IsOneOf(entry.src, {"/coordinate system string/"})) {
    return TranslateBracedText(entry, source, target);
  }
  if (!IsOneOf(entry.src, {"/geo points/", "/map points/"})) {
    return MetadataDefFileTranslator::Translate(entry, source, target, format);
  }
  const bool isThere = source.Find(entry.src) != nullptr;
  if (!TranslateSingle(entry, source, target, format)) return false;
  return !isThere || entry.dt != MetadataTypeOf<double>::kCode || TurnPoints(entry.dest, target);
}

// The path of the grid in a document of one codestream.
#define VEXG_GML_GRID                                                                \
  "/gml:featurecollection/gml:featuremember/gml:featurecollection/gml:featuremember" \
  "/gml:rectifiedgridcoverage/gml:rectifiedgriddomain/gml:rectifiedgrid"

bool GmlMetadataReader::Translate(const MdfEntry& entry, MetadataContainer& source,
                                  MetadataContainer& target, const MdfFormat& format) {
  if (IsOneOf(entry.src, {VEXG_GML_GRID "/gml:origin/gml:point/srsname/",
                          VEXG_GML_GRID "/gml:offsetvector1/srsname/"})) {
    return TranslateCode(entry, source, target);
  }
  return MetadataDefFileTranslator::Translate(entry, source, target, format);
}
#undef VEXG_GML_GRID

bool PleiadesDimMetadataReader::Translate(const MdfEntry& entry, MetadataContainer& source,
                                          MetadataContainer& target, const MdfFormat& format) {
  if (IsOneOf(entry.src, {"/dimap_document/coordinate_reference_system/geodetic_crs"
                          "/geodetic_crs_code/__text__/",
                          "/dimap_document/coordinate_reference_system/projected_crs"
                          "/projected_crs_code/__text__/"})) {
    return TranslateCode(entry, source, target);
  }
  return MetadataDefFileTranslator::Translate(entry, source, target, format);
}

bool LandsatMetadataReader::Read(const Array<String>& connStrings, const String& mdfPath,
                                 MetadataContainer& target) {
  if (!HasInput(connStrings)) return false;
  MdfFormat format = MakeFormat(connStrings);
  format.xmlInputType = "XmlFile";
  std::vector<MdfEntry> entries;
  if (!ReadMdfFile(mdfPath, format, entries)) return false;
  const String& path = connStrings[1];
  std::string bytes, fault;
  if (!ReadMetadataFile(path.ToUTF8(), bytes, fault)) {
    SetFault(fault);
    return false;
  }
  MetadataContainer collection;
  const std::size_t start = bytes.find_first_not_of("\xEF\xBB\xBF \t\r\n");
  const char first = start == bytes.npos ? ' ' : bytes[start];
  const bool isRead =
      first == '{' ? JsonMetadataParser(collection, format, path).ParseText(bytes)
      : first == '<'
          ? XmlMetadataParser(collection, format, path).Parse()
          : TextMetadataParser(collection, format, path).ParseText(DecodeMetadataText(bytes));
  if (!isRead) return false;
  if (first == '<') TakeTextsUp(collection);
  if (collection.Find("/L1_METADATA_FILE/") == nullptr &&
      collection.Find("/LANDSAT_METADATA_FILE/") == nullptr) {
    SetFault(path.ToUTF8() +
             ": neither L1_METADATA_FILE nor LANDSAT_METADATA_FILE is in it, as it is in the "
             "metadata of a Landsat scene");
    return false;
  }
  return TranslateAll(entries, &collection, &target, &format);
}

bool CollectedMetadataReader::Read(MetadataContainer& collection, const String& mdfPath,
                                   MetadataContainer& target) {
  MdfFormat format;
  std::vector<MdfEntry> entries;
  if (!ReadMdfFile(mdfPath, format, entries)) return false;
  format.blankLists = true;
  return TranslateAll(entries, &collection, &target, &format);
}

}  // namespace lumo
