#include "recordings/core/memory.h"

#include <pthread.h>
#include <sys/uio.h>

#include <algorithm>
#include <cstring>

#include "recordings/core/process.h"

namespace recordings {
namespace {

constexpr std::size_t page = 4096;

#ifdef __SANITIZE_ADDRESS__
// It watches over what lies between the variables of a frame.
constexpr bool reads_own_stack = false;
#else
constexpr bool reads_own_stack = true;
#endif

/// Where the stack of a thread ends, which every frame that is in use lies below.
std::uint64_t end_of_stack() {
  pthread_attr_t attributes;
  if (pthread_getattr_np(pthread_self(), &attributes) != 0) {
    return 0;
  }
  void *lowest = nullptr;
  std::size_t size = 0;
  pthread_attr_getstack(&attributes, &lowest, &size);
  pthread_attr_destroy(&attributes);
  return reinterpret_cast<std::uint64_t>(lowest) + size;
}

/// Whether bytes lie in frames of this thread, which need no look from outside.
bool is_on_stack(std::uint64_t address, std::size_t size) {
  static thread_local std::uint64_t const end = end_of_stack();
  auto const here = reinterpret_cast<std::uint64_t>(__builtin_frame_address(0));
  return address >= here && address < end && size <= end - address;
}

bool copy(char *into, std::uint64_t address, std::size_t size) {
  if (reads_own_stack && is_on_stack(address, size)) {
    std::memcpy(into, reinterpret_cast<void const *>(address), size);
    return true;
  }
  iovec const to{into, size};
  iovec const from{reinterpret_cast<void *>(address), size};
  auto const copied = process_vm_readv(process_id(), &to, 1, &from, 1, 0);
  return copied == static_cast<ssize_t>(size);
}

}  // namespace

void Block::open(std::uint64_t address) noexcept {
  address_ = address;
  size_ = 0;
}

bool Block::need(std::size_t size) noexcept {
  if (size <= size_) {
    return true;
  }
  if (size > most_bytes || !room_.reserve(size) ||
      !copy(room_.data() + size_, address_ + size_, size - size_)) {
    return false;
  }
  size_ = size;
  return true;
}

bool Block::need_text() noexcept {
  // No further than to the end of a page: the next one may not be there, and need not be.
  std::size_t step = 64;
  while (size_ < longest_text) {
    auto const left = page - (address_ + size_) % page;
    auto const from = size_;
    if (!need(size_ + std::min(step, left))) {
      return false;
    }
    if (std::memchr(room_.data() + from, 0, size_ - from) != nullptr) {
      return true;
    }
    step = page;
  }
  return true;
}

}  // namespace recordings
