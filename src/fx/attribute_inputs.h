#pragma once

#include <initializer_list>
#include <string>
#include <utility>
#include <vector>

#include "fx/attribute_forms.h"
#include "fx/label_census.h"
#include "raster/raster_command.h"
#include "tasks/process_builder.h"

namespace lumo {

/// Helps the commands that compute values of regions with what they have in common. Each function
/// gives false or empty with the fault set.
class RegionCommand : public RasterCommand {
 protected:
  /// True when the inputs are there and are texts.
  bool CheckAll(std::initializer_list<const char*> names);

  /// The image in SrcURI: of one of EightTypes.
  BasicRasterPtr FindImage();
  /// The labels in LabelURI: of int, or of unsigned int where that is allowed, and of the size of
  /// an image.
  /// @param image  null for none.
  BasicRasterPtr FindLabels(const BasicRaster* image, bool mayBeNatural = true);

  /// A file to make, which no other one of the same command is, nor that of a raster.
  bool TakeOutput(const char* name, URI& uri);
  /// A file to read, which is there and none of the outputs.
  bool TakeExisting(const char* name, URI& uri);

  /// The words of an input with a told form; told when absent.
  Form SumsForm() const { return HasInput("Sums") ? Read<Form>("Sums") : Form::kTold; }

  /// Runs a process here. False, with its fault set, after a failure or an abort.
  bool HasRun(ProcessBuilder<Process>& process);

  /// Notes that an output was created, and is to be removed where the command fails.
  void NoteCreated(const URI& uri) { created_.push_back(uri.ToUTF8()); }
  /// Fails with the fault of this thread; and removes what was created, unless sums that were told
  /// to stay are in there.
  CommandResult FailWithout(const char* otherwise, Form form);

 private:
  bool IsNew(const char* name, const URI& uri) const;

  std::vector<std::pair<std::string, std::string>> outputs_;  // names of inputs, and paths
  std::vector<std::pair<std::string, std::string>> rasters_;  // the same of the rasters
  std::vector<std::string> created_;
};

/// The input "Sums".
InputDeclaration SumsInput();

}  // namespace lumo
