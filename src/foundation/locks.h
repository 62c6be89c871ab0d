#pragma once

#include <cstddef>
#include <mutex>

#include "platform/export.h"

namespace lumo {

/// Root of the scoped locks: held from construction to destruction.
class VEXG_EXPORT PrivateLock {
 public:
  virtual ~PrivateLock() = default;
  PrivateLock(const PrivateLock&) = delete;
  PrivateLock& operator=(const PrivateLock&) = delete;

  /// Makes a reader's lock a writer's. It may be released on the way, so what was read before is to
  /// be read again. Nothing for a lock that knows no readers.
  virtual void UpgradeToWriter() {}

  /// Makes a writer's lock a reader's, without a gap. Nothing for a lock that knows no readers.
  virtual void DowngradeToReader() {}

 protected:
  PrivateLock() = default;
};

/// Holds a recursive mutex: the thread that holds it may enter it again.
class VEXG_EXPORT MutexLock : public PrivateLock {
 public:
  explicit MutexLock(std::recursive_mutex& mutex) : mutex_(&mutex) { mutex_->lock(); }
  ~MutexLock() override { mutex_->unlock(); }

 private:
  std::recursive_mutex* mutex_;
};

/// Mixin of the classes that guard themselves by one recursive mutex.
class VEXG_EXPORT Lockable {
 public:
  Lockable() = default;
  Lockable(const Lockable&) {}  // a copy has a mutex of its own
  Lockable& operator=(const Lockable&) { return *this; }

  MutexLock Lock() const { return MutexLock(mutex_); }

 private:
  mutable std::recursive_mutex mutex_;
};

/// A fair read-write mutex: waiting threads are served in the order in which they came. It is not
/// recursive. Used through QueuingRWMutexLock.
class VEXG_EXPORT QueuingRWMutex {
 public:
  QueuingRWMutex();
  ~QueuingRWMutex();
  QueuingRWMutex(const QueuingRWMutex&) = delete;
  QueuingRWMutex& operator=(const QueuingRWMutex&) = delete;

 private:
  friend class QueuingRWMutexLock;
  struct Impl;
  Impl* impl_;
};

/// Holds a QueuingRWMutex for reading or for writing.
class VEXG_EXPORT QueuingRWMutexLock : public PrivateLock {
 public:
  explicit QueuingRWMutexLock(QueuingRWMutex& mutex, bool write = true);
  ~QueuingRWMutexLock() override;

  void UpgradeToWriter() override;
  void DowngradeToReader() override;

 private:
  struct Impl;
  static constexpr std::size_t kImplBytes = 64;
  Impl& Held();

  QueuingRWMutex& mutex_;
  bool writing_;
  alignas(std::max_align_t) unsigned char storage_[kImplBytes];
};

}  // namespace lumo
