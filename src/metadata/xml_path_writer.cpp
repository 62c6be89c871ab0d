#include "metadata/xml_path_writer.h"

#include "metadata/metadata_text.h"

namespace lumo {
namespace {

constexpr unsigned kMaxNumber = 99;
constexpr std::u16string_view kText = u"__text__/";

std::unique_ptr<MetadataObject> TextValue(const String& text) {
  return std::make_unique<MetadataString>(std::vector<String>{text});
}

}  // namespace

void XmlPathWriter::StartElement(const String& name) {
  if (path_.empty()) path_ = u"/";
  ends_.push_back(path_.size());
  path_.append(View(name)).append(u"/");
}

void XmlPathWriter::EndElement() {
  if (ends_.empty()) return;
  path_.resize(ends_.back());
  ends_.pop_back();
}

bool XmlPathWriter::PutAttribute(const String& name, const String& value) {
  return Put(std::u16string(View(name)) + u"/", false, value);
}

bool XmlPathWriter::PutText(const String& text) {
  return Put(kText, true, text);
}

/// The path of a value whose element has a number behind its name.
std::u16string XmlPathWriter::Numbered(unsigned number, std::u16string_view tail) const {
  std::u16string path = path_.substr(0, path_.size() - 1);
  path += View(String::Format("%u", number));
  return path.append(u"/").append(tail);
}

bool XmlPathWriter::Put(std::u16string_view tail, bool isText, const String& value) {
  if (ends_.empty()) return false;
  const String plain = ToString(path_ + std::u16string(tail));
  const String first = ToString(Numbered(1, tail));
  const bool hasPlain = collection_.Find(plain) != nullptr;
  if (!hasPlain && collection_.Find(first) == nullptr) {
    return collection_.Put(plain, TextValue(value));
  }
  for (unsigned number = 2; number <= kMaxNumber; ++number) {
    const String path = ToString(Numbered(number, tail));
    if (collection_.Find(path) != nullptr) continue;
    if (number == 2 && hasPlain) {
      if (!Move(plain, first)) return false;
      collection_.Remove(isText ? ToString(path_) : plain);
    }
    return collection_.Put(path, TextValue(value));
  }
  return false;
}

/// Copies a text to another place. False when there is none, or no place for it.
bool XmlPathWriter::Move(const String& from, const String& to) {
  String text;
  const MetadataObject* const found = collection_.Find(from);
  return found->Get(text, 0) && collection_.Put(to, TextValue(text));
}

}  // namespace lumo
