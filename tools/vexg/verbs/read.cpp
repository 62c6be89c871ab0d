#include <algorithm>
#include <iostream>
#include <memory>

#include <fmt/format.h>

#include "options/option_values.h"
#include "pictures/block_reader.h"
#include "pictures/npy_writer.h"
#include "pictures/png_writer.h"
#include "platform/process.h"
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

/// Some bands of a block of a request.
struct Part {
  SubRect rect;
  BandSpan bands;
};

/// Takes in the parts of a request.
class PixelSink {
 public:
  virtual ~PixelSink() = default;
  virtual void Write(const Part& part, const unsigned char* pixels) = 0;
  virtual void Close() = 0;
};

/// Sends an array, or its elements alone, to standard output; the parts come in the array's order.
class StreamSink final : public PixelSink {
 public:
  StreamSink(const Request& request, bool isRaw)
      : elementBytes_(DataTypeBytes(request.info.dataType)) {
    if (isRaw) return;
    const std::string header = MakeNpyHeader(request.info.dataType, request.rect,
                                             request.bands.GetCount(), request.interleave);
    Send(header.data(), header.size());
  }
  void Write(const Part& part, const unsigned char* pixels) override {
    Send(pixels,
         std::size_t{part.rect.Width()} * part.rect.Height() * part.bands.count * elementBytes_);
  }
  void Close() override { Check(bool(std::cout.flush())); }

 private:
  static void Send(const void* bytes, std::size_t count) {
    std::cout.write(static_cast<const char*>(bytes), static_cast<std::streamsize>(count));
    Check(bool(std::cout));
  }
  static void Check(bool isSent) {
    if (isSent) return;
    throw HostError(kExitFailed, "standard output can't be written");
  }

  std::size_t elementBytes_;
};

class NpySink final : public PixelSink {
 public:
  NpySink(const OutputFile& output, const Request& request, unsigned dataType, bool isRaw)
      : writer_(output, dataType, request.rect, request.bands.GetCount(), request.interleave,
                isRaw) {}
  void Write(const Part& part, const unsigned char* pixels) override {
    writer_.Write(part.rect, part.bands, pixels);
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
  void Write(const Part& part, const unsigned char* pixels) override {
    for (unsigned line = 0; line < part.rect.Height(); ++line) {
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
        "bands, samples), bsq (bands, lines, samples). A .raw file is the array without a header, "
        "its "
        "numbers little-endian. A PNG holds Byte or UInt16 pixels of 1 to 4 bands as they are.");
    line.AddNote(
        "With - as OUT the array goes to standard output, and nothing else does: a .npy file, or "
        "with --raw its numbers alone. Where that fails half-way the exit code says so.");
    line.AddExample("vexg read scene.tif --rect 0,0,99,49 --bands 2,1,0 -o part.npy");
    line.AddExample("vexg read scene.tif -o - --raw --interleave bsq | sha256sum");
    line.Add("--output,-o", output_, "The .npy, .raw or .png file, or - for standard output")
        .IsFile("OUT")
        .Required();
    line.Add("--raw", isRaw_, "Numbers without a header; for standard output");
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

  bool IsStream() const { return output_ == "-"; }
  bool IsRaw() const { return isRaw_ || EndsWith(output_, ".raw"); }

  void CheckOptions() override {
    if (isRaw_ && !IsStream()) {
      throw HostError(kExitUsage, "--raw: only for standard output; name the file .raw");
    }
    if (IsStream() && !GetJobOptions().printJob && platform::OutputIsTerminal()) {
      throw HostError(kExitUsage, "--output: standard output is a terminal; send it to a pipe");
    }
    if (IsStream() || IsPng() || IsRaw() || EndsWith(output_, ".npy")) return;
    throw HostError(kExitUsage, output_ + ": the output is named .npy, .raw or .png, or is -");
  }

  std::vector<std::string> GetOutputs() const override {
    std::vector<std::string> outputs;
    if (!IsStream()) outputs.push_back(output_);
    if (!mask_.empty()) outputs.push_back(mask_);
    return outputs;
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
    blocks_ = CutIntoBlocks(request_.info, request_.rect, BandsAtOnce(), IsPng() || IsStream());
  }

  /// Bands of a part: where bands follow one another in the output, its order is theirs.
  unsigned BandsAtOnce() const {
    const bool isByBand = IsStream() && request_.interleave == Interleave::BSQ;
    return isByBand ? 1 : request_.bands.GetCount();
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
    const bool isMask = IsStream() || output != 0;
    if (!isMask && IsPng()) return 0;
    const unsigned type = isMask ? kDataTypeOf<std::uint8_t> : request_.info.dataType;
    return NpyWriter::GetBytes(type, request_.rect, request_.bands.GetCount());
  }

  void Make(JobSession& session, const Outputs& outputs) override {
    const std::unique_ptr<PixelSink> pixels = MakeSink(outputs);
    std::unique_ptr<PixelSink> states;
    if (!mask_.empty()) {
      states = std::make_unique<NpySink>(outputs.Get(IsStream() ? 0 : 1), request_,
                                         kDataTypeOf<std::uint8_t>, false);
    }
    BlockReader reader(session, raster_, request_.info, GetSource().file);
    const std::vector<Part> parts = GetParts();
    const ProgressReportPtr progress(new StandardProgressReport);
    const ProgressView view(progress, GetProgressStyle());
    for (std::size_t i = 0; i < parts.size(); ++i) {
      const BlockRequest block{parts[i].rect, BandsOf(parts[i]), request_.interleave};
      reader.Read(block);
      pixels->Write(parts[i], reader.GetPixels());
      if (states) states->Write(parts[i], reader.GetStates());
      isExcluded_ = isExcluded_ || AnyExcluded(reader.GetStates(), block.GetCount());
      progress->Update(static_cast<double>(i + 1) / static_cast<double>(parts.size()));
    }
    pixels->Close();
    if (states) states->Close();
  }

  /// The parts that are read, in the order of the output where that matters.
  std::vector<Part> GetParts() const {
    std::vector<Part> parts;
    const unsigned atOnce = BandsAtOnce();
    for (unsigned band = 0; band < request_.bands.GetCount(); band += atOnce) {
      for (const SubRect& block : blocks_) parts.push_back({block, {band, atOnce}});
    }
    return parts;
  }

  Array<unsigned> BandsOf(const Part& part) const {
    Array<unsigned> bands{ArrayDims(part.bands.count)};
    std::copy_n(request_.bands.begin() + part.bands.first, part.bands.count, bands.begin());
    return bands;
  }

  std::unique_ptr<PixelSink> MakeSink(const Outputs& outputs) const {
    if (IsStream()) return std::make_unique<StreamSink>(request_, IsRaw());
    if (IsPng()) return std::make_unique<PngSink>(outputs.Get(0), request_);
    return std::make_unique<NpySink>(outputs.Get(0), request_, request_.info.dataType, IsRaw());
  }

  std::string Remark() const override {
    if (!isExcluded_ || !mask_.empty()) return {};
    return (IsStream() ? GetSource().file : output_) +
           ": note: some of these pixels are masked or outside; --mask OUT.npy tells which";
  }

  std::string output_, mask_, bands_;
  std::string interleave_ = "bip";
  bool isRaw_ = false;
  unsigned level_ = 0;

  String raster_;  // URI
  Request request_{};
  std::vector<SubRect> blocks_;
  bool isExcluded_ = false;
};

const VerbRegistration readRegistration("read",
                                        "Reads pixels of a raster into an array or a PNG picture",
                                        &SetUp<ReadVerb>);

}  // namespace
}  // namespace lumo::host
