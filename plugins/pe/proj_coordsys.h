#pragma once

#include "definition.h"
#include "georef/coordsys_impl.h"

namespace lumo::pe {

/// A coordinate system whose mathematics is PROJ's.
class ProjCoordSys final : public CoordSysImpl {
 public:
  explicit ProjCoordSys(DefinitionPtr definition) : definition_(std::move(definition)) {}

  void ToString(String& text) const override { text = definition_->info.text; }
  std::int32_t Type() const override { return definition_->type; }
  void Unproject(Array<double>& points) const override;
  void MapToGeo(double& x, double& y, double& longitude, double& latitude) const override;
  void Project(Array<double>& points) const override;
  void GeoToMap(double longitude, double latitude, double& x, double& y) const override;
  void GeoTransform(const String& target, Array<double>& points, Array<double>& second,
                    const Array<double>& extent) const override;
  const CoordSysInfo* Info() const override { return &definition_->info; }
  std::int32_t Code() const override { return definition_->code; }
  void AddRef() override { ++count_; }
  std::int32_t Release() override { return --count_; }

 private:
  const DefinitionPtr definition_;
  std::int32_t count_ = 0;
};

}  // namespace lumo::pe
