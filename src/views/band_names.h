#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Names the bands of one or several rasters, as expressions use them. Bands of the first raster
/// are "b0", "b1" and so on; those of a raster "a" are "a_b0", "a_b1". A band may have a role as a
/// further name, such as "red". Names consist of letters, digits and underscores, and their case
/// does not count.
///
///     BandNames names({{"", 6}, {"a", 1}});
///     if (!names.AddRole("red", "b2")) return Fail();  // with the fault text set
///     const std::optional<BandNames::Band> mask = names.Find("a_b0");  // band 0 of raster 1
class VEXG_EXPORT BandNames {
 public:
  /// A raster whose bands have names.
  struct Source {
    std::string name;  ///< stands in front of its bands; of the first raster it is empty
    unsigned bands = 0;
  };
  /// A band of one of the rasters, both numbered from 0.
  struct Band {
    unsigned source = 0;
    unsigned band = 0;
    bool operator==(const Band& other) const = default;
  };

  explicit BandNames(const std::vector<Source>& sources);

  /// Gives a band a further name. False, with a fault text, when the name is none that can be used,
  /// is in use already, or there is no such band.
  bool AddRole(const std::string& role, const std::string& band);

  /// The band of a name; nothing when there is none.
  std::optional<Band> Find(const std::string& name) const;

  /// Lists the bands that there are, for messages: "b0 to b5, a_b0".
  std::string Describe() const;

  /// True for a text that begins with a letter or an underscore and goes on with these and digits.
  static bool IsName(const std::string& text);

 private:
  std::vector<Source> sources_;
  std::map<std::string, Band> roles_;
};

}  // namespace lumo
