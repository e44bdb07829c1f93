#pragma once

#include <pthread.h>

#include <memory>
#include <new>

namespace platform {

/// One Value for each thread, made when the thread first asks for it and destroyed when the thread
/// or the process ends.
///
/// What a thread_local variable with a destructor is, but for one thing: where there is no memory
/// to take note of the destructor, the C library ends the process, and this throws std::bad_alloc.
template <typename Value>
class PerThread {
 public:
  static Value& value() {
    if (value_ == nullptr) make();
    return *value_;
  }

 private:
  /// Tells of the ends of threads, and is told of the end of the process: the end of the main
  /// thread is none that the C library tells.
  class Key {
   public:
    Key() {
      if (::pthread_key_create(&key_, &destroy) != 0) throw std::bad_alloc();
    }
    ~Key() { destroy(value_); }
    Key(const Key&) = delete;
    Key& operator=(const Key&) = delete;
    bool set(Value* value) { return ::pthread_setspecific(key_, value) == 0; }

   private:
    pthread_key_t key_{};
  };

  static void make() {
    auto made = std::make_unique<Value>();
    // After the value, so as to end before it: a library that the value is the first to set up ends
    // itself when the process does, in reverse order, and is needed until the value is gone.
    static Key key;
    if (!key.set(made.get())) throw std::bad_alloc();
    value_ = made.release();
  }

  static void destroy(void* value) {
    value_ = nullptr;
    delete static_cast<Value*>(value);
  }

  static inline constinit thread_local Value* value_ = nullptr;
};

}  // namespace platform
