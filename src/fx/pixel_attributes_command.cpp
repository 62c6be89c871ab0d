#include <algorithm>

#include <fmt/format.h>

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "foundation/progress.h"
#include "fx/attribute_inputs.h"
#include "fx/pixel_attributes_process.h"
#include "fx/region_pass.h"

namespace lumo {
namespace {

const CommandDeclaration kPixelAttributes{
    "FxComputePixelAttributesCommand",
    "Feature extraction",
    "Computes spectral and texture values of the regions of a label raster.",
    WithShareInputs(
        {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the image"},
         {"LabelURI", Presence::kRequired, ValueKind::kURI,
          "the labels, of type Int or UInt and of the image's size"},
         {"SpectralFXA", Presence::kOptional, ValueKind::kText,
          "the file to create of mean, deviation, minimum, maximum and count; required unless "
          "Values "
          "leaves it out"},
         {"TextureFXA", Presence::kOptional, ValueKind::kText,
          "the file to create of the means of windows' range, mean, variance and entropy, and of "
          "the "
          "count; required unless Values leaves it out"},
         {"TextureKernelSize", Presence::kOptional, ValueKind::kInteger,
          "side of the windows, from 0; half of it, rounded down, is their reach; required with "
          "TextureFXA",
          "pixels"},
         SumsInput(),
         {"Values", Presence::kOptional, ValueKind::kTextList,
          "of spectral, texture and means: the files that are made; spectral and texture when "
          "absent"},
         {"MeansFXA", Presence::kOptional, ValueKind::kText,
          "the file to create of mean and count; with the value means"},
         {"EntropyFXA", Presence::kOptional, ValueKind::kText,
          "the file to create of the mean entropy of windows over the number of their values, and "
          "of "
          "the count; none when absent, and only with exact sums and the value texture"}}),
    {}};

class FxComputePixelAttributesCommand final : public RegionCommand {
  CommandResult Execute() override {
    if (!CheckInputs() || !ReadValues()) return Fail();
    const BasicRasterPtr image = FindImage();
    if (!image) return Fail();
    const BasicRasterPtr labels = FindLabels(image.Get());
    if (!labels || !ReadFiles() || !ReadKernel(*image)) return Fail();
    if (HasInput(kShareInput) && SumsForm() != Form::kExact) {
      return Fail("Share goes with exact sums");
    }
    ShareScope shares;
    if (!shares.Begin({HasInput(kShareInput), Read<Array<unsigned>>(kShareInput),
                       Read<String>(kShareFileInput), Read<Array<String>>(kShareFilesInput)},
                      KeyOfShares(*image, *labels))) {
      return Fail();
    }
    const IPC first(GetIPC().abort,
                    ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, 5)));
    LabelCensus census;
    if (!census.Run(labels, first)) return Fail();
    const IPC second(GetIPC().abort,
                     ProgressReportPtr(new ScaledProgressReport(GetIPC().progress, 5, 4)));
    plan_.ofShare = {Wants("spectral"), Wants("texture"), Wants("means"),
                     entropy_.GetLength() != 0};
    bool isDone = shares.IsShare() || CreateFiles(image->Bands());
    isDone = isDone && DispatchType(EightTypes{}, image->DataType(), [&]<typename T>() {
               const RasterPtr<T> typed(image);
               return SumsForm() == Form::kExact
                          ? RegionPass<T>(typed, labels, census, plan_).Run(second)
                          : RunTold<T>(typed, labels, second);
             });
    isDone = isDone && CloseFiles() && shares.End();
    return isDone ? Succeed() : FailWithout("the values could not be computed", SumsForm());
  }

  std::string KeyOfShares(const BasicRaster& image, const BasicRaster& labels) const {
    std::string key = fmt::format("regions {} {} {} {} {} {} {}", image.DataType(), image.Bands(),
                                  image.Samples(), image.Lines(), labels.DataType(), plan_.kernel,
                                  entropy_.GetLength() != 0);
    for (const std::string& value : values_) key += " " + value;
    return key;
  }

