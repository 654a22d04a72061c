// A disk that is full, as far as this process is concerned.
#pragma once

#include <sys/resource.h>

#include <csignal>
#include <cstdint>
#include <filesystem>
#include <system_error>

/// No file that this process writes to becomes larger, as long as this lives.
class LargestFile {
 public:
  explicit LargestFile(std::uintmax_t bytes) {
    if (getrlimit(RLIMIT_FSIZE, &before_) != 0) {
      throw std::system_error(errno, std::generic_category(), "getrlimit");
    }
    set({.rlim_cur = bytes, .rlim_max = before_.rlim_max});
  }
  ~LargestFile() {
    setrlimit(RLIMIT_FSIZE, &before_);
    std::signal(SIGXFSZ, handled_before_);
  }
  LargestFile(LargestFile const &) = delete;
  LargestFile &operator=(LargestFile const &) = delete;

 private:
  static void set(rlimit const &limit) {
    if (setrlimit(RLIMIT_FSIZE, &limit) != 0) {
      throw std::system_error(errno, std::generic_category(), "setrlimit");
    }
  }

  rlimit before_{};
  void (*handled_before_)(int) = std::signal(SIGXFSZ, SIG_IGN);
};

/// What is committed to a state goes to the end of this file, in pages, each with a head.
inline std::uintmax_t bytes_of_log(std::filesystem::path state) {
  return std::filesystem::file_size(state += "-wal");
}
inline constexpr std::uintmax_t kPageInLog = 4096 + 24;
