#pragma once

#include <optional>
#include <string>
#include <vector>

#include "data/vector_records.h"
#include "foundation/run_controls.h"
#include "geometry/geometry.h"

namespace lumo {

// Records of vector files, chosen by layer and by the value of a field.
//
// Failure: false or empty, with the fault set: the file, and what is wrong with it.

/// Opens a file of records.
VEXG_EXPORT VectorRecordSourcePtr OpenShapes(const std::string& path);

/// The layers that a text names: one, by its name or else its number from 0; all for no text.
/// @return none, with the fault set, when there is no such layer.
VEXG_EXPORT std::vector<std::uint32_t> FindLayers(VectorRecordSource& source,
                                                  const std::string& text);

/// Chooses records by the value of a field.
class VEXG_EXPORT RecordFilter {
 public:
  /// Reads "FIELD=VALUE"; no text chooses all records. Numbers are equal by value.
  /// @return false when the layer has no such field, or the field can't have such a value.
  bool Set(const VectorLayer& layer, const std::string& text);
  /// True for a record that is chosen.
  bool Accepts(const VectorRecord& record) const;

 private:
  std::optional<std::size_t> field_;
  VectorValue value_;
};

/// True when two names of fields are the same but for the case of their letters.
VEXG_EXPORT bool AreSameName(const std::string& a, const std::string& b);

/// The place of a field of a layer by its name, else by its name in letters of another case.
/// @return none, with the fault set, when there is no such field.
VEXG_EXPORT std::optional<std::size_t> FindField(const VectorLayer& layer, const std::string& name);

/// The kind of geometry of a record.
/// @return none, with the fault set, for a record whose shapes are of several kinds, and for one
///         with a coordinate that is not a number.
VEXG_EXPORT std::optional<GeometryKind> KindOf(const VectorRecord& record);

/// Says which records of a file are read.
struct ShapeSelection {
  std::uint32_t layer = 0;  ///< from 0
  std::string where;        ///< see RecordFilter
  std::string field;        ///< whose numbers are read too; records without one are left out
};

/// The text of the value of a field; empty for none. Whole numbers have no point.
VEXG_EXPORT std::string TextOf(const VectorValue& value);

/// Reads all shapes that are selected, with the texts of one of their fields; records without a
/// shape, or a value there, are left out.
/// @param texts  [out] for each record.
VEXG_EXPORT GeometryPtr ReadNamedShapes(VectorRecordSource& source, const ShapeSelection& selection,
                                        const IPC& ipc, std::vector<std::string>& texts);

/// Reads all shapes that are selected; records without a shape are left out.
/// @param ipc     its abort flag ends the reading.
/// @param values  [out] for each record, the number in the selected field, when there is one.
VEXG_EXPORT GeometryPtr ReadShapes(VectorRecordSource& source, const ShapeSelection& selection,
                                   const IPC& ipc, std::vector<double>* values = nullptr);

/// The fault of a file of shapes, with its name in front where that is missing.
VEXG_EXPORT std::string FaultOfShapes(const std::string& path);

}  // namespace lumo
