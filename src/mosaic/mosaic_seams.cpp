#include "mosaic/mosaic_seams.h"

#include <chrono>
#include <filesystem>
#include <random>
#include <set>

#include "commands/catalog.h"
#include "commands/job_parser.h"
#include "commands/job_writer.h"
#include "foundation/fault.h"
#include "geometry/polygon_clip.h"
#include "georef/affine_link.h"
#include "mosaic/footprint_file.h"
#include "mosaic/scene_raster.h"
#include "mosaic/seam_generator.h"
#include "mosaic/step_progress.h"
#include "platform/file_swap.h"
#include "platform/owned_name.h"
#include "platform/temporary_file.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

// The definition is stored as footprints come in, but not more often than this.
constexpr std::chrono::seconds kKeepInterval{2};

/// Finds names for side files that nobody has. Numbers start at random.
class FreeNames {
 public:
  /// @param taken  files that are named already, there or not.
  explicit FreeNames(const Map<String, String>& taken)
      : random_(
            static_cast<unsigned>(std::chrono::system_clock::now().time_since_epoch().count())) {
    for (const auto& entry : taken) taken_.insert(entry.second.ToUTF8());
  }

  /// A name of a beginning, a number and an ending.
  /// @param numbers  how many there are to start at.
  std::string Find(const std::string& beginning, std::uint32_t numbers, const char* ending) {
    std::error_code ignored;
    for (std::uint64_t number = random_() % numbers;; ++number) {
      std::string name = beginning + std::to_string(number) + ending;
      if (!fs::exists(name, ignored) && taken_.insert(name).second) return name;
    }
  }

 private:
  std::mt19937 random_;
  std::set<std::string> taken_;
};

/// Runs a job of one MosaicFootPrintsCommand. @return no text, or why it failed.
String RunFootprintJob(const URI& scene, const std::string& path, const FootprintOptions& options,
                       const URI& mask, const IPC& ipc) {
  JobWriter writer;
  JobWriterCommand* const command =
      writer.AddCommand(String("Footprints@" + scene.ToUTF8()), "MosaicFootPrintsCommand");
  command->AddInput("RasterURI", scene);
  command->AddInput("Level", 0U);
  command->AddInput("SmoothParameter", options.smoothing);
  command->AddInput("VectorMSCFP", URI(path));
  if (options.noData) command->AddInput("NoData", *options.noData);
  if (options.tolerance != 0) command->AddInput("Tolerance", options.tolerance);
  if (mask.GetLength() != 0) command->AddInput("MaskURI", mask);
  Job job;
  JobParser(job).Parse(writer.Write());
  job.ipc.Reset(new IPC(ipc));
  RunJob(job);
  if (job.commands.GetCount() == 1 &&
      job.commands[0]->command->GetResult() == CommandResult::kSuccess) {
    return {};
  }
  const String reason = job.commands.GetCount() == 1 ? job.commands[0]->GetReason() : String();
  return reason.GetLength() != 0 ? reason : String("the footprint could not be made");
}

/// The files of a mosaic's seams while they are made: they take their places together.
class SeamFiles {
 public:
  explicit SeamFiles(Map<String, String>& files) : files_(files) {}
  /// Takes back what was not kept.
  ~SeamFiles() {
    std::error_code ignored;
    for (const auto& [key, paths] : growing_) fs::remove(paths.from, ignored);
    for (const String& key : named_) {
      if (!fs::exists(files_.Find(key).ToUTF8(), ignored)) files_.Remove(key);
    }
  }
  SeamFiles(const SeamFiles&) = delete;
  SeamFiles& operator=(const SeamFiles&) = delete;

  /// Names the files that have no name yet.
  template <typename T>
  void NameAll(const MosaicRasterDef<T>& definition) {
    FreeNames names(files_);
    for (unsigned i = 0; i < definition.SceneCount(); ++i) {
      const String key = definition.SceneKey(i);
      if (files_.HasKey(key)) continue;
      const RasterPtr<T>& scene = definition.Scenes()[i];
      const std::string beginning = definition.WorkingDirectory().ToUTF8() +
                                    std::to_string(scene->Samples()) + "_" +
                                    std::to_string(scene->Lines()) + "_";
      files_[key] = String(names.Find(beginning, 1U << 31, ".emp"));
      named_.push_back(key);
    }
  }

