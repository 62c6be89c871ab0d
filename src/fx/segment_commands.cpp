#include <algorithm>
#include <numeric>
#include <optional>

#include <fmt/format.h>

#include "commands/division.h"
#include "foundation/fault.h"
#include "foundation/scientific_notation.h"
#include "fx/seamless_segmentation.h"
#include "fx/segment_command.h"
#include "fx/segment_share.h"
#include "fx/variance_process.h"
#include "platform/system_memory.h"
#include "raster/pixel_types.h"
#include "stats/raster_histogram.h"

namespace lumo {

std::span<const EnumWord<SegmentAlgorithm>> WordsOf(SegmentAlgorithm) {
  static constexpr EnumWord<SegmentAlgorithm> kWords[] = {
      {"Sobel", SegmentAlgorithm::kSobel}, {"Intensity", SegmentAlgorithm::kIntensity}};
  return kWords;
}

std::span<const EnumWord<MergeOrder>> WordsOf(MergeOrder) {
  static constexpr EnumWord<MergeOrder> kWords[] = {{"Told", MergeOrder::kTold},
                                                    {"Local", MergeOrder::kLocal}};
  return kWords;
}

SegmentAlgorithm SegmentCommand::ReadAlgorithm() const {
  return Read<int>("SegmentAlgorithm") == 1 ? SegmentAlgorithm::kSobel
                                            : SegmentAlgorithm::kIntensity;
}

bool SegmentCommand::CheckAlike(const BasicRaster& segment, const BasicRaster& merge) {
  if (segment.DataType() != merge.DataType()) {
    SetFault("MergeURI: the raster has another pixel type than that of SegmentURI");
    return false;
  }
  if (segment.Samples() != merge.Samples() || segment.Lines() != merge.Lines()) {
    SetFault("MergeURI: the raster has another size than that of SegmentURI");
    return false;
  }
  return true;
}

bool SegmentCommand::ReadShares(const std::string& key, unsigned rounds) {
  std::vector<std::string> files;
  for (const String& file : Read<Array<String>>(kShareFilesInput)) files.push_back(file.ToUTF8());
  if (IsShare() == ShareFile().empty()) {
    SetFault("Share and ShareFile go together");
    return false;
  }
  if (IsShare() && !ReadShare(Read<Array<unsigned>>(kShareInput), share_)) return false;
  if (!IsShare() && files.empty()) return true;
  const std::size_t count = IsShare() ? share_.count : files.size() / rounds;
  const bool fits = IsShare() ? files.size() % count == 0 && files.size() / count < rounds
                              : files.size() % rounds == 0;
  if (!fits) {
    SetFault("ShareFiles: they are not those of all shares of whole rounds");
    return false;
  }
  shares_.emplace(key, static_cast<unsigned>(count), std::move(files));
  return true;
}

namespace {

template <typename T>
String ScientificText(const T& value) {
  std::ostringstream out = MakeTextWriter();
  const ScientificNotation notation(out);
  out << value;
  return String(out.str());
}

const CommandDeclaration kSegmentMerge{
    "FxTileSegmentMergeCommand",
    "Feature extraction",
    "Segments a raster into labels, or counts what merging its segments costs.",
    WithShareInputs(
        {{"SegmentURI", Presence::kRequired, ValueKind::kURI,
          "the raster from which the gradients are computed"},
         {"SegmentAlgorithm", Presence::kRequired, ValueKind::kInteger,
          "1: the largest Sobel gradient of the bands; else the mean of the bands"},
         {"SegmentValue", Presence::kRequired, ValueKind::kNumber,
          "gradients up to this one are one flat level"},
         {"MinGradient", Presence::kRequired, ValueKind::kNumber,
          "the gradient that becomes level 0"},
         {"MaxGradient", Presence::kRequired, ValueKind::kNumber,
          "the gradient that becomes the highest level"},
         {"MergeURI", Presence::kRequired, ValueKind::kURI,
          "the raster whose bands drive merging, of the same size and pixel type"},
         {"MergeAlgorithm", Presence::kOptional, ValueKind::kInteger,
          "1: full lambda schedule; 2: rigorous; others: no merging; 1 when absent"},
         {"MergeValue", Presence::kOptional, ValueKind::kNumber,
          "cost up to which segments are merged; none unless above 0, as when absent"},
         {"StretchValue", Presence::kRequired, ValueKind::kNumber, "the highest level"},
         {"LambdaEstimate", Presence::kRequired, ValueKind::kBoolean,
          "count the costs of merging, and write no raster"},
         {"LabelURI", Presence::kOptional, ValueKind::kURI,
          "the raster of one band and type Int32 that receives the labels; needed without an "
          "estimate"},
         {"TileMemorySize", Presence::kOptional, ValueKind::kInteger,
          "bytes of the pixels of a tile; 8388608 when absent"},
         {"TileBorderSize", Presence::kOptional, ValueKind::kInteger,
          "overlap of the tiles on each side, in pixels; 1 when absent"},
         {"SegmentBorder", Presence::kOptional, ValueKind::kInteger,
          "1: an image of the borders between segments, of 0 and 1, instead of labels"},
         {"Sums", Presence::kOptional, ValueKind::kWord,
          "how the rigorous merge adds up. Told: in single precision; Exact: in double precision",
          "", &WordsIn<Form>},
         {"Seamless", Presence::kOptional, ValueKind::kBoolean,
          "the segments are those of one tile as large as the raster, numbered in raster order "
          "without "
          "gaps; TileMemorySize is then that of the strips that are read, and changes no label, "
          "and "
          "there is no TileBorderSize; false when absent"},
         {"Memory", Presence::kOptional, ValueKind::kInteger,
          "bytes that merging may take when Seamless is true: it fails when it needs more, before "
          "it "
          "begins unless Order is Local; half the machine's when absent"},
         {"MinSize", Presence::kOptional, ValueKind::kInteger,
          "with Seamless and MergeAlgorithm 1: segments of fewer pixels join at the end the "
          "neighbour "
          "that costs least, the smallest first; 0 when absent"},
         {"MaxSize", Presence::kOptional, ValueKind::kInteger,
          "with Seamless and MergeAlgorithm 1: segments that have more pixels together are not "
          "merged, "
          "except by MinSize; none when absent"},
         {"Compactness", Presence::kOptional, ValueKind::kNumber,
          "with Seamless and MergeAlgorithm 1: costs are divided by the length of the common "
          "border to "
          "the power of this besides, 0 to 10; 0 when absent"},
         {"Order", Presence::kOptional, ValueKind::kWord,
          "with Seamless and MergeAlgorithm 1: the order of merging. Told: the cheapest pair "
          "anywhere "
          "first; Local: in rounds, all pairs at once that cost both of their segments least, and "
          "less "
          "than MergeValue",
          "", &WordsIn<MergeOrder>},
         {"Rounds", Presence::kOptional, ValueKind::kInteger,
          "of Order Local, 1 to 1000; 12 when absent"},
         {"Tree", Presence::kOptional, ValueKind::kText,
          "with Seamless and MergeAlgorithm 1: the file to make of all merges, from which segments "
          "of "
          "every MergeValue can be made (CreateTreeLabelsRasterCommand); none when absent"},
         {"MergePercent", Presence::kOptional, ValueKind::kNumber,
          "with Tree: percentage of all merges to do, in place of MergeValue"}}),
    {{"LambdaHistogram", ValueKind::kIntegerArray,
      "cumulative counts of the costs of all merges, in 10000 bins from 0 on"},
     {"LambdaBinSize", ValueKind::kNumber, "width of these bins"}}};

/// Why a segmentation can't be done in shares; null where it can.
const char* WhyNoShares(bool isSeamless, bool isEstimate, bool isRigorous, bool isExact) {
  return isEstimate               ? "an estimate goes by tiles"
         : !isSeamless            ? "Seamless is not true, and tiles depend on those before"
         : isRigorous && !isExact ? "the rigorous merge adds up in single precision"
                                  : nullptr;
}

class FxTileSegmentMergeCommand final : public SegmentCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr segment = FindRaster("SegmentURI");
    const BasicRasterPtr merge = segment ? FindRaster("MergeURI") : BasicRasterPtr();
    if (!merge || !CheckAlike(*segment, *merge)) return Fail();
    const bool isEstimate = Read<bool>("LambdaEstimate");
    BasicRasterPtr labels;
    if (!isEstimate && !IsShare()) {
      labels = FindRaster("LabelURI");
      if (!labels || !CheckLabels(*segment, *labels)) return Fail();
    }
    SegmentRequest request;
    if (!ReadRequest(*segment, request) || !ReadShares(*segment, *merge, request)) return Fail();
    const Pointer<Array<unsigned>> histogram(new Array<unsigned>(ArrayDims(kLambdaBins)));
    const ScalarPtr<double> binSize(new Scalar<double>(0.0));
    std::fill(histogram->begin(), histogram->end(), 0U);
    bool well = false;
    const bool isReal = DispatchType(EightTypes{}, segment->DataType(), [&]<typename T>() {
      const RasterPtr<T> from(segment), by(merge);
      well = isEstimate ? Run<RasterTileWatershedSegmentFLSEstimateProcess<T>>(from, by, request,
                                                                               histogram, binSize)
                        : Segment<T>(from, by, RasterPtr<std::int32_t>(labels), request);
      return true;
    });
    if (!isReal) return Fail("SegmentURI: the raster has no real pixels of at most 64 bits");
    if (!well) return Fail(TakeFaultOr("the raster could not be segmented"));
    if (IsShare()) return Succeed();
    Write("LambdaHistogram", *histogram);
    Result("LambdaBinSize") = MakeText(ScientificText(binSize->value));
    return Succeed();
  }

