#include "output/keeping.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <map>
#include <set>

#include <fmt/format.h>

#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

std::string StepOf(const std::string& name, const char* what) {
  return name + "." + what;
}

/// Details by their names.
std::map<std::string, std::string> SplitDetails(const std::vector<std::string>& details) {
  std::map<std::string, std::string> split;
  for (const std::string& detail : details) {
    const std::size_t equals = detail.find('=');
    if (equals != detail.npos) split[detail.substr(0, equals)] = detail.substr(equals + 1);
  }
  return split;
}

bool IsAlpha(const std::map<std::string, std::string>& details, unsigned band) {
  const auto found = details.find(fmt::format("Bands/{}/Meaning", band));
  return found != details.end() && found->second == "Alpha";
}

/// True when neither no-data values nor an alpha band mark pixels that are not valid.
bool HasPlainPixels(const RasterContents& raster) {
  const bool hasNoData = std::find(raster.info.hasNoData.begin(), raster.info.hasNoData.end(),
                                   true) != raster.info.hasNoData.end();
  const auto details = SplitDetails(raster.details);
  return !hasNoData && !IsAlpha(details, raster.info.bands - 1);
}

bool AllAreValid(const RasterContents& raster) {
  const std::uint64_t pixels = std::uint64_t{raster.info.samples} * raster.info.lines;
  return std::all_of(raster.valid.begin(), raster.valid.end(),
                     [&](std::uint64_t count) { return count == pixels; });
}

/// Counts the valid pixels of the file that was made.
/// @param withValues  also looks for values that none of them has.
JobResults CountValid(JobSession& session, const TargetPlace& place, bool withValues) {
  JobDraft draft;
  AddOpen(draft, "made", {place.file, place.format});
  AddValidityQuery(draft, "made", "$made", withValues);
  draft.Close("close", "$made");
  return session.Run(draft);
}

/// Opens the file that was made and looks at it.
RasterContents LookAt(JobSession& session, const TargetPlace& place, const std::string& shown,
                      const RasterContents& put) {
  JobDraft draft;
  AddOpen(draft, "made", {place.file, place.format});
  AddQuery(draft, "made", "$made");
  AddDetailsQuery(draft, "made", "$made");
  draft.Close("close", "$made");
  RasterContents made = ReadContents(session.Run(draft), "made");
  CheckSame(made.info, put.info, place.format, shown);
  // Where there is nothing by which a pixel could be not valid, none need be counted.
  if (put.valid.empty() || (AllAreValid(put) && HasPlainPixels(made))) return made;
  made.valid = ReadValidPixels(CountValid(session, place, false), StepOf("made", "validity"));
  return made;
}

/// Values that can stand for pixels that are not valid, up to the last band that needs one; none
/// where a band has no such value.
FillValues ChooseFill(JobSession& session, const TargetPlace& place, const RasterContents& put,
                      const RasterContents& made) {
  const auto details = SplitDetails(put.details);
  std::ptrdiff_t count = 0;
  for (unsigned band = 0; band < made.valid.size(); ++band) {
    const bool isKept = put.valid[band] == made.valid[band] || IsAlpha(details, band);
    if (!isKept) count = std::ptrdiff_t{band} + 1;
  }
  const JobResults counted = CountValid(session, place, true);
  const Map<String, String>& told = counted.Find(String(StepOf("made", "validity"))).returns;
  const auto values = ParseValue<Array<double>>(told.Find("FreeValue"));
  const auto has = ParseValue<Array<bool>>(told.Find("HasFreeValue"));
  const bool areAll = count <= std::min<std::ptrdiff_t>(values.GetCount(), has.GetCount()) &&
                      std::find(has.begin(), has.begin() + count, false) == has.begin() + count;
  return areAll ? FillValues(values.begin(), values.begin() + count) : FillValues();
}

/// A line of what the counts of valid pixels lost; empty when they are the same. An alpha band
/// counts as valid everywhere.
std::string CompareCounts(const RasterContents& put, const RasterContents& made) {
  if (made.valid.empty()) return {};
  const auto details = SplitDetails(made.details), wanted = SplitDetails(put.details);
  for (unsigned band = 0; band < made.info.bands; ++band) {
    const bool isAlpha = IsAlpha(details, band) || IsAlpha(wanted, band);
    if (isAlpha || put.valid[band] == made.valid[band]) continue;
    return fmt::format("which pixels are valid: of band {} there are {}, and were {}", band,
                       made.valid[band], put.valid[band]);
  }
  return {};
}

