#pragma once

#include "metadata/metadata_translator.h"

namespace lumo {

// The readers of the metadata formats. Each ties a definition file to a parser, and translates by
// itself the values that the language of definition files can't express.
//
// `connStrings` are the format's word, the input, and for XML formats the kind of input: "XmlFile",
// which it is when nothing is said, "XmlUrl" or "XmlString".

/// Reads texts and XML documents for the readers below: parses, then translates by a definition
/// file.
class VEXG_EXPORT MetadataReader : protected MetadataDefFileTranslator {
 protected:
  /// Reads lines of names and values.
  bool ReadText(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target);
  /// Reads an XML document.
  bool ReadXml(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target);
};

/// Reads lines of names and values.
class VEXG_EXPORT TextMetadataReader final : MetadataReader {
 public:
  bool Read(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target) {
    return ReadText(connStrings, mdfPath, target);
  }
};

/// Reads XML documents.
class VEXG_EXPORT XmlMetadataReader final : MetadataReader {
 public:
  bool Read(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target) {
    return ReadXml(connStrings, mdfPath, target);
  }
};

/// Reads headers of ORVA rasters. The coordinate system is one text although it stands in braces;
/// points count from 0 in place of 1, and their map coordinates come as x, y.
class VEXG_EXPORT OrvaMetadataReader final : MetadataReader {
 public:
  bool Read(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target) {
    return ReadText(connStrings, mdfPath, target);
  }

 private:
  bool Translate(const MdfEntry& entry, MetadataContainer& source, MetadataContainer& target,
                 const MdfFormat& format) override;
};

/// Reads the GML of JPEG 2000 files. Names of coordinate systems become their codes.
class VEXG_EXPORT GmlMetadataReader final : MetadataReader {
 public:
  bool Read(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target) {
    return ReadXml(connStrings, mdfPath, target);
  }

 private:
  bool Translate(const MdfEntry& entry, MetadataContainer& source, MetadataContainer& target,
                 const MdfFormat& format) override;
};

/// Reads product descriptions of Pleiades scenes. Names of coordinate systems become their codes.
class VEXG_EXPORT PleiadesDimMetadataReader final : MetadataReader {
 public:
  bool Read(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target) {
    return ReadXml(connStrings, mdfPath, target);
  }

 private:
  bool Translate(const MdfEntry& entry, MetadataContainer& source, MetadataContainer& target,
                 const MdfFormat& format) override;
};

/// Reads the metadata of a Landsat scene, in the form that the file has: text, JSON or XML, all
/// with the paths of the text. A file without a section of such metadata is refused.
class VEXG_EXPORT LandsatMetadataReader final : MetadataReader {
 public:
  bool Read(const Array<String>& connStrings, const String& mdfPath, MetadataContainer& target);
};

/// Reads texts that a plug-in has collected, with lists that blanks separate.
class VEXG_EXPORT CollectedMetadataReader final : MetadataReader {
 public:
  bool Read(MetadataContainer& collection, const String& mdfPath, MetadataContainer& target);
};

}  // namespace lumo
