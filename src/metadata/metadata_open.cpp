#include <algorithm>

#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "metadata/metadata.h"
#include "metadata/metadata_formats.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_readers.h"
#include "metadata/metadata_sources.h"
#include "metadata/metadata_text.h"

namespace lumo {
namespace {

/// Writes the line to the log.
template <typename... Values>
bool Fail(const char* format, Values... values) {
  MetadataParseLog& log = MetadataParseLog::Instance();
  if constexpr (sizeof...(values) == 0) {
    log.Write(MetadataParseLog::kErrors, "%s", format);
  } else {
    log.Write(MetadataParseLog::kErrors, format, values...);
  }
  return false;
}

/// Fail, with the fault set too.
template <typename... Values>
bool FailWith(const std::string& fault, const char* format, Values... values) {
  SetFault(fault);
  return Fail(format, values...);
}

/// The row of the table for well-formed connection strings; null, with the fault set, for others.
const MetadataFormat* CheckStrings(const Array<String>& strings) {
  const std::string word = strings[0].ToUTF8();
  if (strings.GetCount() < 2) {
    FailWith(word + ": no metadata file is named",
             "Metadata::Open failed. Invalid number of connection strings. String[0]: (%s)\n",
             word.c_str());
    return nullptr;
  }
  const MetadataFormat* const format = FindMetadataFormat(strings[0]);
  if (format == nullptr) {
    std::vector<std::string> known;
    for (const MetadataFormat& row : GetMetadataFormats()) known.push_back(row.word);
    FailWith("\"" + word + "\" is no metadata format" + DidYouMean(word, known),
             "Metadata::Open failed. Invalid format connection string: (%s)\n", word.c_str());
  }
  return format;
}

bool FindMdfPath(const MetadataFormat& format, String& path) {
  std::string directory = GetGlobalEnvironmentImpl().Find(Environment::kMdfDirectory).ToUTF8();
  if (directory.empty()) {
    return FailWith("the directory of the metadata definition files is not known",
                    "Metadata::Open failed. Invalid path to mdf files. Lumo mdf env is not "
                    "valid.\n");
  }
  if (directory.back() != '/') directory += '/';
  path = String(directory + format.mdfFile);
  return true;
}

bool ReadThroughPlugin(const Array<String>& strings, const String& mdfPath,
                       const LockableMetadataImplPtr& store) {
  const MetadataSources& sources = GetMetadataSources();
  bool connected = false;
  if (sources.readConnection != nullptr &&
      sources.readConnection(strings, mdfPath, store, connected)) {
    return true;
  }
  return Fail(connected
                  ? "Metadata::Open failed. Failed to parse gdal input. GetMetadata() failed.\n"
                  : "Metadata::Open failed. Failed to parse gdal input. Connect error.\n");
}

/// True when the named input may be read; the text of a document always may.
bool MayRead(const Array<String>& strings) {
  const MetadataSources& sources = GetMetadataSources();
  if (sources.mayOpen == nullptr) return true;
  if (strings.GetCount() > 2 && strings[2] == "XmlString") return true;
  if (strings.GetCount() > 2 && strings[2] == "XmlUrl" &&
      strings[1].Find("://") == String::kNotFound) {
    SetFault(strings[1].ToUTF8() + ": no address");
    return false;
  }
  return sources.mayOpen(strings[1]);
}

bool ReadSource(const MetadataFormat& format, const Array<String>& strings, const String& mdfPath,
                const LockableMetadataImplPtr& store) {
  if (format.reader == kGdalMetadataReader) return ReadThroughPlugin(strings, mdfPath, store);
  const bool may = MayRead(strings);
  switch (format.reader) {
    case kTextMetadataReader:
      return (may && TextMetadataReader().Read(strings, mdfPath, *store)) ||
             Fail("Metadata::Open failed. Failed to parse text input.\n");
    case kXmlMetadataReader:
      return (may && XmlMetadataReader().Read(strings, mdfPath, *store)) ||
             Fail("Metadata::Open failed. Failed to parse xml input.\n");
    case kOrvaMetadataReader:
      return (may && OrvaMetadataReader().Read(strings, mdfPath, *store)) ||
             Fail("Metadata::Open failed. Failed to parse orva input. \n");
    case kGmlMetadataReader:
      return (may && GmlMetadataReader().Read(strings, mdfPath, *store)) ||
             Fail("Metadata::Open failed. Failed to parse gml input.\n");
    case kPleiadesDimMetadataReader:
      return (may && PleiadesDimMetadataReader().Read(strings, mdfPath, *store)) ||
             Fail("Metadata::Open failed. Failed to parse pleiades dim xml input.\n");
    case kLandsatMetadataReader:
      return (may && LandsatMetadataReader().Read(strings, mdfPath, *store)) ||
             Fail("Metadata::Open failed. Failed to parse landsat input.\n");
    default:
      return false;
  }
}

}  // namespace

MetadataSources& GetMetadataSources() {
  static MetadataSources sources;
  return sources;
}

bool Metadata::Open(const Array<String>& connectionStrings) {
  for (unsigned i = 0; i < connectionStrings.GetCount(); ++i) {
    if (connectionStrings[i].GetLength() != 0) continue;
    return FailWith("a connection string is empty",
                    "Metadata::Open failed. Connection string is empty: (%u)\n", i);
  }
  if (connectionStrings.GetCount() == 0 || connectionStrings[0] == "EMPTY") return true;
  try {
    const MetadataFormat* const format = CheckStrings(connectionStrings);
    String mdfPath;
    if (format == nullptr || !FindMdfPath(*format, mdfPath)) return false;
    // Read apart, without this store's lock: a source may be slow, and opening it takes other
    // locks.
    const LockableMetadataImplPtr read(new LockableMetadataImpl);
    return ReadSource(*format, connectionStrings, mdfPath, read) &&
           Write([&](MetadataContainer& store) { return store.Merge(*read); });
  } catch (...) {
    SetFault(DescribeException());
    SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
}

}  // namespace lumo
