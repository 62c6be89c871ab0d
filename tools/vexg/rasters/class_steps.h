#pragma once

#include <string>
#include <vector>

#include "jobs/raster_job.h"
#include "rasters/rule_file.h"

namespace lumo::host {

/// Samples of known classes, as a user names them.
struct SampleSet {
  std::string file;   ///< with ":LAYER" behind it or not
  std::string field;  ///< with the class of a sample
};

/// How regions get their classes, and where what is needed lies.
struct ClassRequest {
  std::vector<NamedClass> classes;
  std::vector<std::string> files;  ///< of attributes
  RuleFile rules;                  ///< where there are no samples
  SampleSet samples;
  std::string method = "knn";  ///< of samples: knn or pca
  unsigned neighbors = 5;
  Array<unsigned> used;  ///< rows of file, attribute and band

  bool HasRules() const { return samples.file.empty(); }
};

/// Gives a command its inputs "Vectors", "ClassField" and "Layer".
void AddSamples(JobWriterCommand& command, const SampleSet& samples);

constexpr unsigned kMostClasses = 254;

/// Adds the columns of a file of attributes to the places. Throws HostError where they have no
/// names.
void AddColumns(const std::string& file, unsigned bands, unsigned attributes,
                AttributePlaces& places);

/// The rows of attributes of these names; of all where there is none. Throws HostError.
/// @param where  what the user wrote them in.
Array<unsigned> RowsOf(const std::vector<std::string>& names, const std::string& where,
                       const AttributePlaces& places);

constexpr const char* kExampleStep = "examples";
/// Adds the command that finds the examples, into "$examples".
/// @param labels  variable of the labels.
void AddExamples(JobDraft& draft, const SampleSet& samples, const String& labels);

constexpr const char* kScoreStep = "score";
/// The files that scoring makes.
struct ScoreFiles {
  std::string scores;
  std::vector<std::string> statistics;  ///< of each file of attributes; not for rules
};
/// Adds the commands that score the regions of the labels.
void AddScores(JobDraft& draft, const ClassRequest& request, const String& labels,
               const ScoreFiles& files);

/// Adds what the raster of classes is to the command that makes it, and its colours behind.
void AddClasses(JobDraft& draft, JobWriterCommand& create, const std::vector<NamedClass>& classes);

/// Adds the command that paints the classes of best score into "$target".
void AddPainting(JobDraft& draft, const char* step, const String& labels,
                 const std::string& scores);

/// Adds the commands that make polygons of a map that is open, and the style that shows their
/// classes in QGIS.
void AddClassPolygons(JobDraft& draft, const String& map, const std::string& polygons,
                      const std::string& style, const std::vector<NamedClass>& classes);

/// The name of the style beside a file of polygons.
std::string StyleNameOf(const std::string& polygons);

/// Takes the classes from what FindClassExamplesCommand gave, with colours of their own. Throws
/// HostError for a class without an example. @param said  [out] lines for the user.
std::vector<NamedClass> TakeClasses(const JobResults& results, const SampleSet& samples,
                                    std::vector<std::string>& said);

}  // namespace lumo::host
