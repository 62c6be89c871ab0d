#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <type_traits>
#include <vector>

#include "foundation/array.h"
#include "platform/random_access_file.h"

namespace lumo {

/// Holds for the buffers of all element types the file, its header block, and the window as bytes.
/// See Buffer.
class VEXG_EXPORT BasicBuffer : public Object {
 public:
  static const unsigned TypeCode;

  /// How a file is opened.
  enum Mode : unsigned {
    kReadOnly = 0,   ///< reads only; a write is a warning, and is lost
    kReadWrite = 1,  ///< reads and writes what is there
    kCreate = 2,     ///< cuts a file that is there to nothing
  };

  static constexpr unsigned kHeaderSize = 1024;        ///< bytes
  static constexpr unsigned kPageSize = 1024;          ///< elements, the default
  static constexpr unsigned kMargin = 1024;            ///< elements of a window beside its page
  static constexpr unsigned kLargeHeaderSize = 65536;  ///< bytes

  /// Closes what was not closed. Nobody hears of what goes wrong here: see Close.
  ~BasicBuffer() override;
  BasicBuffer(const BasicBuffer&) = delete;
  BasicBuffer& operator=(const BasicBuffer&) = delete;

  bool IsA(unsigned typeCode) const override;

  /// The shape that the owner gave; elements are addressed by one index all the same.
  const ArrayDims& GetDims() const { return dims_; }

  /// Elements in the file, after what changed in the window has gone there; 0 after an error.
  std::uint64_t Count();

  /// Writes what changed in the window to the file. In kReadOnly nothing but BufferWarningReadOnly
  /// comes of it. @return false after an error.
  bool Flush();

  /// The header block, for the owner to read or fill.
  std::span<unsigned char> Header() { return header_; }
  std::span<const unsigned char> Header() const { return header_; }

  /// Takes the header block from the file. A file that is too short for it leaves
  /// BufferWarningNoHeaderData. @return false then, and after an error.
  bool ReadHeader();

  /// Puts the header block into the file. @return false when it isn't there then: with
  /// BufferWarningReadOnly or BufferWarningNoHeaderData, or after an error.
  bool WriteHeader();

  /// Writes what changed, then the header, and closes the file. Nothing works any more after it.
  /// @return false when the file isn't as the owner left the buffer: an error is or was stored, the
  ///         header could not be written, or the file was deleted or replaced meanwhile. TakeFault
  ///         says why. A second call gives what the first gave.
  bool Close();

 protected:
  /// A buffer without a file, in which nothing works.
  explicit BasicBuffer(unsigned elementSize) : elementSize_(elementSize) {}
  BasicBuffer(const String& path, const ArrayDims& dims, unsigned pageSize, Mode mode,
              unsigned headerSize, unsigned elementSize);

  bool Holds(std::uint64_t index) const { return index - windowStart_ < windowCount_; }

  /// Flushes, and loads the window round an element. @return false after an error; the element may
  /// then be in no window.
  bool MoveTo(std::uint64_t index);

  /// An element in the window. @tparam T  of elementSize_ bytes.
  template <typename T>
  T& InWindow(std::uint64_t index) {
    return reinterpret_cast<T*>(window_.get())[index - windowStart_];
  }

  void MarkLent(std::uint64_t index) {
    if (index < lentFrom_) lentFrom_ = index;
    if (index >= lentTo_) lentTo_ = index + 1;
  }

 private:
  bool Fail(const ObjectErrorState& error, const std::string& why);
  bool IsReady();
  void Allocate(std::size_t headerSize);
  void OpenFile(const std::string& path);
  bool LoadWindow();
  bool TakeHeaderAway();
  void ForgetLent();
  std::size_t InWindowBytes(std::uint64_t index) const {
    return static_cast<std::size_t>(index - windowStart_) * elementSize_;
  }
  bool HeaderIsDue() const { return headerIsAway_ || header_ != knownHeader_; }
  std::uint64_t PlaceOf(std::uint64_t index) const { return header_.size() + index * elementSize_; }

