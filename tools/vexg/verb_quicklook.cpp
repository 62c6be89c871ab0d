#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>

#include "block_reader.h"
#include "output_file.h"
#include "palette_reading.h"
#include "picture_writer.h"
#include "quicklook_picture.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  SourceOptions source;
  RasterJobOptions job;
  std::string output;
  std::string bands;
  std::string stretch;
  unsigned size = 1024;
  bool overwrite = false;
};

/// "none", or two percentiles.
QuicklookPicture::Stretch ParseStretch(const std::string& text) {
  QuicklookPicture::Stretch stretch;
  if (text.empty()) return stretch;
  stretch.isPercentile = text != "none";
  if (!stretch.isPercentile) return stretch;
  char* end = nullptr;
  stretch.low = std::strtod(text.c_str(), &end);
  bool isGood = end != text.c_str() && *end == ',';
  if (isGood) {
    const char* const second = end + 1;
    stretch.high = std::strtod(second, &end);
    isGood = end != second && *end == '\0' && stretch.low >= 0.0 && stretch.high <= 100.0 &&
             stretch.low < stretch.high;
  }
  if (isGood) return stretch;
  throw HostError(kExitUsage,
                  "--stretch: \"" + text + "\" is neither none nor two percentiles such as 2,98");
}

/// The bands shown: those asked for, else red, green and blue where there are three or more.
Array<unsigned> ChooseBands(const std::string& text, const RasterInfo& info) {
  std::string chosen = text;
  if (chosen.empty()) chosen = info.bands > 3 ? "2,1,0" : info.bands == 3 ? "0,1,2" : "0";
  const Array<unsigned> bands = ParseBands(chosen, info);
  if (bands.GetCount() == 1 || bands.GetCount() == 3) return bands;
  throw HostError(kExitUsage, "--bands: a picture shows one band or three");
}

JobDraft OpenDraft(const Options& options) {
  JobDraft draft;
  AddOpenWithPyramid(draft, "raster", options.source);
  AddQuery(draft, "raster", "$raster");
  return draft;
}

/// The smallest level of the pyramid that is as large as the picture; 0 for the raster itself.
unsigned ChooseLevel(const RasterInfo& info, unsigned size) {
  if (!info.hasPyramid) return 0;
  const unsigned longer = std::max(info.samples, info.lines);
  unsigned level = info.levelMax;
  while (level >= std::max(info.levelMin, 1U) && (longer >> level) < size) --level;
  const bool isThere = level >= info.levelMin && (std::min(info.samples, info.lines) >> level) != 0;
  return isThere ? level : 0;
}

/// Shows a level as a raster of its own.
JobDraft LevelDraft(const String& raster, unsigned level) {
  JobDraft draft;
  AddLevel(draft, "level", raster, level);
  AddQuery(draft, "level", "$level");
  return draft;
}

/// What the picture is made from.
struct Shown {
  unsigned level = 0;
  String raster;  ///< URI
  RasterInfo info;
};

/// The whole of the work as one document; each block has memory of its own there.
void PrintJob(const Options& options, const Shown& shown, const Array<unsigned>& bands,
              const std::vector<SubRect>& blocks) {
  JobDraft draft = OpenDraft(options);
  if (shown.level != 0) AddLevel(draft, "level", "$raster", shown.level);
  AddBlockSteps(draft, shown.level != 0 ? "$level" : "$raster", shown.info, bands, Interleave::BIP,
                blocks);
  if (shown.level != 0) draft.Close("close.level", "$level");
  draft.Close("close", "$raster");
  std::cout << draft.Write().ToUTF8() << '\n';
}

void WritePicture(const OutputFile& output, const QuicklookPicture& picture,
                  const QuicklookPicture::Bytes& bytes) {
  const auto writer =
      MakePictureWriter(output, picture.GetWidth(), picture.GetHeight(), bytes.channels);
  const std::size_t lineBytes = std::size_t{picture.GetWidth()} * bytes.channels;
  for (std::size_t y = 0; y < picture.GetHeight(); ++y)
    writer->WriteLine(&bytes.pixels[y * lineBytes]);
  writer->Close();
}

int Quicklook(const Options& options) {
  const QuicklookPicture::Stretch stretch = ParseStretch(options.stretch);
  CheckPictureName(options.output);
  OutputFile output(options.output, options.overwrite, {options.source.file});
  JobSession session(options.job);
  const JobResults opened = session.Run(OpenDraft(options));
  const String raster = opened.Find("raster").returns.Find("URI");
  output.RefuseInput(PathOf(raster));
  const RasterInfo info = ReadInfo(opened, "raster");
  const Array<unsigned> bands = ChooseBands(options.bands, info);
  Shown shown{ChooseLevel(info, options.size), raster, info};
  if (shown.level != 0) {
    const JobResults level = session.Run(LevelDraft(raster, shown.level));
    shown.raster = level.Find("level").returns.Find("PyramidURI");
    shown.info = ReadInfo(level, "level");
  }
  QuicklookPicture picture(shown.info, options.size, bands);
  const std::vector<SubRect> blocks = picture.GetBlocks();
  if (options.job.printJob) {
    PrintJob(options, shown, bands, blocks);
    return kExitSuccess;
  }
  constexpr std::uint64_t kMostChannels = 4;
  output.Begin(kMostChannels * picture.GetWidth() * picture.GetHeight());
  BlockReader reader(session, shown.raster, shown.info, options.source.file);
  reader.ReadAll(
      blocks, bands, Interleave::BIP, options.job.GetProgressStyle(),
      [&](const SubRect& block) { picture.Take(block, reader.GetPixels(), reader.GetStates()); });
  const bool inColors =
      bands.GetCount() == 1 && info.hasPalette[bands[0]] && options.stretch.empty();
  WritePicture(
      output, picture,
      inColors ? picture.Draw(ReadPalette(session, raster, bands[0])) : picture.Draw(stretch));
  output.Commit();
  return kExitSuccess;
}

const VerbRegistration registration(
    "quicklook", "Makes a picture of a raster at the size of a screen", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "A band with a palette shows its colours, unless --stretch is given. Pixels without data "
          "are transparent; in a JPEG white.\n"
          "Example: vexg quicklook scene.tif scene.png --bands 3,2,1 --stretch 1,99\n");
      options->source.AddTo(app);
      app.add_option("output", options->output, "The picture, a PNG or JPEG as its name tells")
          ->type_name("OUT.png|jpg")
          ->required();
      app.add_option("--bands", options->bands,
                     "One band, or red,green,blue; by default 2,1,0 of four bands or more, 0,1,2 "
                     "of three, else 0")
          ->type_name("B[,B,B]");
      app.add_option("--stretch", options->stretch,
                     "Percentiles of each band that become black and white, 2,98 by default; or "
                     "none, to cut values to 0 and 255")
          ->type_name("LO,HI");
      app.add_option("--size", options->size, "Pixels of the longer side at most")
          ->check(CLI::Range(1U, 16384U))
          ->capture_default_str();
      app.add_flag("--overwrite", options->overwrite, "Replace a file that is there");
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Quicklook(*options); });
    });

}  // namespace
}  // namespace lumo::host
