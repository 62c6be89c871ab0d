#include "data/format_detection.h"

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "data/access_policy.h"
#include "data/data_connection.h"
#include "data/source_head.h"
#include "foundation/fault.h"
#include "foundation/file_faults.h"
#include "foundation/own_plugin.h"
#include "foundation/thrown.h"

namespace lumo {
namespace {

thread_local const FormatDetection* tDetected = nullptr;

std::string Describe(const FileFault& fault) {
  return fault.path + ": " + fault.Text();
}

/// Takes the fault of a row that has no factory; gives it where the plug-in is there and the system
/// would not load it, and nothing where there is no such plug-in.
String WhyNotLoaded(const FormatRecord& record) {
  const String why = TakeFault();
  const bool isAbsent = why.ToUTF8().find(std::strerror(ENOENT)) != std::string::npos;
  return record.library == nullptr && !isAbsent ? why : String();
}

bool Recognises(DataConnectionFactory& factory, const Array<String>& connStrings) {
  try {
    return factory.CanConnect(connStrings);
  } catch (...) {
    SetFault("the plug-in failed: " + DescribeException());
  }
  return false;
}

}  // namespace

FormatDetection DetectFormats(const Array<String>& connStrings, DetectionExtent extent) {
  FormatDetection found;
  std::error_code fault;
  const std::string own = connStrings.GetCount() != 0
                              ? std::filesystem::absolute(connStrings[0].ToUTF8(), fault).string()
                              : std::string();
  const SourceHead head(connStrings);
  const FileFaults faults;
  for (std::uint32_t row = 0; row < FormatCount(); ++row) {
    const FormatRecord& format = GetFormat(row);
    if (!MayUseFormat(format)) continue;
    const bool isOwnRow = IsOwnPlugin(LibraryName(format).ToUTF8());
    if (isOwnRow && !head.MayBeOf(format)) continue;
    if (extent == DetectionExtent::kToFirst && isOwnRow && !found.willing.empty() &&
        GetFormat(found.willing.front()).kind == format.kind) {
      found.isWhole = false;
      continue;
    }
    LoadFormat(row);
    DataConnectionFactory* const factory = GetFactory(format);
    if (factory == nullptr) {
      if (found.unread.GetLength() == 0) found.unread = WhyNotLoaded(format);
      continue;
    }
    found.isOwn = found.isOwn && isOwnRow;
    if (Recognises(*factory, connStrings)) found.willing.push_back(row);
    if (const FileFault* const broken = faults.FirstOf(own)) {
      found.unread = Describe(*broken);
      found.willing.clear();
      return found;
    }
  }
  if (found.unread.GetLength() == 0 && faults.First() != nullptr) {
    found.unread = Describe(*faults.First());
  }
  return found;
}

DetectedScope::DetectedScope(const FormatDetection* detection) : before_(tDetected) {
  if (detection != nullptr) tDetected = detection;
}

DetectedScope::~DetectedScope() {
  tDetected = before_;
}

const FormatDetection* DetectedScope::Current() {
  return tDetected;
}

}  // namespace lumo
