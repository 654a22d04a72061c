#include "recordings/core/identities.h"

#include <sys/mman.h>

#include <cstddef>
#include <mutex>

namespace recordings {
namespace {

struct Known {
  std::uint64_t address;  ///< 0 where nothing is
  std::uint64_t number;
};

/// A table with open addresses, at most half full, in memory that no heap knows.
class Table {
 public:
  std::uint64_t number_of(std::uint64_t address) {
    if (2 * (used_ + 1) > size_ && !grow()) {
      return 0;
    }
    Known &known = slots_[place_of(address)];
    if (known.address == 0) {
      known = {address, ++last_};
      ++used_;
    }
    return known.number;
  }

  void forget(std::uint64_t address) {
    if (size_ == 0) {
      return;
    }
    auto hole = place_of(address);
    if (slots_[hole].address == 0) {
      return;
    }
    // What was pushed on by others moves back, or it would not be found again.
    for (auto at = next(hole); slots_[at].address != 0; at = next(at)) {
      auto const wanted = start_of(slots_[at].address);
      if (((at - wanted) & (size_ - 1)) >= ((at - hole) & (size_ - 1))) {
        slots_[hole] = slots_[at];
        hole = at;
      }
    }
    slots_[hole] = {};
    --used_;
  }

 private:
  static constexpr std::size_t first_size = 4096;

  [[nodiscard]] std::size_t start_of(std::uint64_t address) const {
    return ((address * 0x9E3779B97F4A7C15U) >> 20U) & (size_ - 1);
  }
  [[nodiscard]] std::size_t next(std::size_t at) const { return (at + 1) & (size_ - 1); }

  [[nodiscard]] std::size_t place_of(std::uint64_t address) const {
    auto at = start_of(address);
    while (slots_[at].address != 0 && slots_[at].address != address) {
      at = next(at);
    }
    return at;
  }

  bool grow() {
    auto const grown = size_ == 0 ? first_size : 2 * size_;
    void *const found = mmap(nullptr, grown * sizeof(Known), PROT_READ | PROT_WRITE,
                             MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    if (found == MAP_FAILED) {
      return false;
    }
    auto *const old = slots_;
    auto const old_size = size_;
    slots_ = static_cast<Known *>(found);
    size_ = grown;
    for (std::size_t at = 0; at < old_size; ++at) {
      if (old[at].address != 0) {
        slots_[place_of(old[at].address)] = old[at];
      }
    }
    if (old != nullptr) {
      munmap(old, old_size * sizeof(Known));
    }
    return true;
  }

  Known *slots_ = nullptr;
  std::size_t size_ = 0;
  std::size_t used_ = 0;
  std::uint64_t last_ = 0;
};

constinit Table table;
constinit std::mutex mutex;

}  // namespace

std::uint64_t identity_of(std::uint64_t address) noexcept {
  std::scoped_lock const lock(mutex);
  return table.number_of(address);
}

void forget(std::uint64_t address) noexcept {
  std::scoped_lock const lock(mutex);
  table.forget(address);
}

void lock_identities() noexcept {
  mutex.lock();
}

void unlock_identities() noexcept {
  mutex.unlock();
}

}  // namespace recordings