  static bool CheckLabels(const BasicRaster& segment, const BasicRaster& labels) {
    constexpr auto kLabelType = kDataTypeOf<std::int32_t>;
    const char* const fault =
        labels.DataType() != kLabelType ? "LabelURI: the raster is not of type Int32"
        : labels.Bands() != 1           ? "LabelURI: the raster has more than one band"
        : labels.Samples() != segment.Samples() || labels.Lines() != segment.Lines()
            ? "LabelURI: the raster has another size than that of SegmentURI"
        : !labels.CanWrite() ? "LabelURI: the raster can't be written"
                             : nullptr;
    if (fault != nullptr) SetFault(fault);
    return fault == nullptr;
  }

  bool ReadRequest(const BasicRaster& segment, SegmentRequest& request) {
    const auto low = Read<double>("MinGradient"), high = Read<double>("MaxGradient");
    const auto stretch = Read<double>("StretchValue");
    request.algorithm = ReadAlgorithm();
    request.stretch = {low, high, 0.0, stretch};
    request.limits = ClipLimits::Of(low, high, Read<double>("SegmentValue"), stretch);
    const int mergeAlgorithm = HasInput("MergeAlgorithm") ? Read<int>("MergeAlgorithm") : 1;
    isRigorous_ = mergeAlgorithm == 2;
    request.mergeValue =
        mergeAlgorithm == 1 || mergeAlgorithm == 2 ? Read<double>("MergeValue") : 0.0;
    request.sums = Read<Form>("Sums");
    request.bordersOnly = Read<int>("SegmentBorder") == 1;
    isSeamless_ = Read<bool>("Seamless");
    request.isRigorous = isRigorous_;
    return ReadOrder(request) && ReadGrowth(request) && ReadTree(request) &&
           ReadMemory(segment, request) && ReadTiles(segment, request);
  }