std::vector<double> NumbersOf(const std::string& text) {
  std::vector<double> numbers;
  const char* at = text.data();
  const char* const end = at + text.size();
  while (at != end) {
    double number = 0;
    const auto [next, fault] = std::from_chars(at, end, number);
    if (fault != std::errc()) return {};
    numbers.push_back(number);
    at = next;
    while (at != end && *at == ' ') ++at;
  }
  return numbers;
}

bool AreClose(const std::string& a, const std::string& b) {
  const std::vector<double> first = NumbersOf(a), second = NumbersOf(b);
  if (first.size() != second.size()) return false;
  for (std::size_t i = 0; i < first.size(); ++i) {
    if (!(std::abs(first[i] - second[i]) <= 1e-9 * std::max(1.0, std::abs(first[i])))) return false;
  }
  return true;
}

bool IsSameSystem(const std::string& a, const std::string& b) {
  CoordSys first, second;
  return first.SetFromString(String(a)) && second.SetFromString(String(b)) && first.IsEqual(second);
}

/// The user's name for a kind of detail; null for what is compared elsewhere.
const char* KindOf(const std::string& name) {
  static constexpr std::pair<const char*, const char*> kKinds[] = {
      {"/NoDataValue", nullptr},
      {"/Description", "the names of bands"},
      {"/Unit", "the units of bands"},
      {"/Scale", "the scales of bands"},
      {"/Offset", "the offsets of bands"},
      {"/Meaning", "the alpha band as such"},
      {"/AttributeTable", "the attribute tables of bands"}};
  if (name.starts_with("Points/")) return "the ground control points";
  if (name == "Grid") return "the sheared grid";
  if (name == "CoordSys") return "the coordinate system";
  if (name.find("Items/") == name.npos) {
    for (const auto& [ending, kind] : kKinds) {
      if (name.ends_with(ending)) return kind;
    }
  }
  return "the metadata items";
}

bool IsSameDetail(const std::string& name, const std::string& a, const std::string& b) {
  if (a == b) return true;
  if (name == "CoordSys") return IsSameSystem(a, b);
  const bool isNumber = name == "Grid" || name.starts_with("Points/") || name.ends_with("/Scale") ||
                        name.ends_with("/Offset");
  return isNumber && AreClose(a, b);
}

void CompareDetails(const MadeRaster& raster, Losses& losses) {
  const auto made = SplitDetails(raster.made.details);
  std::set<std::string> lost;
  for (const auto& [name, text] : SplitDetails(raster.put.details)) {
    const char* const kind = KindOf(name);
    // Colours are a hint for display.
    const bool isColor = name.ends_with("/Meaning") && text != "Alpha";
    if (kind == nullptr || isColor) continue;
    const auto found = made.find(name);
    const bool isKept = found != made.end() && IsSameDetail(name, text, found->second);
    if (!isKept && lost.insert(kind).second) losses.Add(kind);
  }
  const unsigned last = raster.made.info.bands - 1;
  if (IsAlpha(made, last) && !IsAlpha(SplitDetails(raster.put.details), last)) {
    losses.Add(fmt::format("band {} as such, which is an alpha band there", last));
  }
}

/// @param isFilled  bands that had no value may have one.
bool SameNoData(const RasterInfo& a, const RasterInfo& b, bool isFilled) {
  return DispatchType(TwelveTypes{}, a.dataType, [&]<typename T>() {
    const auto values = ParseValue<Array<T>>(a.noData);
    const auto others = ParseValue<Array<T>>(b.noData);
    for (unsigned band = 0; band < a.bands; ++band) {
      if (!a.hasNoData[band] && isFilled) continue;
      if (a.hasNoData[band] != b.hasNoData[band]) return false;
      if (!a.hasNoData[band] || isFilled) continue;
      if (band >= values.GetCount() || band >= others.GetCount()) return false;
      if constexpr (std::is_arithmetic_v<T>) {
        const bool bothNaN = values[band] != values[band] && others[band] != others[band];
        if (values[band] != others[band] && !bothNaN) return false;
      }
    }
    return true;
  });
}

