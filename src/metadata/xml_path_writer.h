#pragma once

#include "metadata/metadata_object.h"

namespace lumo {

/// Puts the values of an XML document into a collection of texts, and numbers those that repeat. It
/// follows the events of a parser:
///
///     writer.StartElement("Band");                 // Path() is "/Band/"
///     writer.PutAttribute("id", "B4");             // at "/Band/id/"
///     writer.PutText("0.665");                     // at "/Band/__text__/"
///     writer.EndElement();
class VEXG_EXPORT XmlPathWriter {
 public:
  /// @param collection  outlives the writer.
  explicit XmlPathWriter(MetadataContainer& collection) : collection_(collection) {}

  /// Enters an element of the one that is open.
  void StartElement(const String& name);
  /// Leaves the element that is open; nothing when none is.
  void EndElement();
  /// Elements that are open.
  unsigned Depth() const { return static_cast<unsigned>(ends_.size()); }

  // Both give false, with nothing stored, when there is no place for the value.
  bool PutAttribute(const String& name, const String& value);
  /// Puts the text of the element that is open.
  bool PutText(const String& text);

  const std::u16string& Path() const { return path_; }  ///< of the element; ends in "/"

 private:
  bool Put(std::u16string_view tail, bool isText, const String& value);
  std::u16string Numbered(unsigned number, std::u16string_view tail) const;
  bool Move(const String& from, const String& to);

  MetadataContainer& collection_;
  std::u16string path_;
  std::vector<std::size_t> ends_;  // lengths of the paths above
};

}  // namespace lumo
