#include "metadata/metadata.h"

#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "foundation/type_code.h"
#include "metadata/metadata_parse_log.h"

namespace lumo {
namespace {

constexpr const char* kPrivateMark = "/private/";

/// "/a/b/" for any way of writing the path.
String FullPath(const String& path) {
  String full("/");
  for (const String& name : SplitMetadataPath(path)) full += name + "/";
  return full;
}

void AddNames(const MetadataContainer& container, const String& path, bool isPrivate,
              List<String>& names) {
  for (const auto& [name, child] : container.GetChildren()) {
    const String childPath = path + name + "/";
    if (const auto* const inner = dynamic_cast<const MetadataContainer*>(child.get())) {
      AddNames(*inner, childPath, isPrivate, names);
    } else if ((childPath.Find(kPrivateMark) != String::kNotFound) == isPrivate) {
      names.PushBack(childPath);
    }
  }
}

}  // namespace

const unsigned Metadata::TypeCode = GloballyUniqueObjectTypeCode("Metadata");

Metadata::Metadata() : store_(new LockableMetadataImpl) {
  MetadataParseLog::Instance();
}

Metadata::Metadata(const Metadata& other) : Object(other), store_(other.Share()) {}

Metadata& Metadata::operator=(const Metadata& other) {
  if (this == &other) return *this;
  Object::operator=(other);
  const LockableMetadataImplPtr shared = other.Share();
  const std::lock_guard handle(handleMutex_);
  store_ = shared;
  return *this;
}

LockableMetadataImplPtr Metadata::Share() const {
  const std::lock_guard handle(handleMutex_);
  return store_;
}

bool Metadata::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

bool Metadata::Exists(const String& path) const {
  return Read(path, [](const MetadataObject& object) {
    return object.TypeCode() != MetadataContainer::kTypeCode;
  });
}

void Metadata::Remove(const String& path) {
  try {
    if (Read(path, [](const MetadataObject&) { return true; })) {
      Write([&](MetadataContainer& store) { return store.Remove(path); });
    }
  } catch (...) {
    SetFault(DescribeException());
    SetErrorState(ObjectErrorOutOfMemory());
  }
}

bool Metadata::SetUndefined(const String& path, std::uint32_t count) {
  return Put(path, [&] {
    return std::make_unique<MetadataUndefined>(std::vector<UndefinedCount>{{count}});
  });
}

bool Metadata::PutValue(const String& path, std::unique_ptr<MetadataObject> value) {
  return Write([&](MetadataContainer& store) { return store.Put(path, std::move(value)); });
}

bool Metadata::GetProperties(const String& path, MetadataProperties& properties) const {
  return Read(path, [&](const MetadataObject& object) {
    properties.typeName = object.TypeName();
    properties.typeCode = object.TypeCode();
    properties.count = object.Count();
    properties.isArray = object.Dims(properties.rows, properties.columns);
    return true;
  });
}

void Metadata::CollectNames(const String& path, bool isPrivate, List<String>& names) const {
  const std::lock_guard handle(handleMutex_);
  const MutexLock lock = store_->Lock();
  detail::Guarded(names, [&] {
    const String full = FullPath(path);
    const MetadataObject* const start = full.GetLength() == 1 ? store_.Get() : store_->Find(path);
    if (const auto* const container = dynamic_cast<const MetadataContainer*>(start)) {
      AddNames(*container, full, isPrivate, names);
    }
  });
}

void Metadata::GetNames(const String& path, List<String>& names) const {
  CollectNames(path, false, names);
}

void Metadata::GetNamesPrivate(const String& path, List<String>& names) const {
  CollectNames(path, true, names);
}

String Metadata::Describe(const String& path) const {
  const std::lock_guard handle(handleMutex_);
  const MutexLock lock = store_->Lock();
  return store_->Describe(path);
}

}  // namespace lumo
