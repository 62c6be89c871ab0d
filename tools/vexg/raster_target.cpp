#include "raster_target.h"

#include <algorithm>

#include <CLI/CLI.hpp>

#include "data/format_table.h"
#include "option_values.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kCloseStep = "close.target";

/// The format that the ending of a name stands for; empty for none.
std::string FormatOfName(const std::string& name) {
  static const std::pair<const char*, const char*> kEndings[] = {
      {".tif", "TIFF"},  {".tiff", "TIFF"}, {".png", "PNG"},      {".jpg", "JPEG"},
      {".jpeg", "JPEG"}, {".bmp", "BMP"},   {".gif", "GIF"},      {".img", "Erdas"},
      {".ntf", "NITF"},  {".nitf", "NITF"}, {".jp2", "JPEG2000"}, {".dat", "ORVA"},
      {".bin", "ORVA"},  {".orva", "ORVA"}};
  const std::string ending =
      CLI::detail::to_lower(std::filesystem::path(name).extension().string());
  for (const auto& [known, format] : kEndings) {
    if (ending == known) return format;
  }
  return {};
}

/// Formats whose files are smaller than their pixels by nobody knows how much.
bool Compresses(const std::string& format) {
  static const char* const kFormats[] = {"JPEG", "PNG", "GIF", "JPEG2000", "MrSID"};
  return std::find(std::begin(kFormats), std::end(kFormats), format) != std::end(kFormats);
}

}  // namespace

void TargetOptions::AddTo(CLI::App& app, const std::string& meaning) {
  app.add_option("output", output, meaning)->type_name("OUT")->required();
  app.add_option("--format", format,
                 "Key of its format, see vexg formats; by default from its name's ending")
      ->type_name("KEY");
  app.add_flag("--overwrite", overwrite, "Replace files that are there");
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

std::uint64_t BytesInFile(const std::string& format, unsigned dataType, std::uint64_t samples,
                          std::uint64_t lines, unsigned bands) {
  return Compresses(format) ? 0 : samples * lines * bands * DataTypeBytes(dataType);
}

JobWriterCommand& AddCreate(JobDraft& draft, const TargetPlace& place, const String& like) {
  JobWriterCommand& create = draft.Open("target", "CreateRasterCommand");
  create.AddInput("ConnStr", ConnStrings({String(AbsoluteName(place.file))}));
  create.AddVariableInput("SrcURI", like);
  create.AddInput("Format", String(place.format));
  return create;
}

void AddCloseTarget(JobDraft& draft) {
  draft.Close(kCloseStep, "$target");
}

void CheckClosed(const JobResults& results) {
  const String fault = results.Find(kCloseStep).returns.Find("Fault");
  if (fault.GetLength() != 0) throw HostError(kExitFailed, fault.ToUTF8());
}

RasterInfo CheckMade(JobSession& session, const TargetPlace& made, const std::string& shown,
                     const RasterInfo& wanted) {
  JobDraft draft;
  AddOpen(draft, "made", {made.file, made.format});
  AddQuery(draft, "made", "$made");
  draft.Close("close", "$made");
  RasterInfo info = ReadInfo(session.Run(draft), "made");
  if (info.samples != wanted.samples || info.lines != wanted.lines || info.bands != wanted.bands ||
      info.dataType != wanted.dataType) {
    throw HostError(kExitFailed, shown + ": the format " + made.format +
                                     " did not keep the raster's size, bands or pixel type");
  }
  return info;
}

ProgressReportPtr ProgressOfStep(const JobSession& session, const JobDraft& draft,
                                 const std::string& name) {
  std::size_t step = 0;
  while (draft.GetSteps()[step].name != String(name)) ++step;
  return ProgressReportPtr(new StepProgress(session.GetProgress(), step, draft.GetSteps().size()));
}

}  // namespace lumo::host
