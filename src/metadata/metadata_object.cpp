#include "metadata/metadata_object.h"

#include <iomanip>

#include "foundation/text_form.h"

namespace lumo {
namespace {

template <typename T>
void WriteElement(std::ostream& out, const T& element) {
  if constexpr (std::is_same_v<T, String>) {
    out << element.ToUTF8();
  } else if constexpr (std::is_same_v<T, UndefinedCount>) {
    out << element.value;
  } else {
    WriteNumber(out, element);
  }
}

/// A text with blanks behind it up to `width` characters, which are counted as UTF-16 units.
void WriteLeft(std::ostream& out, const String& text, unsigned width) {
  out << text.ToUTF8();
  for (unsigned i = text.GetLength(); i < width; ++i) out << ' ';
}

}  // namespace

bool MetadataObject::Get(UndefinedCount&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::int8_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(String&, unsigned) const {
  return false;
}
bool MetadataObject::Get(double&, unsigned) const {
  return false;
}
bool MetadataObject::Get(float&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::uint64_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::int64_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::uint32_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::int32_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::uint16_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::int16_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::uint8_t&, unsigned) const {
  return false;
}
bool MetadataObject::Get(std::vector<UndefinedCount>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::int8_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<String>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<double>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<float>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::uint64_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::int64_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::uint32_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::int32_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::uint16_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::int16_t>&) const {
  return false;
}
bool MetadataObject::Get(std::vector<std::uint8_t>&) const {
  return false;
}

bool MetadataObject::Dims(unsigned& rows, unsigned& columns) const {
  rows = rows_;
  columns = columns_;
  return Is2D();
}

String MetadataObject::Describe(const String& path) const {
  constexpr unsigned kPathWidth = 80;
  std::ostringstream out = MakeTextWriter();
  WriteLeft(out, path, kPathWidth);
  out << std::setw(7) << " = (" << TypeName();
  if (Is2D()) {
    out << std::setw(4) << ' ' << std::setw(3) << rows_ << ',' << columns_;
  } else {
    out << std::setw(8) << ' ' << Count();
  }
  out << ')' << std::setw(50) << " = " << ValueString().ToUTF8() << '\n';
  return String(out.str());
}

template <typename T>
String MetadataValue<T>::ValueString() const {
  std::ostringstream out = MakeTextWriter();
  for (std::size_t i = 0; i < elements_.size(); ++i) {
    if (i != 0) out << ", ";
    WriteElement(out, elements_[i]);
  }
  return String(out.str());
}

template class MetadataValue<UndefinedCount>;
template class MetadataValue<std::uint8_t>;
template class MetadataValue<std::int16_t>;
template class MetadataValue<std::int32_t>;
template class MetadataValue<float>;
template class MetadataValue<double>;
template class MetadataValue<String>;
template class MetadataValue<std::uint16_t>;
template class MetadataValue<std::uint32_t>;
template class MetadataValue<std::int64_t>;
template class MetadataValue<std::uint64_t>;

MetadataContainer::MetadataContainer(const MetadataContainer& other) : MetadataObject(other) {
  for (const auto& [name, child] : other.children_) {
    children_.emplace_hint(children_.end(), name, child->Clone());
  }
}

String MetadataContainer::ValueString() const {
  String names("");
  for (const auto& [name, child] : children_) {
    if (names.GetLength() != 0) names += ", ";
    names += name;
  }
  return names;
}

const void* MetadataContainer::Data(unsigned& count) const {
  count = 0;
  return nullptr;
}

String MetadataContainer::Describe(const String& path) const {
  String lines("");
  for (const auto& [name, child] : children_) lines += child->Describe(path + name + "/");
  return lines;
}

const MetadataObject* MetadataContainer::Find(const String& path) const {
  const MetadataObject* found = nullptr;
  const MetadataContainer* inside = this;
  for (const String& name : SplitMetadataPath(path)) {
    if (inside == nullptr) return nullptr;
    const auto at = inside->children_.find(name);
    if (at == inside->children_.end()) return nullptr;
    found = at->second.get();
    inside = dynamic_cast<const MetadataContainer*>(found);
  }
  return found;
}

bool MetadataContainer::Put(const String& path, std::unique_ptr<MetadataObject> value) {
  const std::vector<String> names = SplitMetadataPath(path);
  if (names.empty() || names.size() > kMaxDepth) return false;
  MetadataContainer* inside = this;
  for (std::size_t i = 0; i + 1 < names.size(); ++i) {
    const auto at = inside->children_.find(names[i]);
    if (at == inside->children_.end()) {
      // From here on all is missing: the rest of the way is made apart and hung in at once.
      for (std::size_t deeper = names.size() - 1; deeper > i; --deeper) {
        auto container = std::make_unique<MetadataContainer>();
        container->children_[names[deeper]] = std::move(value);
        value = std::move(container);
      }
      inside->children_[names[i]] = std::move(value);
      return true;
    }
    inside = dynamic_cast<MetadataContainer*>(at->second.get());
    if (inside == nullptr) return false;
  }
  inside->children_[names.back()] = std::move(value);
  return true;
}

bool MetadataContainer::Remove(const String& path) {
  const std::vector<String> names = SplitMetadataPath(path);
  MetadataContainer* inside = this;
  for (std::size_t i = 0; i < names.size() && inside != nullptr; ++i) {
    const auto at = inside->children_.find(names[i]);
    if (at == inside->children_.end()) return false;
    if (i + 1 == names.size()) {
      inside->children_.erase(at);
      return true;
    }
    inside = dynamic_cast<MetadataContainer*>(at->second.get());
  }
  return false;
}

/// False when a value here would have to become a container, or the other way round.
bool MetadataContainer::HasPlaceFor(const MetadataContainer& other) const {
  for (const auto& [name, child] : other.children_) {
    const auto at = children_.find(name);
    if (at == children_.end()) continue;
    const auto* const mine = dynamic_cast<const MetadataContainer*>(at->second.get());
    const auto* const theirs = dynamic_cast<const MetadataContainer*>(child.get());
    if ((mine == nullptr) != (theirs == nullptr)) return false;
    if (mine != nullptr && !mine->HasPlaceFor(*theirs)) return false;
  }
  return true;
}

void MetadataContainer::Take(const MetadataContainer& other) {
  for (const auto& [name, child] : other.children_) {
    std::unique_ptr<MetadataObject>& place = children_[name];
    auto* const mine = dynamic_cast<MetadataContainer*>(place.get());
    if (mine != nullptr) {
      mine->Take(static_cast<const MetadataContainer&>(*child));
    } else {
      place.reset(child->Clone());
    }
  }
}

bool MetadataContainer::Merge(const MetadataContainer& other) {
  if (!HasPlaceFor(other)) return false;
  Take(other);
  return true;
}

std::vector<String> SplitMetadataPath(const String& path) {
  std::vector<String> names;
  const char16_t* const units = path.GetData();
  const unsigned length = path.GetLength();
  for (unsigned start = 0; start < length;) {
    unsigned end = start;
    while (end < length && units[end] != u'/') ++end;
    if (end > start) names.emplace_back(units + start, end - start);
    start = end + 1;
  }
  return names;
}

}  // namespace lumo
