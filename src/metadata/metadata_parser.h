#pragma once

#include "metadata/mdf_format.h"
#include "metadata/metadata_object.h"

namespace lumo {

// Paths under which a parser notes what it read, and how.
inline constexpr const char* kParserInfo = "/xx vex parser info/";
inline constexpr const char* kParserUri = "/xx vex parser info/uri/";
inline constexpr const char* kParserType = "/xx vex parser info/type/";

/// Turns a file into a collection of texts: every value of it under a path.
///
/// Failure: false; the parse log and the fault text say why. What was read before stays.
/// Threads: used by one thread.
class VEXG_EXPORT MetadataParser {
 public:
  /// Reads the whole input into the collection.
  virtual bool Parse() = 0;
  virtual void LogCollection() const;  ///< writes the texts to the parse log
  virtual ~MetadataParser() = default;

 protected:
  MetadataParser(MetadataContainer& collection, const MdfFormat& format)
      : collection_(collection), format_(format) {}

  /// Puts a text in place of what was there. One whose path leads through another text, or is too
  /// deep, is left out, which the log says.
  void Store(const String& path, const String& text);

  MetadataContainer& collection_;
  const MdfFormat& format_;
};

}  // namespace lumo
