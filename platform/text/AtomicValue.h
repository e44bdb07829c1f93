#pragma once

#include <atomic>
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
    const Guard guard(busy_);
    return value_;
  }

  void store(Value value) {
    const Guard guard(busy_);
    std::swap(value_, value);  // the old value is destroyed after the lock is released
  }

 private:
  class Guard {
   public:
    explicit Guard(std::atomic_flag& busy) : busy_(busy) {
      while (busy_.test_and_set(std::memory_order_acquire)) std::this_thread::yield();
    }
    ~Guard() { busy_.clear(std::memory_order_release); }
    Guard(const Guard&) = delete;
    Guard& operator=(const Guard&) = delete;

   private:
    std::atomic_flag& busy_;
  };

  Value value_{};
  mutable std::atomic_flag busy_;
};

}  // namespace platform
