#pragma once

#include <cstddef>
#include <memory>

#include "foundation/containers.h"
#include "foundation/run_controls.h"

namespace lumo {

namespace platform {
class SharedMemoryBlock;
}

/// A view of a block of named memory that another process made and owns.
class VEXG_EXPORT SharedMemory {
 public:
  /// @param size  bytes that the block has at least.
  /// @param used  its first bytes that are used; all of `size` when 0.
  SharedMemory(const String& name, unsigned size, std::size_t used = 0);
  virtual ~SharedMemory();
  SharedMemory(const SharedMemory&) = delete;
  SharedMemory& operator=(const SharedMemory&) = delete;

  /// Opens the block; a view that is open already is closed first.
  /// @return false when this user has no such block, it is smaller than the size asked for, or
  ///         memory for all of it can't be had.
  bool Open();

  /// First byte of the view; null when it isn't open.
  unsigned char* GetData() const;
  const String& GetName() const { return name_; }
  unsigned GetSize() const { return size_; }

  /// True once the block turned out to have become shorter than the view, whose bytes are then this
  /// process's own.
  bool WasCut() const;

 private:
  String name_;
  unsigned size_;
  std::size_t used_;
  std::unique_ptr<platform::SharedMemoryBlock> block_;
};

/// A SharedMemory that is opened when it is made.
class VEXG_EXPORT ConnectSharedMemory : public SharedMemory {
 public:
  ConnectSharedMemory(const String& name, unsigned size, std::size_t used = 0)
      : SharedMemory(name, size, used) {
    Open();
  }
};

/// An abort flag and a progress report in a block of named memory, through which another process
/// watches a job. The flag is one byte, 1 for abort; the progress is a 32-bit float. Exists for
/// flags of type bool and unsigned char with a progress of type float.
///
/// A block that can't be opened, an offset outside it, a progress offset that is no multiple of 4,
/// or a flag inside the progress value leave the channel unusable: its flag and report are then its
/// own and nobody sees them.
///
///     const ORVAIPC channel("job-7", 64);  // the other process made /dev/shm/job-7
///     if (channel.IsUsable()) …
template <typename A, typename P>
class SHMIPC : public IPC {
 public:
  /// @param size            bytes of the block.
  /// @param abortOffset     byte at which the flag stands.
  /// @param progressOffset  byte at which the progress stands.
  SHMIPC(const String& name, unsigned size, unsigned abortOffset, unsigned progressOffset = 0)
      : memory_(name, size), usable_(Fits(abortOffset, progressOffset)) {
    if (!usable_) return;
    unsigned char* const data = memory_.GetData();
    progress = ProgressReportPtr(
        new ExternalProgressReport<P>(reinterpret_cast<P*>(data + progressOffset)));
    abort = AbortFlagPtr(new ExternalAbortFlag<A>(reinterpret_cast<A*>(data + abortOffset)));
  }

  /// True when the flag and the report lie in the block.
  bool IsUsable() const { return usable_; }

 private:
  bool Fits(unsigned abortOffset, unsigned progressOffset) const {
    const bool inside = abortOffset < memory_.GetSize() && memory_.GetSize() >= sizeof(P) &&
                        progressOffset <= memory_.GetSize() - sizeof(P);
    const bool apart = abortOffset < progressOffset || abortOffset >= progressOffset + sizeof(P);
    return memory_.GetData() != nullptr && inside && apart && progressOffset % alignof(P) == 0;
  }

  ConnectSharedMemory memory_;
  bool usable_;
};

/// The channel with the progress at byte 0 and the abort flag in the last byte of the block.
class VEXG_EXPORT ORVAIPC : public SHMIPC<unsigned char, float> {
 public:
  ORVAIPC(const String& name, unsigned size) : SHMIPC(name, size, size - 1) {}
};

/// An ORVAIPC of fixed size.
class VEXG_EXPORT TQFProcessIPC : public ORVAIPC {
 public:
  /// Bytes of the block.
  static constexpr unsigned kSize = 1034;
  explicit TQFProcessIPC(const String& name) : ORVAIPC(name, kSize) {}
};

/// True for the elements of a job document that name a channel: SHMIPC, ORVAIPC, TQFProcessIPC.
VEXG_EXPORT bool IsChannelElement(const String& element);

/// Opens the channel that such an element names. A missing attribute reads as 0, or as no name.
/// @return empty when the channel is unusable, so that nobody touches it.
VEXG_EXPORT IPCPtr OpenChannel(const String& element, const Map<String, String>& attributes);

}  // namespace lumo