  bool ReadOrder(SegmentRequest& request) {
    const auto refuse = [](const char* fault) {
      SetFault(fault);
      return false;
    };
    if (HasInput("Order")) request.order = Read<MergeOrder>("Order");
    const bool isLocal = request.order == MergeOrder::kLocal;
    if (isLocal && (!isSeamless_ || isRigorous_)) {
      return refuse("Order Local goes with Seamless and MergeAlgorithm 1");
    }
    if (!HasInput("Rounds")) return true;
    if (!isLocal) return refuse("Rounds goes with Order Local");
    constexpr int kMost = 1000;
    const int rounds = Read<int>("Rounds");
    if (rounds < 1 || rounds > kMost) return refuse("Rounds: 1 to 1000");
    request.rounds = static_cast<unsigned>(rounds);
    return true;
  }

  bool ReadGrowth(SegmentRequest& request) {
    const bool isGiven = HasInput("MinSize") || HasInput("MaxSize") || HasInput("Compactness");
    if (!isGiven) return true;
    const auto refuse = [](const char* fault) {
      SetFault(fault);
      return false;
    };
    if (!isSeamless_ || isRigorous_) {
      return refuse("MinSize, MaxSize and Compactness go with Seamless and MergeAlgorithm 1");
    }
    const auto least = Read<std::int64_t>("MinSize"), most = Read<std::int64_t>("MaxSize");
    if (least < 0) return refuse("MinSize: 0 pixels or more");
    if (HasInput("MaxSize") && most < 1) return refuse("MaxSize: 1 pixel or more");
    constexpr double kMostCompact = 10;
    request.growth.compactness = Read<double>("Compactness");
    if (!(request.growth.compactness >= 0 && request.growth.compactness <= kMostCompact)) {
      return refuse("Compactness: 0 to 10");
    }
    request.leastPixels = static_cast<double>(least);
    if (HasInput("MaxSize")) request.growth.mostPixels = static_cast<double>(most);
    return true;
  }

