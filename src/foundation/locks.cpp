#include "foundation/locks.h"

#include <new>

#include <oneapi/tbb/queuing_rw_mutex.h>

// The scheduler's library is not built for the thread sanitizer, so the order that its mutex makes
// is shown to the sanitizer here.
#if defined(__SANITIZE_THREAD__)
#include <sanitizer/tsan_interface.h>
#define VEXG_TSAN(call) call
#else
#define VEXG_TSAN(call)
#endif

namespace lumo {

struct QueuingRWMutex::Impl {
  tbb::queuing_rw_mutex mutex;
};

QueuingRWMutex::QueuingRWMutex() : impl_(new Impl) {
  VEXG_TSAN(__tsan_mutex_create(this, __tsan_mutex_not_static));
}

QueuingRWMutex::~QueuingRWMutex() {
  VEXG_TSAN(__tsan_mutex_destroy(this, __tsan_mutex_not_static));
  delete impl_;
}

struct QueuingRWMutexLock::Impl {
  tbb::queuing_rw_mutex::scoped_lock lock;
};

QueuingRWMutexLock::Impl& QueuingRWMutexLock::Held() {
  return *std::launder(reinterpret_cast<Impl*>(storage_));
}

QueuingRWMutexLock::QueuingRWMutexLock(QueuingRWMutex& mutex, bool write)
    : mutex_(mutex), writing_(write) {
  static_assert(sizeof(Impl) <= kImplBytes);
  new (storage_) Impl;
  VEXG_TSAN(__tsan_mutex_pre_lock(&mutex_, write ? 0 : __tsan_mutex_read_lock));
  Held().lock.acquire(mutex_.impl_->mutex, write);
  VEXG_TSAN(__tsan_mutex_post_lock(&mutex_, write ? 0 : __tsan_mutex_read_lock, 0));
}

QueuingRWMutexLock::~QueuingRWMutexLock() {
  VEXG_TSAN(__tsan_mutex_pre_unlock(&mutex_, writing_ ? 0 : __tsan_mutex_read_lock));
  Held().lock.release();
  VEXG_TSAN(__tsan_mutex_post_unlock(&mutex_, writing_ ? 0 : __tsan_mutex_read_lock));
  Held().~Impl();
}

void QueuingRWMutexLock::UpgradeToWriter() {
  if (writing_) return;
  VEXG_TSAN(__tsan_mutex_pre_unlock(&mutex_, __tsan_mutex_read_lock));
  VEXG_TSAN(__tsan_mutex_post_unlock(&mutex_, __tsan_mutex_read_lock));
  VEXG_TSAN(__tsan_mutex_pre_lock(&mutex_, 0));
  Held().lock.upgrade_to_writer();
  VEXG_TSAN(__tsan_mutex_post_lock(&mutex_, 0, 0));
  writing_ = true;
}

void QueuingRWMutexLock::DowngradeToReader() {
  if (!writing_) return;
  VEXG_TSAN(__tsan_mutex_pre_unlock(&mutex_, 0));
  VEXG_TSAN(__tsan_mutex_post_unlock(&mutex_, 0));
  VEXG_TSAN(__tsan_mutex_pre_lock(&mutex_, __tsan_mutex_read_lock));
  Held().lock.downgrade_to_reader();
  VEXG_TSAN(__tsan_mutex_post_lock(&mutex_, __tsan_mutex_read_lock, 0));
  writing_ = false;
}

}  // namespace lumo
