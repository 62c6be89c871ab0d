#pragma once

#include <cstdint>
#include <initializer_list>

#include "foundation/array.h"
#include "foundation/plugin_library.h"

namespace lumo {

class DataConnectionFactory;

/// Names what the sources of a format hold.
enum class DataSourceKind : std::int32_t { kUnknown = 0, kRaster = 1, kVector = 2 };

/// One row of the table of formats: a format that some plug-in library reads.
struct FormatRecord {
  String name;            ///< the format's key, compared exactly
  String windowsLibrary;  ///< file names of the plug-in
  String linuxLibrary;    ///< see LibraryName
  String macLibrary;
  String driver;            ///< the plug-in's own name for the format; nothing here reads it
  std::int32_t kind = 0;    ///< a DataSourceKind
  void* library = nullptr;  ///< null until the plug-in is loaded
  DataConnectionFactory* factory = nullptr;  ///< null until the plug-in has made it; see GetFactory
};

/// Rows of the table.
inline constexpr std::uint32_t kFormatCount = 27;

/// The table, in the order in which a source of unknown format is offered to its rows. Its names
/// are filled at load, before any plug-in can look; the last two fields only ever go from null to a
/// value.
VEXG_EXPORT extern FormatRecord gCdfFormatRecords[kFormatCount];
VEXG_EXPORT extern const std::uint32_t gCdfFormatRecordCount;

/// The entry point that a plug-in exports, without decoration, as "CreateDataConnectionFactory":
/// makes the factory of a row. It is called once for each row that names the library; the factory
/// lives until the process ends.
using CreateDataConnectionFactoryFunction = DataConnectionFactory*(FormatRecord*);

// Connection strings are arrays: a piece either equals a format's key exactly, or is for the
// plug-in.

/// File name of the plug-in of a row on this system.
VEXG_EXPORT const String& LibraryName(const FormatRecord& record);

/// Makes the array of these pieces: ConnStrings({"TIFF", path}).
VEXG_EXPORT Array<String> ConnStrings(std::initializer_list<String> pieces);

/// The first piece, in the order of the array, that is a format's key; no text when none is.
VEXG_EXPORT String FindFormatName(const Array<String>& connStrings);

/// Sets `out` to the pieces that are no format's key, in order. True.
VEXG_EXPORT bool RemoveFormatNames(const Array<String>& connStrings, Array<String>& out);

/// FindFormatName and RemoveFormatNames together.
VEXG_EXPORT String SplitConnStr(const Array<String>& connStrings, Array<String>& rest);

/// The row of a format's key; null for an unknown one.
VEXG_EXPORT FormatRecord* FindFormat(const String& name);

/// The factory of the format called `name`, whose plug-in is loaded when it isn't yet. Null for an
/// unknown name, or when the plug-in is missing or unusable; the fault text then says which.
VEXG_EXPORT DataConnectionFactory* FactoryForFormat(const String& name);

/// A format that a plug-in brings beside those of the table.
struct FormatDescription {
  const char* name;     ///< the format's key; none of the table, nor of another plug-in
  const char* driver;   ///< the plug-in's own name for the format
  DataSourceKind kind;  ///< of its sources
};

/// The entry point "DescribeFormats" of a plug-in that brings formats of its own: gives their
/// descriptions, which live until the process ends, and their number. Such a plug-in lies in one of
/// PluginDirectories, and the name of its library begins with kFormatPlugin.
inline constexpr const char* kFormatPlugin = "vexgformat_";
using DescribeFormatsFunction = const FormatDescription*(std::uint32_t* count);

/// How many formats there are: those of the table, which come first, and those that plug-ins bring.
/// The first call looks for such plug-ins and loads them. May be called on any thread.
VEXG_EXPORT std::uint32_t FormatCount();

/// A format by its number, below FormatCount(). It stays where it is until the process ends.
VEXG_EXPORT FormatRecord& GetFormat(std::uint32_t row);

/// Loads the plug-in of a format and asks it for the format's factory, unless that is done; nothing
/// for a number of no format. A library without the entry point counts as missing. What fails is
/// tried again the next time, see LoadPlugin. May be called on any thread.
VEXG_EXPORT void LoadFormat(std::uint32_t row);

/// The factory of a row, without loading anything; null when there is none yet.
VEXG_EXPORT DataConnectionFactory* GetFactory(const FormatRecord& record);

}  // namespace lumo