/// True when both models put the raster's corners and its middle to the same places, to within a
/// thousandth of a pixel, in the same system.
bool IsSamePlace(const GeoRefPtr& wanted, const GeoRefPtr& made) {
  if (wanted->IsEqual(made)) return true;
  if (made.IsNull() || wanted->GetType() != made->GetType()) return false;
  const CoordSys& system = wanted->CoordinateSystem();
  const CoordSys& other = made->CoordinateSystem();
  if (system.IsEmpty() != other.IsEmpty() || (!system.IsEmpty() && !system.IsEqual(other))) {
    return false;
  }
  for (const double x : {0.0, 0.5, 1.0}) {
    for (const double y : {0.0, 0.5, 1.0}) {
      const double pixelX = x * wanted->Samples(), pixelY = y * wanted->Lines();
      double mapX = 0, mapY = 0, nextX = 0, nextY = 0, madeX = 0, madeY = 0;
      constexpr double kOff = 1e-3;
      const bool isSame =
          wanted->PixelToMap(pixelX, pixelY, mapX, mapY) &&
          wanted->PixelToMap(pixelX + 1, pixelY, nextX, nextY) &&
          made->PixelToMap(pixelX, pixelY, madeX, madeY) &&
          std::hypot(madeX - mapX, madeY - mapY) <= kOff * std::hypot(nextX - mapX, nextY - mapY);
      if (!isSame) return false;
    }
  }
  return true;
}

}  // namespace

void Losses::Settle() const {
  if (lost_.empty()) return;
  if (strict_) {
    throw HostError(kExitFailed, fmt::format("{}: not made, as the format {} does not keep {}",
                                             shown_, format_, fmt::join(lost_, "; ")));
  }
  for (const std::string& what : lost_) {
    Say(fmt::format("{}: note: the format {} does not keep {}", shown_, format_, what));
  }
}

void AddDetailsQuery(JobDraft& draft, const std::string& name, const String& raster) {
  draft.Step(StepOf(name, "details"), "QueryRasterDetailsCommand").AddInput("URI", raster);
}

void AddValidityQuery(JobDraft& draft, const std::string& name, const String& raster,
                      bool withValues) {
  JobWriterCommand& command = draft.Step(StepOf(name, "validity"), "QueryRasterValidityCommand");
  command.AddInput("URI", raster);
  command.AddInput("Values", withValues);
}

RasterContents ReadContents(const JobResults& results, const std::string& name) {
  RasterContents contents;
  contents.info = ReadInfo(results, name);
  const String text = results.Find(String(StepOf(name, "details"))).returns.Find("Details");
  for (const String& detail : ParseValue<Array<String>>(text)) {
    contents.details.push_back(detail.ToUTF8());
  }
  return contents;
}

std::vector<std::uint64_t> ReadValidPixels(const JobResults& results, const std::string& step) {
  const auto counts =
      ParseValue<Array<std::uint64_t>>(results.Find(String(step)).returns.Find("ValidPixels"));
  return {counts.begin(), counts.end()};
}

MadeRaster MakeKept(JobSession& session, const TargetPlace& place, Losses& losses, bool mayFill,
                    const std::function<RasterContents(const FillValues& noData)>& make) {
  MadeRaster raster;
  raster.put = make({});
  raster.made = LookAt(session, place, losses.GetShownName(), raster.put);
  const bool isKept = CompareCounts(raster.put, raster.made).empty();
  mayFill = mayFill && !place.LosesValues();  // where no value stays as it is
  const FillValues fill =
      isKept || !mayFill ? FillValues() : ChooseFill(session, place, raster.put, raster.made);
  if (!fill.empty()) {
    raster.put = make(fill);
    raster.isFilled = true;
    const bool isOne = std::all_of(fill.begin(), fill.end(), [&](double value) {
      return value == fill[0] || std::isnan(value);
    });
    Say(fmt::format(
        "{}: note: the format {} can't say otherwise which pixels are valid: those that "
        "are not have the no-data value {}",
        losses.GetShownName(), place.format,
        isOne ? fmt::format("{}", fill[0]) : fmt::format("{}", fmt::join(fill, ","))));
    raster.made = LookAt(session, place, losses.GetShownName(), raster.put);
  }
  const std::string lost = CompareCounts(raster.put, raster.made);
  if (!lost.empty()) losses.Add(lost);
  return raster;
}

void CompareKept(const MadeRaster& raster, Losses& losses) {
  const RasterInfo& wanted = raster.put.info;
  if (!SameNoData(wanted, raster.made.info, raster.isFilled)) {
    losses.Add("the no-data values as they are");
  }
  if (wanted.geoRef && !IsSamePlace(wanted.geoRef, raster.made.info.geoRef)) {
    losses.Add("the geo-reference as it is");
  }
  CompareDetails(raster, losses);
}

}  // namespace lumo::host
