#include "tiff/tiff_siblings.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <memory>
#include <mutex>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "foundation/text_case.h"

namespace lumo::tiff {
namespace {

namespace fs = std::filesystem;

/// The names in a folder that can mean something to another file, in small letters and sorted.
struct Listing {
  fs::file_time_type changed;
  bool isSettled = false;  // listed so long after the change that none can have been missed
  std::vector<std::string> names;
};
using ListingPtr = std::shared_ptr<const Listing>;

bool IsTiff(std::string_view name) {
  return name.ends_with(".tif") || name.ends_with(".tiff");
}

ListingPtr List(const fs::path& folder, fs::file_time_type changed) {
  auto listing = std::make_shared<Listing>();
  listing->changed = changed;
  constexpr auto kTick = std::chrono::seconds(2);
  listing->isSettled = fs::file_time_type::clock::now() - changed > kTick;
  std::error_code fault;
  for (fs::directory_iterator at(folder, fault), end; !fault && at != end; at.increment(fault)) {
    std::string name = LowerCase(at->path().filename().string());
    if (!IsTiff(name)) listing->names.push_back(std::move(name));
  }
  if (fault) return nullptr;
  std::sort(listing->names.begin(), listing->names.end());
  return listing;
}

ListingPtr FindListing(const fs::path& folder) {
  constexpr std::size_t kMostFolders = 64;
  static std::mutex mutex;
  static auto& listings = *new std::unordered_map<std::string, ListingPtr>;
  std::error_code fault;
  const fs::file_time_type changed = fs::last_write_time(folder, fault);
  if (fault) return nullptr;
  {
    const std::lock_guard lock(mutex);
    const auto at = listings.find(folder.string());
    if (at != listings.end() && at->second->changed == changed) return at->second;
  }
  ListingPtr listing = List(folder, changed);
  if (listing == nullptr || !listing->isSettled) return listing;
  const std::lock_guard lock(mutex);
  if (listings.size() >= kMostFolders) listings.clear();
  listings[folder.string()] = listing;
  return listing;
}

/// Calls `test` for the names that begin with a text, until it says true.
template <typename Test>
bool AnyWith(const Listing& listing, const std::string& start, const Test& test) {
  auto at = std::lower_bound(listing.names.begin(), listing.names.end(), start);
  for (; at != listing.names.end() && at->starts_with(start); ++at) {
    if (test(*at)) return true;
  }
  return false;
}

/// Headers of scenes, whose names begin like those of the scenes' files.
bool MayBeHeader(std::string_view name) {
  constexpr std::array<std::string_view, 9> kEndings = {".txt", ".xml", ".imd",  ".rpb", ".pvl",
                                                        ".rpc", ".eph", ".pass", ".dim"};
  return !name.ends_with(".aux.xml") &&
         std::any_of(kEndings.begin(), kEndings.end(),
                     [&](std::string_view ending) { return name.ends_with(ending); });
}

}  // namespace

Company CompanyOf(const std::string& path) {
  const fs::path file(path);
  const ListingPtr listing = FindListing(file.parent_path());
  const std::string stem = LowerCase(file.stem().string());
  // These have headers that begin in another way.
  if (listing == nullptr || stem.empty() || stem.starts_with("img")) return Company::kOthers;
  constexpr std::size_t kAlike = 3;
  const std::string side = LowerCase(file.filename().string()) + ".aux.xml";
  bool hasSideFile = false;
  const auto isNear = [&](std::string_view name) {
    const bool goesOn = name.size() > stem.size() &&
                        std::isalnum(static_cast<unsigned char>(name[stem.size()])) != 0;
    const bool isSide = name == side && !hasSideFile;
    hasSideFile = hasSideFile || isSide;
    return !goesOn && !isSide;
  };
  if (AnyWith(*listing, stem, isNear) || AnyWith(*listing, stem.substr(0, kAlike), MayBeHeader)) {
    return Company::kOthers;
  }
  return hasSideFile ? Company::kSideFile : Company::kNone;
}

}  // namespace lumo::tiff
