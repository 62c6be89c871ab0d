#include "data/open_sources.h"

#include <algorithm>
#include <mutex>
#include <set>

#include "data/file_uri.h"
#include "data/format_table.h"

namespace lumo {
namespace {

/// The sources that are open or about to be made.
struct Sources {
  std::mutex mutex;
  std::set<const SourceStamp*> stamps;

  static Sources& Get() {
    static auto& sources = *new Sources;
    return sources;
  }
};

/// True when a name of one source leads to a file of the other. Files may have been made, and links
/// set, since a stamp was taken.
bool Meet(const SourceStamp::File& one, const SourceStamp::File& open) {
  return one.uri == open.uri || one.identity.IsSameFile(open.identity) ||
         one.identity.IsSameFile(platform::IdentifyFile(open.path));
}

bool Meet(const SourceStamp& one, const SourceStamp& open) {
  return std::any_of(
      one.GetFiles().begin(), one.GetFiles().end(), [&](const SourceStamp::File& file) {
        return std::any_of(open.GetFiles().begin(), open.GetFiles().end(),
                           [&](const SourceStamp::File& other) { return Meet(file, other); });
      });
}

template <typename Holds>
bool AllFiles(const SourceStamp& stamp, const Holds& holds) {
  return std::all_of(
      stamp.GetFiles().begin(), stamp.GetFiles().end(), [&](const SourceStamp::File& file) {
        return !file.identity.exists || holds(file.identity, platform::IdentifyFile(file.path));
      });
}

}  // namespace

SourceStamp::SourceStamp(const Array<String>& connStrings) {
  if (FindFormatName(connStrings) == "MemoryRaster") return;
  for (const String& piece : connStrings) {
    if (FindFormat(piece) != nullptr) continue;
    for (const std::string& path : PathsIn(piece.ToUTF8())) {
      const platform::FileIdentity identity = platform::IdentifyFile(path);
      // A part of a longer name means a file only where there is one.
      if (identity.exists || path == piece.ToUTF8()) {
        files_.push_back({path, FileURI(path), identity});
      }
    }
  }
}

bool SourceStamp::IsCurrent() const {
  return AllFiles(*this, [](const auto& then, const auto& now) { return then == now; });
}

bool SourceStamp::HasSameFiles() const {
  return AllFiles(*this, [](const auto& then, const auto& now) { return then.IsSameFile(now); });
}

OpenSource::OpenSource(const SourceStamp& stamp) : stamp_(stamp) {
  Sources& sources = Sources::Get();
  const std::lock_guard lock(sources.mutex);
  sources.stamps.insert(&stamp_);
}

OpenSource::~OpenSource() {
  Sources& sources = Sources::Get();
  const std::lock_guard lock(sources.mutex);
  sources.stamps.erase(&stamp_);
}

SourceClaim::SourceClaim(const Array<String>& connStrings) : stamp_(connStrings) {
  Sources& sources = Sources::Get();
  const std::lock_guard lock(sources.mutex);
  granted_ = std::none_of(sources.stamps.begin(), sources.stamps.end(),
                          [this](const SourceStamp* open) { return Meet(stamp_, *open); });
  if (granted_) sources.stamps.insert(&stamp_);
}

SourceClaim::~SourceClaim() {
  Sources& sources = Sources::Get();
  const std::lock_guard lock(sources.mutex);
  sources.stamps.erase(&stamp_);
}

}  // namespace lumo