  /// Writes what a scene shows, in pixels of the mosaic.
  template <typename T>
  bool Write(const String& key, const Polygon2D<double>& part) {
    const std::string to = files_.Find(key).ToUTF8();
    const std::string from = platform::TemporaryPathBeside(to);
    growing_[key] = {from, to};
    MosaicFootPrintPolygonWriter<T> writer(URI(from), 0);
    return writer.Write(Polygon2D<std::uint32_t>(InGrid(part))) && writer.Close();
  }

  bool Keep() {
    platform::FileSwap swap;
    std::string fault;
    for (const auto& [key, paths] : growing_) {
      if (!swap.MoveIn(paths.from, paths.to, &fault)) return Refuse(fault);
    }
    swap.Keep();
    growing_.clear();
    return true;
  }

 private:
  struct Paths {
    std::string from;
    std::string to;
  };

  /// The part to the right of and below the corner of the grid, which files can hold.
  static Polygon2D<double> InGrid(Polygon2D<double> part) {
    part.CloseRings();
    if (part.Measure(PolygonMeasure::kMinX) >= 0 && part.Measure(PolygonMeasure::kMinY) >= 0) {
      return part;
    }
    const double right = std::max(part.Measure(PolygonMeasure::kMaxX), 0.0) + 1;
    const double bottom = std::max(part.Measure(PolygonMeasure::kMaxY), 0.0) + 1;
    return Clip(
        ClipOperation::kIntersection, part,
        Polygon2D<double>({{{{0, 0}, {right, 0}, {right, bottom}, {0, bottom}, {0, 0}}, false}}));
  }

  Map<String, String>& files_;
  std::vector<String> named_;        // by this run
  std::map<String, Paths> growing_;  // by scene
};

/// Carries the vertices of a footprint to the grid of the mosaic.
bool CarryRings(Contour2DArray<double>& rings, const GeoRef& from, const GeoRef& to) {
  for (Contour2D<double>& ring : rings) {
    if (ring.points.empty()) continue;
    Array<double> points{ArrayDims(static_cast<unsigned>(ring.points.size()), 2)};
    if (!points.IsValid()) return false;
    double* put = points.begin();
    for (const Point2D<double>& point : ring.points) {
      *put++ = point.x;
      *put++ = point.y;
    }
    if (!CarryPixels(from, to, points)) return false;
    const double* get = points.begin();
    for (Point2D<double>& point : ring.points) {
      point.x = *get++;
      point.y = *get++;
      if (!std::isfinite(point.x) || !std::isfinite(point.y)) return false;
    }
  }
  return true;
}

template <typename T>
bool CheckScenes(const MosaicRasterDef<T>& definition) {
  for (unsigned i = 0; i < definition.SceneCount(); ++i) {
    const RasterPtr<T>& scene = definition.Scenes()[i];
    if (scene && scene->IsValid()) continue;
    return Refuse("scene " + std::to_string(i) + " " + definition.SceneKey(i).ToUTF8() +
                  ": is gone");
  }
  return true;
}

/// Removes what processes that have ended left of side files in a working directory.
void RemoveAbandonedSideFiles(const String& workingDirectory) {
  std::error_code fault;
  const fs::path folder = fs::path(workingDirectory.ToUTF8() + ".").parent_path();
  std::vector<fs::path> abandoned;
  for (fs::directory_iterator at(folder.empty() ? "." : folder, fault), end; !fault && at != end;
       at.increment(fault)) {
    const std::string name = at->path().filename().string();
    for (const std::string_view ending : {".emp.", "_footprint.msf."}) {
      const std::size_t found = name.find(ending);
      if (found == std::string::npos || !name.ends_with(".tmp")) continue;
      const std::string_view mark = std::string_view(name).substr(found + ending.size() - 1);
      if (platform::IsAbandoned(mark)) abandoned.push_back(at->path());
    }
  }
  for (const fs::path& path : abandoned) fs::remove(path, fault);
}

bool RefuseAborted() {
  return Refuse("the work on the mosaic was aborted");
}

