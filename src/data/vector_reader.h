#pragma once

#include <tuple>

#include "data/data_connection.h"
#include "data/data_errors.h"
#include "raster/pixel_types.h"

namespace lumo {

/// Answers for a vector source what needs no coordinate type. See data_connection.h for threads and
/// failure.
class VEXG_EXPORT BasicVectorReader {
 public:
  using PointerRoot = BasicVectorReader;

  /// True when the reader is usable.
  virtual bool OpBool() = 0;
  /// The plug-in's own number for this kind of reader; nothing here reads it.
  virtual std::int32_t ReaderType() = 0;
  /// The description of the source.
  virtual lumo::VectorDef VectorDef() = 0;
  /// Vertices of all features together.
  virtual std::int32_t Vertices() = 0;
  /// Mode 0: change the vertices of a feature; 1: append features.
  virtual bool CanWriteGeometry(std::int32_t mode) = 0;
  virtual ~BasicVectorReader() = default;
};

/// The face of a vector source for coordinate type T, one of EightTypes. Features count from 0;
/// each has one or more parts (the rings of polygons, outer and inner, each closed), and a vertex
/// is a pair x, y in the source's coordinate system.
///
/// All buffers belong to the caller. GetFeatureInfo and Vertices say how large they have to be:
///
///     std::int32_t kind = 0;
///     unsigned parts = 0, count = 0;
///     if (!reader->GetFeatureInfo(feature, &kind, &parts, &count)) return false;
///     std::vector<double> vertices(2 * count);
///     std::vector<unsigned> partEnds(parts);
///     if (!reader->ReadGeometryT1(feature, vertices.data(), partEnds.data())) return false;
template <typename T>
class VectorReader : public BasicVectorReader {
 public:
  /// @param connection  the owner, which outlives the reader.
  explicit VectorReader(VectorDataConnection* connection) : connection_(connection) {}

  /// The connection that owns this reader.
  virtual VectorDataConnection* Connection() { return connection_; }

  /// Reads all features, one after the other.
  /// @param vertices     2 * Vertices() elements.
  /// @param featureEnds  one entry for each feature: the number of vertices up to its end.
  virtual bool ReadGeometryT2(T* vertices, unsigned* featureEnds) = 0;
  /// Reads one feature.
  /// @param vertices  2 * its vertices.
  /// @param partEnds  one entry for each part: the number of the feature's vertices up to its end.
  virtual bool ReadGeometryT1(std::int32_t feature, T* vertices, unsigned* partEnds) = 0;
  /// Replaces the vertices of a feature, whose parts and their sizes stay. Buffers as for
  /// ReadGeometryT1.
  virtual bool WriteGeometryT1(std::int32_t feature, const T* vertices,
                               const unsigned* partEnds) = 0;
  /// Appends a feature of one part.
  /// @param geometry  a VectorGeometry.
  /// @param vertices  2 * `vertexCount` elements.
  virtual bool AppendGeometry(std::int32_t geometry, std::int32_t vertexCount,
                              const T* vertices) = 0;
  /// The VectorGeometry of a feature, its number of parts, its number of vertices.
  virtual bool GetFeatureInfo(std::int32_t feature, std::int32_t* geometry, unsigned* parts,
                              unsigned* vertexCount) = 0;

 protected:
  VectorDataConnection* connection_;
};

template <typename T>
using VectorReaderPtr = Pointer<VectorReader<T>>;

/// Holds the one typed reader of a source.
/// Failure: one without a reader has VectorReaderErrorInvalid stored, and type code 0.
class VEXG_EXPORT VectorReaderDispatch : public ErrorState {
 public:
  VectorReaderDispatch() { SetErrorState(VectorReaderErrorInvalid()); }

  template <typename T>
  explicit VectorReaderDispatch(const VectorReaderPtr<T>& reader)
      : basic_(reader), dataType_(reader ? kDataTypeOf<T> : 0) {
    std::get<VectorReaderPtr<T>>(readers_) = reader;
    if (!reader) SetErrorState(VectorReaderErrorInvalid());
  }

  /// Code of the coordinate type of the reader; 0 when there is none.
  unsigned DataType() const { return dataType_; }

  /// The reader, when it is one of coordinate type T; else empty.
  template <typename T>
  const VectorReaderPtr<T>& Get() const {
    return std::get<VectorReaderPtr<T>>(readers_);
  }

  /// The reader whatever its type; empty when there is none.
  const Pointer<BasicVectorReader>& GetBasic() const { return basic_; }

 private:
  template <typename... Ts>
  static std::tuple<VectorReaderPtr<Ts>...> NoReaders(TypeList<Ts...>);

  decltype(NoReaders(EightTypes{})) readers_;  // at most one is not empty
  Pointer<BasicVectorReader> basic_;           // the same one
  unsigned dataType_ = 0;
};

}  // namespace lumo
