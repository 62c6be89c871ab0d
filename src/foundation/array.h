#pragma once

#include <cstdint>
#include <cstring>
#include <istream>
#include <ostream>
#include <type_traits>
#include <utility>

#include "foundation/errors.h"
#include "foundation/object.h"
#include "foundation/text_form.h"

namespace lumo {

/// A complex number: real part, then imaginary part.
template <typename T>
struct Complex {
  T real;
  T imag;
  friend bool operator==(const Complex&, const Complex&) = default;
};

/// Writes "(real,imaginary)", the stream form of the standard library's complex numbers.
template <typename T>
std::ostream& operator<<(std::ostream& out, const Complex<T>& value) {
  out << '(';
  WriteNumber(out, value.real);
  out << ',';
  WriteNumber(out, value.imag);
  return out << ')';
}

/// Reads what operator<< writes.
template <typename T>
std::istream& operator>>(std::istream& in, Complex<T>& value) {
  SkipPast(in, '(');
  ReadNumber(in, value.real);
  SkipPast(in, ',');
  ReadNumber(in, value.imag);
  SkipPast(in, ')');
  return in;
}

/// The shape of an array: up to eight dimensions, the last the fastest in storage.
struct VEXG_EXPORT ArrayDims {
  /// The most dimensions that an array can have.
  static constexpr unsigned kMaxRank = 8;

  unsigned extent[kMaxRank] = {1, 1, 1, 1, 1, 1, 1, 1};  ///< unused dimensions hold 1
  unsigned rank = 0;                                     ///< dimensions in use, 0 to 8
  /// Product of the extents, 0 for rank 0; kTooMany when 32 bits can't hold it.
  unsigned count = 0;

  /// The count of a shape whose elements 32 bits can't count: no array can have it.
  static constexpr unsigned kTooMany = 0xFFFFFFFF;

  ArrayDims() = default;
  /// 0 stands for a dimension that does not exist. The rank is the position of the last extent that
  /// is not 0; a zero before it counts as 1.
  explicit ArrayDims(unsigned e0, unsigned e1 = 0, unsigned e2 = 0, unsigned e3 = 0,
                     unsigned e4 = 0, unsigned e5 = 0, unsigned e6 = 0, unsigned e7 = 0);
  /// The same from a list of eight extents.
  explicit ArrayDims(const unsigned (&extents)[kMaxRank]);

  friend bool operator==(const ArrayDims&, const ArrayDims&) = default;
};

/// Gives the arrays of all element types one type code, so that IsA finds an Array among Objects
/// but not its element type.
class VEXG_EXPORT ArrayObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// An array of up to eight dimensions whose elements lie without gaps, the last dimension fastest:
/// element (i, j) of two dimensions stands at i * GetExtent(1) + j.
///
/// It either owns its elements, and can then grow, or wraps memory of somebody else, within which
/// it can only change shape. Its capacity never shrinks, so an array that is re-shaped in a loop
/// allocates once. Elements of plain data are not initialised; others are constructed.
///
///     Array<float> block(ArrayDims(lines, samples));
///     if (!block.IsValid()) return false;                    // there was no memory
///     block[line * block.GetExtent(1) + sample] = 1.0F;
///     Array<float> view(pixels, ArrayDims(lines, samples));  // wraps `pixels`, copies nothing
///
/// Cost:    a copy of an owning array copies every element; a move trades the storage.
/// Threads: like a standard container: many readers or one writer.
/// Failure: an allocation that fails leaves an empty array with ObjectErrorOutOfMemory stored;
///          IsValid() is then false. Element access is not checked.
template <typename T>
class Array : public ArrayObject {
 public:
  /// An empty array of rank 0 that owns its elements and can grow.
  Array() = default;

  /// Allocates `dims.count` elements.
  explicit Array(const ArrayDims& dims) { Resize(dims); }

  /// Wraps `dims.count` elements at `data`, which outlive the array and all copies of it.
  Array(T* data, const ArrayDims& dims)
      : data_(data), dims_(dims), capacity_(dims.count), ownsData_(false) {}

