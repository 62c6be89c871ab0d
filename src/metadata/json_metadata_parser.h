#pragma once

#include <string>

#include "metadata/metadata_parser.h"

namespace lumo {

/// Reads JSON documents. The value of a member goes to the names that lead to it, "/a/b/", the
/// elements of a list to numbers from 1 on, "/a/1/"; a null is left out. Texts come as they are,
/// numbers and truth values as JSON writes them. Objects and lists are nested 64 deep at most.
class VEXG_EXPORT JsonMetadataParser final : public MetadataParser {
 public:
  /// @param path  the file.
  JsonMetadataParser(MetadataContainer& collection, const MdfFormat& format, const String& path)
      : MetadataParser(collection, format), path_(path) {}

  bool Parse() override;

  /// Reads the document itself, UTF-8, in place of the file.
  bool ParseText(const std::string& bytes);

 private:
  const String path_;
};

}  // namespace lumo
