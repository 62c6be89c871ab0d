#include "gdal_creation.h"

#include <climits>
#include <cpl_string.h>
#include <cpl_vsi.h>
#include <filesystem>

#include "foundation/abandonment.h"
#include "foundation/fault.h"
#include "gdal_common/messages.h"
#include "gdal_details.h"
#include "gdal_georef.h"
#include "gdal_makers.h"
#include "gdal_no_data.h"
#include "gdal_rows.h"
#include "gdal_side_file.h"
#include "gdal_tiff_options.h"
#include "gdal_types.h"
#include "gdal_world_file.h"
#include "orva/orva_file.h"
#include "platform/file_swap.h"
#include "platform/folder_lock.h"
#include "platform/random_access_file.h"
#include "platform/temporary_file.h"
#include "raster/copy_blocks.h"
#include "tiff_writer/packed_pixels.h"
#include "tiff_writer/plain_pixels.h"

namespace lumo::gdal {
namespace {

namespace fs = std::filesystem;

/// Up to this size a raster that is to be copied waits in memory.
constexpr double kMaxBytesInMemory = 64 << 20;

/// Files that belong to a raster by their name alone, and describe its pixels.
constexpr const char* kSideFiles[] = {".aux.xml", ".ovr", ".msk"};

bool Exists(const std::string& path) {
  std::error_code fault;
  return fs::exists(path, fault);
}

void Remove(const std::string& path) {
  std::error_code ignored;
  fs::remove(path, ignored);
}

/// With the extension at the end, since drivers choose by it.
std::string TemporaryPath(const std::string& path) {
  return platform::TemporaryPathBeside(path) + fs::path(path).extension().string();
}

}  // namespace

NewRaster::NewRaster(std::string driver, const std::string& path, const RasterDef& def)
    : driver_(std::move(driver)),
      path_(path),
      def_(AsKept(driver_, def)),
      older_(platform::IdentifyFile(path)),
      temporary_(TemporaryPath(path)),
      isPacked_(driver_ == "GTiff" && IsPacked(def_)),
      mask_(platform::TemporaryPathBeside(path), def.samples, def.lines) {}

NewRaster::~NewRaster() {
  for (const std::string& path : {temporary_, scratch_}) {
    if (path.empty()) continue;
    Remove(path);
    for (const char* const suffix : kSideFiles) Remove(path + suffix);
    Remove(fs::path(path).replace_extension(".ige").string());
    Remove(WorldName(path));
  }
}

/// GDAL's words name the temporary files; the user knows only the place.
std::string NewRaster::Shown(const std::string& text) const {
  std::string shown = text;
  const std::string name = fs::path(temporary_).filename().string();
  for (const auto& [from, to] : {std::pair(temporary_, path_), std::pair(scratch_, path_),
                                 std::pair(name, fs::path(path_).filename().string())}) {
    for (std::size_t at = 0; !from.empty() && (at = shown.find(from, at)) != shown.npos;
         at += to.size()) {
      shown.replace(at, from.size(), to);
    }
  }
  return shown;
}

/// Sets the fault of this thread by the user's name.
bool NewRaster::ShowFault() const {
  SetFault(Shown(TakeFault().ToUTF8()));
  return false;
}

bool NewRaster::ReadPixels(const BlockPlace& place, void* pixels) const {
  return pixels_->Read(place, pixels) || ShowFault();
}

bool NewRaster::WritePixels(const BlockPlace& place, const void* pixels) {
  return pixels_->Write(place, pixels) || ShowFault();
}

bool NewRaster::Fail(const std::string& what) const {
  return FailWith(path_, Shown(what.empty() ? "GDAL gave no reason" : what));
}

std::unique_ptr<NewRaster> NewRaster::Begin(const Format& format, const std::string& path,
                                            const RasterDef& def, DatasetPtr& dataset) {
  const std::string& driver = format.drivers.front();
  std::unique_ptr<NewRaster> made(new NewRaster(driver, path, def));
  if (FindMaker(driver) == nullptr || (driver == "VRT" && def.creation.rows == nullptr)) {
    made->Fail("rasters of the format " + format.key + " are only read");
    return nullptr;
  }
  if (!made->CheckTarget() || !made->TryTheFormat()) return nullptr;
  dataset = FindMaker(driver)->isCopied ? made->MakeForCopy() : made->MakeDirectly();
  if (dataset == nullptr) return nullptr;
  return made;
}

/// Says no to what can't end well, before anything is made.
bool NewRaster::CheckTarget() const {
  std::error_code fault;
  if (path_.starts_with("/vsi")) return Fail("a raster can't be made under a virtual name");
  if (Exists(path_) && !fs::is_regular_file(path_, fault)) return Fail("not a file");
  if (def_.samples == 0 || def_.lines == 0 || def_.bands == 0 || def_.samples > INT_MAX ||
      def_.lines > INT_MAX || def_.bands > USHRT_MAX) {
    return Fail("no raster can have this size");
  }
  const PixelType type = PixelTypeOf(def_.dataType);
  if (type.type == GDT_Unknown) return Fail("no raster can have this pixel type");
  const std::string misfit = FindCreationMisfit(def_);
  if (!misfit.empty()) return Fail(misfit);
  if (def_.creation.worldFile && WorldText(def_).empty()) {
    return Fail("has no grid for a world file");
  }
  if (driver_ == "JPEG" && type.type != GDT_Byte) {
    return Fail("the format holds bytes only");  // of 16 bits GDAL would keep 12
  }
  if (type.isSignedByte && !HoldsSignedBytes(GDALGetDriverByName(driver_.c_str()))) {
    return Fail("the format can't hold signed bytes");
  }
  platform::RemoveAbandonedFiles(path_);
  std::string why;
  if (!platform::WriteNewFile(temporary_, "", &why)) {
    SetFault(Shown(why));
    return false;
  }
  Remove(temporary_);
  return true;
}

/// Makes a raster of a few pixels in GDAL's memory: the driver itself says what it can't hold.
bool NewRaster::TryTheFormat() {
  const bool hasAlpha = GivesMask(def_) && IsAlpha(def_, def_.bands - 1);
  if (!FindMaker(driver_)->isCopied) {
    keepsAlpha_ = hasAlpha && driver_ == "GTiff";
    return true;
  }
  std::string fault;
  const bool isRounded = FindMaker(driver_)->roundsGrid && (def_.geoRef || HasPlaceDetails(def_));
  for (const Given given : {Given::kAll, Given::kBands, Given::kNothing}) {
    if (given == Given::kAll && isRounded) continue;
    given_ = given;
    if (!TrySample(fault)) continue;
    keepsAlpha_ = keepsAlpha_ && hasAlpha;
    return true;
  }
  return Fail(fault);
}

bool NewRaster::TrySample(std::string& fault) {
  const Messages messages;
  fault = "the format can't hold such pixels";
  constexpr int kSide = 32;
  const GDALDataType type = PixelTypeOf(def_.dataType).type;
  const DatasetPtr sample(GDALCreate(GDALGetDriverByName("MEM"), "", kSide, kSide,
                                     static_cast<int>(def_.bands), type, nullptr));
  if (sample == nullptr || !Describe(sample.get())) return false;
  const std::string name = "/vsimem/vexg" + fs::path(temporary_).filename().string();
  DatasetPtr copy = CopyTo(name, sample.get());
  const bool fits = copy != nullptr && !messages.HasError() &&
                    GDALGetRasterCount(copy.get()) == static_cast<int>(def_.bands) &&
                    GDALGetRasterDataType(GDALGetRasterBand(copy.get(), 1)) == type;
  keepsAlpha_ = fits && GDALGetRasterColorInterpretation(GDALGetRasterBand(
                            copy.get(), static_cast<int>(def_.bands))) == GCI_AlphaBand;
  copy.reset();
  VSIUnlink(name.c_str());
  for (const char* const suffix : kSideFiles) VSIUnlink((name + suffix).c_str());
  if (messages.HasError()) fault = messages.Text();
  return fits;
}

DatasetPtr NewRaster::MakeDirectly() {
  const Messages messages;
  const PixelType type = PixelTypeOf(def_.dataType);
  CPLStringList options = OptionsOf(*FindMaker(driver_));
  if (type.isSignedByte) options.SetNameValue("PIXELTYPE", "SIGNEDBYTE");
  if (driver_ == "GTiff") {
    options.SetNameValue("BIGTIFF", BigTiffWord(def_));
    AddLayout(def_, options);
    AddMeaning(def_, options);
  }
  if (isPacked_) scratch_ = platform::TemporaryPathBeside(path_);
  const std::string& name = isPacked_ ? scratch_ : temporary_;
  DatasetPtr dataset(GDALCreate(GDALGetDriverByName(driver_.c_str()), name.c_str(),
                                static_cast<int>(def_.samples), static_cast<int>(def_.lines),
                                static_cast<int>(def_.bands), type.type, options.List()));
  if (dataset == nullptr || !Describe(dataset.get()) || messages.HasError()) {
    Fail(messages.Text());
    return nullptr;
  }
  if (driver_ == "VRT") {
    hasRows_ = AddRowsToVrt(*def_.creation.rows, dataset.get()) || ShowFault();
    return hasRows_ ? std::move(dataset) : nullptr;
  }
  return driver_ == "GTiff" ? BeginPixels(std::move(dataset)) : std::move(dataset);
}

/// Has the blocks of a TIFF file placed, which for that is closed and opened again.
DatasetPtr NewRaster::BeginPixels(DatasetPtr dataset) {
  const Messages messages;
  tiff::BlockLayout layout;
  layout.samples = def_.samples;
  layout.lines = def_.lines;
  layout.bands = def_.bands;
  layout.element = DataTypeBytes(def_.dataType);
  layout.byPixel = EQUAL(
      CSLFetchNameValueDef(GDALGetMetadata(dataset.get(), "IMAGE_STRUCTURE"), "INTERLEAVE", "BAND"),
      "PIXEL");
  layout.isTiled = def_.tileWidth > 1 && def_.tileHeight > 1;
  int width = 0, height = 0;
  GDALGetBlockSize(GDALGetRasterBand(dataset.get(), 1), &width, &height);
  layout.blockWidth = static_cast<unsigned>(width);
  layout.blockHeight = static_cast<unsigned>(height);
  dataset.reset();
  if (messages.HasError()) {
    Fail(messages.Text());
    return nullptr;
  }
  std::unique_ptr<tiff::PlainPixels> plain;
  const bool isBegun = isPacked_ ? BeginPacked(layout)
                                 : tiff::PlainPixels::Begin(temporary_, def_, layout.byPixel,
                                                            FillValueOf(def_), plain);
  if (!isBegun) {
    ShowFault();
    return nullptr;
  }
  if (plain != nullptr) pixels_ = std::move(plain);
  dataset.reset(GDALOpenEx(isPacked_ ? scratch_.c_str() : temporary_.c_str(),
                           GDAL_OF_RASTER | GDAL_OF_UPDATE, nullptr, nullptr, nullptr));
  if (dataset != nullptr && !messages.HasError()) return dataset;
  Fail(messages.Text());
  return nullptr;
}

bool NewRaster::BeginPacked(const tiff::BlockLayout& layout) {
  tiff::PackedRaster raster;
  raster.def = def_;
  raster.layout = layout;
  raster.fill = FillValueOf(def_);
  raster.isFillNoData = !DiffersByBand(def_) && NoDataOf(def_, 0).has_value();
  raster.hasAlpha = keepsAlpha_;
  raster.path = temporary_;
  raster.description = scratch_;
  raster.getExcluded = [this](const BlockPlace& place, std::vector<unsigned char>& excluded) {
    return mask_.Read(place, excluded);
  };
  std::unique_ptr<tiff::PackedPixels> packed = tiff::PackedPixels::Begin(std::move(raster));
  if (packed == nullptr) return false;
  if (def_.creation.rows != nullptr && !TakeRows(*packed)) return false;
  pixels_ = std::move(packed);
  return true;
}

/// Takes packed blocks out of files where they are packed alike. Levels are not made of what masks
/// hide, and a mask in a file has more than a block that is written would bring: a file with levels
/// has its pixels written then.
bool NewRaster::TakeRows(tiff::PackedPixels& packed) {
  RowsFiles rows = *def_.creation.rows;
  if (rows.walksAsTarget) {
    const TileDimensions blocks = StreamTiles(
        def_, GDALGetDataTypeSizeBytes(PixelTypeOf(def_.dataType).type), kTargetBudget, def_.bands);
    rows.walkWidth = blocks.width;
    rows.walkHeight = blocks.height;
  }
  bool hasMask = false;
  if (def_.creation.LosesValues() || !FindRowsMask(rows, hasMask)) {
    TakeFault();
    return true;
  }
  const bool hasLevels = def_.creation.layout == FileLayout::kCog;
  if (hasMask && hasLevels) return true;
  return packed.TakeRows(rows, hasRows_) &&
         (!hasRows_ || !hasMask || TakeRowsMasks(rows, def_.samples, mask_));
}

DatasetPtr NewRaster::MakeForCopy() {
  const Messages messages;
  const PixelType type = PixelTypeOf(def_.dataType);
  const bool inMemory = BytesOf(def_) <= kMaxBytesInMemory;
  CPLStringList options;
  options.SetNameValue("INTERLEAVE", def_.interleave == Interleave::BIP ? "PIXEL" : "BAND");
  if (!inMemory) {
    options.SetNameValue("BIGTIFF", "IF_SAFER");
    scratch_ = platform::TemporaryPathBeside(path_);
  }
  DatasetPtr dataset(GDALCreate(GDALGetDriverByName(inMemory ? "MEM" : "GTiff"), scratch_.c_str(),
                                static_cast<int>(def_.samples), static_cast<int>(def_.lines),
                                static_cast<int>(def_.bands), type.type, options.List()));
  if (dataset == nullptr || !Describe(dataset.get())) {
    Fail(messages.Text());
    return nullptr;
  }
  return dataset;
}

/// Gives a new dataset all but its pixels, as far as the format has room for it.
bool NewRaster::Describe(GDALDatasetH dataset) const {
  if (given_ == Given::kNothing) return true;
  WriteBandDetails(dataset, def_);
  if (given_ == Given::kBands) return true;
  if (def_.geoRef && !WriteGeoRef(dataset, *def_.geoRef)) return false;
  const bool isTiff = GDALGetDatasetDriver(dataset) == GDALGetDriverByName("GTiff");
  // A TIFF file has room for one value.
  return WritePlaceDetails(dataset, def_) &&
         ((isTiff && DiffersByBand(def_)) || SetNoData(dataset, def_));
}

bool NewRaster::Finish(DatasetPtr dataset) {
  if (isDoomed_ || IsAbandoning()) {
    dataset.reset();
    return Fail(isDoomed_ ? "not made, since some of its pixels could not be written"
                          : "not made, as it was given up");
  }
  const Messages messages;
  if (FindMaker(driver_)->isCopied) {
    if (!CopyToFormat(std::move(dataset))) return false;
  } else {
    dataset.reset();
    if (messages.HasError()) return Fail(messages.Text());
    if (pixels_ != nullptr && !pixels_->Finish()) return ShowFault();
    pixels_.reset();
    if (isPacked_) Remove(scratch_);
  }
  return WriteBeside() && WriteMask() && IsWhole() && NameRows() && TakePlace();
}

bool NewRaster::NameRows() const {
  return driver_ != "VRT" || NameRowsOfVrt(*def_.creation.rows, temporary_) || ShowFault();
}

DatasetPtr NewRaster::CopyTo(const std::string& name, GDALDatasetH dataset) const {
  CPLStringList options = OptionsOf(*FindMaker(driver_));
  return DatasetPtr(GDALCreateCopy(GDALGetDriverByName(driver_.c_str()), name.c_str(), dataset,
                                   TRUE, options.List(), nullptr, nullptr));
}

bool NewRaster::CopyToFormat(DatasetPtr dataset) {
  const Messages messages;
  for (int band = 1; band <= static_cast<int>(def_.bands); ++band) {
    histograms_.push_back(ReadStoredHistogram(GDALGetRasterBand(dataset.get(), band)));
  }
  DatasetPtr copy = CopyTo(temporary_, dataset.get());
  const bool isMade = copy != nullptr;
  copy.reset();
  return (isMade && !messages.HasError()) || Fail(messages.Text());
}

/// Writes the values that the format has no room for into a file beside the raster.
bool NewRaster::WriteBeside() const {
  const Messages messages;
  // A VRT file has room for all of them.
  const bool isSet = driver_ == "VRT" || CompleteBeside(temporary_, driver_, def_, histograms_);
  if (!isSet || messages.HasError()) return Fail(messages.Text());
  std::string why;
  if (!def_.creation.worldFile ||
      platform::WriteNewFile(WorldName(temporary_), WorldText(def_), &why)) {
    return true;
  }
  SetFault(Shown(why));
  return false;
}

bool NewRaster::WriteMask() {
  // The levels of a cloud-optimised file have masks, which lie among them.
  if (def_.creation.layout == FileLayout::kCog) return true;
  return mask_.WriteTo(temporary_, driver_) || ShowFault();
}

/// Opens the file once more and reads its last pixel: not every driver reports a disk that is full.
bool NewRaster::IsWhole() const {
  const Messages messages;
  const char* const drivers[] = {driver_.c_str(), nullptr};
  const DatasetPtr dataset(GDALOpenEx(temporary_.c_str(), GDAL_OF_RASTER | GDAL_OF_VERBOSE_ERROR,
                                      drivers, nullptr, nullptr));
  if (dataset == nullptr) return Fail(messages.Text());
  const auto samples = static_cast<int>(def_.samples), lines = static_cast<int>(def_.lines);
  if (GDALGetRasterXSize(dataset.get()) != samples || GDALGetRasterYSize(dataset.get()) != lines ||
      GDALGetRasterCount(dataset.get()) != static_cast<int>(def_.bands) ||
      GDALGetRasterDataType(GDALGetRasterBand(dataset.get(), 1)) !=
          PixelTypeOf(def_.dataType).type) {
    return Fail(messages.HasError() ? messages.Text() : "the format can't hold such a raster");
  }
  for (int band = 1; band <= static_cast<int>(def_.bands); ++band) {
    double pixel[2];
    if (GDALRasterIO(GDALGetRasterBand(dataset.get(), band), GF_Read, samples - 1, lines - 1, 1, 1,
                     pixel, 1, 1, GDT_CFloat64, 0, 0) != CE_None) {
      return Fail(messages.Text());
    }
  }
  return !messages.HasError() || Fail(messages.Text());
}

/// The new file comes onto the disk before an old one goes; the older one comes back, with what it
/// had beside it, when something fails.
bool NewRaster::TakePlace() const {
  std::string why;
  if (older_.exists) {
    const auto file = platform::RandomAccessFile::Open(
        temporary_, platform::RandomAccessFile::Access::kUpdate, &why);
    if (file == nullptr || !file->Flush(&why)) return Fail(why);
  }
  const platform::FolderLock lock(path_);
  if (!lock.IsHeld(&why)) return Fail(why);
  const platform::FileIdentity now = platform::IdentifyFile(path_);
  if (now.exists && !now.IsSameFile(older_)) return Fail("was made by another program meanwhile");
  platform::FileSwap swap;
  if (!MoveFiles(swap, why)) {
    SetFault(Shown(why));
    return false;
  }
  swap.Keep();
  return true;
}

bool NewRaster::MoveFiles(platform::FileSwap& swap, std::string& why) const {
  // A header of our own format would describe the new file as if it were the older one.
  if (orva::HasHeader(path_) && !swap.MoveAside(orva::HeaderPath(path_), &why)) return false;
  // Files beside the older one describe other pixels.
  for (const char* const suffix : kSideFiles) {
    if (!swap.MoveAside(path_ + suffix, &why)) return false;
  }
  if (!(driver_ == "HFA" ? MoveImagine(swap, why) : swap.MoveIn(temporary_, path_, &why))) {
    return false;
  }
  if (def_.creation.worldFile && !(swap.MoveAside(WorldName(path_), &why) &&
                                   swap.MoveIn(WorldName(temporary_), WorldName(path_), &why))) {
    return false;
  }
  for (const char* const suffix : kSideFiles) {
    if (Exists(temporary_ + suffix) && !swap.MoveIn(temporary_ + suffix, path_ + suffix, &why)) {
      return false;
    }
  }
  return true;
}

/// Moves an Imagine file. Where its pixels lie in a file of their own, whose name stands inside,
/// GDAL does it.
bool NewRaster::MoveImagine(platform::FileSwap& swap, std::string& why) const {
  const auto pixelsOf = [](const std::string& path) {
    return fs::path(path).replace_extension(".ige").string();
  };
  if (!swap.MoveAside(pixelsOf(path_), &why)) return false;
  if (!Exists(pixelsOf(temporary_))) return swap.MoveIn(temporary_, path_, &why);
  if (!swap.MoveAside(path_, &why)) return false;
  const Messages messages;
  GDALDriverH const driver = GDALGetDriverByName(driver_.c_str());
  if (GDALRenameDataset(driver, path_.c_str(), temporary_.c_str()) == CE_None &&
      !messages.HasError()) {
    return true;
  }
  why = path_ + ": " + messages.Text();
  for (const std::string& half : {path_, pixelsOf(path_)}) Remove(half);
  return false;
}

}  // namespace lumo::gdal
