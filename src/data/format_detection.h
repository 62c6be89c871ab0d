#pragma once

#include <vector>

#include "data/format_table.h"

namespace lumo {

/// The formats that recognise a source whose strings name none.
struct FormatDetection {
  /// Numbers of the rows whose factories recognise the source, in the order of the table.
  std::vector<std::uint32_t> willing;
  /// Why a file could not be read that had to be, to recognise the source: its own, one beside it
  /// or a plug-in. Where that is the source's own file, no format is willing: what they make of it
  /// is nothing to go by.
  String unread;
  /// Only plug-ins that come with the library were asked.
  bool isOwn = true;
  /// False when rows were left out that wouldn't be tried before the first that is willing.
  bool isWhole = true;
};

/// How many rows are asked.
enum class DetectionExtent : unsigned {
  kAll,     ///< all
  kToFirst  ///< of the plug-ins that come with the library, none of its kind behind the first
            ///< willing
};

/// Asks the rows of the table, in their order, whether they recognise a source.
///
/// A plug-in that comes with the library is not asked, nor loaded, where the first bytes of a file
/// are those of another format: what it would say is known. All others are asked, always.
VEXG_EXPORT FormatDetection DetectFormats(const Array<String>& connStrings,
                                          DetectionExtent extent = DetectionExtent::kAll);

/// While one lives, what ConnectDirect opens on this thread under no format's key was detected
/// before. A null detection changes nothing.
class DetectedScope {
 public:
  /// @param detection  outlives the scope.
  explicit DetectedScope(const FormatDetection* detection);
  ~DetectedScope();
  DetectedScope(const DetectedScope&) = delete;
  DetectedScope& operator=(const DetectedScope&) = delete;

  /// That of the innermost scope of this thread; null without one.
  static const FormatDetection* Current();

 private:
  const FormatDetection* const before_;
};

}  // namespace lumo
