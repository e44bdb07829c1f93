#pragma once

#include <atomic>
#include <mutex>
#include <thread>
#include <utility>

namespace platform {

/// A value whose reading and writing are atomic with respect to each other, for types that
/// std::atomic does not take.
///
/// A reader gets a whole value of its own, which stays valid whatever other threads write. The lock
/// is one byte, so that a record can have one for each of its fields, and is held only for the copy
/// or the swap of a handle.
template <typename Value>
class AtomicValue {
 public:
  AtomicValue() = default;
  AtomicValue(const AtomicValue&) = delete;
  AtomicValue& operator=(const AtomicValue&) = delete;

  Value load() const {
    const std::lock_guard guard(lock_);
    return value_;
  }

  void store(Value value) {
    const std::lock_guard guard(lock_);
    std::swap(value_, value);  // the old value is destroyed after the lock is released
  }

  /// What the function makes of the value while no other thread reads or writes it. It is short and
  /// calls nothing of this object.
  template <typename Function>
  auto use(Function function) {
    const std::lock_guard guard(lock_);
    return function(value_);
  }
  template <typename Function>
  auto use(Function function) const {
    const std::lock_guard guard(lock_);
    return function(value_);
  }

 private:
  struct Lock {
    void lock() {
      while (busy.test_and_set(std::memory_order_acquire)) std::this_thread::yield();
    }
    void unlock() { busy.clear(std::memory_order_release); }

    std::atomic_flag busy;
  };

  Value value_{};
  mutable Lock lock_;
};

}  // namespace platform
