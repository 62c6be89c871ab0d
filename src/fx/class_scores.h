#pragma once

#include <functional>

#include "commands/division.h"
#include "commands/value_text.h"
#include "fx/attribute_inputs.h"
#include "fx/chosen_attributes.h"
#include "fx/region_kinds.h"

namespace lumo {

/// An example of a class: a region.
struct ClassExample {
  unsigned classIndex = 0;
  unsigned region = 0;
};

/// Helps the commands that score regions for classes. They may do it in shares of the regions.
class ClassScoresCommand : public RegionCommand {
 protected:
  /// Opens the files of the inputs "AttributesFXA" and, where they are asked for, "StatsFXAS".
  bool OpenFiles(bool withStatistics);
  /// Chooses the attributes of the input "AttributeDefinition", in rows of file, attribute, band.
  bool ChooseAttributes();
  /// Reads the input "ExampleDefinition": rows of class and region. There are as many classes as
  /// the largest index and 1.
  bool ReadExamples();

  /// Makes the file of the input "ClassFXC", for so many classes; for a share none.
  bool CreateScores(unsigned classes);
  /// True where a share of the regions is scored alone: nothing but its file is made.
  bool IsShare() const { return HasInput(kShareInput); }
  /// True where the scores come out of the files of shares.
  bool Joins() const { return Read<Array<String>>(kShareFilesInput).GetCount() != 0; }

  /// Computes scores of regions, many at once: `count` regions from `first` of `regions` on, or of
  /// all where that is null. `values` are those of their attributes, as ChosenAttributes::Read
  /// gives them; `scores` are for each region one for each class, zeros at first.
  using ScoreBlock = std::function<void(const unsigned* regions, unsigned count,
                                        const double* values, double* scores)>;
  /// Scores regions in blocks and stores what comes out. False at an abort, or a failure.
  bool ScoreRegions(const std::vector<unsigned>& regions, const ScoreBlock& score);

  /// Ends a command whose scores are all there, or which failed.
  CommandResult Finish(bool isDone);

  ChosenAttributes columns_;
  std::vector<ClassExample> examples_;
  unsigned classCount_ = 0;
  std::unique_ptr<RegionClassificationProbabilityFile> scores_;

 private:
  /// Scores regions in blocks, and hands the scores of each block on.
  using Store = std::function<void(const unsigned* regions, unsigned count, const float* scores)>;
  bool ScoreBlocks(const unsigned* regions, std::size_t count, const ScoreBlock& score,
                   const Store& store);
  bool MakeShare(const std::vector<unsigned>& regions, const ScoreBlock& score);
  bool TakeShares(const std::vector<unsigned>& regions);
  std::string KeyOfShares(const std::vector<unsigned>& regions) const;
};

/// The inputs that the commands share.
InputDeclaration ExamplesInput();
InputDeclaration ChoicesInput();
InputDeclaration AttributesInput();
InputDeclaration StatisticsInput();
InputDeclaration ScoresInput();

}  // namespace lumo
