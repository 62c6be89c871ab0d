#pragma once

#include <string>
#include <vector>

#include "output/keeping.h"
#include "rasters/file_verb.h"
#include "rasters/raster_chain.h"

namespace lumo::host {

/// A verb that makes a raster file out of a raster.
///
/// The verb says what stands on the source, as commands; making the file, keeping what is known of
/// the pixels, comparing the file with what was put in, and all that FileVerb does, is done here.
/// `examples/clip_verb.cpp` is the whole of a verb.
class RasterVerb : public FileVerb {
 protected:
  /// Adds the raster and the output to the command line.
  /// @param meaning  what the output is, for the help.
  RasterVerb(OptionSet& line, const std::string& meaning) { AddFilesTo(line, meaning); }
  /// Leaves that to a verb that has something in front of them.
  RasterVerb() = default;
  /// @param isRequired  false for a verb that may make something else.
  void AddFilesTo(OptionSet& line, const std::string& meaning, bool isRequired = true);
  /// Adds the output alone.
  void AddOutputTo(OptionSet& line, const std::string& meaning);
  /// Adds what is said of the output beside its name, which the verb sets.
  void AddFormatTo(OptionSet& line);
  void SetTargetName(const std::string& name) { target_.output = name; }

  // A verb says what is made:

  /// Decides what is made of the source.
  /// @param opened  what the commands of AddOpening gave.
  /// @return the size, bands and pixel type of what is made. Throws HostError.
  virtual RasterInfo PlanRaster(JobSession& session, const JobResults& opened,
                                const RasterInfo& source) = 0;
  /// Adds the views that show what is made; none by default.
  virtual void AddViews(RasterChain& /*chain*/) const {}

  // It may say more:

  /// Opens the source for the chain.
  virtual void AddSource(RasterChain& chain) const;
  /// Adds what is to be known before the plan is made, beside the raster.
  virtual void AddQuestions(JobDraft& /*draft*/) const {}
  /// Which of the details of what is shown the file gets: a word of KeptDetails.
  virtual const char* GetKeptDetails() const { return "All"; }
  /// How the levels of a cloud-optimised file come about unless the user says it: a word of
  /// OverviewMethod. Of numbers that stand for classes it isn't the mean.
  virtual std::string GetOverviewMethod() const { return "Average"; }
  /// Adds inputs to the command that makes the file, and commands behind it.
  virtual void AddToCreate(JobDraft& /*draft*/, JobWriterCommand& /*create*/) const {}
  /// Holds what the step kMakeStep works on.
  struct Making {
    const String& shown;       ///< variable of the raster that is shown
    const std::string& file;   ///< that is made; other files beside it, under its name and a
                               ///< further ending, are in nobody's way
    const FillValues& noData;  ///< as they were chosen for bands, in the place of pixels that are
                               ///< not valid
  };
  /// Adds the step kMakeStep, which fills "$target"; by default a copy of what is shown.
  virtual void AddMaking(JobDraft& draft, const Making& making) const;
  /// Whether a copy has the no-data value of the file in the place of pixels that are not valid.
  virtual bool FillsNoData(const FillValues& noData) const { return !noData.empty(); }
  /// Whether a copy goes through the blocks of the source's storage, and not of the file's.
  virtual bool CopiesBlocksOfSource() const { return true; }
  /// Whether pixels that are not valid may get a no-data value where the format has nothing else.
  virtual bool MayChooseNoData() const { return true; }
  /// The no-data values of the file, where these were chosen; none for those of what is shown.
  virtual FillValues GetNoData(const FillValues& chosen) const { return chosen; }
  /// Adds commands that ask the raster that is shown, when the file is made.
  virtual void AddLastQuestions(JobDraft& /*draft*/, const String& /*shown*/) const {}
  /// Reads from the results of the job what the file shall hold.
  virtual RasterContents ReadWanted(const JobResults& results) const;
  /// Whether the bands of the file mean what those that are shown do, and get their palettes.
  virtual bool KeepsPalettes() const { return false; }
  /// Adds what the format did not keep to the losses.
  virtual void Compare(MadeRaster& raster, Losses& losses) const { CompareKept(raster, losses); }

  /// Further files that are made of the raster, behind it among the outputs.
  virtual std::vector<std::string> GetFurtherOutputs() const { return {}; }
  /// The endings of the files that the making leaves beside the raster, which nobody wants.
  virtual std::vector<std::string> GetLeftovers() const { return {}; }
  /// Adds commands that make further outputs, in a job behind the one that makes the raster.
  /// @param made   the raster file.
  /// @param files  the further outputs.
  virtual void AddFurther(JobDraft& /*draft*/, const TargetPlace& /*made*/,
                          const std::vector<std::string>& /*files*/) const {}

  static constexpr const char* kMakeStep = "make";
  /// The first of the steps whose progress is shown; kMakeStep is the last.
  virtual const char* GetFirstStep() const { return kMakeStep; }
  /// Name of what is shown in queries.
  static constexpr const char* kShown = "shown";

  const std::string& GetFormat() const { return format_; }
  /// The name of the raster file; empty where the command line has none.
  const std::string& GetTargetName() const { return target_.output; }

  void CheckOptions() override;
  std::vector<std::string> GetOutputs() const override;
  JobDraft GetJob(const Outputs& outputs) const override;
  std::uint64_t GetBytes(std::size_t output) const override;
  void Make(JobSession& session, const Outputs& outputs) override;

  // These are the steps of a verb that makes a raster; one that also makes other things overrides
  // them for those alone.

  void AddOpening(JobDraft& draft) const override;
  void Plan(JobSession& session, const JobResults& opened) override;

 private:
  void MakeFurther(JobSession& session, const Outputs& outputs);
  void MakeStac(JobSession& session, const Outputs& outputs, const RasterContents& made) const;
  void AddStacTo(OptionSet& line);
  JobDraft MakeDraft(const std::string& file, const FillValues& noData) const;
  TargetPlace PlaceAt(const std::string& file) const { return {file, format_, creation_}; }

  TargetOptions target_;
  std::string format_;
  CreationTexts creation_;
  bool stac_ = false;  // a STAC item beside the raster
  RasterInfo planned_;
};

}  // namespace lumo::host
