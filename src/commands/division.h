#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "commands/declaration.h"
#include "foundation/array.h"
#include "foundation/string.h"

namespace lumo {

// Commands say here, beside their declarations, which files they make, and how a job of theirs can
// be divided into several that run on their own: on other processors, or on other machines. `vexg
// plan` makes those jobs out of it.

/// The ways in which the work of a command is divided.
enum class DivisionKind : unsigned {
  kNone,   ///< it isn't
  kEach,   ///< it isn't, and costs so little that who needs what it makes does it for himself
  kFirst,  ///< it isn't, and what it makes or changes in place has to be there before others begin
  kRows,   ///< each line of the raster that it writes comes from that line of the one that it reads
  kShares  ///< by its inputs of ShareInputs
};

/// Gives the text of an input of a command in a document; null for one that isn't there.
using DivisionInputs = std::function<const std::string*(const std::string& input)>;

/// Says what becomes of a command in a job that is divided.
struct DivisionDeclaration {
  const char* command;  ///< class name
  DivisionKind kind = DivisionKind::kNone;
  const char* source = "";  ///< input that names the raster; kFirst with it: by shares
  const char* target = "";  ///< input that names the raster to write; kShares don't need it
  std::vector<const char*> makes{};  ///< inputs that name files which the command makes
  const char* makesWhen = "";        ///< input that has to be 1 for that; empty for none
  const char* dividesWhen = "";      ///< input that has to be Exact for shares; empty for none
  /// Of shares that are done in several rounds, how many there are for a data type, at most
  /// kMostRounds: those of a round get the files of all rounds before as ShareFiles. Null for one
  /// round.
  unsigned (*rounds)(unsigned dataType, const DivisionInputs& inputs) = nullptr;
  /// Gives the reason why work can't be divided as it is asked for; no text where it can. Null for
  /// work that always can.
  /// @param bands  of the source.
  std::string (*whyNot)(const DivisionInputs& inputs, unsigned bands) = nullptr;

  /// Bytes of memory that a share takes for each of its pixels, and joining for each of all.
  unsigned shareBytes = 0, joinBytes = 0;

  static constexpr unsigned kMostRounds = 4;
};

/// Registers a division: one static object beside the command.
class VEXG_EXPORT DivisionRegistration {
 public:
  explicit DivisionRegistration(const DivisionDeclaration& division);
};

/// Finds the division of a command by its class name; null for one that has none.
VEXG_EXPORT const DivisionDeclaration* FindDivision(const String& command);

/// One of the shares into which work is divided: of `things` in a row it has those from Begin to
/// before End, perhaps none.
struct Share {
  unsigned index = 0;
  unsigned count = 1;

  std::uint64_t Begin(std::uint64_t things) const { return At(things, index); }
  std::uint64_t End(std::uint64_t things) const { return At(things, index + 1); }

 private:
  std::uint64_t At(std::uint64_t things, std::uint64_t number) const {
    return things / count * number + things % count * number / count;
  }
};

/// Reads a share out of its two numbers. False, with the fault set, for what is none.
VEXG_EXPORT bool ReadShare(const Array<unsigned>& numbers, Share& share);

/// Adds the inputs of a command that does its work in shares, all optional:
///
/// - Share, with ShareFile: the command does that share of its work alone and keeps it in a file;
/// - ShareFiles: the command takes its work out of the files of all shares. What it then gives and
///   makes is the same to the bit as without shares.
VEXG_EXPORT std::vector<InputDeclaration> WithShareInputs(std::vector<InputDeclaration> inputs);

inline constexpr const char* kShareInput = "Share";
inline constexpr const char* kShareFileInput = "ShareFile";
inline constexpr const char* kShareFilesInput = "ShareFiles";

}  // namespace lumo
