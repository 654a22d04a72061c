// Preloaded into a process, counts the live blocks of its heap by their size.
//
// Under a sanitizer, whose allocator comes before any other, that allocator says what it does;
// otherwise the C library's is called from here.

#include <malloc.h>

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdlib>

namespace {

constexpr std::size_t kLargest = 1 << 14;
// For one size the C library allocates 8 bytes more or, where it would leave too little of a free
// block, 24: both belong to one step.
constexpr std::size_t kStep = 32;

// Zero before anything runs, as the first allocations of a process come early.
constinit std::array<std::atomic<long>, kLargest / kStep + 1> live_blocks{};

std::atomic<long> &blocks_like(std::size_t usable) {
  return live_blocks[(usable + kStep - 8) / kStep];
}

void count(void *block, long change) {
  std::size_t const size = block == nullptr ? 0 : malloc_usable_size(block);
  if (size != 0 && size < kLargest) {
    blocks_like(size).fetch_add(change, std::memory_order_relaxed);
  }
}

}  // namespace

extern "C" {

/** The number of live blocks such as one for `size` bytes, a multiple of 32. */
[[gnu::visibility("default")]] long allocations_like(std::size_t size) {
  void *const block = std::malloc(size);
  std::size_t const usable = malloc_usable_size(block);
  std::free(block);
  return usable < kLargest ? blocks_like(usable).load(std::memory_order_relaxed) : -1;
}

#ifdef __SANITIZE_ADDRESS__

int __sanitizer_install_malloc_and_free_hooks(void (*allocated)(void const volatile *, std::size_t),
                                              void (*freed)(void const volatile *));

static void allocated(void const volatile *block, std::size_t /*size*/) {
  count(const_cast<void *>(block), 1);
}

static void freed(void const volatile *block) {
  count(const_cast<void *>(block), -1);
}

[[gnu::constructor]] static void install() {
  if (__sanitizer_install_malloc_and_free_hooks(allocated, freed) == 0) {
    std::abort();
  }
}

#else

// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name): the C library's are reserved
void *__libc_malloc(std::size_t size);
void *__libc_calloc(std::size_t number, std::size_t size);
void *__libc_realloc(void *block, std::size_t size);
void __libc_free(void *block);

[[gnu::visibility("default")]] void *malloc(std::size_t size) {
  void *const block = __libc_malloc(size);
  count(block, 1);
  return block;
}

[[gnu::visibility("default")]] void *calloc(std::size_t number, std::size_t size) {
  void *const block = __libc_calloc(number, size);
  count(block, 1);
  return block;
}

[[gnu::visibility("default")]] void *realloc(void *block, std::size_t size) {
  count(block, -1);
  void *const moved = __libc_realloc(block, size);
  // A block that could not be moved is still there, unless it was to be freed.
  count(moved == nullptr && size != 0 ? block : moved, 1);
  return moved;
}

[[gnu::visibility("default")]] void free(void *block) {
  count(block, -1);
  __libc_free(block);
}
// NOLINTEND(readability-inconsistent-declaration-parameter-name)

#endif
}