  const ArrayDims dims_;
  const unsigned pageSize_ = kPageSize;
  const Mode mode_ = kReadOnly;
  const unsigned elementSize_;
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::vector<unsigned char> header_;
  std::vector<unsigned char> knownHeader_;  // as it was read or written last; empty of a new file
  std::unique_ptr<unsigned char[]> window_;
  std::uint64_t windowStart_ = 0;
  std::uint64_t windowCount_ = 0;  // 0: none was loaded yet
  // Elements to which the owner may hold references that write, until the window moves.
  std::uint64_t lentFrom_ = UINT64_MAX;
  std::uint64_t lentTo_ = 0;
  // The elements that were lent, as the file holds them since the window was last flushed.
  std::vector<unsigned char> flushed_;
  std::uint64_t flushedFrom_ = 0;
  std::uint64_t count_ = 0;
  bool countIsStale_ = true;
  bool headerIsAway_ = false;  // there are zeros in its place in the file
  bool closedWell_ = false;
};

/// An array that lives in a file: a header block whose meaning is the owner's, then the elements
/// without gaps, in the machine's byte order. One window of it is in memory, a page with kMargin
/// elements on each side, and moves as elements are touched; so the memory taken is the same for
/// any number of elements. Elements between the old end of the file and one that is written far
/// behind it are 0.
///
/// While a file has changes that belong together with ones still in memory, its header block is
/// zero; Close puts it there last. So whoever looks for a mark in the header refuses what a writer
/// left that was killed, or had no room on the disk.
///
/// Threads: one at a time.
/// Failure: BufferErrorBadBuffer or BufferErrorBadHeader when there is no memory, ObjectErrorIO
///          when the file can't be opened, read or written. Nothing is done under an error.
///          References that Ref and At give then lead to an element of no file, which is 0 at
///          first.
///
///     Buffer<double> areas(path, ArrayDims(regions));  // creates the file
///     for (unsigned i = 0; i < regions; ++i) areas.Ref(i) = area[i];
///     if (!areas.Close()) return false;                // TakeFault() says why
template <typename T>
class Buffer final : public BasicBuffer {
  static_assert(std::is_trivially_copyable_v<T> && alignof(T) <= alignof(std::max_align_t));

 public:
  /// A buffer without a file, in which nothing works.
  Buffer() : BasicBuffer(sizeof(T)) {}

  /// Opens a file; one that doesn't exist is made, empty, in every mode.
  Buffer(const String& path, unsigned pageSize, Mode mode)
      : BasicBuffer(path, ArrayDims(1, 1, 1, 1, 1, 1, 1, 1), pageSize, mode, kHeaderSize,
                    sizeof(T)) {}

  /// Creates a file.
  Buffer(const String& path, const ArrayDims& dims, unsigned pageSize)
      : BasicBuffer(path, dims, pageSize, kCreate, kHeaderSize, sizeof(T)) {}

  /// Creates a file with pages of kPageSize, whose header has kLargeHeaderSize bytes for counts
  /// (unsigned), else kHeaderSize.
  Buffer(const String& path, const ArrayDims& dims)
      : BasicBuffer(path, dims, kPageSize, kCreate,
                    std::is_same_v<T, unsigned> ? kLargeHeaderSize : kHeaderSize, sizeof(T)) {}

  /// An element to write. The reference is good until an element outside the window is touched;
  /// Count and Flush leave it good, and what is written through it afterwards goes to the file with
  /// the next of them.
  T& Ref(std::uint64_t index) {
    if (!Holds(index) && !MoveTo(index)) return Nowhere();
    MarkLent(index);
    return InWindow<T>(index);
  }

  /// An element to read; 0 behind the end of the file, which does not grow by it. The reference is
  /// good as long as that of Ref.
  const T& At(std::uint64_t index) {
    if (!Holds(index) && !MoveTo(index)) return Nowhere();
    return InWindow<T>(index);
  }

 private:
  T& Nowhere() { return nowhere_ = T(); }

  T nowhere_{};
};

}  // namespace lumo
