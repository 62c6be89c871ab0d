#include "georef/georef_text.h"

#include <iomanip>
#include <string>

#include "foundation/text_form.h"
#include "georef/georef_cache.h"
#include "georef/std_rpc_georef.h"

namespace lumo {
namespace {

constexpr int kFractionDigits = 16;
constexpr const char* kTypeWords[] = {"Unknown", "Std", "Rpc", "StdRpc"};

/// 0 for a word that names no type.
std::uint32_t TypeOf(const String& word) {
  for (std::uint32_t type = GeoRef::kStd; type <= GeoRef::kStdRpc; ++type) {
    if (word == kTypeWords[type]) return type;
  }
  return GeoRef::kUnknown;
}

GeoRef* MakeModel(std::uint32_t type) {
  switch (type) {
    case GeoRef::kStd:
      return new StdGeoRef;
    case GeoRef::kRpc:
      return new RpcGeoRef;
    case GeoRef::kStdRpc:
      return new StdRpcGeoRef;
    default:
      return nullptr;
  }
}

}  // namespace

void WriteNumbers(std::ostream& out, std::span<const double> values) {
  const std::ios::fmtflags flags = out.flags();
  const std::streamsize precision = out.precision(kFractionDigits);
  out << std::scientific;
  for (const double value : values) out << value << ' ';
  out.flags(flags);
  out.precision(precision);
}

void ReadNumbers(std::istream& in, std::span<double> values) {
  for (double& value : values) ReadNumber(in, value);
}

String ReadUpToBar(std::istream& in) {
  std::string text;
  std::getline(in, text, '|');
  if (in.eof()) in.setstate(std::ios::failbit);
  std::istringstream trimmed(text);
  return ReadWholeText(trimmed);
}

void GeoRefCache::Write(std::ostream& out) const {
  const MapRect extent = Extent();
  const double values[] = {CenterLatitude(), extent.minX, extent.minY, extent.maxX, extent.maxY};
  WriteNumbers(out, values);
}

void GeoRefCache::Read(std::istream& in) {
  double values[5];
  ReadNumbers(in, values);
  SetCenterLatitude(values[0]);
  SetExtent({values[1], values[2], values[3], values[4]});
}

void GeoRef::Write(std::ostream& out) const {
  const double grid[] = {pixelSizeX_, pixelSizeY_, tieMapX_, tieMapY_, tiePixelX_, tiePixelY_};
  WriteNumbers(out, grid);
  out << samples_ << ' ' << lines_ << ' ';
  WriteNumbers(out, {&rotation_, 1});
  String text;
  coordSys_.ToString(text);
  out << text.ToUTF8() << "| ";
}

void GeoRef::Read(std::istream& in) {
  double grid[6];
  ReadNumbers(in, grid);
  pixelSizeX_ = grid[0];
  pixelSizeY_ = grid[1];
  tieMapX_ = grid[2];
  tieMapY_ = grid[3];
  tiePixelX_ = grid[4];
  tiePixelY_ = grid[5];
  ReadNumber(in, samples_);
  ReadNumber(in, lines_);
  ReadNumber(in, rotation_);
  const String text = ReadUpToBar(in);
  if (in.fail() || text.GetLength() == 0) {
    coordSys_ = CoordSys();
  } else {
    coordSys_.SetFromString(text);
  }
}

std::ostream& operator<<(std::ostream& out, const GeoRef& geoRef) {
  const std::uint32_t type = geoRef.GetType();
  out << kTypeWords[type <= GeoRef::kStdRpc ? type : GeoRef::kUnknown] << ' ';
  geoRef.Write(out);
  return out;
}

std::ostream& operator<<(std::ostream& out, const GeoRefPtr& geoRef) {
  if (geoRef.IsNull()) return out << kTypeWords[GeoRef::kUnknown] << ' ';
  return out << *geoRef;
}

std::istream& operator>>(std::istream& in, GeoRef& geoRef) {
  const std::uint32_t type = TypeOf(ReadWordText(in));
  if (type == GeoRef::kUnknown || type != geoRef.GetType()) {
    in.setstate(std::ios::failbit);
  } else {
    geoRef.Read(in);
  }
  return in;
}

std::istream& operator>>(std::istream& in, GeoRefPtr& geoRef) {
  geoRef.Reset(MakeModel(TypeOf(ReadWordText(in))));
  if (geoRef.IsNull()) return in;
  geoRef->Read(in);
  if (in.fail()) geoRef.Reset();
  return in;
}

}  // namespace lumo
