#pragma once

#include <cstdint>
#include <set>

#include "foundation/string.h"

namespace lumo {

/// How a text of names and values is punctuated. A definition file changes it by its "frmt."
/// properties.
struct MdfFormat {
  static constexpr char16_t kNone = u' ';

  char16_t sep = u'=';      ///< between a name and its value
  char16_t vsep = u',';     ///< between the elements of a list
  char16_t sm = u'{';       ///< starts a list
  char16_t em = u'}';       ///< ends a list
  char16_t eol = kNone;     ///< ends a value that goes over several lines
  char16_t del = kNone;     ///< stands around values, such as a quote
  bool blankLists = false;  ///< values of entries with a count other than 1 may be lists
                            ///< that only blanks separate
  bool joinsTexts = false;  ///< of XML: what stands between two tags is one text, and not as many
                            ///< as the parser hands on
  std::set<std::u16string> sectionStarts;  ///< names that open a section, in upper case
  std::set<std::u16string> sectionEnds;    ///< names that close one
  String input = "UGH";                    ///< the format's word, for the notes of the parser
  String xmlInputType;                     ///< "XmlFile", "XmlUrl" or "XmlString"
};

/// One entry of a definition file: the place and type of the text at one path.
struct MdfEntry {
  String src;              ///< path among the texts; a "#" in it stands for a running number
  String dest;             ///< path in the target
  String alias;            ///< read, and of no further effect
  unsigned dt = 7;         ///< type code of the metadata value
  std::uint32_t cnt = 1;   ///< elements; other than 1: a list, whose length the text decides
  std::uint32_t cols = 0;  ///< columns of a two-dimensional array; 0: none
  std::uint32_t idx = 1;   ///< the first running number
  std::uint32_t mton = 0;  ///< how many elements this entry adds to a shared array; 0: no such one
  std::uint32_t mtoi = 0;  ///< position of the first of them
};

}  // namespace lumo
