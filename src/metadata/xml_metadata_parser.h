#pragma once

#include "metadata/metadata_parser.h"

namespace lumo {

/// Reads XML documents. The text of an element goes to its path and "__text__", an attribute to its
/// path and the attribute's name. Where a value repeats under one path the name of its element gets
/// a number: "/a/b1/x/", "/a/b2/x/", up to 99; values behind these are left out.
///
/// Nothing outside the document is opened. Entities that it declares count up to 10,000 times, and
/// not when one is longer than 1,024 characters; elements are nested 200 deep at most.
class VEXG_EXPORT XmlMetadataParser final : public MetadataParser {
 public:
  /// @param input  a path, an address or the document, as the format's xmlInputType says.
  XmlMetadataParser(MetadataContainer& collection, const MdfFormat& format, const String& input)
      : MetadataParser(collection, format), input_(input) {}

  bool Parse() override;

 private:
  bool ReadDocument(std::string& bytes) const;
  bool ParseDocument(const std::string& bytes);

  const String input_;
};

}  // namespace lumo
