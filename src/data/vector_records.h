#pragma once

#include <cstdint>
#include <string>
#include <variant>
#include <vector>

#include "data/vector_def.h"
#include "foundation/pointer.h"
#include "georef/coordsys.h"

// Records of shapes with fields, one after the other, as vector files of every GIS hold them. They
// stand beside VectorReader, which knows shapes without fields.
//
//     const VectorRecordSourcePtr file = GetVectorRecordFactory()->Open(path);
//     if (!file || !file->Begin(0, nullptr)) return false;
//     for (VectorRecord record; file->Next(record);) Use(record);
//
// Threads: one at a time; a source and a sink stay on the thread that made them or move with it.
// Failure: false or empty, with the reason set by SetFault.

namespace lumo {

/// Types of fields.
enum class VectorFieldType : std::int32_t { kInteger = 1, kReal = 2, kText = 3 };

/// A column of a layer.
struct VectorField {
  std::string name;
  VectorFieldType type = VectorFieldType::kText;
};

/// The value of a field; none where a record has none.
using VectorValue = std::variant<std::monostate, std::int64_t, double, std::string>;

/// The description of a layer.
struct VectorLayer {
  std::string name;
  VectorGeometry geometry =
      VectorGeometry::kUnknown;  ///< unknown where shapes are of several kinds
  CoordSys coordSys;
  std::vector<VectorField> fields;
  std::int64_t records = -1;  ///< how many there are; below 0 when it isn't known
  MapRect bounds;             ///< of all records, zeros when it isn't known
  bool hasShapes = true;      ///< a new file gets the shapes, not only the fields
  bool isMulti = false;       ///< polygons of a new file may have several outer rings
};

/// One record. Polygons are lists of rings, each closed; an outer ring begins a polygon, whose
/// holes follow it.
struct VEXG_EXPORT VectorRecord {
  std::int64_t id = -1;  ///< below 0: none
  VectorGeometry geometry = VectorGeometry::kUnknown;
  std::vector<double> coordinates;      ///< x, y of all vertices
  std::vector<std::uint32_t> partEnds;  ///< for each part, the number of vertices up to its end
  std::vector<unsigned char> holes;     ///< for each part, 1 for a hole
  std::vector<VectorValue> values;      ///< for each field

  /// Empties the record; memory stays.
  void Clear();
};

/// A file of layers that is read.
class VEXG_EXPORT VectorRecordSource {
 public:
  using PointerRoot = VectorRecordSource;

  /// Layers of the file.
  virtual std::uint32_t LayerCount() = 0;
  /// The description of a layer, from 0.
  virtual VectorLayer Layer(std::uint32_t layer) = 0;
  /// Begins to read a layer.
  /// @param box  gives only records whose bounds touch it; null for all.
  virtual bool Begin(std::uint32_t layer, const MapRect* box) = 0;
  /// Reads the next record. @return false at the end, and, with the fault set, on a failure.
  virtual bool Next(VectorRecord& record) = 0;
  virtual ~VectorRecordSource() = default;
};

using VectorRecordSourcePtr = Pointer<VectorRecordSource>;

/// A file of layers that is made, one layer after the other. It isn't there before Close says so;
/// one that is destroyed before leaves nothing.
class VEXG_EXPORT VectorRecordSink {
 public:
  using PointerRoot = VectorRecordSink;

  /// Writes a record with a value for each field of the layer.
  virtual bool Write(const VectorRecord& record) = 0;
  /// Completes the file, and puts it in its place. Nothing is written after that.
  virtual bool Close() = 0;
  virtual ~VectorRecordSink() = default;
  /// Ends the layer, and begins another one. False for a format whose files hold one layer.
  virtual bool NextLayer(const VectorLayer& layer) = 0;
};

using VectorRecordSinkPtr = Pointer<VectorRecordSink>;

/// Opens and makes files of records; a plug-in supplies one. Threads: any, several at once.
class VEXG_EXPORT VectorRecordFactory {
 public:
  /// The endings, each with its dot, by which a path chooses the format of a new file.
  virtual std::vector<std::string> SinkEndings() = 0;
  /// Opens a file; empty when it is of no format that the plug-in knows.
  virtual VectorRecordSourcePtr Open(const std::string& path) = 0;
  /// Makes a file in the format of its ending. What is there already is replaced at its Close.
  virtual VectorRecordSinkPtr Create(const std::string& path, const VectorLayer& layer) = 0;
  virtual ~VectorRecordFactory() = default;
};

/// The entry point that a plug-in exports, without decoration, as "CreateVectorRecordFactory". The
/// factory lives until the process ends.
using CreateVectorRecordFactoryFunction = VectorRecordFactory*();

/// The factory of the plug-in that ships with the library. Null when it can't be loaded; the fault
/// text then says why. Any thread.
VEXG_EXPORT VectorRecordFactory* GetVectorRecordFactory();

}  // namespace lumo
