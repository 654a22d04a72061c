// Objects of a thread's own that are there for every call that it makes, up to the last.
#pragma once

#include <pthread.h>

#include <new>

namespace recordings {

/// The calling thread's own object of a type.
///
/// Tools make calls even after their thread_local objects were destroyed: from what atexit runs,
/// and from destructors of statics. So an object ends with a key of its thread, which is later;
/// that of the thread that ends the process stays.
template <typename T>
class OfThread {
 public:
  static T &get() noexcept {
    if (own == nullptr) {
      own = new (static_cast<void *>(room)) T();
      pthread_setspecific(key(), own);
    }
    return *own;
  }

 private:
  static pthread_key_t key() noexcept {
    static pthread_key_t const made = [] {
      pthread_key_t one{};
      pthread_key_create(&one, end);
      return one;
    }();
    return made;
  }

  static void end(void *object) {
    own = nullptr;
    static_cast<T *>(object)->~T();
  }

  alignas(T) static inline constinit thread_local char room[sizeof(T)] = {};
  static inline constinit thread_local T *own = nullptr;
};

}  // namespace recordings
