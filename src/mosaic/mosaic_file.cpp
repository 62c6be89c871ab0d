#include "mosaic/mosaic_file.h"

#include <algorithm>
#include <chrono>
#include <map>
#include <mutex>

#include <fmt/format.h>

#include "data/access_policy.h"
#include "data/format_table.h"
#include "foundation/fault.h"
#include "foundation/json_lines.h"
#include "foundation/near_name.h"
#include "foundation/text_case.h"
#include "mosaic/json_fields_body.h"
#include "mosaic/mosaic_json.h"
#include "mosaic/owner_file.h"
#include "platform/random_access_file.h"

namespace lumo {
namespace {

bool ReadText(const std::string& path, std::string& text, std::string& fault) {
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  std::uint64_t size = 0;
  if (!file || !file->GetSize(size, &fault)) return false;
  constexpr std::uint64_t kMost = std::uint64_t{256} << 20;
  if (size > kMost) {
    fault = path + ": too large for the definition of a mosaic";
    return false;
  }
  text.resize(size);
  return file->Read(0, text.data(), text.size(), &fault);
}

}  // namespace

Array<String> ConnStringsOf(const MosaicScene& scene) {
  std::vector<String> pieces;
  bool isFirst = true;
  for (const std::string& option : scene.options) {
    if (isFirst && FindFormat(String(option)) == nullptr) pieces.emplace_back(scene.file);
    isFirst = isFirst && FindFormat(String(option)) != nullptr;
    pieces.emplace_back(option);
  }
  const String file(scene.file);
  if (std::find(pieces.begin(), pieces.end(), file) == pieces.end()) pieces.push_back(file);
  Array<String> strings{ArrayDims(static_cast<unsigned>(pieces.size()))};
  std::copy(pieces.begin(), pieces.end(), strings.begin());
  return strings;
}

std::string StateOfScene(const MosaicScene& scene) {
  if (!IsSceneOnDisk(scene.file)) return {};
  std::string state;
  for (const char* const ending : {"", ".ovr", ".pyr"}) {
    const platform::FileIdentity file = platform::IdentifyFile(scene.file + ending);
    if (!file.exists && *ending == '\0') return {};
    if (!file.exists) continue;
    if (!state.empty()) state.append(" ").append(ending);
    state.append(state.empty() ? "" : " ").append(fmt::format("{} {}", file.size, file.time));
  }
  return state;
}

bool IsMosaicFile(const std::string& path) {
  if (!LowerCase(path).ends_with(kMosaicEnding)) return false;
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, nullptr);
  char begin[256];
  std::size_t got = 0;
  if (!file || !file->ReadUpTo(0, begin, sizeof(begin), got)) return false;
  const std::string text(begin, got);
  const std::size_t first = text.find_first_not_of(" \t\r\n");
  return first != text.npos && text[first] == '{';
}

namespace {

/// The definitions that were read last, as long as their files stay the same: a raster is opened by
/// several hands, each of which reads it.
class RecentDocuments {
 public:
  bool Find(const std::string& path, const platform::FileIdentity& file, MosaicDocument& document) {
    const std::lock_guard lock(lock_);
    for (const Entry& entry : entries_) {
      if (entry.path != path || !(entry.file == file)) continue;
      document = entry.document;
      return true;
    }
    return false;
  }
  void Add(const std::string& path, const platform::FileIdentity& file,
           const MosaicDocument& document) {
    const std::lock_guard lock(lock_);
    constexpr std::size_t kKept = 4;
    std::erase_if(entries_, [&](const Entry& entry) { return entry.path == path; });
    if (entries_.size() == kKept) entries_.erase(entries_.begin());
    entries_.push_back({path, file, document});
  }

 private:
  struct Entry {
    std::string path;
    platform::FileIdentity file;
    MosaicDocument document;
  };
  std::mutex lock_;
  std::vector<Entry> entries_;
};

RecentDocuments& GetRecentDocuments() {
  static RecentDocuments documents;
  return documents;
}

/// True for a file that was last changed so long ago that a change since would show in its time.
bool IsSettled(const platform::FileIdentity& file) {
  const auto now = std::chrono::duration_cast<std::chrono::nanoseconds>(
                       std::chrono::system_clock::now().time_since_epoch())
                       .count();
  constexpr std::int64_t kTick = 20'000'000;  // ns, above that of file systems' clocks
  return file.exists && now - file.time > kTick;
}

}  // namespace

bool ReadMosaicFile(const std::string& path, MosaicDocument& document, std::string& fault) {
  const platform::FileIdentity file = platform::IdentifyFile(path);
  if (MayReachFile(path, false) && GetRecentDocuments().Find(path, file, document)) return true;
  std::string text;
  if (!ReadText(path, text, fault)) return false;
  try {
    document = MosaicFromJson(text, path);
    if (IsSettled(file) && platform::IdentifyFile(path) == file) {
      GetRecentDocuments().Add(path, file, document);
    }
    return true;
  } catch (const JsonMisfit& misfit) {
    fault = misfit.pointer.empty() && misfit.what.starts_with("line ")
                ? fmt::format("{}: {}", path, misfit.what)
                : fmt::format("{}: line {}: {}{}{}", path, LineOfJson(text, misfit.pointer),
                              misfit.pointer.empty() ? "" : misfit.pointer.c_str() + 1,
                              misfit.pointer.empty() ? "" : ": ", misfit.what);
  } catch (const std::exception& error) {
    fault = fmt::format("{}: {}", path, Printable(error.what(), 120));
  }
  return false;
}

bool WriteMosaicFile(const std::string& path, const MosaicDocument& document, std::string& fault,
                     const std::string& place) {
  const std::string text = MosaicToJson(document, place.empty() ? path : place);
  return platform::ReplaceFile(path, text, &fault);
}

bool UpdateMosaicFile(const std::string& path,
                      const std::function<bool(MosaicDocument&, std::string&)>& change,
                      std::string& fault) {
  static std::mutex ofThisProcess;
  const std::lock_guard lock(ofThisProcess);
  OwnerFile owner(path);
  MosaicDocument document;
  return owner.Take(fault) && ReadMosaicFile(path, document, fault) && change(document, fault) &&
         WriteMosaicFile(path, document, fault);
}

}  // namespace lumo
