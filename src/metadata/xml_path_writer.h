#pragma once

#include "metadata/metadata_object.h"

namespace lumo {

/// Puts the values of an XML document into a collection of texts, and numbers those that repeat.
class VEXG_EXPORT XmlPathWriter {
 public:
  explicit XmlPathWriter(MetadataContainer& collection) : collection_(collection) {}

  void StartElement(const String& name);
  void EndElement();
  unsigned Depth() const { return static_cast<unsigned>(ends_.size()); }

  // Both give false, with nothing stored, when there is no place for the value.
  bool PutAttribute(const String& name, const String& value);
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
