#pragma once

#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <mutex>
#include <string>

#include "foundation/string.h"

namespace lumo {

/// The log of the coordinate system layer, shared by the library and the projection plug-in. The
/// control file pelog.txt in the projection data directory switches it; it is made, all off, when
/// missing. Lines go to standard error, to two files of about 500,000 bytes that alternate, or
/// both.
///
/// Threads: any operation from any thread; the log has a lock of its own.
/// Failure: files that can't be made or written mean no log lines, and nothing else.
class VEXG_EXPORT CoordSysLog {
 public:
  // Levels of log lines.
  static constexpr std::uint32_t kFirstTransform = 0x1;    ///< first geographic transform
  static constexpr std::uint32_t kAllTransforms = 0x2;     ///< all geographic transforms
  static constexpr std::uint32_t kTransformTexts = 0x4;    ///< texts of both systems
  static constexpr std::uint32_t kTransformValues = 0x8;   ///< first values in and out
  static constexpr std::uint32_t kOverrides = 0x10;        ///< overrides of transforms and datums
  static constexpr std::uint32_t kTransformUsed = 0x20;    ///< the transform that was chosen
  static constexpr std::uint32_t kTransformExtent = 0x40;  ///< its bounding box
  static constexpr std::uint32_t kReprojection = 0x200;    ///< core reprojection values
  static constexpr std::uint32_t kSystems = 0x400;         ///< a system is fetched or deleted
  static constexpr std::uint32_t kGeographicMade = 0x800;  ///< a geographic system is made
  static constexpr std::uint32_t kProjectedMade = 0x1000;  ///< a projected system is made
  static constexpr std::uint32_t kErrors = 0x2000;         ///< errors

  /// Makes the log for the projection data directory `directory`.
  /// @return null when the directory does not exist.
  static CoordSysLog* Create(const String& directory);
  ~CoordSysLog();
  CoordSysLog(const CoordSysLog&) = delete;
  CoordSysLog& operator=(const CoordSysLog&) = delete;

  /// The levels that are switched on; 0 when there is no destination.
  std::uint32_t EnabledMask() const { return mask_; }

  /// Writes one line when `mask` has a level that is switched on.
  /// @param format  printf text, UTF-8; the result is cut to 4095 bytes.
  void Write(std::uint32_t mask, const char* format, ...) __attribute__((format(printf, 3, 4)));
  void WriteList(std::uint32_t mask, const char* format, std::va_list values);

 private:
  explicit CoordSysLog(std::string directory) : directory_(std::move(directory)) {}

  void ReadControlFile();
  void TakeSettings(const std::string& line);
  void OpenFiles();
  void WriteLine(const char* text);
  void SwitchFile();

  const std::string directory_;
  std::string paths_[2];
  std::FILE* file_ = nullptr;
  unsigned openFile_ = 1;  // 1 or 2
  unsigned messages_ = 0;
  std::uint32_t mask_ = 0;
  bool toConsole_ = false;
  bool toFile_ = false;
  std::mutex mutex_;
};

/// The one log; null until the coordinate system factory was first asked for, and where the
/// projection data directory does not exist. Once made it stays.
VEXG_EXPORT extern CoordSysLog* gpCoordSysLogInstance;

/// Writes a line to the one log; nothing while there is none. See CoordSysLog::Write.
VEXG_EXPORT void LogCoordSys(std::uint32_t mask, const char* format, ...)
    __attribute__((format(printf, 2, 3)));

/// The one log, or null; safe on any thread.
VEXG_EXPORT CoordSysLog* FindCoordSysLog();

/// Makes the one log unless it is there already.
void MakeCoordSysLog(const String& directory);

}  // namespace lumo
