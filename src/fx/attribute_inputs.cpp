#include "fx/attribute_inputs.h"

#include <filesystem>
#include <system_error>

#include "data/access_policy.h"
#include "foundation/fault.h"

namespace lumo {
namespace {

bool AreSameFile(const std::string& a, const std::string& b) {
  std::error_code none;
  return a == b || std::filesystem::equivalent(a, b, none);
}

}  // namespace

bool RegionCommand::CheckAll(std::initializer_list<const char*> names) {
  for (const char* const name : names) {
    if (!CheckRequired(name)) return false;
  }
  return true;
}

BasicRasterPtr RegionCommand::FindImage() {
  BasicRasterPtr image = FindRaster("SrcURI");
  if (!image) return {};
  rasters_.emplace_back("SrcURI", image->GetURI().ToUTF8());
  if (DispatchType(EightTypes{}, image->DataType(), [&]<typename T>() { return true; })) {
    return image;
  }
  SetFault("SrcURI: regions have no values in pixels of this type");
  return {};
}

BasicRasterPtr RegionCommand::FindLabels(const BasicRaster* image, bool mayBeNatural) {
  BasicRasterPtr labels = FindRaster("LabelURI");
  if (!labels) return {};
  rasters_.emplace_back("LabelURI", labels->GetURI().ToUTF8());
  const unsigned type = labels->DataType();
  if (type != kDataTypeOf<std::int32_t> && (!mayBeNatural || type != kDataTypeOf<std::uint32_t>)) {
    SetFault(mayBeNatural ? "LabelURI: labels are whole numbers of type Int or UInt"
                          : "LabelURI: labels are whole numbers of type Int");
    return {};
  }
  if (image != nullptr &&
      (labels->Samples() != image->Samples() || labels->Lines() != image->Lines())) {
    SetFault(String("LabelURI: the labels have " + std::to_string(labels->Samples()) + " x " +
                    std::to_string(labels->Lines()) + " pixels, the image " +
                    std::to_string(image->Samples()) + " x " + std::to_string(image->Lines())));
    return {};
  }
  return labels;
}

bool RegionCommand::IsNew(const char* name, const URI& uri) const {
  const std::string path = uri.ToUTF8();
  if (path.empty()) return Refuse(std::string(name) + ": there is no name of a file");
  for (const auto* const files : {&outputs_, &rasters_}) {
    for (const auto& [other, otherPath] : *files) {
      if (!AreSameFile(path, otherPath)) continue;
      return Refuse(std::string(name) + ": the file is that of " + other + " too");
    }
  }
  return true;
}

bool RegionCommand::TakeOutput(const char* name, URI& uri) {
  uri = URI(Read<String>(name));
  if (!IsNew(name, uri)) return false;
  outputs_.emplace_back(name, uri.ToUTF8());
  return true;
}

bool RegionCommand::TakeExisting(const char* name, URI& uri) {
  uri = URI(Read<String>(name));
  if (!IsNew(name, uri)) return false;
  if (!MayReachFile(uri.ToUTF8(), false)) return false;
  std::error_code none;
  if (std::filesystem::exists(uri.ToUTF8(), none)) return true;
  return Refuse(std::string(name) + ": there is no file " + uri.ToUTF8());
}

bool RegionCommand::HasRun(ProcessBuilder<Process>& process) {
  const bool hasRun = process.RunProcess(process.kHere);
  const bool isAborted = GetIPC().abort->IsSet();
  if (hasRun && !isAborted) return true;
  SetFault(isAborted ? String("the work was aborted") : process.GetFault());
  return false;
}

CommandResult RegionCommand::FailWithout(const char* otherwise, Form form) {
  const String fault = TakeFaultOr(otherwise);
  if (form != Form::kTold) {
    std::error_code none;
    for (const std::string& path : created_) std::filesystem::remove(path, none);
  }
  return Fail(fault);
}

InputDeclaration SumsInput() {
  return {"Sums",
          Presence::kOptional,
          ValueKind::kWord,
          "Told: in float, tile after tile; Exact: in integers or doubles until the end, with the "
          "same bits for any tiles and threads; values that are not finite then count for nothing",
          "",
          &WordsIn<Form>};
}

}  // namespace lumo
