#pragma once

#include <cstddef>
#include <mutex>

#include "platform/export.h"

namespace lumo {

/// Holds a lock from its construction to its destruction: the root of the scoped locks.
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

/// Holds a recursive mutex: the thread that holds it may enter it again. It blocks until the mutex
/// is free, without a bound in time.
class VEXG_EXPORT MutexLock : public PrivateLock {
 public:
  /// @param mutex  outlives the lock.
  explicit MutexLock(std::recursive_mutex& mutex) : mutex_(&mutex) { mutex_->lock(); }
  ~MutexLock() override { mutex_->unlock(); }

 private:
  std::recursive_mutex* mutex_;
};

/// Mixin of the classes that guard themselves by one recursive mutex. An operation that holds it
/// may call others of the same object that take it too.
///
///     const MutexLock lock = table.Lock();  // several operations as one
///     if (!table.HasKey(key)) table[key] = value;
class VEXG_EXPORT Lockable {
 public:
  Lockable() = default;
  Lockable(const Lockable&) {}  // a copy has a mutex of its own
  Lockable& operator=(const Lockable&) { return *this; }

  /// Enters the mutex; it is left when the result goes.
  MutexLock Lock() const { return MutexLock(mutex_); }

 private:
  mutable std::recursive_mutex mutex_;
};

/// A fair read-write mutex: waiting threads are served in the order in which they came. It is not
/// recursive. Used through QueuingRWMutexLock. Many may hold it for reading, or one for writing. A
/// thread that enters it twice waits for itself.
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
///
///     QueuingRWMutexLock lock(mutex, false);  // to read
///     if (cache.Has(key)) return cache.At(key);
///     lock.UpgradeToWriter();                 // others may have been here: look again
///     if (!cache.Has(key)) cache.Make(key);
class VEXG_EXPORT QueuingRWMutexLock : public PrivateLock {
 public:
  /// @param mutex  outlives the lock.
  /// @param write  false to share it with other readers.
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