  bool ReadTree(SegmentRequest& request) {
    if (!HasInput("Tree") && !HasInput("MergePercent")) return true;
    const auto refuse = [](const char* fault) {
      SetFault(fault);
      return false;
    };
    request.tree = Read<String>("Tree").ToUTF8();
    if (request.tree.empty()) {
      return refuse(HasInput("Tree") ? "Tree: there is no name of a file"
                                     : "MergePercent goes with Tree");
    }
    const bool isSchedule = !HasInput("MergeAlgorithm") || Read<int>("MergeAlgorithm") == 1;
    if (!isSeamless_ || !isSchedule || Read<bool>("LambdaEstimate")) {
      return refuse("Tree goes with Seamless and MergeAlgorithm 1, and without an estimate");
    }
    if (request.leastPixels > 0) return refuse("Tree goes without MinSize");
    if (!HasInput("MergePercent")) return true;
    request.mergePercent = Read<double>("MergePercent");
    if (!(*request.mergePercent >= 0 && *request.mergePercent <= 100)) {
      return refuse("MergePercent: 0 to 100 percent");
    }
    return true;
  }

  bool ReadMemory(const BasicRaster& segment, SegmentRequest& request) {
    if (!isSeamless_) return true;
    const auto given = Read<std::int64_t>("Memory");
    if (given < 0 || (HasInput("Memory") && given == 0)) {
      SetFault("Memory: 1 byte or more");
      return false;
    }
    request.memory =
        HasInput("Memory") ? static_cast<std::uint64_t>(given) : platform::GetMemoryOfMachine() / 2;
    request.tileBytes = SeamlessStripBytes(segment, DataTypeBytes(segment.DataType()));
    return true;
  }

