#pragma once

#include <deque>
#include <list>
#include <map>
#include <set>
#include <utility>

#include "foundation/array.h"
#include "foundation/errors.h"
#include "foundation/locks.h"
#include "foundation/object.h"

// The standard containers as Objects. They never let an exception out: an operation that can't
// allocate stores ObjectErrorOutOfMemory in its container, which is invalid from then on, leaves
// the contents as they were and gives false. Each has one type code for all its instances.
//
// Threads: like the standard containers, many readers or one writer; only LockableMap has a lock.

namespace lumo {

namespace detail {

/// Runs `work`; on an exception stores ObjectErrorOutOfMemory in `container` and gives false.
template <typename Work>
bool Guarded(ErrorState& container, Work&& work) {
  try {
    work();
    return true;
  } catch (...) {
    container.SetErrorState(ObjectErrorOutOfMemory());
    return false;
  }
}

}  // namespace detail

/// Gives the maps of all types one type code.
class VEXG_EXPORT MapObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// An ordered map with a default value, which a lookup of an absent key gives. A lookup takes a
/// number of compares that grows with the logarithm of the count.
///
///     Map<String, unsigned> codes(kUnknown);
///     codes[String("water")] = 1;
///     const unsigned code = codes.Find(String("forest"));  // kUnknown; adds no entry
template <typename K, typename V>
class Map : public MapObject {
 public:
  Map() = default;
  /// @param defaultValue  is copied; lookups of absent keys give it from then on.
  explicit Map(const V& defaultValue) : defaultValue_(defaultValue) {}

  /// The value of `key`, made as a copy of the default when absent. When it can't be made the error
  /// is stored, and the reference is to a value that is not part of the map.
  V& operator[](const K& key) {
    V* value = nullptr;
    const bool made = detail::Guarded(
        *this, [&] { value = &map_.try_emplace(key, defaultValue_).first->second; });
    return made ? *value : unplaced_;
  }

  /// The value of `key`, or the default; nothing is inserted.
  const V& Find(const K& key) const {
    const auto at = map_.find(key);
    return at != map_.end() ? at->second : defaultValue_;
  }

  /// True when the key has a value of its own, be it equal to the default.
  bool HasKey(const K& key) const { return map_.find(key) != map_.end(); }
  /// Takes the key out; nothing for an absent one.
  void Remove(const K& key) { map_.erase(key); }
  /// Number of keys.
  unsigned GetCount() const { return static_cast<unsigned>(map_.size()); }
  /// Takes all keys out; the default stays.
  void Clear() { map_.clear(); }

  /// All keys, in ascending order; an invalid array when there is no memory for it.
  Array<K> GetKeys() const {
    Array<K> keys{ArrayDims(GetCount())};
    K* next = keys.begin();
    if (keys.IsValid()) {
      for (const auto& entry : map_) *next++ = entry.first;
    }
    return keys;
  }

  /// Iterators over pairs of key and value, in ascending order of the keys.
  auto begin() { return map_.begin(); }
  auto end() { return map_.end(); }
  auto begin() const { return map_.begin(); }
  auto end() const { return map_.end(); }

 private:
  V defaultValue_ = V();
  std::map<K, V> map_;
  V unplaced_ = V();
};

/// A Map that enters its lock for each of its operations, so that threads may share it. References
/// that it gives, and its iterators, are safe only while the caller holds Lock():
///
///     const MutexLock lock = map.Lock();
///     for (const auto& [key, value] : map) …
template <typename K, typename V>
class LockableMap : public Map<K, V>, public Lockable {
  using Base = Map<K, V>;

 public:
  using Base::Base;

