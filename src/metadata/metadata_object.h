#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <vector>

#include "foundation/array.h"
#include "foundation/string.h"

namespace lumo {

/// The element of a MetadataUndefined: the size of something whose type has no class here.
struct UndefinedCount {
  std::uint32_t value = 0;
};

/// Names the type word and the type code of a metadata value, by its element type.
template <typename T>
struct MetadataTypeOf;

#define VEXG_METADATA_TYPE(T, typeWord, typeCode)  \
  template <>                                      \
  struct MetadataTypeOf<T> {                       \
    static constexpr const char* kWord = typeWord; \
    static constexpr unsigned kCode = typeCode;    \
  }
VEXG_METADATA_TYPE(UndefinedCount, "undefined", 0);
VEXG_METADATA_TYPE(std::uint8_t, "uchar", 1);
VEXG_METADATA_TYPE(std::int16_t, "short", 2);
VEXG_METADATA_TYPE(std::int32_t, "int", 3);
VEXG_METADATA_TYPE(float, "float", 4);
VEXG_METADATA_TYPE(double, "double", 5);
VEXG_METADATA_TYPE(String, "string", 7);
VEXG_METADATA_TYPE(std::uint16_t, "ushort", 12);
VEXG_METADATA_TYPE(std::uint32_t, "uint", 13);
VEXG_METADATA_TYPE(std::int64_t, "long64", 14);
VEXG_METADATA_TYPE(std::uint64_t, "ulong64", 15);
#undef VEXG_METADATA_TYPE

/// One value of a metadata tree: elements of one type, or a container of named values. The shape is
/// 0 by 0 unless the elements were stored as rows and columns.
class VEXG_EXPORT MetadataObject {
 public:
  virtual ~MetadataObject() = default;

  virtual MetadataObject* Clone() const = 0;  ///< a deep copy that belongs to the caller
  /// The elements, or a container's names, joined by ", ".
  virtual String ValueString() const = 0;
  /// The elements and their number; null and 0 for a container.
  virtual const void* Data(unsigned& count) const = 0;
  /// Elements, or children of a container.
  virtual unsigned Count() const = 0;

  // Element `index`; false past the end, or when the elements have another type. No class has
  // elements of signed 8 bits.
  virtual bool Get(UndefinedCount& value, unsigned index) const;
  virtual bool Get(std::int8_t& value, unsigned index) const;
  virtual bool Get(String& value, unsigned index) const;
  virtual bool Get(double& value, unsigned index) const;
  virtual bool Get(float& value, unsigned index) const;
  virtual bool Get(std::uint64_t& value, unsigned index) const;
  virtual bool Get(std::int64_t& value, unsigned index) const;
  virtual bool Get(std::uint32_t& value, unsigned index) const;
  virtual bool Get(std::int32_t& value, unsigned index) const;
  virtual bool Get(std::uint16_t& value, unsigned index) const;
  virtual bool Get(std::int16_t& value, unsigned index) const;
  virtual bool Get(std::uint8_t& value, unsigned index) const;

  // All elements; false when they have another type.
  virtual bool Get(std::vector<UndefinedCount>& values) const;
  virtual bool Get(std::vector<std::int8_t>& values) const;
  virtual bool Get(std::vector<String>& values) const;
  virtual bool Get(std::vector<double>& values) const;
  virtual bool Get(std::vector<float>& values) const;
  virtual bool Get(std::vector<std::uint64_t>& values) const;
  virtual bool Get(std::vector<std::int64_t>& values) const;
  virtual bool Get(std::vector<std::uint32_t>& values) const;
  virtual bool Get(std::vector<std::int32_t>& values) const;
  virtual bool Get(std::vector<std::uint16_t>& values) const;
  virtual bool Get(std::vector<std::int16_t>& values) const;
  virtual bool Get(std::vector<std::uint8_t>& values) const;

  /// The type word; "container" for a container.
  virtual const char* TypeName() const = 0;
  /// The type code; 20 for a container.
  virtual unsigned TypeCode() const = 0;
  /// True when the elements are stored as rows and columns.
  virtual bool Is2D() const { return rows_ > 0 && columns_ > 0; }
  /// The shape of elements that are stored as rows and columns. False for others.
  virtual bool Dims(unsigned& rows, unsigned& columns) const;
  /// One line of text with path, type, shape and value, for the parse log. A container gives the
  /// lines of its children in the order of their names.
  virtual String Describe(const String& path) const;

