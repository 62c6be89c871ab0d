#pragma once

#include <memory>
#include <string>
#include <vector>

#include "output/output_file.h"
#include "rasters/area_options.h"
#include "rasters/raster_source.h"
#include "verb.h"

namespace lumo::host {

/// A verb that opens a raster and makes files from it, or describes it, or saves something with it.
///
/// Run goes through the steps that all such verbs have in common, in one order:
///
/// 1. CheckOptions looks at what can be judged without the raster.
/// 2. An output that is there already, is an input or has no folder is refused.
/// 3. The job of AddOpening opens the raster, by whose names outputs are refused once more.
/// 4. Plan decides what is made.
/// 5. With --print-job, the job of GetJob is printed, and nothing else done.
/// 6. Disks without room for the outputs are refused.
/// 7. Make makes the outputs, under names of their own, and looks at them.
/// 8. Save changes things in place; then all outputs take their places, or none.
/// 9. What Describe and Remark gave before that is printed.
///
/// A failure in any of them leaves what was there before. An interrupt ends each of them within a
/// fifth of a second, and the user hears what has become of the files.
///
/// A verb derives from this, adds its options in its constructor, and overrides what it needs. Its
/// registration is one line: `VerbRegistration registration("name", "Summary", &SetUp<NameVerb>);`
/// Verbs that make one raster file derive from RasterVerb instead.
class FileVerb {
 public:
  virtual ~FileVerb() = default;
  FileVerb(const FileVerb&) = delete;
  FileVerb& operator=(const FileVerb&) = delete;

  /// Adds the options that stand behind the verb's own.
  void AddLastOptions(OptionSet& line);

  /// Gives the exit code. Throws HostError.
  virtual int Run();

 protected:
  /// Adds the raster to the command line.
  explicit FileVerb(OptionSet& line) { source_.AddTo(line); }
  /// Leaves that to the verb.
  FileVerb() = default;

  /// Adds --overwrite, for a verb that makes files.
  /// @param replaced  what it lets replace, for the help.
  void AddOverwriteTo(OptionSet& line, const char* replaced);

  /// Adds the options that choose the pixels that the verb works on.
  /// @param noDataOption  see AreaOptions.
  void AddAreaTo(OptionSet& line, const char* noDataOption = "--no-data") {
    area_.AddTo(line, noDataOption);
  }

  virtual void CheckOptions() {}
  /// The files to make, as the user names them.
  virtual std::vector<std::string> GetOutputs() const { return {}; }
  /// Files that are read beside the raster, which no output may be.
  virtual std::vector<std::string> GetFurtherInputs() const { return {}; }
  /// Files that Make or Save change in place.
  virtual std::vector<std::string> GetChangedFiles() const { return {}; }
  virtual void AddOpening(JobDraft& draft) const = 0;
  /// @param opened  what the commands of AddOpening gave.
  virtual void Plan(JobSession& session, const JobResults& opened) = 0;
  /// The whole of the work as one document.
  /// @param outputs  with the names that the files shall have.
  virtual JobDraft GetJob(const Outputs& outputs) const = 0;
  /// Bytes that the output of this number takes; 0 when that is not known in advance.
  virtual std::uint64_t GetBytes(std::size_t /*output*/) const { return 0; }
  virtual void Make(JobSession& session, const Outputs& outputs) = 0;
  virtual void Save(JobSession& /*session*/) {}
  /// Gives the text for standard output, made before anything changes.
  virtual std::string Describe() const { return {}; }
  /// Gives the line for standard error, made before anything changes.
  virtual std::string Remark() const { return {}; }

  /// A raster that is open.
  struct OpenRaster {
    String uri;
    RasterInfo info;
  };
  /// Finds the area of a raster, and says where it lies unless the user wants it quiet.
  /// @return what shows the area is like that.
  RasterInfo PlanArea(JobSession& session, const OpenRaster& whole);
  /// Opens what shows the area of a raster, which stays open; gives the raster itself where the
  /// command line names no area.
  OpenRaster ShowArea(JobSession& session, const OpenRaster& whole);

  const SourceOptions& GetSource() const { return source_; }
  SourceOptions& GetSource() { return source_; }
  ProgressStyle GetProgressStyle() const { return job_.GetProgressStyle(); }
  const RasterJobOptions& GetJobOptions() const { return job_; }
  const AreaOptions& GetArea() const { return area_; }
  AreaOptions& GetArea() { return area_; }

 private:
  std::vector<std::string> GetInputs() const;
  void RefuseOpened(const JobDraft& draft, const JobResults& opened, Outputs& outputs) const;

  SourceOptions source_;
  AreaOptions area_;
  RasterJobOptions job_;
  bool overwrite_ = false;
  bool isDurable_ = false;
};

/// Makes a verb of the class for the command line; for a VerbRegistration.
template <typename Verb>
VerbRegistration::Work SetUp(OptionSet& line) {
  const auto verb = std::make_shared<Verb>(line);
  verb->AddLastOptions(line);
  return [verb] { return verb->Run(); };
}

}  // namespace lumo::host