bool ReadWholeFile(const std::string& path, std::string& bytes, std::string& why) {
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &why);
  std::uint64_t size = 0;
  if (file == nullptr || !file->GetSize(size, &why)) return false;
  bytes.resize(size);
  return file->Read(0, bytes.data(), bytes.size(), &why);
}

/// Makes the footprint of a scene aside, and puts the bytes of its file.
template <typename T>
bool PutFootprint(MosaicRasterDef<T>& definition, unsigned scene, const FootprintOptions& options,
                  const IPC& ipc, SceneShares& shares) {
  const String key = definition.SceneKey(scene);
  const RasterPtr<T>& raster = definition.Scenes()[scene];
  const std::string path = platform::TemporaryPathBeside(shares.GetFile());
  catalog::Add(raster);
  const String reason = RunFootprintJob(
      URI(key), path, options, options.masks.GetCount() != 0 ? options.masks[scene] : URI(), ipc);
  catalog::Remove(raster);
  if (reason.GetLength() != 0) return Refuse(SceneFileOf(key) + ": " + reason.ToUTF8());
  std::string bytes, why;
  const bool isRead = ReadWholeFile(path, bytes, why);
  std::error_code ignored;
  fs::remove(path, ignored);
  if (!isRead) return Refuse(why);
  ShareWriter& out = shares.Out(scene);
  const std::uint64_t count = bytes.size();
  out.Put(count);
  out.PutAll(bytes.data(), bytes.size());
  return true;
}

/// Makes the file of a footprint out of its bytes. @return no text, or why it failed.
String TakeFootprint(const std::string& path, ShareReader& in) {
  std::uint64_t count = 0;
  if (!in.Get(count) || count > in.Left()) return "the file of its share is damaged";
  std::string bytes(count, '\0');
  std::string why;
  if (!in.GetAll(bytes.data(), bytes.size())) return "the file of its share is damaged";
  return platform::ReplaceFile(path, bytes, &why) ? String() : String(why);
}

}  // namespace

template <typename T>
bool MakeMissingFootprints(MosaicRasterDef<T>& definition, const FootprintOptions& options,
                           const IPC& ipc, unsigned& made, SceneShares& shares) {
  made = 0;
  const unsigned count = definition.SceneCount();
  if (options.masks.GetCount() != 0 && options.masks.GetCount() != count) {
    return Refuse("there has to be a mask for each scene, or an empty name");
  }
  RemoveAbandonedSideFiles(definition.WorkingDirectory());
  FreeNames names(definition.Footprints());
  std::string why;
  auto kept = std::chrono::steady_clock::now();
  bool isKept = true;
  for (unsigned i = 0; i < count && !ipc.abort->IsSet(); ++i) {
    const String key = definition.SceneKey(i);
    const bool isThere = definition.Footprints().HasKey(key);
    if ((isThere && !options.again) || !shares.IsWanted(i)) continue;
    if (shares.IsShare()) {
      if (!PutFootprint(definition, i, options, StepOf(ipc, 1.0 / count), shares)) return false;
      continue;
    }
    const std::string path =
        isThere ? definition.Footprints().Find(key).ToUTF8()
                : names.Find(definition.WorkingDirectory().ToUTF8(), 10000, "_footprint.msf");
    const RasterPtr<T>& scene = definition.Scenes()[i];
    const URI mask = options.masks.GetCount() != 0 ? options.masks[i] : URI();
    ShareReader* done = nullptr;
    if (!shares.Find(i, done)) return false;
    String reason;
    if (done != nullptr) {
      reason = TakeFootprint(path, *done);
    } else {
      catalog::Add(scene);
      reason = RunFootprintJob(URI(key), path, options, mask, StepOf(ipc, 1.0 / count));
      catalog::Remove(scene);
    }
    if (reason.GetLength() == 0) {
      definition.Footprints()[key] = String(path);
      isKept = false;
      ++made;
    } else if (why.empty()) {
      why = SceneFileOf(key) + ": " + reason.ToUTF8();
    }
    const auto now = std::chrono::steady_clock::now();
    if (!isKept && now - kept >= kKeepInterval) {
      std::string unused;
      isKept = definition.Keep(unused);
      kept = now;
    }
    ipc.progress->Update((i + 1.0) / count);
  }
  std::string fault;
  if (!isKept && !definition.Keep(fault)) return Refuse(fault);
  if (ipc.abort->IsSet()) return RefuseAborted();
  return why.empty() || Refuse(why);
}

