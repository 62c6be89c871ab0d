#pragma once

#include <mutex>
#include <type_traits>

#include "foundation/containers.h"
#include "foundation/pointer.h"
#include "metadata/metadata_object.h"

namespace lumo {

/// A tree of values that several Metadata share, with its lock. Who reads or writes it by itself
/// holds Lock().
class VEXG_EXPORT LockableMetadataImpl : public MetadataContainer, public Lockable {
 public:
  using PointerRoot = LockableMetadataImpl;
};
using LockableMetadataImplPtr = Pointer<LockableMetadataImpl>;

/// Describes the value or container at a path of a Metadata.
struct MetadataProperties {
  String typeName;        ///< the type word; "container" for a container
  unsigned typeCode = 0;  ///< see MetadataTypeOf; 20 for a container
  unsigned count = 0;     ///< elements, or children of a container
  bool isArray = false;   ///< rows and columns are set
  unsigned rows = 0;      ///< of an array of rank 2
  unsigned columns = 0;
};

/// The ten element types that a value can have.
template <typename T>
concept MetadataScalar = std::is_same_v<T, std::uint8_t> || std::is_same_v<T, std::int16_t> ||
    std::is_same_v<T, std::int32_t> || std::is_same_v<T, float> || std::is_same_v<T, double> ||
    std::is_same_v<T, String> || std::is_same_v<T, std::uint16_t> ||
    std::is_same_v<T, std::uint32_t> || std::is_same_v<T, std::int64_t> ||
    std::is_same_v<T, std::uint64_t>;

/// A tree of typed values under paths such as "/Image/Bands/Gain/", in which slashes at the ends do
/// not matter and case does. Paths that contain "/private/" hold internal entries, which GetNames
/// hides.
///
///     Metadata metadata;
///     metadata.Set("/Image/CloudCover", 12.5);
///     double clouds = 0;
///     if (metadata.Get("/Image/CloudCover", clouds)) …  // false for another type than double
///
/// Copies are cheap: they share one store until one of them is written to.
/// Threads: any operation on any thread. Each holds the store's lock for its whole length.
/// Failure: false, and nothing has changed.
class VEXG_EXPORT Metadata : public Object {
 public:
  static const unsigned TypeCode;

  Metadata();
  Metadata(const Metadata& other);
  Metadata& operator=(const Metadata& other);

  bool IsA(unsigned typeCode) const override;

  /// Adds what a source says of itself, see docs/metadata.md. The strings are the word of its
  /// format, its name and, for XML formats, what the name is: "XmlFile", "XmlUrl" or "XmlString".
  /// No strings, or "EMPTY" as the first one, change nothing and give true.
  /// @return false when a string is empty, the format is unknown or the source can't be read; the
  ///         parse log and the fault text say why.
  bool Open(const Array<String>& connectionStrings);

  /// True when there is a value, not a container, at `path`.
  bool Exists(const String& path) const;

  /// Deletes what is at `path`, a container with all that is in it.
  void Remove(const String& path);

  /// Stores one value in place of what was there; containers on the way are made. False when the
  /// path is empty or leads through a value.
  template <MetadataScalar T>
  bool Set(const String& path, const T& value) {
    return Put(path, [&] { return std::make_unique<MetadataValue<T>>(std::vector<T>{value}); });
  }
  /// Stores a text, UTF-8.
  bool Set(const String& path, const char* text) { return Set(path, String(text)); }

  /// Stores a value of unknown type of which only a size is known.
  bool SetUndefined(const String& path, std::uint32_t count);

  /// Stores the elements of an array of rank 1, or of rank 2 as rows and columns. False for an
  /// array of another rank or without elements.
  template <MetadataScalar T>
  bool SetArray(const String& path, const Array<T>& array);

