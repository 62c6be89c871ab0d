#include "rasters/raster_target.h"

#include <algorithm>

#include "data/format_table.h"
#include "foundation/text_case.h"
#include "options/option_values.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// The format that the ending of a name stands for; empty for none.
std::string FormatOfName(const std::string& name) {
  static const std::pair<const char*, const char*> kEndings[] = {
      {".tif", "TIFF"},  {".tiff", "TIFF"}, {".png", "PNG"},      {".jpg", "JPEG"},
      {".jpeg", "JPEG"}, {".bmp", "BMP"},   {".gif", "GIF"},      {".img", "Erdas"},
      {".ntf", "NITF"},  {".nitf", "NITF"}, {".jp2", "JPEG2000"}, {".dat", "ORVA"},
      {".bin", "ORVA"},  {".orva", "ORVA"}};
  const std::string ending = LowerCase(std::filesystem::path(name).extension().string());
  for (const auto& [known, format] : kEndings) {
    if (ending == known) return format;
  }
  return {};
}

/// Formats whose files hold every pixel as it is. Not TIFF: blocks of zeros take no room there.
bool HoldsAllPixels(const std::string& format) {
  static const char* const kFormats[] = {"ORVA", "BMP", "NITF"};
  return std::find(std::begin(kFormats), std::end(kFormats), format) != std::end(kFormats);
}

}  // namespace

void TargetOptions::AddTo(OptionSet& line, const std::string& meaning) {
  Option option = line.Add("output", output, meaning).IsFile("OUT");
  if (isRequired) option.Required();
  AddFormatTo(line);
}

void TargetOptions::AddFormatTo(OptionSet& line) {
  line.Add("--format", format,
           "Key of its format, see vexg formats; by default from its name's ending")
      .Shows("KEY");
  line.Add("--strict", strict,
           "Fail, and make nothing, where the format does not keep all that is put in");
}

std::string ChooseFormat(const TargetOptions& target) {
  if (target.format.empty()) {
    const std::string format = FormatOfName(target.output);
    if (!format.empty()) return format;
    throw HostError(kExitUsage, target.output +
                                    ": the name's ending tells no format; give --format, one "
                                    "of vexg formats");
  }
  return FormatKey("--format", target.format);
}

std::uint64_t BytesInFile(const std::string& format, const RasterInfo& raster) {
  const std::uint64_t pixels = std::uint64_t{raster.samples} * raster.lines;
  return HoldsAllPixels(format) ? pixels * raster.bands * DataTypeBytes(raster.dataType) : 0;
}

JobWriterCommand& AddCreate(JobDraft& draft, const TargetPlace& place, const String& like,
                            const char* details, const std::vector<double>& noData) {
  JobWriterCommand& create = draft.Open("target", "CreateRasterCommand");
  create.AddInput("ConnStr", ConnStrings({String(AbsoluteName(place.file))}));
  create.AddVariableInput("SrcURI", like);
  create.AddInput("Format", String(place.format));
  create.AddInput("Details", String(details));
  if (!noData.empty()) {
    Array<double> values{ArrayDims(static_cast<unsigned>(noData.size()))};
    std::copy(noData.begin(), noData.end(), values.begin());
    create.AddInput("NoDataValue", values);
  }
  return create;
}

void AddCloseTarget(JobDraft& draft) {
  draft.Close(kCloseTargetStep, "$target");
}

void CheckClosed(const JobResults& results, const char* step) {
  const String fault = results.Find(String(step)).returns.Find("Fault");
  if (fault.GetLength() != 0) throw HostError(kExitFailed, fault.ToUTF8());
}

void CheckSame(const RasterInfo& made, const RasterInfo& wanted, const std::string& format,
               const std::string& shown) {
  if (made.samples != wanted.samples || made.lines != wanted.lines || made.bands != wanted.bands ||
      made.dataType != wanted.dataType) {
    throw HostError(kExitFailed, shown + ": the format " + format +
                                     " did not keep the raster's size, bands or pixel type");
  }
}

ProgressReportPtr ProgressOfSteps(const JobSession& session, const JobDraft& draft,
                                  const std::string& first, const std::string& last) {
  const auto& steps = draft.GetSteps();
  const auto find = [&](const std::string& name) {
    std::size_t step = 0;
    while (steps[step].name != String(name)) ++step;
    return step;
  };
  return ProgressReportPtr(
      new StepProgress(session.GetProgress(), find(first), find(last), steps.size()));
}

ProgressReportPtr ProgressOfStep(const JobSession& session, const JobDraft& draft,
                                 const std::string& name) {
  return ProgressOfSteps(session, draft, name, name);
}

}  // namespace lumo::host