  /// Copies the elements of an array that owns them; wraps the same memory as one that doesn't.
  Array(const Array& other) : ArrayObject(other) { CopyFrom(other); }
  /// Takes the elements over, wrapped ones too; `other` is left empty.
  Array(Array&& other) noexcept { Swap(other); }
  ~Array() override { Release(); }

  /// Becomes a copy as the copy constructor makes it; memory that was wrapped before is let go, not
  /// written.
  Array& operator=(const Array& other) {
    if (this == &other) return *this;
    Release();
    ArrayObject::operator=(other);
    CopyFrom(other);
    return *this;
  }
  /// Trades elements, shape and error state with `other`.
  Array& operator=(Array&& other) noexcept {
    Swap(other);
    return *this;
  }

  /// Changes the shape; the elements at the start of the storage stay, in storage order. It
  /// allocates only when the new count is above the capacity.
  /// @return false when memory that isn't owned is too small, with no change; or when an allocation
  ///          failed: the array is then empty, with ObjectErrorOutOfMemory stored.
  bool Resize(const ArrayDims& dims);

  /// Number of elements: the product of the extents.
  unsigned GetCount() const { return dims_.count; }
  /// Dimensions in use, 0 to 8; 0 for an empty array.
  unsigned GetRank() const { return dims_.rank; }
  /// Size of dimension `index`, 0 to 7; 1 for a dimension that isn't in use.
  unsigned GetExtent(unsigned index) const { return dims_.extent[index]; }
  const ArrayDims& GetDims() const { return dims_; }
  /// Elements up to which Resize needs no allocation.
  unsigned GetCapacity() const { return capacity_; }
  /// False for an array that wraps memory of somebody else.
  bool OwnsData() const { return ownsData_ != 0; }

  /// The first element; null for an array that never had any.
  T* GetData() { return data_; }
  const T* GetData() const { return data_; }
  /// The element at a place of the storage, which has to be below GetCount(): nothing checks it.
  T& operator[](std::size_t index) { return data_[index]; }
  const T& operator[](std::size_t index) const { return data_[index]; }

  T* begin() { return data_; }
  T* end() { return data_ + dims_.count; }
  const T* begin() const { return data_; }
  const T* end() const { return data_ + dims_.count; }

 private:
  void Release() {
    if (ownsData_ != 0) delete[] data_;
    data_ = nullptr;
  }
  void CopyFrom(const Array& other);
  void Swap(Array& other) noexcept;

