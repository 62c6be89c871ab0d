#include "georef/coordsys_log.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <filesystem>
#include <string_view>

#include "platform/clock.h"
#include "platform/debug_output.h"

namespace lumo {
namespace {

constexpr long kFullFile = 500000;  // bytes

constexpr std::string_view kControlText =
    "# -----------------------------------------------------------------------------\n"
    "#              Projection Logging Usage Notes \n"
    "# -----------------------------------------------------------------------------\n"
    "#  - the purpose of this logging feature is to enable the debugging of projection issues. \n"
    "#  - any combination of logging levels can be enabled by setting the corresponding bits to 1 "
    "\n"
    "#  - at least one destination must be set to 1 (file and/or console). \n"
    "#    logging will be disabled if a destination is not selected. \n"
    "#  - there are two alternating log files which are written to in: \n"
    "#    <ZEP_DIR>/resource/pedata/logs \n"
    "#  - for example: 0110, 0000, 0000, 0001\n"
    "#                  ||               |- this enables logging of the first geogtran item \n"
    "#                  || - this enables logging all errors \n"
    "#                  | - this enables writing to the log files \n"
    "# \n"
    "#  definition of log levels \n"
    "#  - 0000, 0000, 0000, 0001 = Level 1 = Log first geographic transform \n"
    "#  - 0000, 0000, 0000, 0010 = Level 2 = Log all geographic transforms \n"
    "#  - 0000, 0000, 0000, 0100 = Level 3 = Log coordinate systems strings used during a "
    "geographic transform \n"
    "#  - 0000, 0000, 0000, 1000 = Level 4 = Log the first input/output values for a geographic "
    "transform \n"
    "#  - 0000, 0000, 0001, 0000 = Level 5 = Log overrides for both geographic transforms and "
    "datums \n"
    "#  - 0000, 0000, 0010, 0000 = Level 6 = Log the geographic transform used \n"
    "#  - 0000, 0000, 0100, 0000 = Level 7 = Log the geographic transform bounding box \n"
    "#  - 0000, 0000, 1000, 0000 = Level 8 = \n"
    "#  - 0000, 0001, 0000, 0000 = Level 9 = \n"
    "#  - 0000, 0010, 0000, 0000 = Level 10 = Log core reprojection values \n"
    "#  - 0000, 0100, 0000, 0000 = Level 11 = Log when a coordinate system string/object is "
    "fetched/deleted \n"
    "#  - 0000, 1000, 0000, 0000 = Level 12 = Log when a geographic coordinate system object is "
    "created \n"
    "#  - 0001, 0000, 0000, 0000 = Level 13 = Log when a projected coordinate system object is "
    "created \n"
    "#  - 0010, 0000, 0000, 0000 = Level 14 = Log errors \n"
    "#  - 0100, 0000, 0000, 0000 = Level 15 = Destination: Enable logging to a file \n"
    "#  - 1000, 0000, 0000, 0000 = Level 16 = Destination: Enable logging to a ZEP console window "
    "\n"
    "#                                      in core log to win32/64 dev studio output window or "
    "dbmon window \n"
    "#  \n"
    "# Change this line to enable or disable logging features.\n"
    "0000, 0000, 0000, 0000\n";

/// Size of an open file, with the position left at its end.
long SizeOf(std::FILE* file) {
  std::fseek(file, 0, SEEK_END);
  return std::ftell(file);
}

std::mutex gLogMaking;

}  // namespace

CoordSysLog* gpCoordSysLogInstance = nullptr;

CoordSysLog* FindCoordSysLog() {
  return std::atomic_ref(gpCoordSysLogInstance).load(std::memory_order_acquire);
}

void MakeCoordSysLog(const String& directory) {
  const std::lock_guard lock(gLogMaking);
  if (FindCoordSysLog() != nullptr) return;
  std::atomic_ref(gpCoordSysLogInstance)
      .store(CoordSysLog::Create(directory), std::memory_order_release);
}

CoordSysLog* CoordSysLog::Create(const String& directory) {
  const std::string path = directory.ToUTF8();
  std::error_code fault;
  if (path.empty() || !std::filesystem::is_directory(path, fault)) return nullptr;
  auto* const log = new CoordSysLog(path);
  log->ReadControlFile();
  if (log->mask_ != 0 && log->toFile_) log->OpenFiles();
  return log;
}

CoordSysLog::~CoordSysLog() {
  if (file_ != nullptr) std::fclose(file_);
}

void CoordSysLog::ReadControlFile() {
  const std::string path = directory_ + "/pelog.txt";
  std::error_code fault;
  if (!std::filesystem::exists(path, fault)) {
    if (std::FILE* const made = std::fopen(path.c_str(), "w+")) {
      std::fwrite(kControlText.data(), 1, kControlText.size(), made);
      std::fclose(made);
    }
  }
  std::FILE* const file = std::fopen(path.c_str(), "r");
  if (file == nullptr) return;
  std::array<char, 1024> line{};
  while (std::fgets(line.data(), static_cast<int>(line.size()), file) != nullptr) {
    if (line[0] != '0' && line[0] != '1') continue;
    TakeSettings(line.data());
    break;
  }
  std::fclose(file);
}

void CoordSysLog::TakeSettings(const std::string& line) {
  constexpr std::size_t kLength = 19;  // 0000,0000,0000,0000
  if (line.size() < kLength || line.find_first_not_of("01,") < kLength) return;
  std::string digits;
  for (std::size_t i = 0; i < kLength; ++i) {
    const bool isComma = line[i] == ',';
    if (isComma != (i == 4 || i == 9 || i == 14)) return;
    if (!isComma) digits += line[i];
  }
  toConsole_ = digits[0] == '1';
  toFile_ = digits[1] == '1';
  if (!toConsole_ && !toFile_) return;
  for (std::size_t i = 2; i < digits.size(); ++i) {
    mask_ = mask_ << 1U | (digits[i] == '1' ? 1U : 0U);
  }
}

void CoordSysLog::OpenFiles() {
  const std::string logs = directory_ + "/logs";
  std::error_code fault;
  std::filesystem::create_directory(logs, fault);
  paths_[0] = logs + "/vexpe_pe_1.log";
  paths_[1] = logs + "/vexpe_pe_2.log";
  for (openFile_ = 1; openFile_ <= 2; ++openFile_) {
    file_ = std::fopen(paths_[openFile_ - 1].c_str(), "a+");
    if (file_ != nullptr && SizeOf(file_) < kFullFile) return;
    if (file_ != nullptr) std::fclose(file_);
  }
  openFile_ = 1;
  file_ = std::fopen(paths_[0].c_str(), "w");
}

void LogCoordSys(std::uint32_t mask, const char* format, ...) {
  CoordSysLog* const log = FindCoordSysLog();
  if (log == nullptr) return;
  std::va_list values;
  va_start(values, format);
  log->WriteList(mask, format, values);
  va_end(values);
}

void CoordSysLog::Write(std::uint32_t mask, const char* format, ...) {
  std::va_list values;
  va_start(values, format);
  WriteList(mask, format, values);
  va_end(values);
}

void CoordSysLog::WriteList(std::uint32_t mask, const char* format, std::va_list values) {
  if ((mask & mask_) == 0) return;
  std::array<char, 4096> text{};
  std::vsnprintf(text.data(), text.size(), format, values);
  if (toConsole_) platform::DebugOutput(std::string(text.data()) + "\n");
  if (toFile_) WriteLine(text.data());
}

void CoordSysLog::WriteLine(const char* text) {
  const std::lock_guard lock(mutex_);
  ++messages_;
  if (file_ == nullptr) return;
  std::fprintf(file_, "%s, %5d, %5u, %s \n", platform::LocalDateText().c_str(), 0, messages_, text);
  std::fflush(file_);
  if (SizeOf(file_) > kFullFile) SwitchFile();
}

void CoordSysLog::SwitchFile() {
  std::fclose(file_);
  openFile_ = openFile_ == 1 ? 2 : 1;
  file_ = std::fopen(paths_[openFile_ - 1].c_str(), "w");
}

}  // namespace lumo
