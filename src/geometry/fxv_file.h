#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "foundation/string.h"
#include "geometry/polygon_stream.h"
#include "platform/random_access_file.h"

namespace lumo {

/// The FXV file of polygons: a header of kFxvHeaderSize bytes with a mark and the number of
/// polygons, then a record for each polygon. See docs/file-formats.md.
inline constexpr unsigned kFxvHeaderSize = 1024;

/// The default of the bytes that the reader and the writer hold of a file.
inline constexpr unsigned kFxvBufferSize = 1 << 18;

/// True for a path that ends as those of FXV files do, in any case.
VEXG_EXPORT bool IsFxvName(const std::string& path);

/// Writes an FXV file. The header is zero until the file is complete, so that nobody takes one for
/// whole that a run left which failed or was killed.
///
///     FxvPolygonWriter<std::int32_t, std::uint32_t> file{URI("areas.fxv")};
///     for (const Polygon2D<std::uint32_t>& polygon : polygons) file.Write(polygon);
///     if (!file.Close()) return false;  // TakeFault() says why
///
/// Failure: ObjectErrorIO when the file can't be made or written; nothing is written then any more,
///          and the header stays zero. TakeFault says why.
template <typename L, typename C>
class FxvPolygonWriter;

template <>
class VEXG_EXPORT FxvPolygonWriter<std::int32_t, std::uint32_t> final
    : public PolygonWriter<std::int32_t, std::uint32_t>,
      public FlatPolygonWriter<std::int32_t, std::uint32_t> {
 public:
  /// Creates a file, or empties the one that is there.
  /// @param bufferSize  bytes that are gathered before they are written.
  explicit FxvPolygonWriter(const URI& uri, unsigned bufferSize = kFxvBufferSize);
  /// Closes what was not closed.
  ~FxvPolygonWriter() override;
  FxvPolygonWriter(const FxvPolygonWriter&) = delete;
  FxvPolygonWriter& operator=(const FxvPolygonWriter&) = delete;

  bool Write(const std::int32_t& label, const Deque<bool>& holes, const Deque<unsigned>& starts,
             const Deque<std::uint32_t>& coordinates) override;
  bool Write(const std::int32_t& label, const Array<bool>& holes, const Array<unsigned>& starts,
             const Array<std::uint32_t>& coordinates) override;
  using PolygonWriter::Write;

  bool WriteFlat(const std::int32_t& label, std::size_t rings, const unsigned char* holes,
                 const std::uint32_t* starts, std::size_t coordinateCount,
                 const std::uint32_t* coordinates) override;

  /// Completes the file and closes it. @return false when it isn't whole on the disk.
  bool Close();
  /// Closes the file without a header: it stands for nothing.
  void Abandon();

  /// Polygons that were written.
  std::uint32_t Count() const { return count_; }

 private:
  bool Fail(const std::string& why);
  bool Put(const void* data, std::size_t bytes);
  bool Flush();

  std::unique_ptr<platform::RandomAccessFile> file_;
  std::vector<unsigned char> buffer_;
  std::size_t held_ = 0;
  std::uint64_t place_ = 0;
  std::uint32_t count_ = 0;
};

/// Reads an FXV file, of either byte order.
///
/// Failure: ObjectErrorIO when the file can't be opened, is shorter than a header, has another mark
///          or other types. A record that the end of the file cuts off ends reading.
template <typename L, typename C>
class FxvPolygonReader;

template <>
class VEXG_EXPORT FxvPolygonReader<std::int32_t, std::uint32_t> final
    : public PolygonReader<std::int32_t, std::uint32_t> {
 public:
  /// Opens a file and reads its header; IsValid() is false when that fails.
  /// @param bufferSize  bytes that are read at once.
  explicit FxvPolygonReader(const URI& uri, unsigned bufferSize = kFxvBufferSize);
  ~FxvPolygonReader() override;

  bool Read(std::int32_t& label, Deque<bool>& holes, Deque<unsigned>& starts,
            Deque<std::uint32_t>& coordinates) override;
  bool Read(std::int32_t& label, Array<bool>& holes, Array<unsigned>& starts,
            Array<std::uint32_t>& coordinates) override;
  using PolygonReader::Read;
  /// Polygons of the file, as its header has it.
  unsigned Count() const override { return count_; }

 private:
  bool Get(void* data, std::size_t bytes);
  std::uint32_t Ordered(std::uint32_t value) const;
  void OrderAll(Array<std::uint32_t>& values) const;

  std::unique_ptr<platform::RandomAccessFile> file_;
  std::vector<unsigned char> buffer_;
  std::uint64_t size_ = 0;
  std::uint64_t bufferPlace_ = 0;  // of the first byte held
  std::size_t held_ = 0;
  std::uint64_t place_ = 0;
  std::uint32_t count_ = 0;
  bool isSwapped_ = false;
};

}  // namespace lumo
