#include "recordings/player/ledger.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>

namespace recordings {
namespace {

// A byte that is set when a call could not be played, one for each process of the trace, one for
// each call.
constexpr std::size_t failure = 0;
constexpr std::size_t first_part = 1;

std::atomic_ref<std::uint8_t> shared(std::uint8_t &byte) {
  return std::atomic_ref<std::uint8_t>(byte);
}

}  // namespace

Ledger::~Ledger() {
  if (bytes_ != nullptr) {
    munmap(bytes_, size_);
  }
}

bool Ledger::open(std::string const &path, std::size_t parts, std::size_t calls) {
  int const file = ::open(path.c_str(), O_RDWR | O_CLOEXEC);
  struct stat found {};
  auto const size = first_part + parts + calls;
  bool const fits =
      file >= 0 && fstat(file, &found) == 0 && static_cast<std::size_t>(found.st_size) == size;
  void *const mapped =
      fits ? mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0) : MAP_FAILED;
  if (file >= 0) {
    close(file);
  }
  if (mapped == MAP_FAILED) {
    return false;
  }
  bytes_ = static_cast<std::uint8_t *>(mapped);
  size_ = size;
  parts_ = parts;
  return true;
}

bool Ledger::claim(std::size_t part) {
  return shared(bytes_[first_part + part]).exchange(1) == 0;
}

bool Ledger::is_claimed(std::size_t part) const {
  return shared(bytes_[first_part + part]).load() != 0;
}

void Ledger::note_made(std::size_t call) {
  shared(bytes_[first_part + parts_ + call]).store(1);
}

bool Ledger::is_made(std::size_t call) const {
  return shared(bytes_[first_part + parts_ + call]).load() != 0;
}

void Ledger::note_failure() {
  shared(bytes_[failure]).store(1);
}

}  // namespace recordings