  /// Declares the elements rows and columns; their product is the number of elements.
  void SetDims(unsigned rows, unsigned columns) {
    rows_ = rows;
    columns_ = columns;
  }

 protected:
  unsigned rows_ = 0;
  unsigned columns_ = 0;
};

/// A value with elements of type T; a scalar has one. It owns them, and only its shape can change.
template <typename T>
class VEXG_EXPORT MetadataValue final : public MetadataObject {
 public:
  using MetadataObject::Get;

  explicit MetadataValue(std::vector<T> elements) : elements_(std::move(elements)) {}

  MetadataValue* Clone() const override { return new MetadataValue(*this); }
  String ValueString() const override;
  const void* Data(unsigned& count) const override {
    count = Count();
    return elements_.data();
  }
  unsigned Count() const override { return static_cast<unsigned>(elements_.size()); }
  bool Get(T& value, unsigned index) const override {
    if (index >= elements_.size()) return false;
    value = elements_[index];
    return true;
  }
  bool Get(std::vector<T>& values) const override {
    values = elements_;
    return true;
  }
  const char* TypeName() const override { return MetadataTypeOf<T>::kWord; }
  unsigned TypeCode() const override { return MetadataTypeOf<T>::kCode; }

  /// The elements, row after row where there are rows.
  const std::vector<T>& Elements() const { return elements_; }

 private:
  std::vector<T> elements_;
};

using MetadataUndefined = MetadataValue<UndefinedCount>;
using MetadataUChar = MetadataValue<std::uint8_t>;
using MetadataShort = MetadataValue<std::int16_t>;
using MetadataInt = MetadataValue<std::int32_t>;
using MetadataFloat = MetadataValue<float>;
using MetadataDouble = MetadataValue<double>;
using MetadataString = MetadataValue<String>;
using MetadataUShort = MetadataValue<std::uint16_t>;
using MetadataUInt = MetadataValue<std::uint32_t>;
using MetadataLong64 = MetadataValue<std::int64_t>;
using MetadataULong64 = MetadataValue<std::uint64_t>;

/// Named values in the order of their names, which are case-sensitive. It owns them.
class VEXG_EXPORT MetadataContainer : public MetadataObject {
 public:
  /// The type code of containers.
  static constexpr unsigned kTypeCode = 20;
  static constexpr unsigned kMaxDepth = 256;  ///< names in a path
  using Children = std::map<String, std::unique_ptr<MetadataObject>>;

  MetadataContainer() = default;
  MetadataContainer(const MetadataContainer& other);
  MetadataContainer& operator=(const MetadataContainer&) = delete;

  MetadataContainer* Clone() const override { return new MetadataContainer(*this); }
  String ValueString() const override;
  const void* Data(unsigned& count) const override;
  unsigned Count() const override { return static_cast<unsigned>(children_.size()); }
  const char* TypeName() const override { return "container"; }
  unsigned TypeCode() const override { return kTypeCode; }
  String Describe(const String& path) const override;

  /// The values and containers right in this one, by name.
  const Children& GetChildren() const { return children_; }

  /// The value or container at `path`, pieces between slashes, empty ones dropped; null when there
  /// is none, or when the path has no piece.
  const MetadataObject* Find(const String& path) const;

  /// Puts a value at `path`, in place of what stood there; missing containers on the way are made.
  /// @return false, with nothing changed, when the path has no piece or more than kMaxDepth, or
  ///         leads through a value.
  bool Put(const String& path, std::unique_ptr<MetadataObject> value);

  /// Deletes what stands at `path`. False when nothing does.
  bool Remove(const String& path);

  /// Puts copies of all values of `other` at their paths.
  /// @return false, with nothing changed, when one of them has no place here.
  bool Merge(const MetadataContainer& other);

 private:
  bool HasPlaceFor(const MetadataContainer& other) const;
  void Take(const MetadataContainer& other);

  Children children_;
};

/// The pieces of a path, without the empty ones.
VEXG_EXPORT std::vector<String> SplitMetadataPath(const String& path);

}  // namespace lumo
