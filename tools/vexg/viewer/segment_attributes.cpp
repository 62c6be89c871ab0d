#include "viewer/segment_attributes.h"

#include <atomic>

#include "foundation/thrown.h"
#include "fx/attribute_names.h"
#include "fx/region_attributes.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// Adds the values of a region in a file. False where the region isn't there.
bool AddValues(const std::string& file, AttributeKind kind, std::uint32_t label, Json& list) {
  const RegionAttributesFile<float> store(URI(String(file)), false);
  if (!store.IsValid() || label >= const_cast<RegionAttributesFile<float>&>(store).RegionCount()) {
    return false;
  }
  if (!store.RegionExists(label, 0)) return false;
  for (unsigned band = 0; band < store.Bands(); ++band) {
    unsigned attribute = 0;
    for (const AttributeName& name : NamesOf(kind)) {
      const double value = store.Value(label, band, attribute++);
      list.push_back({{"name", ColumnName(kind, name, band)}, {"value", NumberAsJson(value)}});
    }
  }
  return true;
}

}  // namespace

SegmentAttributes::SegmentAttributes(std::shared_ptr<const ViewedRaster> scene,
                                     std::shared_ptr<const ViewedRaster> labels, WorkFolder& folder)
    : scene_(std::move(scene)), labels_(std::move(labels)), name_(folder.NewPath("")) {}

SegmentAttributes::~SegmentAttributes() {
  std::atomic_ref(abort_).store(1);
  if (thread_.joinable()) thread_.join();
}

void SegmentAttributes::Compute() {
  AttributeRequest request;
  request.spectral = request.shape = true;
  request.isNarrow = DataTypeBytes(labels_->Code()) < 4;
  request.TakePixelSize(labels_->GetGeoRef().IsNull() ? scene_->GetGeoRef() : labels_->GetGeoRef());
  std::string fault;
  try {
    JobDraft draft;
    RasterChain scene(draft);
    scene_->AddTo(scene, 0, "scene_");
    RasterChain labels(draft);
    labels_->AddTo(labels, 0, "labels_");
    AddAttributes(draft, request, {scene.GetTop(), labels.GetTop()}, FilesOf(request, name_), "");
    labels.Close();
    scene.Close();
    scene_->GetDoor().Run(draft, &abort_, &progress_);
  } catch (...) {
    fault = DescribeException();
  }
  const std::lock_guard lock(mutex_);
  state_ = fault.empty() ? State::kDone : State::kFailed;
  fault_ = fault;
}

Json SegmentAttributes::Find(std::uint32_t label) {
  const std::lock_guard lock(mutex_);
  if (state_ == State::kIdle) {
    state_ = State::kRuns;
    thread_ = std::thread([this] { Compute(); });
  }
  if (state_ == State::kRuns) {
    return {{"progress", std::atomic_ref(progress_).load(std::memory_order_relaxed)}};
  }
  if (state_ == State::kFailed) return {{"fault", fault_}};
  Json list = Json::array();
  const bool isThere = AddValues(name_ + ".spectral.fxa", AttributeKind::kSpectral, label, list);
  AddValues(name_ + ".shape.fxa", AttributeKind::kShape, label, list);
  if (!isThere) return {{"fault", "the segment has no pixel that counts"}};
  return {{"label", label}, {"attributes", list}};
}

}  // namespace lumo::host
