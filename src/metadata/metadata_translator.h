#pragma once

#include <vector>

#include "metadata/mdf_format.h"
#include "metadata/metadata_object.h"

namespace lumo {

/// Moves the texts that a parser collected to where a definition file wants them, as values of the
/// types that it names; see docs/metadata.md. A text that holds no number where one is wanted stays
/// a text, as do those that no entry names.
///
/// Failure: false; the parse log and the fault text say why. What was moved before stays moved.
/// Threads: used by one thread.
class VEXG_EXPORT MetadataDefFileTranslator {
 public:
  /// Handles the entries in their order, and carries over the texts that are left: to their own
  /// paths, or below "/private/" where a value has that path already, and the notes of the parser.
  bool TranslateAll(const std::vector<MdfEntry>& entries, MetadataContainer* source,
                    MetadataContainer* target, const MdfFormat* format);

  virtual ~MetadataDefFileTranslator() = default;

 protected:
  /// Handles one entry. A text that isn't there is no failure.
  virtual bool Translate(const MdfEntry& entry, MetadataContainer& source,
                         MetadataContainer& target, const MdfFormat& format);

  /// Translate for an entry whose path has no running number.
  static bool TranslateSingle(const MdfEntry& entry, MetadataContainer& source,
                              MetadataContainer& target, const MdfFormat& format);
  /// Translate for the texts at all running numbers up to the first gap, as one list.
  static bool TranslateRepeated(const MdfEntry& entry, MetadataContainer& source,
                                MetadataContainer& target, const MdfFormat& format);

 private:
  bool TranslateEach(const std::vector<MdfEntry>& entries, MetadataContainer& source,
                     MetadataContainer& target, const MdfFormat& format);
  const MdfEntry* current_ = nullptr;  // for the words of a failure
};

/// The text at `path` of a collection. False when there is none.
bool FindText(const MetadataContainer& collection, const String& path, String& text);

}  // namespace lumo
