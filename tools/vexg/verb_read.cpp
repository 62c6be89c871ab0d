#include <iostream>
#include <memory>
#include <optional>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "block_reader.h"
#include "npy_writer.h"
#include "option_values.h"
#include "output_file.h"
#include "png_writer.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Options {
  SourceOptions source;
  RasterJobOptions job;
  std::string rect;
  std::string bands;
  std::string interleave = "bip";
  std::string output;
  std::string mask;
  unsigned level = 0;
  bool overwrite = false;
};

bool EndsWith(const std::string& name, const char* ending) {
  return std::filesystem::path(name).extension() == ending;
}

/// What is read of a raster, and how it lies in the output.
struct Request {
  RasterInfo info;
  SubRect rect;
  Array<unsigned> bands;
  Interleave interleave;

  std::uint64_t GetBytes() const {
    return NpyWriter::GetBytes(info.dataType, rect, bands.GetCount());
  }
};

/// Takes in the blocks of a request.
class PixelSink {
 public:
  virtual ~PixelSink() = default;
  virtual void Write(const SubRect& rect, const unsigned char* pixels) = 0;
  virtual void Close() = 0;
};

class NpySink final : public PixelSink {
 public:
  NpySink(const OutputFile& output, const Request& request, unsigned dataType)
      : writer_(output, dataType, request.rect, request.bands.GetCount(), request.interleave) {}
  void Write(const SubRect& rect, const unsigned char* pixels) override {
    writer_.Write(rect, pixels);
  }
  void Close() override { writer_.Close(); }

 private:
  NpyWriter writer_;
};

class PngSink final : public PixelSink {
 public:
  PngSink(const OutputFile& output, const Request& request)
      : lineBytes_(std::size_t{request.rect.Width()} * request.bands.GetCount() *
                   DataTypeBytes(request.info.dataType)),
        writer_(output, request.rect.Width(), request.rect.Height(), request.bands.GetCount(),
                8 * DataTypeBytes(request.info.dataType)) {}
  void Write(const SubRect& rect, const unsigned char* pixels) override {
    for (unsigned line = 0; line < rect.Height(); ++line) {
      writer_.WriteLine(pixels + line * lineBytes_);
    }
  }
  void Close() override { writer_.Close(); }

 private:
  std::size_t lineBytes_;
  PngWriter writer_;
};

/// Throws when a PNG can't hold what is read.
void CheckPng(const Options& options, const Request& request) {
  const bool isPixel = request.info.dataType == kDataTypeOf<std::uint8_t> ||
                       request.info.dataType == kDataTypeOf<std::uint16_t>;
  if (!isPixel || request.bands.GetCount() > 4) {
    throw HostError(kExitUsage, options.output +
                                    ": a PNG holds Byte or UInt16 pixels of 1 to 4 bands; take "
                                    ".npy, other --bands, or vexg quicklook");
  }
}

/// The name of the raster, or level of one, that is read.
const char* NameOf(const Options& options) {
  return options.level == 0 ? "raster" : "level";
}

JobDraft OpenDraft(const Options& options) {
  JobDraft draft;
  if (options.level == 0) {
    AddOpen(draft, "raster", options.source);
  } else {
    AddOpenWithPyramid(draft, "raster", options.source);
    AddLevel(draft, "level", "$raster", options.level);
  }
  AddQuery(draft, NameOf(options), String(std::string("$") + NameOf(options)));
  return draft;
}

/// The whole of the work as one document. Each block has memory of its own there, which whoever
/// runs it makes.
void PrintJob(const Options& options, const Request& request, const std::vector<SubRect>& blocks) {
  JobDraft draft = OpenDraft(options);
  AddBlockSteps(draft, String(std::string("$") + NameOf(options)), request.info, request.bands,
                request.interleave, blocks);
  if (options.level != 0) draft.Close("close.level", "$level");
  draft.Close("close", "$raster");
  std::cout << draft.Write().ToUTF8() << '\n';
}

std::unique_ptr<PixelSink> MakeSink(const OutputFile& output, const Request& request, bool isPng) {
  if (isPng) return std::make_unique<PngSink>(output, request);
  return std::make_unique<NpySink>(output, request, request.info.dataType);
}

Request MakeRequest(const Options& options, const JobResults& opened, bool isPng) {
  Request request{ReadInfo(opened, NameOf(options)), {}, {}, ParseInterleave(options.interleave)};
  request.rect = ParseRect(options.rect, request.info);
  request.bands = ParseBands(options.bands, request.info);
  if (isPng) {
    CheckPng(options, request);
    request.interleave = Interleave::BIP;
  }
  return request;
}

/// The second output of --mask.
class MaskOutput {
 public:
  explicit MaskOutput(const Options& options) {
    if (options.mask.empty()) return;
    output_.emplace(options.mask, options.overwrite,
                    std::vector{options.source.file, options.output});
  }

