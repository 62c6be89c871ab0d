#pragma once

#include <atomic>
#include <cstdint>

#include "platform/export.h"

namespace lumo::platform {

/// Chooses whether the files that this process makes and saves outlast a power cut. They do not at
/// the start: the system writes them to the disk in its own time, in any order.
///
/// Where they shall, RandomAccessFile has the system begin with that while more is being written,
/// and the moves of file_moves.h return only when a file and its folder are on the disk. So data
/// are there before the header that points to them, if the header takes its place last.
VEXG_EXPORT void SetDurable(bool isDurable);
VEXG_EXPORT bool IsDurable();

/// Has the system begin to write a file back to its disk every few MiB, where files are durable, so
/// that little is left to wait for in the end.
///
/// Threads: any number of threads may call.
class WriteBack {
 public:
  /// Counts bytes that were written to the file of this descriptor.
  void Count(int descriptor, std::uint64_t bytes);

 private:
  std::atomic<std::uint64_t> waiting_{0};  // bytes written since the last begin
};

}  // namespace lumo::platform
