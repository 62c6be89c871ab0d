#pragma once

#include <memory>
#include <mutex>
#include <vector>

namespace lumo {

/// Lends objects to the threads of a loop, one to each: buffers that are used again, or the counts
/// of each thread. There are as many as were out at once. Threads: any may borrow.
///
///     ScratchPool<std::vector<double>> lines;
///     ParallelFor(height, abort, [&](unsigned y) {
///       const auto line = lines.Borrow(width);  // width numbers at first; later as they were left
///       Filter(y, *line);
///     });
template <typename T>
class ScratchPool {
 public:
  /// Holds an object of the pool, which goes back with it.
  class Loan {
   public:
    Loan(ScratchPool& pool, std::unique_ptr<T> object) : pool_(pool), object_(std::move(object)) {}
    ~Loan() { pool_.Return(std::move(object_)); }
    Loan(const Loan&) = delete;
    Loan& operator=(const Loan&) = delete;

    /// The object, which nobody else has until the loan ends.
    T& operator*() const { return *object_; }
    T* operator->() const { return object_.get(); }

   private:
    ScratchPool& pool_;
    std::unique_ptr<T> object_;
  };

  /// Lends one that is free, as its last user left it, or a new one made from `args`.
  template <typename... Args>
  Loan Borrow(const Args&... args) {
    std::unique_ptr<T> object = TakeFree();
    if (!object) object = std::make_unique<T>(args...);
    return Loan(*this, std::move(object));
  }

  /// Takes all out of the pool. Nobody borrows meanwhile. Their order is that in which they came
  /// back, which differs from run to run.
  std::vector<std::unique_ptr<T>> TakeAll() {
    const std::lock_guard lock(mutex_);
    return std::move(free_);
  }

 private:
  std::unique_ptr<T> TakeFree() {
    const std::lock_guard lock(mutex_);
    if (free_.empty()) {
      free_.reserve(++made_);  // so that the way back can't fail
      return nullptr;
    }
    std::unique_ptr<T> object = std::move(free_.back());
    free_.pop_back();
    return object;
  }
  void Return(std::unique_ptr<T> object) {
    const std::lock_guard lock(mutex_);
    free_.push_back(std::move(object));
  }

  std::mutex mutex_;
  std::vector<std::unique_ptr<T>> free_;  // under mutex_
  std::size_t made_ = 0;
};

}  // namespace lumo