  bool Wants(const char* value) const {
    return std::find(values_.begin(), values_.end(), value) != values_.end();
  }

  bool ReadValues() {
    if (!HasInput("Values")) {
      values_ = {"spectral", "texture"};
      return true;
    }
    for (const String& value : Read<Array<String>>("Values")) {
      values_.push_back(value.ToUTF8());
      const std::string& name = values_.back();
      if (name == "spectral" || name == "texture" || name == "means") continue;
      SetFault(String("Values: \"" + name + "\" is none of spectral, texture and means"));
      return false;
    }
    if (!values_.empty()) return true;
    SetFault("Values: there are none");
    return false;
  }

  bool ReadFiles() {
    const auto read = [this](const char* value, const char* name, URI& uri) {
      return !Wants(value) || (CheckRequired(name) && TakeOutput(name, uri));
    };
    if (!read("spectral", "SpectralFXA", spectral_) || !read("texture", "TextureFXA", texture_) ||
        !read("means", "MeansFXA", means_)) {
      return false;
    }
    if (!HasInput("EntropyFXA")) return true;
    if (Wants("texture") && SumsForm() == Form::kExact) {
      return TakeOutput("EntropyFXA", entropy_);
    }
    SetFault("EntropyFXA: the entropy comes with exact sums and the value texture");
    return false;
  }

  bool ReadKernel(const BasicRaster& image) {
    if (!Wants("texture")) return true;
    if (!CheckRequired("TextureKernelSize")) return false;
    const auto kernel = Read<std::int32_t>("TextureKernelSize");
    if (kernel < 0) {
      SetFault(
          String("TextureKernelSize: a window of " + std::to_string(kernel) + " pixels can't be"));
      return false;
    }
    // No window reaches further than to the far side of the raster.
    const std::uint64_t most = 2 * std::uint64_t{std::max(image.Samples(), image.Lines())} + 1;
    plan_.kernel = static_cast<unsigned>(std::min(static_cast<std::uint64_t>(kernel), most));
    return true;
  }

  bool CreateFiles(unsigned bands) {
    const auto create = [&](const URI& uri, auto& file) {
      using File = std::remove_pointer_t<decltype(file.Get())>;
      if (uri.GetLength() == 0) return true;
      file.Reset(new File(uri, bands));
      if (!file->IsValid()) return false;
      NoteCreated(uri);
      return true;
    };
    return create(spectral_, plan_.spectral) && create(texture_, plan_.texture) &&
           create(means_, plan_.means) && create(entropy_, plan_.entropy);
  }

  bool CloseFiles() {
    const auto close = [](const auto& file) { return !file || file->Close(); };
    return close(plan_.spectral) && close(plan_.texture) && close(plan_.means) &&
           close(plan_.entropy);
  }

  template <typename T>
  bool RunTold(const RasterPtr<T>& image, const BasicRasterPtr& labels, const IPC& ipc) {
    if (plan_.spectral || plan_.texture) {
      SpectralTextureRegionAttributesComputeProcess<T> process(image, labels, plan_.spectral,
                                                               plan_.texture, plan_.kernel, ipc);
      if (!HasRun(process)) return false;
    }
    if (!plan_.means) return true;
    RegionMeansComputeProcess<T> process(image, labels, plan_.means, ipc);
    return HasRun(process);
  }

  std::vector<std::string> values_;
  URI spectral_, texture_, means_, entropy_;
  RegionPassPlan plan_;
};

const CommandFactoryT<FxComputePixelAttributesCommand> fxComputePixelAttributesFactory(
    kPixelAttributes);
const DivisionRegistration fxComputePixelAttributesDivision(
    {.command = "FxComputePixelAttributesCommand",
     .kind = DivisionKind::kShares,
     .source = "SrcURI",
     .makes = {"SpectralFXA", "TextureFXA", "MeansFXA", "EntropyFXA"},
     .dividesWhen = "Sums"});

}  // namespace
}  // namespace lumo
