#pragma once

#include <string>
#include <vector>

#include "foundation/array.h"
#include "foundation/color.h"
#include "rasters/json_file.h"

namespace lumo::host {

/// A class as a file of rules, or samples, name it.
struct NamedClass {
  std::string name;
  Color color;
  double threshold = 0;
};

/// Finds the place of an attribute by its name, as row of file, attribute and band.
class AttributePlaces {
 public:
  /// Adds the attributes of a file. @param names  of its columns, band by band.
  void AddFile(const std::vector<std::string>& columns, unsigned attributes);

  struct Place {
    unsigned file = 0;
    unsigned attribute = 0;
    unsigned band = 0;
  };
  /// Throws HostError for a name that no file has. @param where  what the user wrote it in.
  Place Find(const std::string& name, const std::string& where) const;
  /// Those of all attributes but counts and presence, in the order of the files.
  std::vector<Place> All() const;

 private:
  struct Entry {
    std::string name;
    Place place;
  };
  std::vector<Entry> entries_;
  unsigned files_ = 0;
};

/// Rules of classes, as FxComputeFuzzyClassificationCommand takes them.
struct RuleFile {
  std::vector<NamedClass> classes;
  Array<float> classRows, ruleRows, testRows;
};

/// Reads rules; resources/schemas/rules.schema.json describes them. Throws HostError, which names
/// the line and the field of what is wrong.
RuleFile ReadRules(const JsonField& root, const AttributePlaces& places);

/// A colour of its own for each of some classes.
Color ColorOfClass(unsigned index);

}  // namespace lumo::host
