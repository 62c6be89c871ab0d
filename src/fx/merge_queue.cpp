#include "fx/merge_queue.h"

#include <algorithm>

namespace lumo {

void MergeQueue::Clear() {
  later_.resize(kFront);
  coming_.clear();
  next_.clear();
  bound_ = 0;
}

void MergeQueue::Push(const Entry& entry) {
  const Key key = KeyOf(entry);
  if (key <= bound_) return PushNext(entry);
  later_.push_back(key);
  std::size_t at = later_.size() - 1 - kFront;
  Key* const heap = later_.data() + kFront;
  while (at > 0) {
    const std::size_t parent = (at - 1) / kBranches;
    if (heap[parent] <= key) break;
    heap[at] = heap[parent];
    at = parent;
  }
  heap[at] = key;
}

void MergeQueue::PushNext(const Entry& entry) {
  next_.push_back(entry);
  std::push_heap(next_.begin(), next_.end());
}

MergeQueue::Entry MergeQueue::TakeNext() {
  std::pop_heap(next_.begin(), next_.end());
  const Entry taken = next_.back();
  next_.pop_back();
  return taken;
}

MergeQueue::Key MergeQueue::TakeLater() {
  const Key taken = later_[kFront], last = later_.back();
  later_.pop_back();
  if (later_.size() > kFront) Sink(0, last);
  return taken;
}

/// Puts a key at a place of the heap, or where it belongs below.
void MergeQueue::Sink(std::size_t at, Key key) {
  Key* const heap = later_.data() + kFront;
  const std::size_t count = later_.size() - kFront;
  for (;;) {
    const std::size_t begin = at * kBranches + 1, end = std::min(begin + kBranches, count);
    if (begin >= end) break;
    std::size_t least = begin;
    for (std::size_t i = begin + 1; i < end; ++i) least = heap[i] < heap[least] ? i : least;
    if (heap[least] >= key) break;
    heap[at] = heap[least];
    at = least;
  }
  heap[at] = key;
}

/// Makes heaps of the entries.
void MergeQueue::Order() {
  const std::size_t count = later_.size() - kFront;
  for (std::size_t at = count / kBranches + 1; at-- > 0;) {
    if (at < count) Sink(at, later_[kFront + at]);
  }
  std::make_heap(next_.begin(), next_.end());
}

}  // namespace lumo
