#pragma once

#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

#include "geometry/polygon_stream.h"
#include "platform/random_access_file.h"
#include "raster/pixel_types.h"

namespace lumo {

/// The bytes of the header of a polygon file.
inline constexpr unsigned kPolygonHeaderSize = 1024;

/// The default of the bytes that readers and writers hold of a polygon file.
inline constexpr unsigned kPolygonBufferSize = 1 << 18;

/// Tells one kind of polygon file from another. All begin with a header of kPolygonHeaderSize bytes
/// (mark, swap flag, codes of the label's and the coordinates' types, number of polygons); then
/// comes a record for each polygon. See docs/file-formats.md.
struct PolygonFileKind {
  std::string_view mark;  ///< the first characters of the file
  const char* name;       ///< as reasons call it
};

/// Says where a writer puts a file until it is complete: at its place, with a header of zeros, or
/// beside it under another name, so that what stood there stays until the new file is whole.
enum class PolygonFileGrowth { kInPlace, kBeside };

namespace detail {

/// The bytes of a polygon file that is being written.
class VEXG_EXPORT PolygonFileOutput {
 public:
  /// @param error  takes ObjectErrorIO when the file can't be made or written; TakeFault says why.
  PolygonFileOutput(const PolygonFileKind& kind, const std::string& path, unsigned bufferSize,
                    PolygonFileGrowth growth, ErrorState& error);
  /// Abandons the file, unless it was completed.
  ~PolygonFileOutput();
  PolygonFileOutput(const PolygonFileOutput&) = delete;
  PolygonFileOutput& operator=(const PolygonFileOutput&) = delete;

  bool IsOpen() const { return file_ != nullptr && !error_.HasError(); }
  bool Put(const void* data, std::size_t bytes);
  /// Writes the header, and gives the file its place.
  bool Complete(std::uint16_t labelType, std::uint32_t count);
  void Abandon();

 private:
  bool Flush();
  bool Fail(const std::string& why);
  void RemoveGrowing();

  const PolygonFileKind kind_;
  const std::string path_;
  const std::string growing_;  // where the file lies until it is complete
  ErrorState& error_;
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::vector<unsigned char> buffer_;
  std::size_t held_ = 0;
  std::uint64_t place_ = kPolygonHeaderSize;
};

/// The bytes of a polygon file that is being read.
class VEXG_EXPORT PolygonFileInput {
 public:
  /// Opens the file and reads its header.
  PolygonFileInput(const PolygonFileKind& kind, std::uint16_t labelType, const std::string& path,
                   unsigned bufferSize, ErrorState& error);

  /// Reads on. False at the end of the file, and when it can't be read.
  bool Get(void* data, std::size_t bytes);
  /// Reads numbers of `size` bytes, in the machine's byte order.
  bool GetNumbers(void* data, std::size_t count, unsigned size);
  /// The bytes that are left.
  std::uint64_t Left() const { return file_ ? size_ - place_ : 0; }
  std::uint32_t Count() const { return count_; }
  void Close() { file_.reset(); }

 private:
  bool Fail(const std::string& why);

  ErrorState& error_;
  std::unique_ptr<platform::RandomAccessFile> file_;
  std::vector<unsigned char> buffer_;
  std::uint64_t size_ = 0;
  std::uint64_t bufferPlace_ = 0;  // of the first byte held
  std::size_t held_ = 0;
  std::uint64_t place_ = kPolygonHeaderSize;
  std::uint32_t count_ = 0;
  bool isSwapped_ = false;
};

}  // namespace detail

/// Writes a file of polygons whose labels are of type L, one of EightTypes. The header is written
/// last, so that nobody takes a file for whole that a run left which failed or was killed.
///
/// Failure: ObjectErrorIO when the file can't be made or written; nothing is written then any more,
///          and the file has no header, or never comes. TakeFault says why.
template <typename L>
class PolygonFileWriter : public PolygonWriter<L, std::uint32_t>,
                          public FlatPolygonWriter<L, std::uint32_t> {
 public:
  PolygonFileWriter(const PolygonFileKind& kind, const URI& uri, unsigned bufferSize,
                    PolygonFileGrowth growth);
  /// Closes what was not closed.
  ~PolygonFileWriter() override;
  PolygonFileWriter(const PolygonFileWriter&) = delete;
  PolygonFileWriter& operator=(const PolygonFileWriter&) = delete;

  bool Write(const L& label, const Deque<bool>& holes, const Deque<unsigned>& starts,
             const Deque<std::uint32_t>& coordinates) override;
  bool Write(const L& label, const Array<bool>& holes, const Array<unsigned>& starts,
             const Array<std::uint32_t>& coordinates) override;
  using PolygonWriter<L, std::uint32_t>::Write;

  bool WriteFlat(const L& label, std::size_t rings, const unsigned char* holes,
                 const std::uint32_t* starts, std::size_t coordinateCount,
                 const std::uint32_t* coordinates) override;

  /// Completes the file and closes it. @return false when it isn't whole on the disk.
  bool Close();
  /// Closes the file without a header: it stands for nothing.
  void Abandon();

  /// Polygons that were written.
  std::uint32_t Count() const { return count_; }

 protected:
  bool IsOpen() const { return output_.IsOpen(); }
  /// Writes a record as it stands.
  bool PutRecord(const L& label, std::size_t rings, const unsigned char* holes,
                 const std::uint32_t* starts, std::size_t coordinateCount,
                 const std::uint32_t* coordinates);

 private:
  detail::PolygonFileOutput output_;
  std::uint32_t count_ = 0;
  bool isClosed_ = false;
};

/// Reads a file of polygons whose labels are of type L, of either byte order.
///
/// Failure: ObjectErrorIO when the file can't be opened, is shorter than a header, has another mark
///          or other types. A record that the end of the file cuts off ends reading.
template <typename L>
class PolygonFileReader : public PolygonReader<L, std::uint32_t> {
 public:
  /// Opens a file and reads its header; IsValid() is false when that fails.
  /// @param bufferSize  bytes that are read at once.
  PolygonFileReader(const PolygonFileKind& kind, const URI& uri, unsigned bufferSize);

  bool Read(L& label, Deque<bool>& holes, Deque<unsigned>& starts,
            Deque<std::uint32_t>& coordinates) override;
  bool Read(L& label, Array<bool>& holes, Array<unsigned>& starts,
            Array<std::uint32_t>& coordinates) override;
  using PolygonReader<L, std::uint32_t>::Read;
  /// Polygons of the file, as its header has it.
  unsigned Count() const override { return input_.Count(); }

 protected:
  void CloseFile() { input_.Close(); }

 private:
  detail::PolygonFileInput input_;
};

VEXG_EXTERN(EIGHT, PolygonFileWriter);
VEXG_EXTERN(EIGHT, PolygonFileReader);

}  // namespace lumo