template <typename T>
Polygon2D<double> LoadFootprint(MosaicRasterDef<T>& definition, unsigned scene,
                                const GeoRef& grid) {
  const std::string key = definition.SceneKey(scene).ToUTF8();
  const Polygon2D<std::uint32_t> pixels =
      ReadFootprint<T>(definition.Footprints().Find(definition.SceneKey(scene)));
  if (!pixels.IsValid()) {
    Refuse(key + ": " + TakeFaultOr("the footprint can't be read").ToUTF8());
    return {};
  }
  const GeoRefPtr geoRef = definition.Scenes()[scene]->GetRasterDef().geoRef;
  if (!geoRef) {
    Refuse(key + ": has no geo-reference");
    return {};
  }
  if (geoRef->CoordinateSystem().IsEmpty() != grid.CoordinateSystem().IsEmpty()) {
    Refuse(key + (geoRef->CoordinateSystem().IsEmpty()
                      ? ": has no coordinate system"
                      : ": has a coordinate system, and the mosaic has none"));
    return {};
  }
  Contour2DArray<double> rings = Polygon2D<double>(pixels).Rings();
  if (!CarryRings(rings, *geoRef, grid)) {
    Refuse(key + ": the footprint can't be carried to the grid of the mosaic");
    return {};
  }
  return Polygon2D<double>(std::move(rings), pixels.Label());
}

template <typename T>
bool MakeSeams(MosaicRaster<T>& mosaic, const IPC& ipc, Form sides) {
  MosaicRasterDef<T>& definition = *mosaic.Definition();
  if (!CheckScenes(definition)) return false;
  RemoveAbandonedSideFiles(definition.WorkingDirectory());
  const unsigned count = definition.SceneCount();
  double rest = 1.0;  // of the progress, when the footprints are there
  for (unsigned i = 0; i < count; ++i) {
    if (!definition.Footprints().HasKey(definition.SceneKey(i))) rest = 0.1;
  }
  unsigned made = 0;
  SceneShares none;
  if (rest < 1 && !MakeMissingFootprints(definition, {}, StepOf(ipc, 0.9), made, none))
    return false;

  SeamFiles files(definition.SeamFiles());
  files.NameAll(definition);
  const IPC loading = StepOf(ipc, 0.05 * rest);
  const GeoRefPtr grid = mosaic.GetRasterDef().geoRef;
  std::vector<Polygon2D<double>> footprints;
  for (unsigned i = 0; i < count; ++i) {
    if (ipc.abort->IsSet()) return RefuseAborted();
    footprints.push_back(LoadFootprint(definition, i, *grid));
    if (!footprints.back().IsValid()) return false;
    loading.progress->Update((i + 1.0) / count);
  }

  SeamGenerator seams(std::move(footprints), sides);
  const IPC pairs = StepOf(ipc, 0.8 * rest);
  if (!seams.CutPairs(pairs)) return RefuseAborted();
  pairs.progress->Update(1);
  const IPC remainder = StepOf(ipc, 0.05 * rest);
  if (!seams.AssignRest(remainder)) return RefuseAborted();
  remainder.progress->Update(1);

  const IPC writing = StepOf(ipc, 0.1 * rest);
  for (unsigned i = 0; i < count; ++i) {
    if (ipc.abort->IsSet()) return RefuseAborted();
    if (!files.template Write<T>(definition.SceneKey(i), seams.Parts()[i])) return false;
    writing.progress->Update((i + 1.0) / count);
  }
  return files.Keep();
}

#define VEXG_SEAMS(T)                                                                              \
  template VEXG_EXPORT bool MakeMissingFootprints<T>(MosaicRasterDef<T>&, const FootprintOptions&, \
                                                     const IPC&, unsigned&, SceneShares&);         \
  template VEXG_EXPORT Polygon2D<double> LoadFootprint<T>(MosaicRasterDef<T>&, unsigned,           \
                                                          const GeoRef&);                          \
  template VEXG_EXPORT bool MakeSeams<T>(MosaicRaster<T>&, const IPC&, Form);
VEXG_FOR_ALL(EIGHT, VEXG_SEAMS);
#undef VEXG_SEAMS

}  // namespace lumo