  bool ReadTiles(const BasicRaster& segment, SegmentRequest& request) {
    constexpr std::int64_t kMost = 0xFFFFFFFF;
    const auto bytes = HasInput("TileMemorySize") ? Read<std::int64_t>("TileMemorySize")
                                                  : std::int64_t{request.tileBytes};
    const auto border =
        HasInput("TileBorderSize") ? Read<std::int64_t>("TileBorderSize") : std::int64_t{1};
    if (bytes < 0 || bytes > kMost) {
      SetFault("TileMemorySize: a tile has 0 to 4294967295 bytes");
      return false;
    }
    request.tileBytes = static_cast<unsigned>(bytes);
    if (isSeamless_) return true;
    const SegmentGrid grid(segment, DataTypeBytes(segment.DataType()), request.tileBytes, 1);
    if (border < 0 || (!grid.IsOneTile() && border > std::int64_t{grid.side})) {
      SetFault("TileBorderSize: a border has 0 to " + std::to_string(grid.side) +
               " pixels, the side of a tile");
      return false;
    }
    request.tileBorder = static_cast<unsigned>(std::min(border, kMost));
    return true;
  }

  template <typename Process, typename... Args>
  bool Run(const Args&... args) {
    Process process(args..., GetIPC());
    return process.RunProcess(process.kHere);
  }

  template <typename T>
  bool Segment(const RasterPtr<T>& segment, const RasterPtr<T>& merge,
               const RasterPtr<std::int32_t>& labels, const SegmentRequest& request) {
    if (IsShare()) {
      return SegmentShare<T>(segment, merge, request, *Shares(), GetIPC())
          .Run(GetShare().index, ShareFile());
    }
    if (isSeamless_) {
      return SeamlessSegmentation<T>(segment, merge, labels, request, GetIPC(), Shares()).Run();
    }
    return isRigorous_
               ? Run<RasterTileWatershedSegmentLambdaMergeProcess<T>>(segment, merge, labels,
                                                                      request)
               : Run<RasterTileWatershedSegmentFLSMergeProcess<T>>(segment, merge, labels, request);
  }

  /// Reads which share of the work is done, or the files of all.
  bool ReadShares(const BasicRaster& segment, const BasicRaster& merge,
                  const SegmentRequest& request) {
    if (!SegmentCommand::ReadShares(KeyOfShares(segment, merge, request), kSegmentRounds)) {
      return false;
    }
    const char* const why = WhyNoShares(isSeamless_, Read<bool>("LambdaEstimate"), isRigorous_,
                                        request.sums == Form::kExact);
    if (why == nullptr || Shares() == nullptr) return true;
    SetFault(String(std::string("Share and ShareFiles: ") + why));
    return false;
  }

  static std::string KeyOfShares(const BasicRaster& segment, const BasicRaster& merge,
                                 const SegmentRequest& request) {
    return fmt::format("segments {} {} {} {} {} {} {} {} {} {} {} {} {} {}", segment.DataType(),
                       segment.Samples(), segment.Lines(), segment.Bands(), merge.Bands(),
                       static_cast<int>(request.algorithm), request.stretch.low,
                       request.stretch.high, request.stretch.outHigh, request.limits.floor,
                       request.limits.ceiling, static_cast<int>(request.order), request.isRigorous,
                       !request.tree.empty());
  }

  bool isRigorous_ = false, isSeamless_ = false;
};

const CommandFactoryT<FxTileSegmentMergeCommand> segmentMergeFactory(kSegmentMerge);
const DivisionRegistration segmentMergeDivision(
    {.command = "FxTileSegmentMergeCommand",
     .kind = DivisionKind::kShares,
     .source = "SegmentURI",
     .target = "LabelURI",
     .makes = {"Tree"},
     .rounds = [](unsigned, const DivisionInputs&) { return kSegmentRounds; },
     .whyNot =
         [](const DivisionInputs& inputs) {
           const auto is = [&](const char* name, const char* word) {
             const std::string* const text = inputs(name);
             return text != nullptr && *text == word;
           };
           return WhyNoShares(is("Seamless", "1"), is("LambdaEstimate", "1"),
                              is("MergeAlgorithm", "2"), is("Sums", "Exact"));
         },
     .shareBytes = 32,
     .joinBytes = 24});  // of texture, a tenth of whose pixels are basins

