#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "foundation/run_controls.h"
#include "foundation/string.h"

namespace lumo {

/// Gives one of the files that hold the lines of a raster, and how many of them.
struct RowsFile {
  String file;  ///< a raster of as many samples and bands as the whole, and of its pixel type
  unsigned lines = 0;  ///< its own, which follow those of the file before
  String name{};       ///< as a VRT file names it, relative to its place
};

/// Carries, to the command that waits for it, how far a new raster is with the taking of rows, and
/// the abort of that command to the new raster. Nobody listens outside a Scope.
/// Threads: any.
class VEXG_EXPORT RowsWatch {
 public:
  /// Has a command listen as long as it lives.
  class VEXG_EXPORT Scope {
   public:
    /// @param watch  null for nobody to listen to.
    Scope(const std::shared_ptr<RowsWatch>& watch, const IPC& ipc);
    ~Scope();
    Scope(const Scope&) = delete;
    Scope& operator=(const Scope&) = delete;

   private:
    const std::shared_ptr<RowsWatch> watch_;
  };

  /// Reports a fraction done. @return false, with the fault set, when the work is to end.
  bool Report(double done);

 private:
  std::mutex lock_;
  const IPC* ipc_ = nullptr;
};

/// Describes files that hold all lines of a raster, from the first to the last, and the order in
/// which a copy of the raster would go through its pixels.
struct RowsFiles {
  std::vector<RowsFile> files{};
  unsigned walkWidth = 0;   ///< pixels of the blocks of the copy, which go line by line of them
  unsigned walkHeight = 0;  ///< lines
  bool walksAsTarget =
      false;  ///< the blocks are those of StreamTiles for the copy, with kTargetBudget
  std::shared_ptr<RowsWatch> watch{};  ///< null for none
};

/// Answers for a raster whose pixels lie in files which a new raster may take them from.
class RowsSource {
 public:
  virtual ~RowsSource() = default;

  virtual std::shared_ptr<const RowsFiles> GetRows() const = 0;
};

}  // namespace lumo
