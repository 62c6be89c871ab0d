#pragma once

#include <map>
#include <memory>

#include "fx/attribute_forms.h"
#include "fx/label_table.h"
#include "fx/record_spool.h"
#include "fx/shape_sums.h"
#include "geometry/polygon_stream.h"
#include "tasks/process_builder.h"
#include "tasks/task.h"

namespace lumo {

/// Holds what the stage that computes shapes needs.
template <typename File>
struct SpatialSetup : Object {
  Pointer<File> file;
  PixelSize size;
  RegionParts parts = RegionParts::kTold;
  /// With kTogether: how often labels come, 2 for more than once.
  LabelTable<unsigned char> counts;
};

/// Computes the shape of the polygon in slot 0, a Polygon2DPtr<C>, and puts it into the file under
/// the label. Setup arguments: a SpatialSetup. Exists for labels of std::int32_t with coordinates
/// of std::uint32_t.
///
/// Failure: TaskErrorBadParams without a file; TaskErrorBadArgs for a polygon that isn't valid, or
///          whose label is negative. After one the file holds some of the regions.
template <typename L, typename C, typename File>
class SpatialRegionAttributesComputeTask final : public SequentialTask {
 public:
  explicit SpatialRegionAttributesComputeTask(ArgList& setup);
  ~SpatialRegionAttributesComputeTask() override;
  bool Execute(ArgList& args) override;

 private:
  bool Write(std::uint32_t label, const ShapeSums& shape);

  ObjectPtr held_;
  SpatialSetup<File>* setup_;  // the same
  std::unique_ptr<RecordSpool> spool_;
  std::map<std::uint32_t, ShapeSums> repeated_;  // of labels that come more than once
};

/// Reads polygons and computes their shapes.
///
///     SpatialRegionAttributesComputeProcess<std::int32_t, std::uint32_t,
///                                           SpatialRegionAttributesFile>
///         process(reader, setup, ipc);
///     if (!process.RunProcess(process.kHere) || !setup->file->Close()) return false;
template <typename L, typename C, typename File>
class SpatialRegionAttributesComputeProcess final : public ProcessBuilder<Process> {
 public:
  /// @param reader  stands before its first polygon.
  SpatialRegionAttributesComputeProcess(const PolygonReaderPtr<L, C>& reader,
                                        const Pointer<SpatialSetup<File>>& setup,
                                        const IPC& ipc = {});
  ~SpatialRegionAttributesComputeProcess() override;

 private:
  struct Stages;
  std::unique_ptr<Stages> stages_;
};

extern template class VEXG_EXPORT
    SpatialRegionAttributesComputeTask<std::int32_t, std::uint32_t, SpatialRegionAttributesFile>;
extern template class VEXG_EXPORT
    SpatialRegionAttributesComputeProcess<std::int32_t, std::uint32_t, SpatialRegionAttributesFile>;

/// Puts the values of a shape into a spool of a SpatialRegionAttributesFile.
VEXG_EXPORT bool AddShape(RecordSpool& spool, std::uint32_t label, const ShapeSums::Values& values);

}  // namespace lumo