  T* data_ = nullptr;
  ArrayDims dims_;
  unsigned capacity_ = 0;
  std::uint32_t ownsData_ = 1;
};

template <typename T>
bool Array<T>::Resize(const ArrayDims& dims) {
  if (dims.count <= capacity_ && dims.count != ArrayDims::kTooMany) {
    dims_ = dims;
    return true;
  }
  if (ownsData_ == 0) return false;

  T* fresh = nullptr;
  try {
    if (dims.count != ArrayDims::kTooMany) fresh = new T[dims.count];
    if (fresh != nullptr) {
      if constexpr (std::is_trivially_copyable_v<T>) {
        if (capacity_ != 0) std::memcpy(static_cast<void*>(fresh), data_, capacity_ * sizeof(T));
      } else {
        for (unsigned i = 0; i < capacity_; ++i) fresh[i] = data_[i];
      }
    }
  } catch (...) {
    delete[] fresh;
    fresh = nullptr;
  }
  Release();
  data_ = fresh;
  dims_ = fresh != nullptr ? dims : ArrayDims();
  capacity_ = dims_.count;
  if (fresh == nullptr) SetErrorState(ObjectErrorOutOfMemory());
  return fresh != nullptr;
}

template <typename T>
void Array<T>::CopyFrom(const Array& other) {
  ownsData_ = other.ownsData_;
  if (ownsData_ == 0) {
    data_ = other.data_;
    dims_ = other.dims_;
    capacity_ = other.capacity_;
    return;
  }
  data_ = nullptr;
  capacity_ = 0;
  dims_ = ArrayDims();
  if (!Resize(other.dims_)) return;
  try {
    for (unsigned i = 0; i < dims_.count; ++i) data_[i] = other.data_[i];
  } catch (...) {
    Release();
    dims_ = ArrayDims();
    capacity_ = 0;
    SetErrorState(ObjectErrorOutOfMemory());
  }
}

template <typename T>
void Array<T>::Swap(Array& other) noexcept {
  ErrorState::Swap(other);
  std::swap(data_, other.data_);
  std::swap(dims_, other.dims_);
  std::swap(capacity_, other.capacity_);
  std::swap(ownsData_, other.ownsData_);
}

/// Writes rank ":", each extent and a blank, then "[", the elements separated by a blank, and "] ":
/// three integers read "1:3 [10 20 30] ". Numbers have the precision that the stream is set to.
template <typename T>
std::ostream& operator<<(std::ostream& out, const Array<T>& array) {
  out << array.GetRank() << ':';
  for (unsigned i = 0; i < array.GetRank(); ++i) out << array.GetExtent(i) << ' ';
  out << '[';
  for (unsigned i = 0; i < array.GetCount(); ++i) {
    if (i != 0) out << ' ';
    if constexpr (std::is_arithmetic_v<T>) {
      WriteNumber(out, array[i]);
    } else {
      out << array[i];
    }
  }
  return out << "] ";
}

namespace detail {

/// Reads the shape and the opening bracket of an array text. False when the stream can't hold as
/// many elements as the shape asks for.
VEXG_EXPORT bool ReadArrayDims(std::istream& in, ArrayDims& dims);

}  // namespace detail

/// Reads what operator<< writes; of a rank over 8 only eight extents are read. A text whose shape
/// can't be had, or that breaks off among the elements, stores ArrayErrorInvalidArray.
template <typename T>
std::istream& operator>>(std::istream& in, Array<T>& array) {
  ArrayDims dims;
  if (!detail::ReadArrayDims(in, dims) || !array.Resize(dims)) {
    array.SetErrorState(ArrayErrorInvalidArray());
    return in;
  }
  for (T& element : array) {
    if constexpr (std::is_arithmetic_v<T>) {
      ReadNumber(in, element);
    } else {
      in >> element;
    }
    if (in.fail()) {
      array.Resize(ArrayDims());
      array.SetErrorState(ArrayErrorInvalidArray());
      return in;
    }
  }
  SkipPast(in, ']');
  return in;
}

/// Inverse of a square matrix, GetExtent(0) rows by GetExtent(1) columns; of one that isn't square,
/// of its leading square. LU decomposition by Crout's method with implicit partial pivoting (Press
/// et al., Numerical Recipes, section 2.3); a pivot of 0 counts as 1e-20. The cost grows with the
/// cube of the rows.
/// @return an array of the same shape; one with MatrixErrorSingular stored when a row holds only
///          zeros.
VEXG_EXPORT Array<double> Inverse(const Array<double>& matrix);

/// Gives the jagged arrays of all element types one type code.
class VEXG_EXPORT JaggedArrayObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// Rows of uneven length, each an array of its own. A new one has empty rows; each is sized by
/// itself:
///
///     JaggedArray2D<unsigned> neighbours(regions);
///     neighbours.Row(region).Resize(ArrayDims(count));
///
/// Failure: IsValid() is false when the rows could not be allocated; a row that could not be sized
///          has its own error state.
template <typename T>
class JaggedArray2D : public JaggedArrayObject {
 public:
  /// @param rows  how many there are from now on; they begin empty.
  explicit JaggedArray2D(unsigned rows) : rows_(ArrayDims(rows)) {}

  bool IsValid() const override { return Object::IsValid() && rows_.IsValid(); }
  /// How many rows there are, empty ones among them.
  unsigned GetRowCount() const { return rows_.GetCount(); }
  /// The row `index`, from 0, which has to be there.
  Array<T>& Row(unsigned index) { return rows_[index]; }
  const Array<T>& Row(unsigned index) const { return rows_[index]; }

 private:
  Array<Array<T>> rows_;
};

}  // namespace lumo
