#pragma once

#include <string>

#include "foundation/string.h"
#include "geometry/polygon_file.h"

namespace lumo {

/// The FXV file of polygons: a header of kFxvHeaderSize bytes with a mark and the number of
/// polygons, then a record for each polygon. See docs/file-formats.md.
inline constexpr unsigned kFxvHeaderSize = kPolygonHeaderSize;

/// The default of the bytes that the reader and the writer hold of a file.
inline constexpr unsigned kFxvBufferSize = kPolygonBufferSize;

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
    : public PolygonFileWriter<std::int32_t> {
 public:
  /// Creates a file, or empties the one that is there.
  /// @param bufferSize  bytes that are gathered before they are written.
  explicit FxvPolygonWriter(const URI& uri, unsigned bufferSize = kFxvBufferSize);
};

/// Reads an FXV file, of either byte order.
///
/// Failure: ObjectErrorIO when the file can't be opened, is shorter than a header, has another mark
///          or other types. A record that the end of the file cuts off ends reading.
template <typename L, typename C>
class FxvPolygonReader;

template <>
class VEXG_EXPORT FxvPolygonReader<std::int32_t, std::uint32_t> final
    : public PolygonFileReader<std::int32_t> {
 public:
  /// Opens a file and reads its header; IsValid() is false when that fails.
  /// @param bufferSize  bytes that are read at once.
  explicit FxvPolygonReader(const URI& uri, unsigned bufferSize = kFxvBufferSize);
};

}  // namespace lumo
