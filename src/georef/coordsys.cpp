#include "georef/coordsys.h"

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstring>

#include "georef/coordsys_factory.h"

namespace lumo {
namespace {

constexpr int kWgs84Code = 4326;

std::mutex gCoordSysMutex;
std::atomic<std::uint32_t> gIdentifiers{0};

const CoordSysInfo& EmptyInfo() {
  static const auto& info = *new CoordSysInfo;
  return info;
}

bool SameText(const String& a, const String& b) {
  return (a.GetLength() == 0 && b.GetLength() == 0) || a == b;
}

}  // namespace

std::mutex* gpCoordSysMutex = &gCoordSysMutex;

CoordSys::CoordSys() : identifier_(++gIdentifiers) {}

CoordSys::CoordSys(const CoordSys& other) : CoordSys() {
  *this = other;
}

CoordSys& CoordSys::operator=(const CoordSys& other) {
  if (this == &other || (impl_ == nullptr && other.impl_ == nullptr)) return *this;
  const std::lock_guard lock(*gpCoordSysMutex);
  CoordSysImpl* const shared = other.impl_;
  if (shared != nullptr) shared->AddRef();
  ReleaseLocked();
  impl_ = shared;
  return *this;
}

CoordSys::~CoordSys() {
  if (impl_ == nullptr) return;
  const std::lock_guard lock(*gpCoordSysMutex);
  ReleaseLocked();
}

void CoordSys::ReleaseLocked() {
  CoordSysImpl* const held = impl_;
  impl_ = nullptr;
  if (held == nullptr || held->Release() >= 1) return;
  if (CoordSysFactory::GetFactory() != nullptr && fp_Esri_Pe_Release != nullptr) {
    fp_Esri_Pe_Release(held);
  }
}

template <typename Make>
bool CoordSys::Remake(Make&& make) {
  const std::lock_guard lock(*gpCoordSysMutex);
  ReleaseLocked();
  if (CoordSysFactory::GetFactory() == nullptr) return false;
  impl_ = make();
  if (impl_ == nullptr) return false;
  impl_->AddRef();
  return true;
}

bool CoordSys::SetFromString(const String& text) {
  return Remake([&]() -> CoordSysImpl* {
    return fp_Esri_Pe_CreateFromString != nullptr ? fp_Esri_Pe_CreateFromString(text) : nullptr;
  });
}

bool CoordSys::SetGeographic() {
  return Remake([]() -> CoordSysImpl* {
    return fp_Esri_Pe_CreateFromCode != nullptr ? fp_Esri_Pe_CreateFromCode(kWgs84Code) : nullptr;
  });
}

void CoordSys::ToString(String& text) const {
  text = "";
  if (impl_ != nullptr) impl_->ToString(text);
}

std::int32_t CoordSys::Type() const {
  return impl_ != nullptr ? impl_->Type() : 0;
}

const CoordSysInfo* CoordSys::Info() const {
  return impl_ != nullptr ? impl_->Info() : &EmptyInfo();
}

bool CoordSys::IsEqual(const CoordSys& other) const {
  const CoordSysInfo& a = *Info();
  const CoordSysInfo& b = *other.Info();
  if (a.name.GetLength() != 0 && b.name.GetLength() != 0 && a.name.CompareNoCase(b.name) == 0) {
    return true;
  }
  if (!SameText(a.unitName, b.unitName)) return false;
  if (!std::equal(std::begin(a.parameters), std::end(a.parameters), std::begin(b.parameters))) {
    return false;
  }
  const String unknown("D_Unknown");
  return a.datumName.CompareNoCase(unknown) == 0 || b.datumName.CompareNoCase(unknown) == 0 ||
         a.datumName.CompareNoCase(b.datumName) == 0;
}

bool CoordSys::SameDatum(const CoordSys& other) const {
  return SameText(Info()->datumName, other.Info()->datumName);
}

void CoordSys::Unproject(Array<double>& points) const {
  if (Type() != 0) impl_->Unproject(points);
}

void CoordSys::Project(Array<double>& points) const {
  if (Type() != 0) impl_->Project(points);
}

void CoordSys::MapToGeo(double x, double y, double& longitude, double& latitude) const {
  longitude = HUGE_VAL;
  latitude = HUGE_VAL;
  if (Type() != 0) impl_->MapToGeo(x, y, longitude, latitude);
}

void CoordSys::GeoTransform(const CoordSys& other, Array<double>& points,
                            const Array<double>& extent) const {
  if (impl_ == nullptr || other.impl_ == nullptr) return;
  String target;
  other.ToString(target);
  Array<double> second;
  const std::lock_guard lock(*gpCoordSysMutex);
  impl_->GeoTransform(target, points, second, extent);
}

}  // namespace lumo
