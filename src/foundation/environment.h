#pragma once

#include "foundation/containers.h"

namespace lumo {

/// Key of a Context: case-sensitive text.
struct ContextKey {
  /// Compared unit by unit.
  String text;
  friend bool operator<(const ContextKey& a, const ContextKey& b) { return a.text < b.text; }
};

/// Value of a Context, which its holder may write.
struct ContextValue {
  String text;
};

/// Texts under keys. A missing key reads as the empty text.
class VEXG_EXPORT Context : public Object {
 public:
  static const unsigned TypeCode;
  Context();
  bool IsA(unsigned typeCode) const override;

  /// The entry of `key`, made empty when it is missing: the way to write and to read.
  ContextValue& operator[](const ContextKey& key) { return values_[key]; }

  /// The text under `key`, or the empty text; adds no entry.
  String Find(const ContextKey& key) const { return values_.Find(key).text; }

  /// The value of kWorkingDirectory, or the empty text; adds no entry.
  String WorkingDirectory() const;

  unsigned GetCount() const { return values_.GetCount(); }

  /// A directory for temporary data; used in a local Context, not in the environment.
  static const ContextKey kWorkingDirectory;

 private:
  Map<ContextKey, ContextValue> values_;
};

/// Names the directories that the library reads from. The host fills the environment before the
/// first operation, and after that it is only read:
///
///     GetGlobalEnvironmentImpl()[Environment::kMdfDirectory].text = String("/opt/vexg/mdf");
///     InitEnvironment();  // the rest by itself
///
/// Threads: no lock. Reading a key that the host left out makes it, so a host sets all keys first.
class VEXG_EXPORT Environment : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  static const ContextKey kBinDirectory;   ///< the host's binaries
  static const ContextKey kXmlDirectory;   ///< XML files; read by nothing in the library
  static const ContextKey kPeDirectory;    ///< coordinate system data
  static const ContextKey kGdalDirectory;  ///< GDAL data
  static const ContextKey kMdfDirectory;   ///< metadata definition files
};

/// The object behind the process-wide environment.
class VEXG_EXPORT EnvironmentImpl : public Context {};

/// The one environment of the process, made at the first call and never destroyed.
VEXG_EXPORT EnvironmentImpl& GetGlobalEnvironmentImpl();

/// Fills the directories of the environment that nobody has set, as far as they can be found, for a
/// program that has none of its own to name:
///   kBinDirectory   the folder of this library, where its plug-ins lie;
///   kMdfDirectory   "share/vexg/mdf" as it is built and installed beside the library;
///   kXmlDirectory   "share/vexg";
///   kGdalDirectory  $GDAL_DATA, else "share/gdal" beside the library or in /usr;
///   kPeDirectory    "share/vexg/pedata", else "vexg/pedata" in $XDG_DATA_HOME or ~/.local/share:
///                   making the second switches on the projection log of one user.
/// A host calls it once, from one thread, before the first operation.
VEXG_EXPORT void InitEnvironment();

}  // namespace lumo
