#pragma once

#include <string>
#include <vector>

#include "data/format_table.h"

namespace lumo {

/// The first bytes of a file, by which the formats are ruled out that it can't be of.
class SourceHead {
 public:
  /// Reads the first bytes of the one file that connection strings name. None for another source,
  /// or one that can't be read.
  explicit SourceHead(const Array<String>& connStrings);

  /// False when a plug-in that comes with the library, asked as the row's, would not recognise the
  /// file. True where that isn't sure.
  bool MayBeOf(const FormatRecord& row) const;

 private:
  bool Begins(const char* text) const;

  bool isRead_ = false;
  std::string ending_;  // of the file's name, in small letters, with its dot
  std::string bytes_;   // in small letters too, where they are letters
  std::string row_;     // the key of the format whose mark the file begins with; none
};

}  // namespace lumo
