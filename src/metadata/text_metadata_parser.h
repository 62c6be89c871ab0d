#pragma once

#include <string>
#include <string_view>

#include "metadata/metadata_parser.h"

namespace lumo {

class TextLines;

/// Reads texts of lines "name = value", with sections and with values that go over several lines,
/// punctuated as the format says.
class VEXG_EXPORT TextMetadataParser final : public MetadataParser {
 public:
  /// @param path     the file.
  /// @param section  path under which the names go.
  TextMetadataParser(MetadataContainer& collection, const MdfFormat& format, const String& path,
                     const String& section = "/");

  bool Parse() override;

  /// Reads the text itself in place of the file. False when its sections are nested too deep.
  bool ParseText(std::u16string_view text);

 private:
  bool TakeLine(std::u16string_view line, TextLines& lines);
  void TakeValue(std::u16string_view name, std::u16string_view start, TextLines& lines);
  bool OpenSection(std::u16string_view name);
  void CloseSection();

  const String path_;
  std::u16string section_;  // ends in "/"
};

/// `raw` as it is stored: without tabs, blanks at the ends, end marks and quotes, and with the
/// punctuation of a list made regular.
std::u16string CleanValue(std::u16string_view raw, const MdfFormat& format);

}  // namespace lumo