  V& operator[](const K& key) {
    const MutexLock lock = Lock();
    return Base::operator[](key);
  }
  const V& Find(const K& key) const {
    const MutexLock lock = Lock();
    return Base::Find(key);
  }
  bool HasKey(const K& key) const {
    const MutexLock lock = Lock();
    return Base::HasKey(key);
  }
  void Remove(const K& key) {
    const MutexLock lock = Lock();
    Base::Remove(key);
  }
  unsigned GetCount() const {
    const MutexLock lock = Lock();
    return Base::GetCount();
  }
  void Clear() {
    const MutexLock lock = Lock();
    Base::Clear();
  }
  Array<K> GetKeys() const {
    const MutexLock lock = Lock();
    return Base::GetKeys();
  }
};

/// Gives the sets of all types one type code.
class VEXG_EXPORT SetObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// An ordered set, iterated in ascending order.
template <typename T>
class Set : public SetObject {
 public:
  /// Puts `value` in, which may be there already. False only when memory fails.
  bool Insert(const T& value) {
    return detail::Guarded(*this, [&] { set_.insert(value); });
  }
  /// True when an equal value is in the set.
  bool Contains(const T& value) const { return set_.find(value) != set_.end(); }
  /// Takes the value out; nothing for an absent one.
  void Remove(const T& value) { set_.erase(value); }
  unsigned GetCount() const { return static_cast<unsigned>(set_.size()); }

  auto begin() const { return set_.begin(); }
  auto end() const { return set_.end(); }

 private:
  std::set<T> set_;
};

/// Gives the lists of all types one type code.
class VEXG_EXPORT ListObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// A doubly linked list: elements stay where they are in memory while others come and go.
template <typename T>
class List : public ListObject {
 public:
  /// Puts a copy at the end. False when there is no memory.
  bool PushBack(const T& value) {
    return detail::Guarded(*this, [&] { list_.push_back(value); });
  }
  /// Puts a copy at the front. False when there is no memory.
  bool PushFront(const T& value) {
    return detail::Guarded(*this, [&] { list_.push_front(value); });
  }
  /// Drops the first element; nothing on an empty list.
  void PopFront() {
    if (!list_.empty()) list_.pop_front();
  }
  unsigned GetCount() const { return static_cast<unsigned>(list_.size()); }
  void Clear() { list_.clear(); }

  auto begin() { return list_.begin(); }
  auto end() { return list_.end(); }
  auto begin() const { return list_.begin(); }
  auto end() const { return list_.end(); }

 private:
  std::list<T> list_;
};

/// Gives the deques of all types one type code.
class VEXG_EXPORT DequeObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// A double-ended queue, whose ends grow and shrink in constant time.
template <typename T>
class Deque : public DequeObject {
 public:
  /// Puts a copy at the end. False when there is no memory.
  bool PushBack(const T& value) {
    return detail::Guarded(*this, [&] { deque_.push_back(value); });
  }
  /// Puts a copy at the front. False when there is no memory.
  bool PushFront(const T& value) {
    return detail::Guarded(*this, [&] { deque_.push_front(value); });
  }
  /// Drops the last element; nothing on an empty deque.
  void PopBack() {
    if (!deque_.empty()) deque_.pop_back();
  }
  /// Drops the first element; nothing on an empty deque.
  void PopFront() {
    if (!deque_.empty()) deque_.pop_front();
  }
  /// Element `index` from the front, which must be there.
  T& operator[](unsigned index) { return deque_[index]; }
  const T& operator[](unsigned index) const { return deque_[index]; }
  unsigned GetCount() const { return static_cast<unsigned>(deque_.size()); }
  void Clear() { deque_.clear(); }

  auto begin() { return deque_.begin(); }
  auto end() { return deque_.end(); }
  auto begin() const { return deque_.begin(); }
  auto end() const { return deque_.end(); }

 private:
  std::deque<T> deque_;
};

/// Last in, first out: the top is the last element of the deque.
template <typename T>
class Stack : public Deque<T> {
 public:
  /// Puts a copy on top. False when there is no memory.
  bool Push(const T& value) { return this->PushBack(value); }
  /// Drops the top; nothing on an empty stack.
  void Pop() { this->PopBack(); }
  /// The value pushed last, which must be there.
  T& Top() { return (*this)[this->GetCount() - 1]; }
};

}  // namespace lumo
