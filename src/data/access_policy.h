#pragma once

#include <string>
#include <vector>

#include "data/format_table.h"

namespace lumo {

/// Says what sources may be opened and made. The default allows everything, as suits a program that
/// does what its user says; a server that takes jobs from others sets a narrower one:
///
///     AccessPolicy policy;
///     policy.roots = {"/srv/scenes"};
///     policy.network = policy.memory = policy.special = false;
///     if (!SetAccessPolicy(policy)) return TakeFault();
struct AccessPolicy {
  /// Folders that hold all sources, outputs and temporary files, links resolved; none: no limit.
  std::vector<std::string> roots;
  bool network = true;       ///< formats and names that reach over the network
  bool virtualFiles = true;  ///< names of files inside other files, or that stand for no file
  bool memory = true;        ///< names of memory addresses
  bool indirect = true;      ///< formats whose files name further files to read
  bool special = true;       ///< devices, pipes and sockets, whose opening may never end
};

/// Takes over a policy for the process, before the first source is opened. False, with the fault
/// set and nothing changed, when a root is no directory.
VEXG_EXPORT bool SetAccessPolicy(const AccessPolicy& policy);

/// The policy in force, its roots resolved.
VEXG_EXPORT AccessPolicy GetAccessPolicy();

/// True when the process may reach the file at `path`, which may be a link and need not exist: it
/// lies in one of the roots once all links are followed. The library's own folders, as the
/// environment names them, may be read. Else sets the fault. Whatever opens files asks here, with
/// the name that it is about to open.
/// @param writing  the file is to be made, changed, renamed or removed.
VEXG_EXPORT bool MayReachFile(const std::string& path, bool writing);

/// Keeps the refusal of a file that a library opened on this thread, for whoever called it.
VEXG_EXPORT void NoteRefusal(const String& text);

/// Takes the refusal off the thread; no text when there was none since the last call.
VEXG_EXPORT String TakeRefusal();

/// True when a policy with roots is in force.
VEXG_EXPORT bool AreFilesLimited();

/// True when sources of the format may be opened and made; else sets the fault.
VEXG_EXPORT bool MayUseFormat(const FormatRecord& format);

/// While one lives, this thread may open the library's own blocks of memory, whatever the policy.
class VEXG_EXPORT OwnMemoryScope {
 public:
  /// Begins on the thread that makes it, which also ends it.
  OwnMemoryScope();
  ~OwnMemoryScope();
  OwnMemoryScope(const OwnMemoryScope&) = delete;
  OwnMemoryScope& operator=(const OwnMemoryScope&) = delete;
};

/// While one lives, this thread may open sources again under the names that open connections answer
/// to: the policy has admitted them before.
class VEXG_EXPORT AdmittedSourceScope {
 public:
  /// Begins on the thread that makes it, which also ends it.
  AdmittedSourceScope();
  ~AdmittedSourceScope();
  AdmittedSourceScope(const AdmittedSourceScope&) = delete;
  AdmittedSourceScope& operator=(const AdmittedSourceScope&) = delete;
};

/// True when a source may be used; else sets the fault. Of the pieces that are no format's key the
/// first is the source's name: a file, or a name that holds one ("HDF5:"a.h5"://band"). Further
/// pieces NAME=VALUE are options, whose values count as files only where there is such a file.
/// @param making  the source is to be made: it need not exist, its folder has to.
VEXG_EXPORT bool MayUseSource(const Array<String>& connStrings, bool making);

}  // namespace lumo