  /// The first element. False when there is none, or when its type is not T.
  template <MetadataScalar T>
  bool Get(const String& path, T& value) const {
    return Read(path, [&](const MetadataObject& object) { return object.Get(value, 0); });
  }
  /// The text of the first element. False for a value of another type, see
  /// MetadataObject::ValueString.
  bool GetString(const String& path, String& value) const { return Get(path, value); }

  /// All elements, of rank 2 when they were stored so. False as for Get.
  template <MetadataScalar T>
  bool GetArray(const String& path, Array<T>& array) const;

  /// Calls `use(const MetadataObject&)` for the value or container at `path`, under the store's
  /// lock. `use` must not touch this Metadata.
  /// @return what it gave; false, with no call, when there is nothing.
  template <typename Use>
  bool Visit(const String& path, Use&& use) const {
    return Read(path, std::forward<Use>(use));
  }

  /// False when there is nothing at `path`.
  bool GetProperties(const String& path, MetadataProperties& properties) const;

  /// Adds the full path, "/a/b/", of every value below `path` in the order of the names.
  void GetNames(const String& path, List<String>& names) const;         ///< the public ones
  void GetNamesPrivate(const String& path, List<String>& names) const;  ///< the others

  /// One line for each value, see MetadataObject::Describe.
  String Describe(const String& path = "/") const;

 private:
  template <typename Reader>
  bool Read(const String& path, Reader&& reader) const {
    const std::lock_guard handle(handleMutex_);
    const MutexLock lock = store_->Lock();
    try {
      const MetadataObject* const object = store_->Find(path);
      return object != nullptr && reader(*object);
    } catch (...) {  // memory failed
      return false;
    }
  }
  template <typename Make>
  bool Put(const String& path, Make&& make) {
    try {
      return PutValue(path, make());
    } catch (...) {
      SetErrorState(ObjectErrorOutOfMemory());
      return false;
    }
  }
  bool PutValue(const String& path, std::unique_ptr<MetadataObject> value);
  void CollectNames(const String& path, bool isPrivate, List<String>& names) const;
  /// Runs `work(MetadataContainer&)` on a store that no other Metadata shares.
  template <typename Work>
  bool Write(Work&& work);
  LockableMetadataImplPtr Share() const;

  mutable std::mutex handleMutex_;  // guards which store this is; held around the store's lock
  LockableMetadataImplPtr store_;
};

using MetadataPtr = Pointer<Metadata>;

template <typename Work>
bool Metadata::Write(Work&& work) {
  const std::lock_guard handle(handleMutex_);
  const LockableMetadataImplPtr shared = store_;  // keeps it, and its lock, for this call
  const MutexLock lock = shared->Lock();
  constexpr unsigned kOwn = 2;  // store_ and shared
  if (shared.GetCount() <= kOwn) return work(*store_);
  LockableMetadataImplPtr own(new LockableMetadataImpl(*shared));
  if (!work(*own)) return false;
  store_ = own;
  return true;
}

template <MetadataScalar T>
bool Metadata::SetArray(const String& path, const Array<T>& array) {
  const unsigned rank = array.GetRank();
  if (array.GetCount() == 0 || (rank != 1 && rank != 2)) return false;
  return Put(path, [&] {
    auto value = std::make_unique<MetadataValue<T>>(std::vector<T>(array.begin(), array.end()));
    if (rank == 2) value->SetDims(array.GetExtent(0), array.GetExtent(1));
    return value;
  });
}

template <MetadataScalar T>
bool Metadata::GetArray(const String& path, Array<T>& array) const {
  return Read(path, [&](const MetadataObject& object) {
    std::vector<T> elements;
    if (!object.Get(elements)) return false;
    unsigned rows = 0, columns = 0;
    const bool is2D = object.Dims(rows, columns);
    if (!array.Resize(is2D ? ArrayDims(rows, columns)
                           : ArrayDims(static_cast<unsigned>(elements.size())))) {
      return false;
    }
    std::copy(elements.begin(), elements.end(), array.begin());
    return true;
  });
}

}  // namespace lumo