const CommandDeclaration kHistogram{
    "FxTileSegmentHistogramCommand",
    "Feature extraction",
    "Counts the gradients of a raster.",
    {{"SegmentURI", Presence::kRequired, ValueKind::kURI, "the raster"},
     {"HistogramMin", Presence::kRequired, ValueKind::kNumber, "smallest gradient that counts"},
     {"HistogramMax", Presence::kRequired, ValueKind::kNumber, "largest gradient that counts"},
     {"SegmentAlgorithm", Presence::kRequired, ValueKind::kInteger,
      "1: the largest Sobel gradient of the bands; else the mean of the bands"},
     {"HistogramBins", Presence::kOptional, ValueKind::kInteger,
      "how many bins between the two; when absent, bins of width 1, or 65000 where these were more "
      "than 65001"}},
    {{"SegmentHistogram", ValueKind::kNumberArray,
      "cumulative counts of the bins, divided by the last"},
     {"SegmentBinSize", ValueKind::kNumber, "width of the bins"},
     {"SegmentMin", ValueKind::kNumber, "always 0"}}};

class FxTileSegmentHistogramCommand final : public SegmentCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster("SegmentURI");
    if (!raster) return Fail();
    const auto min = Read<double>("HistogramMin"), max = Read<double>("HistogramMax");
    if (!(max >= min)) return Fail("HistogramMax is below HistogramMin");
    std::optional<unsigned> bins;
    if (HasInput("HistogramBins")) {
      const auto given = Read<std::int64_t>("HistogramBins");
      constexpr std::int64_t kMost = 1 << 24;
      if (given < 1 || given > kMost) return Fail("HistogramBins: there are 1 to 16777216 bins");
      bins = static_cast<unsigned>(given);
    }
    GradientHistogram histogram;
    if (!CountGradients(raster, ReadAlgorithm(), {min, max, bins}, GetIPC(), histogram)) {
      return Fail(TakeFaultOr("the gradients could not be counted"));
    }
    Result("SegmentHistogram") = MakeText(ScientificText(histogram.shares));
    Result("SegmentBinSize") = MakeText(ScientificText(histogram.binSize));
    Result("SegmentMin") = MakeText(ScientificText(0.0));
    return Succeed();
  }
};

const CommandFactoryT<FxTileSegmentHistogramCommand> histogramFactory(kHistogram);

const CommandDeclaration kVariance{
    "FxTileVarianceCommand",
    "Feature extraction",
    "Computes the variance of each tile of 512 by 512 pixels.",
    {{"MergeURI", Presence::kRequired, ValueKind::kURI, "the raster"}},
    {{"TileVariances", ValueKind::kNumberArray,
      "mean of the sample variances of the bands, by tile column and tile row"},
     {"PixelCounts", ValueKind::kIntegerArray,
      "pixels that count, of the last band that has more than one"},
     {"TileSubrects", ValueKind::kIntegerArray,
      "first and last sample, first and last line of each tile"}}};

class FxTileVarianceCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster("MergeURI");
    if (!raster) return Fail();
    TileVariances result;
    bool well = false;
    const bool isReal = DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      const RasterIteratorPtr<T> tiles(new RasterIteratorTile<T>(RasterPtr<T>(raster)));
      if (!result.Resize(tiles->Columns(), tiles->Rows())) return true;
      RasterVarianceSubrectProcess<T> process(tiles, result, GetIPC());
      well = process.RunProcess(process.kHere);
      return true;
    });
    if (!isReal) return Fail("MergeURI: the raster has no real pixels of at most 64 bits");
    if (!well) return Fail(TakeFaultOr("the variances could not be computed"));
    Result("TileVariances") = MakeText(ScientificText(result.variances));
    Write("PixelCounts", result.pixelCounts);
    Write("TileSubrects", result.subrects);
    return Succeed();
  }
};

const CommandFactoryT<FxTileVarianceCommand> varianceFactory(kVariance);

}  // namespace
}  // namespace lumo
