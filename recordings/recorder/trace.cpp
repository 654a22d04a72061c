#include "recordings/recorder/trace.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <pthread.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "recordings/core/identities.h"
#include "recordings/core/process.h"
#include "recordings/front/forward.h"

namespace recordings {
namespace {

constexpr char const *trace_variable = "VSWITCH_RECORD_TRACE";
constexpr std::int64_t second = 1'000'000'000;

// Out of the way of the numbers that a tool expects its next file to have.
constexpr int lowest_descriptor = 500;

struct State {
  char path[4096];
  std::atomic<int> file;
  dev_t device;
  ino_t inode;
  std::atomic<bool> is_on;
  std::atomic<bool> has_told;  ///< of the process
  pid_t parent;
  std::int64_t start;
  std::atomic<std::uint64_t> numbers;
  std::atomic<std::uint64_t> threads;
};

constinit State state{};

std::int64_t read_clock(clockid_t clock) {
  timespec moment{};
  clock_gettime(clock, &moment);
  return moment.tv_sec * second + moment.tv_nsec;
}

/// Opens the trace that exists; what it is, who began the recording has written into it.
bool open_trace() {
  int const opened = open(static_cast<char const *>(state.path), O_WRONLY | O_APPEND | O_CLOEXEC);
  struct stat found {};
  if (opened < 0 || fstat(opened, &found) != 0) {
    return false;
  }
  int const moved = fcntl(opened, F_DUPFD_CLOEXEC, lowest_descriptor);
  if (moved >= 0) {
    close(opened);
  }
  state.device = found.st_dev;
  state.inode = found.st_ino;
  state.file = moved >= 0 ? moved : opened;
  return true;
}

/// Whether the descriptor is still that of the trace: a tool may close all that it did not open.
bool is_trace(int file) {
  struct stat found {};
  return fstat(file, &found) == 0 && found.st_dev == state.device && found.st_ino == state.inode;
}

void stop_because(char const *reason) {
  state.is_on = false;
  std::fprintf(stderr, "vswitch record: %s: %s: what follows is not recorded\n",
               static_cast<char const *>(state.path), reason);
}

void write_whole(std::string_view text) {
  while (!text.empty()) {
    auto const written = write(state.file, text.data(), text.size());
    if (written < 0 && errno == EINTR) {
      continue;
    }
    if (written <= 0) {
      stop_because(written == 0 ? "nothing was written" : std::strerror(errno));
      return;
    }
    text.remove_prefix(static_cast<std::size_t>(written));
  }
}

void write_time(Line &line) {
  timespec moment{};
  clock_gettime(CLOCK_REALTIME, &moment);
  std::tm parts{};
  gmtime_r(&moment.tv_sec, &parts);
  std::array<char, 32> written{};
  std::strftime(written.data(), written.size(), "%Y-%m-%dT%H:%M:%SZ", &parts);
  line.member("time").text(written.data());
}

void write_libraries(Line &line) {
  line.member("libraries").raw("{");
  for (std::string_view const library : {"libvswitch.so", "libnebPublic.so"}) {
    Dl_info found{};
    for (std::size_t at = 0; at < calls.size() && found.dli_fname == nullptr; ++at) {
      if (calls[at].library == library && host_functions[at] != nullptr) {
        dladdr(host_functions[at], &found);
      }
    }
    if (found.dli_fname != nullptr) {
      line.member(library).text(found.dli_fname);
    }
  }
  line.raw("}");
}

void tell_of_process() {
  Line line;
  std::array<char, 4096> program{};
  auto const length = readlink("/proc/self/exe", program.data(), program.size());
  line.raw("{").member("process").number(std::int64_t{process_id()});
  line.member("parent").number(std::int64_t{state.parent});
  write_time(line);
  line.member("program").text({program.data(), static_cast<std::size_t>(length < 0 ? 0 : length)});
  write_libraries(line);
  line.raw("}\n");
  if (line.is_whole()) {
    write_whole(line.text());
  }
}

void begin_process() {
  state.parent = getppid();
  state.start = now();
  state.has_told = false;
}

void after_fork_in_child() {
  unlock_identities();
  begin_process();
}

[[gnu::constructor]] void begin() {
  begin_process();
  pthread_atfork(lock_identities, unlock_identities, after_fork_in_child);
  char const *const path = std::getenv(trace_variable);
  if (path != nullptr && *path != '\0' && !begin_recording(path)) {
    stop_because(std::strerror(errno));
  }
}

}  // namespace

bool begin_recording(char const *path) noexcept {
  std::snprintf(static_cast<char *>(state.path), sizeof state.path, "%s", path);
  if (!open_trace()) {
    return false;
  }
  state.has_told = false;
  state.is_on = true;
  return true;
}

void end_recording() noexcept {
  state.is_on = false;
  if (is_trace(state.file)) {
    close(state.file);
  }
  state.file = -1;
}

bool is_recording() noexcept {
  return state.is_on.load(std::memory_order_relaxed);
}

std::uint64_t next_number() noexcept {
  return state.numbers.fetch_add(1, std::memory_order_relaxed) + 1;
}

std::uint64_t next_thread() noexcept {
  return state.threads.fetch_add(1, std::memory_order_relaxed) + 1;
}

std::int64_t now() noexcept {
  return read_clock(CLOCK_MONOTONIC);
}

std::int64_t since_start(std::int64_t moment) noexcept {
  return (moment - state.start) / 1000;
}

void write_line(Line const &line, File file) noexcept {
  if (!is_recording()) {
    return;
  }
  if (file == File::may_be_closed && !is_trace(state.file) && !open_trace()) {
    stop_because(std::strerror(errno));
    return;
  }
  if (!state.has_told.exchange(true)) {
    tell_of_process();
  }
  if (is_recording()) {
    write_whole(line.text());
  }
}

}  // namespace recordings
