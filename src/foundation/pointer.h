#pragma once

#include <atomic>
#include <cstddef>
#include <functional>
#include <type_traits>

#include "foundation/object.h"

namespace lumo {

/// Holds the state that the Pointers to one object share. An empty Pointer has one too, with a null
/// object.
struct ControlBlock {
  std::atomic<unsigned> count{1};    ///< Pointers that share this block
  void* object = nullptr;            ///< address of the object's root base, see PointerRoot
  bool noDelete = false;             ///< the object belongs to somebody else
  void (*destroy)(void*) = nullptr;  ///< deletes the object by its root base
};

/// Base of the classes whose objects can give out a Pointer to themselves, as work does that
/// another thread is to keep alive: Pointer<T>::ShareOwner(*this) shares the object that a Pointer
/// owns.
class SelfPointing {
 public:
  SelfPointing() = default;
  SelfPointing(const SelfPointing&) {}  // a copy has an owner of its own
  SelfPointing& operator=(const SelfPointing&) { return *this; }

 private:
  template <typename T>
  friend class Pointer;
  ControlBlock* owner_ = nullptr;  // of the Pointers that own this object
};

namespace detail {

/// The base class under which a ControlBlock keeps the address of a T, so that Pointers to any two
/// classes of one family can share a block: Object or ErrorState where T has it, else the
/// `PointerRoot` that the family names in its root class, else T itself.
template <typename T>
auto FindPointerRoot() {
  if constexpr (std::is_base_of_v<Object, T>) {
    return std::type_identity<Object>();
  } else if constexpr (std::is_base_of_v<ErrorState, T>) {
    return std::type_identity<ErrorState>();
  } else if constexpr (requires { typename T::PointerRoot; }) {
    return std::type_identity<typename T::PointerRoot>();
  } else {
    return std::type_identity<T>();
  }
}

template <typename T>
using PointerRoot = typename decltype(FindPointerRoot<T>())::type;

}  // namespace detail

/// The shared pointer of the library: a counted reference to an object that is deleted, through
/// its virtual destructor, with the last Pointer that shares it. There are no weak references.
///
/// Two Pointers made from one raw pointer do not know of each other; sharing goes through copying.
/// `XPtr` stands for Pointer<X>.
///
///     const RasterPtr<float> floats(raster);  // shares `raster` where its pixels are float
///     if (floats.IsNull()) return false;      // they are of another type
///     const ColorPtr wrapped(&color, true);   // `color` stays its owner's
///
/// Cost:      a Pointer is two addresses wide, as it has a virtual destructor; its block is
///            one allocation more, which an empty Pointer makes too. A copy is one atomic addition.
/// Ownership: a raw pointer given to the constructor changes hands, unless `noDelete` is set, which
///            wraps an object that belongs to somebody else and outlives the Pointer.
/// Threads:   only the count is protected. Copies may live on different threads; one Pointer may
///            not be assigned on one thread while another uses it.
template <typename T>
class Pointer {
 public:
  /// An empty Pointer.
  Pointer() : block_(new ControlBlock) {}
  Pointer(std::nullptr_t) : Pointer() {}
  /// Takes over `object`, which no other Pointer may own, or wraps it. When there is no memory for
  /// the block an object that was to be owned is deleted, and std::bad_alloc comes out.
  explicit Pointer(T* object, bool noDelete = false) : block_(MakeBlock(object, noDelete)) {}
  /// Shares the object of another Pointer.
  Pointer(const Pointer& other) : block_(other.block_) { ++block_->count; }

  /// Shares the object of a Pointer to another class when it is a T: known at compile time for a
  /// class derived from T, else asked by IsA. Otherwise, or when `other` is null, empty.
  template <typename U>
  requires(!std::is_same_v<T, U>) Pointer(const Pointer<U>& other) : block_(ShareOrEmpty(other)) {}

  /// Shares the object that holds `self` with the Pointers that own it, which were made from a
  /// class derived from SelfPointing. Empty when none owns it: on the stack, or wrapped.
  static Pointer ShareOwner(const SelfPointing& self) {
    Pointer shared;
    if (self.owner_ == nullptr) return shared;
    ++self.owner_->count;
    shared.Release();
    shared.block_ = self.owner_;
    return shared;
  }

  virtual ~Pointer() { Release(); }

  /// Shares the object of `other`; the one held before is deleted when this was its last Pointer.
  Pointer& operator=(const Pointer& other) {
    if (this == &other) return *this;
    ControlBlock* const shared = other.block_;
    ++shared->count;  // before the release, which may destroy `other` itself
    Release();
    block_ = shared;
    return *this;
  }

  /// Lets go of the object that is held and takes over `object`, as the constructor does.
  void Reset(T* object = nullptr, bool noDelete = false) {
    ControlBlock* const fresh = MakeBlock(object, noDelete);
    Release();
    block_ = fresh;
  }

  /// True without an object.
  bool IsNull() const { return block_->object == nullptr; }
  explicit operator bool() const { return !IsNull(); }

  /// The object, which belongs to the Pointers that share it; null when there is none. `->` and `*`
  /// have to be guarded by IsNull().
  T* Get() const { return static_cast<T*>(static_cast<detail::PointerRoot<T>*>(block_->object)); }
  T* operator->() const { return Get(); }
  T& operator*() const { return *Get(); }

  /// How many Pointers share the object at this moment; another thread may change it at once.
  unsigned GetCount() const { return block_->count; }

  /// By the address of the control block: Pointers that share are equal.
  friend bool operator==(const Pointer& a, const Pointer& b) { return a.block_ == b.block_; }
  friend bool operator<(const Pointer& a, const Pointer& b) {
    return std::less<ControlBlock*>()(a.block_, b.block_);
  }

 private:
  template <typename U>
  friend class Pointer;

  static ControlBlock* MakeBlock(T* object, bool noDelete) {
    using Root = detail::PointerRoot<T>;
    Root* const root = object;
    try {
      auto* const block = new ControlBlock;
      block->object = root;
      block->noDelete = noDelete;
      block->destroy = [](void* held) { delete static_cast<Root*>(held); };
      if constexpr (std::is_base_of_v<SelfPointing, T>) {
        if (object != nullptr && !noDelete) object->SelfPointing::owner_ = block;
      }
      return block;
    } catch (...) {
      if (!noDelete) delete root;
      throw;
    }
  }

  template <typename U>
  static ControlBlock* ShareOrEmpty(const Pointer<U>& other) {
    static_assert(std::is_same_v<detail::PointerRoot<T>, detail::PointerRoot<U>>,
                  "the classes do not belong to one family");
    bool fits = !other.IsNull();
    if constexpr (!std::is_base_of_v<T, U>) {
      // Under sanitizers the compiler can't compare two addresses; then there is no check.
      static_assert(!__builtin_constant_p(&T::TypeCode == &Object::TypeCode) ||
                        &T::TypeCode != &Object::TypeCode,
                    "the class has no type code of its own");
      fits = fits && other->IsA(T::TypeCode);
    }
    if (!fits) return new ControlBlock;
    ++other.block_->count;
    return other.block_;
  }

  void Release() {
    if (block_->count != 0 && --block_->count != 0) return;
    if (block_->object != nullptr && !block_->noDelete) block_->destroy(block_->object);
    delete block_;
    block_ = nullptr;
  }

  ControlBlock* block_;
};

using ObjectPtr = Pointer<Object>;

}  // namespace lumo
