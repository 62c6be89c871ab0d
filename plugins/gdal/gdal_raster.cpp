#include "gdal_raster.h"

#include <algorithm>
#include <cpl_minixml.h>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/warnings.h"
#include "gdal_band_values.h"
#include "gdal_common/file_guard.h"
#include "gdal_common/messages.h"
#include "gdal_creation.h"
#include "gdal_georef.h"
#include "gdal_levels.h"
#include "gdal_masks.h"
#include "gdal_open.h"
#include "gdal_overviews.h"
#include "gdal_twins.h"
#include "gdal_types.h"
#include "platform/folder_lock.h"
#include "platform/random_access_file.h"

namespace lumo::gdal {
namespace {

Interleave ReadInterleave(GDALDatasetH dataset) {
  const char* const word = GDALGetMetadataItem(dataset, "INTERLEAVE", "IMAGE_STRUCTURE");
  const std::string text = word != nullptr ? word : "";
  // With one band all are the same.
  if (GDALGetRasterCount(dataset) == 1) return Interleave::BSQ;
  return text == "PIXEL" ? Interleave::BIP : text == "LINE" ? Interleave::BIL : Interleave::BSQ;
}

bool DriverUpdates(const Format& format) {
  GDALDriverH const driver = GDALGetDriverByName(format.drivers.front().c_str());
  const char* const creates = GDALGetMetadataItem(driver, GDAL_DCAP_CREATE, nullptr);
  return creates != nullptr && std::string(creates) == "YES";
}

/// False for a file of values beside a raster that GDAL would pass over without a word.
bool IsSideFileWhole(const std::string& path) {
  std::error_code ignored;
  if (!std::filesystem::is_regular_file(path, ignored)) return true;
  const Messages messages;
  CPLXMLNode* const tree = CPLParseXMLFile(path.c_str());
  const bool isWhole = tree != nullptr && CPLGetXMLNode(tree, "=PAMDataset") != nullptr;
  CPLDestroyXMLNode(tree);
  return isWhole;
}

/// Warns of files beside a raster that are left out, since they are damaged or of something else.
void WarnOfUnusedFiles(const std::string& name, const RasterLevel& full) {
  const Messages messages;  // GDAL's words on them would not say that they are left out
  std::error_code ignored;
  const auto warn = [&](const char* suffix, const char* what) {
    AddWarning(name + suffix + ": " + what + "; it is left out");
  };
  if (!IsSideFileWhole(name + ".aux.xml") && messages.Files().First() == nullptr) {
    warn(".aux.xml", "isn't whole");
  }
  GDALRasterBandH const band = full.bands.front();
  if (HasLevelFile(name) && GDALGetOverviewCount(band) == 0) {
    warn(".ovr", "holds no levels that can be read");
  }
  if (std::filesystem::is_regular_file(name + ".msk", ignored) &&
      (GDALGetMaskFlags(band) & GMF_ALL_VALID) != 0) {
    warn(".msk", "holds no mask that can be read");
  }
}

}  // namespace

/// Strides of a block in an interleave, in bytes.
struct OpenRaster::Strides {
  Strides(lumo::Interleave interleave, const BlockPlace& place, GSpacing element) {
    const GSpacing width = place.width, height = place.height, bands = place.bands.GetCount();
    switch (interleave) {
      case lumo::Interleave::BIP:
        pixel = bands * element, line = width * pixel, band = element;
        break;
      case lumo::Interleave::BIL:
        pixel = element, band = width * element, line = bands * band;
        break;
      default:
        pixel = element, line = width * element, band = height * line;
        break;
    }
  }
  GSpacing pixel, line, band;
};

OpenRaster::OpenRaster(const Format& format, const Source& source)
    : format_(format), source_(source) {}

OpenRaster::~OpenRaster() {
  Close();
}

std::unique_ptr<OpenRaster> OpenRaster::Open(const Format& format, const Source& source) {
  std::unique_ptr<OpenRaster> raster(new OpenRaster(format, source));
  if (!raster->TakeDataset(OpenToRead(format, source))) return nullptr;
  raster->twins_ = std::make_unique<Twins>(format, source, raster->dataset_.get());
  if (source.isFile) WarnOfUnusedFiles(source.name, raster->levels_.at(0));
  return raster;
}

std::unique_ptr<OpenRaster> OpenRaster::OpenTwin(const Format& format, const Source& source) {
  std::unique_ptr<OpenRaster> raster(new OpenRaster(format, source));
  return raster->TakeDataset(OpenToRead(format, source)) ? std::move(raster) : nullptr;
}

bool OpenRaster::IsAlike(const OpenRaster& other) const {
  return dataType_ == other.dataType_ && Bands() == other.Bands() &&
         interleave_ == other.interleave_ &&
         std::equal(levels_.begin(), levels_.end(), other.levels_.begin(), other.levels_.end(),
                    [](const auto& a, const auto& b) {
                      return a.first == b.first && a.second.samples == b.second.samples &&
                             a.second.lines == b.second.lines;
                    });
}

std::unique_ptr<OpenRaster> OpenRaster::Create(const Format& format, const Source& source,
                                               const RasterDef& def) {
  std::unique_ptr<OpenRaster> raster(new OpenRaster(format, source));
  DatasetPtr dataset;
  raster->newRaster_ = NewRaster::Begin(format, source.name, def, dataset);
  if (raster->newRaster_ == nullptr) return nullptr;
  raster->isUpdated_ = true;
  raster->canWrite_ = Answer::kYes;
  if (raster->TakeDataset(std::move(dataset))) return raster;
  const String why = TakeFault();
  raster->newRaster_->Doom();
  raster.reset();
  SetFault(why);  // rather than that its end gives
  return nullptr;
}

bool OpenRaster::TakeDataset(DatasetPtr dataset) {
  const Messages messages;
  twins_.reset();  // of what was open before
  dataset_ = std::move(dataset);
  levels_.clear();
  if (dataset_ == nullptr) return false;
  dataType_ = CommonDataType(dataset_.get(), Name());
  if (dataType_ == 0) return false;
  interleave_ = ReadInterleave(dataset_.get());
  levels_ = FindLevels(dataset_.get());
  // The overviews are looked for only now, and a file may name one anywhere.
  return IsWithoutFault(messages, source_) && WasRefusedNothing();
}

/// Takes the dataset of a raster that was open before: its reader goes by what it was then.
bool OpenRaster::TakeAgain(DatasetPtr dataset) {
  const unsigned dataType = dataType_, bands = Bands();
  const unsigned samples = levels_.at(0).samples, lines = levels_.at(0).lines;
  const lumo::Interleave interleave = interleave_;
  if (!TakeDataset(std::move(dataset))) return false;
  const RasterLevel& full = levels_.at(0);
  if (dataType_ == dataType && Bands() == bands && full.samples == samples && full.lines == lines &&
      interleave_ == interleave) {
    return true;
  }
  levels_.clear();
  dataset_.reset();
  return FailWith(Name(), "has become another raster since it was opened");
}

bool OpenRaster::Close() {
  if (dataset_ == nullptr) return true;
  levels_.clear();
  twins_.reset();
  const std::unique_ptr<NewRaster> made = std::move(newRaster_);
  if (made != nullptr) return made->Finish(std::move(dataset_));
  const Messages messages;
  dataset_.reset();
  // A raster that was only read has nothing to lose.
  return !isUpdated_ || !messages.HasError() || messages.Fail(Name());
}

const RasterLevel* OpenRaster::FindLevel(unsigned level) const {
  const auto at = levels_.find(level);
  return at != levels_.end() ? &at->second : nullptr;
}

RasterDef OpenRaster::Describe(bool hasSystem) const {
  const Messages messages;
  RasterDef def;
  const RasterLevel& full = levels_.at(0);
  def.samples = full.samples;
  def.lines = full.lines;
  def.bands = Bands();
  def.interleave = interleave_;
  def.dataType = dataType_;
  def.format = String(format_.key);
  int width = 0, height = 0;
  GDALGetBlockSize(full.bands.front(), &width, &height);
  // Blocks of whole lines are no tiles, however many lines they have.
  const bool isTiled = static_cast<unsigned>(width) != full.samples && height > 1;
  def.tileWidth = static_cast<unsigned>(width);
  def.tileHeight = isTiled ? static_cast<unsigned>(height) : 1;
  def.SetGeoRef(ReadGeoRef(full.dataset, hasSystem));
  return def;
}

bool OpenRaster::CanWrite() {
  if (canWrite_ == Answer::kUnknown) {
    const bool can = source_.isFile && DriverUpdates(format_) &&
                     platform::RandomAccessFile::Open(
                         Name(), platform::RandomAccessFile::Access::kUpdate) != nullptr;
    canWrite_ = can ? Answer::kYes : Answer::kNo;
  }
  return canWrite_ == Answer::kYes;
}

bool OpenRaster::OpenForUpdate() {
  if (isUpdated_) return true;
  if (levels_.empty() || !CanWrite()) return FailWith(Name(), "can't be written");
  DatasetPtr updated = OpenDataset(source_, format_, GDAL_OF_RASTER | GDAL_OF_UPDATE);
  canWrite_ = updated != nullptr ? Answer::kYes : Answer::kNo;
  if (updated == nullptr) return false;
  isUpdated_ = true;
  return TakeAgain(std::move(updated));
}

const RasterLevel* OpenRaster::CheckPlace(const BlockPlace& place) const {
  const RasterLevel* const level = FindLevel(place.level);
  if (level == nullptr) {
    FailWith(Name(), "has no level " + std::to_string(place.level));
    return nullptr;
  }
  const bool isInside =
      place.width != 0 && place.height != 0 && place.bands.GetCount() != 0 &&
      std::uint64_t{place.left} + place.width <= level->samples &&
      std::uint64_t{place.top} + place.height <= level->lines &&
      std::all_of(place.bands.begin(), place.bands.end(), [&](unsigned b) { return HasBand(b); });
  if (isInside) return level;
  FailWith(Name(), "the block asked for isn't inside the raster");
  return nullptr;
}

bool OpenRaster::ReadInto(const BlockPlace& part, const BlockPlace& whole, unsigned band,
                          void* pixels) const {
  const GSpacing element = GDALGetDataTypeSizeBytes(PixelTypeOf(dataType_).type);
  const Strides strides(interleave_, whole, element);
  char* const first = static_cast<char*>(pixels) + (part.left - whole.left) * strides.pixel +
                      (part.top - whole.top) * strides.line + band * strides.band;
  return Transfer(GF_Read, part, strides, first);
}

bool OpenRaster::Transfer(GDALRWFlag direction, const BlockPlace& place, void* pixels) const {
  const GSpacing element = GDALGetDataTypeSizeBytes(PixelTypeOf(dataType_).type);
  return Transfer(direction, place, Strides(interleave_, place, element), pixels);
}

bool OpenRaster::Transfer(GDALRWFlag direction, const BlockPlace& place, const Strides& strides,
                          void* pixels) const {
  const RasterLevel* const level = CheckPlace(place);
  if (level == nullptr) return false;
  if (newRaster_ != nullptr && newRaster_->HasPixels()) {
    return direction == GF_Read ? newRaster_->ReadPixels(place, pixels)
                                : newRaster_->WritePixels(place, pixels);
  }
  const Messages messages(Messages::Damage::kIsError);
  const GDALDataType type = PixelTypeOf(dataType_).type;
  const auto at = [](unsigned number) { return static_cast<int>(number); };
  CPLErr result = CE_None;
  const bool isWhole = level->dataset != nullptr;
  if (isWhole) {
    std::vector<int> numbers;
    for (const unsigned band : place.bands) numbers.push_back(at(band) + 1);
    result = GDALDatasetRasterIOEx(
        level->dataset, direction, at(place.left), at(place.top), at(place.width), at(place.height),
        pixels, at(place.width), at(place.height), type, at(place.bands.GetCount()), numbers.data(),
        strides.pixel, strides.line, strides.band, nullptr);
  }
  for (unsigned i = 0; !isWhole && result == CE_None && i < place.bands.GetCount(); ++i) {
    void* const first = static_cast<char*>(pixels) + strides.band * i;
    result = GDALRasterIOEx(level->bands[place.bands[i]], direction, at(place.left), at(place.top),
                            at(place.width), at(place.height), first, at(place.width),
                            at(place.height), type, strides.pixel, strides.line, nullptr);
  }
  // Some drivers report a read that broke off by a message alone.
  if (result == CE_None && !messages.HasError()) return true;
  return messages.Fail(Name(), direction == GF_Read ? "can't be read" : "can't be written");
}

bool OpenRaster::Read(const BlockPlace& place, void* pixels) {
  // GDAL's cache holds what was read of damaged data as if it were whole, and codecs warn once.
  if (isDamaged_ && !isUpdated_) {
    isPlain_ = true;
    if (!TakeAgain(OpenDataset(source_, format_, GDAL_OF_RASTER))) return false;
  }
  isDamaged_ = false;
  if (twins_ != nullptr && CheckPlace(place) != nullptr && twins_->Read(*this, place, pixels)) {
    return true;
  }
  if (Transfer(GF_Read, place, pixels)) return true;
  isDamaged_ = CheckPlace(place) != nullptr;
  const bool isShortCut = !isPlain_ && !isUpdated_ && format_.drivers.front() == "GTiff";
  if (!isShortCut || !isDamaged_) return false;
  // A read past its cache says nothing. A plain one says it here.
  isPlain_ = true;
  isDamaged_ = !TakeAgain(OpenDataset(source_, format_, GDAL_OF_RASTER)) ||
               !Transfer(GF_Read, place, pixels);
  return !isDamaged_;
}

bool OpenRaster::Write(const BlockPlace& place, const void* pixels) {
  if (place.level != 0) return FailWith(Name(), "a reduced level can't be written");
  if (CheckPlace(place) == nullptr || !OpenForUpdate()) return false;
  ForgetStatistics(place.bands);
  // GDAL only reads what it is given to write.
  if (Transfer(GF_Write, place, const_cast<void*>(pixels))) return true;
  if (newRaster_ != nullptr) newRaster_->Doom();
  return false;
}

std::map<unsigned, double> OpenRaster::KeptNoData() const {
  return newRaster_ != nullptr ? newRaster_->Definition().noData : std::map<unsigned, double>();
}

bool OpenRaster::HasRows() const {
  return newRaster_ != nullptr && newRaster_->HasRows();
}

bool OpenRaster::KeepsAlpha() const {
  return newRaster_ != nullptr && newRaster_->KeepsAlpha();
}

bool OpenRaster::ExcludeFromNew(const BlockPlace& place,
                                const std::vector<unsigned char>& excluded) {
  if (newRaster_ == nullptr) return true;
  const bool isWhole = place.bands.GetCount() >= Bands();
  if (newRaster_->Mask().Take(place, excluded, isWhole)) return true;
  newRaster_->Doom();
  return false;
}

/// Deletes what is stored of the pixels before a write to bands; of other bands what they have with
/// these.
void OpenRaster::ForgetStatistics(const Array<unsigned>& bands) {
  for (const unsigned band : bands) {
    DeleteStoredStats(Band(band));
    DeleteStoredHistograms(Band(band));
  }
  if (!mayHavePairs_) return;
  for (unsigned band = 0; band < Bands(); ++band) DeleteStoredPairs(Band(band));
  mayHavePairs_ = false;
}

bool OpenRaster::ReadMasks(const BlockPlace& place, unsigned char* state) {
  const RasterLevel* const level = CheckPlace(place);
  if (level == nullptr) return false;
  if (newRaster_ != nullptr && newRaster_->IsDescribedBeside()) return ReadNewAlpha(place, state);
  const Messages messages(Messages::Damage::kIsError);
  const Masks masks(*level, place.bands);
  if (!masks.IsNeeded()) return !messages.HasError() || messages.Fail(Name());
  const Strides strides(interleave_, place, 1);
  if (masks.Apply(place, strides.pixel, strides.line, strides.band, state) &&
      !messages.HasError()) {
    return true;
  }
  isDamaged_ = true;
  return messages.Fail(Name(), "the mask can't be read");
}

/// Excludes pixels of a raster that is being made, whose alpha band GDAL doesn't see.
bool OpenRaster::ReadNewAlpha(const BlockPlace& place, unsigned char* state) const {
  if (!newRaster_->KeepsAlpha()) return true;
  Array<unsigned> last(ArrayDims(1));
  last[0] = Bands() - 1;
  const std::size_t pixels = std::size_t{place.width} * place.height;
  const unsigned each = DataTypeBytes(dataType_);
  std::vector<unsigned char> alpha(pixels * each);
  const BlockPlace place1{place.left, place.top, place.width, place.height, last, 0};
  if (!newRaster_->ReadPixels(place1, alpha.data())) return false;
  const Strides strides(interleave_, place, 1);
  for (unsigned i = 0; i < place.bands.GetCount(); ++i) {
    if (place.bands[i] == last[0]) continue;
    for (std::size_t pixel = 0; pixel < pixels; ++pixel) {
      const unsigned char* const value = &alpha[pixel * each];
      if (std::any_of(value, value + each, [](unsigned char byte) { return byte != 0; })) continue;
      unsigned char& byte =
          state[strides.band * i + strides.line * static_cast<GSpacing>(pixel / place.width) +
                strides.pixel * static_cast<GSpacing>(pixel % place.width)];
      byte = static_cast<unsigned char>(byte | PixelValueState::Masked);
    }
  }
  return true;
}

bool OpenRaster::BuildOverviews(const char* method, unsigned levelMin, unsigned levelMax) {
  if (newRaster_ != nullptr) return FailWith(Name(), "a raster that is being made has no levels");
  std::vector<int> factors;
  for (unsigned level = std::max(levelMin, 1U); level <= std::min(levelMax, 30U); ++level) {
    factors.push_back(1 << level);
  }
  if (factors.empty()) return FailWith(Name(), "no levels asked for");
  // Levels inside a file that is being written can only be made there.
  const bool isInside = isUpdated_ && levels_.size() > 1 && !HasLevelFile(Name());
  if (isInside) {
    const bool isBuilt = gdal::BuildOverviews(dataset_.get(), method, factors, Name());
    levels_ = FindLevels(dataset_.get());
    return isBuilt;
  }
  if (isUpdated_) {
    const Messages messages;
    dataset_.reset();
    isUpdated_ = false;
    if (messages.HasError()) return messages.Fail(Name());
  }
  const bool isBuilt = BuildOverviewsBeside(source_, format_, method, factors);
  const String fault = TakeFault();
  const bool isOpen = Reopen();
  if (!isBuilt) SetFault(fault);
  return isBuilt && isOpen;
}

/// Opens the raster anew, as it was opened.
bool OpenRaster::Reopen() {
  if (isUpdated_) {
    const Messages messages;
    dataset_.reset();
    if (messages.HasError()) return messages.Fail(Name());
    return TakeAgain(OpenDataset(source_, format_, GDAL_OF_RASTER | GDAL_OF_UPDATE));
  }
  DatasetPtr dataset = OpenToRead(format_, source_);
  if (dataset == nullptr) return false;  // what is open stays
  isPlain_ = false;
  if (!TakeAgain(std::move(dataset))) return false;
  twins_ = std::make_unique<Twins>(format_, source_, dataset_.get());
  return true;
}

bool OpenRaster::ChangeStored(const std::function<bool()>& change) {
  const Messages messages;
  if (newRaster_ != nullptr) return change() || messages.Fail(Name());
  const platform::FolderLock lock(Name());
  std::string busy;
  if (!lock.IsHeld(&busy)) return FailWith(Name(), busy);
  if (levels_.empty() || !Reopen()) return false;
  // Values that could not be read would be lost when the file beside the raster is written anew.
  if (messages.Files().First() != nullptr) return messages.Fail(Name());
  if (!IsSideFileWhole(Name() + ".aux.xml")) {
    if (messages.Files().First() != nullptr) return messages.Fail(Name());
    return FailWith(Name() + ".aux.xml", "isn't whole, and stays as it is");
  }
  TakeFault();
  const bool isChanged = change();
  if (isChanged) GDALFlushCache(dataset_.get());  // which warns where it can't
  if (isChanged && !messages.HasError()) return true;
  String fault = TakeFault();
  if (fault.GetLength() == 0) {
    messages.Fail(Name());
    fault = TakeFault();
  }
  DropUnsaved(dataset_.get());
  Reopen();
  SetFault(fault);
  return false;
}

bool OpenRaster::FindLevelsAnew() {
  return isUpdated_ || levels_.empty() ? !levels_.empty() : Reopen();
}

bool OpenRaster::DeleteOverviews() {
  const Messages messages;
  const CPLErr result =
      GDALBuildOverviews(dataset_.get(), "NONE", 0, nullptr, 0, nullptr, nullptr, nullptr);
  levels_ = FindLevels(dataset_.get());
  return (result == CE_None && !messages.HasError()) || messages.Fail(Name());
}

}  // namespace lumo::gdal