  void RefuseInput(const std::string& input) {
    if (output_) output_->RefuseInput(input);
  }
  void Begin(const Request& request) {
    if (!output_) return;
    constexpr unsigned kByte = kDataTypeOf<std::uint8_t>;
    output_->Begin(NpyWriter::GetBytes(kByte, request.rect, request.bands.GetCount()));
    sink_.emplace(*output_, request, kByte);
  }
  void Write(const SubRect& rect, const unsigned char* states) {
    if (sink_) sink_->Write(rect, states);
  }
  void Commit() {
    if (!sink_) return;
    sink_->Close();
    output_->Commit();
  }

 private:
  std::optional<OutputFile> output_;
  std::optional<NpySink> sink_;
};

/// True when a mask or a region excludes some of the pixels that were read. What a no-data value
/// says, the values say themselves.
bool AnyExcluded(const unsigned char* states, std::uint64_t count) {
  unsigned char any = 0;
  for (std::uint64_t i = 0; i < count; ++i) any |= states[i];
  return (any & (PixelValueState::Masked | PixelValueState::OutsideROI)) != 0;
}

int Read(const Options& options) {
  const bool isPng = EndsWith(options.output, ".png");
  if (!isPng && !EndsWith(options.output, ".npy")) {
    throw HostError(kExitUsage, options.output + ": the output is named .npy or .png");
  }
  OutputFile output(options.output, options.overwrite, {options.source.file});
  MaskOutput mask(options);
  JobSession session(options.job);
  const JobResults opened = session.Run(OpenDraft(options));
  const String raster = opened.Find("raster").returns.Find("URI");
  output.RefuseInput(PathOf(raster));
  mask.RefuseInput(PathOf(raster));
  const Request request = MakeRequest(options, opened, isPng);
  const std::vector<SubRect> blocks =
      CutIntoBlocks(request.info, request.rect, request.bands.GetCount(), isPng);
  if (options.job.printJob) {
    PrintJob(options, request, blocks);
    return kExitSuccess;
  }
  output.Begin(request.GetBytes());
  mask.Begin(request);
  const std::unique_ptr<PixelSink> pixels = MakeSink(output, request, isPng);
  const String source =
      options.level == 0 ? raster : opened.Find("level").returns.Find("PyramidURI");
  BlockReader reader(session, source, request.info, options.source.file);
  bool isExcluded = false;
  reader.ReadAll(blocks, request.bands, request.interleave, options.job.GetProgressStyle(),
                 [&](const SubRect& block) {
                   pixels->Write(block, reader.GetPixels());
                   mask.Write(block, reader.GetStates());
                   const std::uint64_t count =
                       std::uint64_t{block.Width()} * block.Height() * request.bands.GetCount();
                   isExcluded = isExcluded || AnyExcluded(reader.GetStates(), count);
                 });
  pixels->Close();
  mask.Commit();
  output.Commit();
  if (isExcluded && options.mask.empty()) {
    Say(options.output +
        ": note: a mask excludes some of these pixels; --mask OUT.npy tells which");
  }
  return kExitSuccess;
}

const VerbRegistration registration(
    "read", "Reads pixels of a raster into a .npy array or a PNG picture", [](CLI::App& app) {
      const auto options = std::make_shared<Options>();
      app.footer(
          "The array has the axes (lines, samples, bands), or those of --interleave: bil (lines, "
          "bands, samples), bsq (bands, lines, samples). A PNG holds Byte or UInt16 pixels of 1 to "
          "4 bands as they are.\n"
          "Example: vexg read scene.tif --rect 0,0,99,49 --bands 2,1,0 -o part.npy\n");
      options->source.AddTo(app);
      app.add_option("-o,--output", options->output, "The .npy or .png file")
          ->type_name("OUT")
          ->required();
      app.add_option("--rect", options->rect,
                     "Pixels: left,top,right,bottom, from 0, inclusive; all by default")
          ->type_name("L,T,R,B");
      app.add_option("--bands", options->bands, "Bands in the order wanted, from 0; all by default")
          ->type_name("B,B…");
      app.add_option("--interleave", options->interleave, "Order of the array")
          ->transform(OneOf({"bip", "bil", "bsq"}))
          ->capture_default_str();
      app.add_option("--mask", options->mask,
                     "A second array, of a byte for each value: 0 valid, else the sum of 1 no "
                     "data, 2 masked, 4 outside the region")
          ->type_name("OUT.npy");
      app.add_option("--level", options->level,
                     "Level of its pyramid: 0 the raster itself, each further one half the size")
          ->check(CLI::Range(0U, 31U))
          ->capture_default_str();
      app.add_flag("--overwrite", options->overwrite, "Replace files that are there");
      options->job.AddTo(app);
      options->job.AddProgressTo(app);
      return VerbRegistration::Work([options] { return Read(*options); });
    });

}  // namespace
}  // namespace lumo::host
