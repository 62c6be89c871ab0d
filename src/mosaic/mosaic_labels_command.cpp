#include <functional>

#include "foundation/fault.h"
#include "mosaic/mosaic_masks.h"
#include "mosaic/mosaic_raster.h"
#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "views/publish_raster.h"

namespace lumo {
namespace {

/// Names the labels of a mosaic's pixels.
enum class MosaicLabels : unsigned { kSeams = 0, kFootprints = 1 };

std::span<const EnumWord<MosaicLabels>> WordsOf(MosaicLabels) {
  static constexpr EnumWord<MosaicLabels> kWords[] = {{"Seams", MosaicLabels::kSeams},
                                                      {"Footprints", MosaicLabels::kFootprints}};
  return kWords;
}

const CommandDeclaration kLabels{
    "CreateMosaicLabelsCommand",
    "Mosaics",
    "Shows by whose polygons the pixels of a mosaic lie, as a raster of labels. A command of this "
    "library's own.",
    {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic"},
     {"Labels", Presence::kOptional, ValueKind::kWord,
      "Seams: 1 more than the number of the scene in whose seam polygon, or else footprint, a "
      "pixel lies, the first of several; Footprints: one number for each set of footprints that "
      "lie over one another; 0 outside",
      "", &WordsIn<MosaicLabels>}},
    PublishedOutputs()};

/// Holds all that the labels of a mosaic come from.
struct LabelSource {
  RasterDef grid;
  std::shared_ptr<MosaicMasks> masks;
  std::function<std::vector<std::int32_t>(const SubRect&)> scenesIn;
  BasicRasterPtr mosaic;  // lives as long
  MosaicLabels labels = MosaicLabels::kSeams;
};

/// Shows labels by the polygons of a mosaic; see the command.
class MosaicLabelsRaster final : public ComputedRaster<std::uint32_t> {
 public:
  explicit MosaicLabelsRaster(LabelSource source) : source_(std::move(source)) {
    RasterDef& def = source_.grid;
    def.bands = 1;
    def.dataType = kDataTypeOf<std::uint32_t>;
    def.noData.clear();
    def.interleave = Interleave::BSQ;
    def.format = "Unknown";
  }
  ~MosaicLabelsRaster() override { StopComputing(); }

  bool IsValid() const override { return Object::IsValid(); }
  URI GetURI() const override { return DefaultURI("MosaicLabelsRaster"); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return source_.grid; }
  unsigned Samples() const override { return source_.grid.samples; }
  unsigned Lines() const override { return source_.grid.lines; }
  unsigned Bands() const override { return 1; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<std::uint32_t>& pixels, Array<unsigned char>& state) override {
    const BlockShape block(rect, bands, interleave);
    if (!block.Size(pixels, state)) return false;
    std::fill(pixels.begin(), pixels.end(), 0U);
    std::fill(state.begin(), state.end(), static_cast<unsigned char>(PixelValueState::Valid));
    const BlockStrides strides(interleave, block.width, block.height, block.count);
    for (const std::int32_t number : source_.scenesIn(rect)) {
      const auto scene = static_cast<unsigned>(number);
      MosaicMasks::Shape shape;
      if (!FindShape(scene, shape)) return false;
      if (!shape) continue;
      for (unsigned y = rect.top; y <= rect.bottom; ++y) {
        const SpanRows& rows = shape->Rows();
        for (const ColumnSpan* span = rows.Begin(y); span != rows.End(y); ++span) {
          const auto first = std::max<std::int64_t>(span->first, rect.left);
          const auto last = std::min<std::int64_t>(span->last, rect.right);
          for (std::int64_t x = first; x <= last; ++x) {
            const std::size_t at = (y - rect.top) * strides.line +
                                   static_cast<std::size_t>(x - rect.left) * strides.pixel;
            for (unsigned i = 0; i < block.count; ++i) {
              Mark(pixels.GetData()[at + i * strides.band], scene);
            }
          }
        }
      }
    }
    return true;
  }
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<std::uint32_t>&,
                  Array<unsigned char>&) override {
    return false;
  }

 private:
  bool FindShape(unsigned scene, MosaicMasks::Shape& shape) {
    MosaicMasks& masks = *source_.masks;
    const bool hasSeam = source_.labels == MosaicLabels::kSeams && masks.HasSeam(scene);
    if (!hasSeam && !masks.HasFootprint(scene)) return true;
    shape = hasSeam ? masks.Seam(scene) : masks.Footprint(scene);
    return bool(shape);
  }

  void Mark(std::uint32_t& label, unsigned scene) const {
    if (source_.labels == MosaicLabels::kSeams) {
      if (label == 0) label = scene + 1;
      return;
    }
    label = (label ^ (scene + 1)) * 16777619U;  // FNV-1a, over the numbers of the set
    if (label == 0) label = 1;
  }

  LabelSource source_;
};

class CreateMosaicLabelsCommand final : public PublishCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster("MosaicURI");
    if (!raster) return Fail();
    LabelSource source;
    source.labels = Read<MosaicLabels>("Labels");
    source.mosaic = raster;
    DispatchType(EightTypes{}, raster->DataType(), [&]<typename T>() {
      const MosaicRasterPtr<T> mosaic{RasterPtr<T>(raster)};
      if (!mosaic) return false;
      source.grid = mosaic->GetRasterDef();
      source.masks = mosaic->MakeMasks();
      MosaicRaster<T>* const plain = mosaic.Get();
      source.scenesIn = [plain](const SubRect& rect) { return plain->ScenesIn(rect); };
      return true;
    });
    if (!source.masks) return Fail("MosaicURI: the raster is no mosaic");
    return Publish(
        BasicRasterPtr(RasterPtr<std::uint32_t>(new MosaicLabelsRaster(std::move(source)))));
  }
};

const CommandFactoryT<CreateMosaicLabelsCommand> createMosaicLabelsFactory(kLabels);

}  // namespace
}  // namespace lumo
