#include <memory>

#include <fmt/format.h>

#include "options/option_values.h"
#include "pictures/block_reader.h"
#include "pictures/npy_writer.h"
#include "pictures/png_writer.h"
#include "raster/pixel_states.h"
#include "raster/pixel_types.h"
#include "rasters/file_verb.h"

namespace lumo::host {
namespace {

bool EndsWith(const std::string& name, const char* ending) {
  return std::filesystem::path(name).extension() == ending;
}

/// The part of a raster that is read, and its order in the output.
struct Request {
  RasterInfo info;
  SubRect rect;
  Array<unsigned> bands;
  Interleave interleave;
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
        writer_(MakePngWriter(output, request.rect.Width(), request.rect.Height(),
                              request.bands.GetCount(), 8 * DataTypeBytes(request.info.dataType))) {
  }
  void Write(const SubRect& rect, const unsigned char* pixels) override {
    for (unsigned line = 0; line < rect.Height(); ++line) {
      writer_->WriteLine(pixels + line * lineBytes_);
    }
  }
  void Close() override { writer_->Close(); }

 private:
  std::size_t lineBytes_;
  const std::unique_ptr<PictureWriter> writer_;
};

/// True when a mask or a region excludes some of the pixels that were read. What a no-data value
/// says, the values say themselves.
bool AnyExcluded(const unsigned char* states, std::uint64_t count) {
  return AnyHasState(states, count, PixelValueState::Masked | PixelValueState::OutsideROI);
}

class ReadVerb final : public FileVerb {
 public:
  explicit ReadVerb(OptionSet& line) : FileVerb(line) {
    line.AddNote(
        "The array has the axes (lines, samples, bands), or those of --interleave: bil (lines, "
        "bands, samples), bsq (bands, lines, samples). A PNG holds Byte or UInt16 pixels of 1 to "
        "4 "
        "bands as they are.");
    line.AddExample("vexg read scene.tif --rect 0,0,99,49 --bands 2,1,0 -o part.npy");
    line.Add("--output,-o", output_, "The .npy or .png file").IsFile("OUT").Required();
    AddAreaTo(line);
    line.Add("--bands", bands_, "Bands in the order wanted, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    line.Add("--interleave", interleave_, "Order of the array")
        .Takes(OneOf({"bip", "bil", "bsq"}))
        .ShowsDefault();
    line.Add("--mask", mask_,
             "A second array, of a byte for each value: 0 valid, else the sum of 1 no data, "
             "2 masked, 4 outside the region")
        .IsFile("OUT.npy");
    line.Add("--level", level_,
             "Level of its pyramid: 0 the raster itself, each further one half the size")
        .Within(0, 31)
        .ShowsDefault();
    AddOverwriteTo(line, "files that are there");
  }

 private:
  bool IsPng() const { return EndsWith(output_, ".png"); }

  void CheckOptions() override {
    if (IsPng() || EndsWith(output_, ".npy")) return;
    throw HostError(kExitUsage, output_ + ": the output is named .npy or .png");
  }

  std::vector<std::string> GetOutputs() const override {
    return mask_.empty() ? std::vector{output_} : std::vector{output_, mask_};
  }

  void AddOpening(JobDraft& draft) const override {
    RasterChain chain(draft);
    AddSource(chain);
    AddQuery(draft, "shown", chain.GetTop());
  }

  /// Opens the raster, or a level of it.
  void AddSource(RasterChain& chain) const {
    if (level_ == 0) {
      AddOpen(chain.GetDraft(), "raster", GetSource());
      chain.Take("raster");
      return;
    }
    AddOpenWithPyramid(chain.GetDraft(), "raster", GetSource());
    chain.Take("raster");
    AddLevel(chain.GetDraft(), "level", "$raster", level_);
    chain.Take("level");
  }

  void Plan(JobSession& session, const JobResults& opened) override {
    const String source = URIOf(opened, level_ == 0 ? "$raster" : "$level");
    const OpenRaster shown = ShowArea(session, {source, ReadInfo(opened, "shown")});
    raster_ = shown.uri;
    request_.info = shown.info;
    request_.rect = shown.info.GetRect();
    request_.bands = ParseBands(bands_, request_.info);
    request_.interleave = IsPng() ? Interleave::BIP : ParseInterleave(interleave_);
    if (IsPng()) CheckPng();
    blocks_ = CutIntoBlocks(request_.info, request_.rect, request_.bands.GetCount(), IsPng());
  }

  /// Throws when a PNG can't hold what is read.
  void CheckPng() const {
    const unsigned type = request_.info.dataType;
    const bool isPixel = type == kDataTypeOf<std::uint8_t> || type == kDataTypeOf<std::uint16_t>;
    if (isPixel && request_.bands.GetCount() <= 4) return;
    throw HostError(kExitUsage, output_ +
                                    ": a PNG holds Byte or UInt16 pixels of 1 to 4 bands; take "
                                    ".npy, other --bands, or vexg quicklook");
  }

  /// Each block has memory of its own there, which whoever runs it makes.
  JobDraft GetJob(const Outputs& /*outputs*/) const override {
    JobDraft draft;
    RasterChain chain(draft);
    AddSource(chain);
    GetArea().AddViews(chain);
    AddBlockSteps(draft, chain.GetTop(), request_.info, request_.bands, request_.interleave,
                  blocks_);
    chain.Close();
    return draft;
  }

  std::uint64_t GetBytes(std::size_t output) const override {
    if (output == 0 && IsPng()) return 0;
    const unsigned type = output == 0 ? request_.info.dataType : kDataTypeOf<std::uint8_t>;
    return NpyWriter::GetBytes(type, request_.rect, request_.bands.GetCount());
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    std::vector<std::unique_ptr<PixelSink>> sinks;
    sinks.push_back(MakeSink(outputs.Get(0)));
    if (!mask_.empty()) {
      sinks.push_back(
          std::make_unique<NpySink>(outputs.Get(1), request_, kDataTypeOf<std::uint8_t>));
    }
    BlockReader reader(session, raster_, request_.info, GetSource().file);
    reader.ReadAll(blocks_, request_.bands, request_.interleave, GetProgressStyle(),
                   [&](const SubRect& block) {
                     sinks[0]->Write(block, reader.GetPixels());
                     if (sinks.size() > 1) sinks[1]->Write(block, reader.GetStates());
                     const std::uint64_t count =
                         std::uint64_t{block.Width()} * block.Height() * request_.bands.GetCount();
                     isExcluded_ = isExcluded_ || AnyExcluded(reader.GetStates(), count);
                   });
    for (const auto& sink : sinks) sink->Close();
  }

  std::unique_ptr<PixelSink> MakeSink(const OutputFile& output) const {
    if (IsPng()) return std::make_unique<PngSink>(output, request_);
    return std::make_unique<NpySink>(output, request_, request_.info.dataType);
  }

  std::string Remark() const override {
    if (!isExcluded_ || !mask_.empty()) return {};
    return output_ +
           ": note: some of these pixels are masked or outside; --mask OUT.npy tells which";
  }

  std::string output_, mask_, bands_;
  std::string interleave_ = "bip";
  unsigned level_ = 0;

  String raster_;  // URI
  Request request_{};
  std::vector<SubRect> blocks_;
  bool isExcluded_ = false;
};

const VerbRegistration registration("read",
                                    "Reads pixels of a raster into a .npy array or a PNG picture",
                                    &SetUp<ReadVerb>);

}  // namespace
}  // namespace lumo::host
