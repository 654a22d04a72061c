// Children, watched by descriptors of processes.
#include "events/process.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace simhost::events {
namespace {

std::vector<char *> pointers_to(std::vector<std::string> &texts) {
  std::vector<char *> pointers;
  pointers.reserve(texts.size() + 1);
  for (auto &text : texts) {
    pointers.push_back(text.data());
  }
  pointers.push_back(nullptr);
  return pointers;
}

std::vector<std::string> environment_with(std::map<std::string, std::string> const &more) {
  std::vector<std::string> all;
  for (char **entry = environ; *entry != nullptr; ++entry) {
    std::string text(*entry);
    if (!more.contains(text.substr(0, text.find('=')))) {
      all.push_back(std::move(text));
    }
  }
  for (auto const &[name, value] : more) {
    all.push_back(name);
    all.back().append("=").append(value);
  }
  return all;
}

// What a child inherits beside its input; none if negative.
struct Inherited {
  int output = -1;
  int life = -1;
};

// The kernel closes what has the highest number first, so that the end of this one is seen before
// all others are closed. Its table of numbers grows to that.
int life_in_child() {
  constexpr rlim_t kHighest = 0x7fff;
  rlimit limit{};
  getrlimit(RLIMIT_NOFILE, &limit);
  return static_cast<int>(std::min(limit.rlim_cur - 1, kHighest));
}

// In the child, between fork and exec: only what may be called there.
[[noreturn]] void become(char const *program, char **words, char **environment, pid_t parent,
                         Inherited inherited) {
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  // The parent may have ended before that.
  if (getppid() == parent) {
    if (inherited.output >= 0) {
      dup2(inherited.output, STDOUT_FILENO);
      dup2(inherited.output, STDERR_FILENO);
    }
    if (inherited.life >= 0) {
      dup2(inherited.life, life_in_child());
    }
    execvpe(program, words, environment);
  }
  _exit(127);
}

pid_t started(Command const &command, Inherited inherited) {
  auto words = command.words;
  words.insert(words.begin(), command.program);
  auto environment = environment_with(command.environment);
  auto const word_pointers = pointers_to(words);
  auto const environment_pointers = pointers_to(environment);
  auto const parent = getpid();
  auto const child = fork();
  if (child < 0) {
    fail_with_errno("fork");
  }
  if (child == 0) {
    become(command.program.c_str(), const_cast<char **>(word_pointers.data()),
           const_cast<char **>(environment_pointers.data()), parent, inherited);
  }
  return child;
}

std::string how_it_ended(int status) {
  if (WIFSIGNALED(status)) {
    return "was ended by signal " + std::to_string(WTERMSIG(status));
  }
  auto const code = WEXITSTATUS(status);
  return code == 127 ? "cannot be run" : "ended with status " + std::to_string(code);
}

// How a process ends that the kernel has begun to take down, as waitpid() will tell its parent once
// it is gone.
std::optional<int> status_of_ending(pid_t process) {
  constexpr std::size_t kFlags = 6;  // counted from what follows the name
  constexpr std::size_t kStatus = 49;
  constexpr unsigned long kIsExiting = 4;
  // Of one that vanishes meanwhile there is nothing to read, and a mere iterator would throw.
  std::ostringstream content;
  content << std::ifstream("/proc/" + std::to_string(process) + "/stat").rdbuf();
  auto const line = content.str();
  std::istringstream after_name(line.substr(std::min(line.rfind(')'), line.size() - 1) + 1));
  std::vector<std::string> const fields(std::istream_iterator<std::string>(after_name), {});
  if (fields.size() <= kStatus || (std::stoul(fields[kFlags]) & kIsExiting) == 0) {
    return std::nullopt;
  }
  return std::stoi(fields[kStatus]);
}

// It ends as soon as it runs again.
bool is_killed(pid_t process) {
  constexpr auto kKill = 1ULL << (SIGKILL - 1);
  std::ifstream file("/proc/" + std::to_string(process) + "/status");
  for (std::string line; std::getline(file, line);) {
    if ((line.starts_with("SigPnd:") || line.starts_with("ShdPnd:")) &&
        (std::stoull(line.substr(7), nullptr, 16) & kKill) != 0) {
      return true;
    }
  }
  return false;
}

struct Pipe {
  Descriptor read;
  Descriptor write;
};

Pipe pipe_for_child() {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    fail_with_errno("pipe2");
  }
  return {.read = Descriptor(ends[0]), .write = Descriptor(ends[1])};
}

}  // namespace

Process::Start Process::start(Command const &command) {
  auto life = pipe_for_child();
  auto const id = started(command, {.life = life.write.number()});
  return {.id = id, .life = std::move(life.read)};
}

Process::Process(Loop &loop, Command const &command, std::function<void(std::string)> ended)
    : Process(loop, start(command), std::move(ended)) {}

Process::Process(Loop &loop, Start start, std::function<void(std::string)> ended) try
    : id_(start.id),
      life_(std::move(start.life)),
      descriptor_(owned(static_cast<int>(syscall(SYS_pidfd_open, id_, 0)), "pidfd_open")),
      ended_(std::move(ended)),
      life_watch_(loop.watch(life_.number(), [this] { read_life(); })),
      watch_(loop.watch(descriptor_.number(), [this] { tell(reap()); })) {
} catch (...) {
  // Nobody has it.
  ::kill(start.id, SIGKILL);
  waitpid(start.id, nullptr, 0);
}

Process::~Process() {
  if (runs_) {
    constexpr auto kPatience = std::chrono::seconds(1);
    kill();
    if (is_gone_within(is_left_ ? Clock::duration() : kPatience)) {
      reap();
    }
  }
}

// A program may close what it did not open.
void Process::read_life() {
  life_watch_.end();
  if (auto const status = status_of_ending(id_)) {
    tell(how_it_ended(*status));
  } else {
    // Whoever has the number is told nothing by it any more.
    Descriptor const silent(eventfd(0, EFD_CLOEXEC));
    // Where there is none its end cannot be looked up either, and is told once it is gone.
    if (silent) {
      dup3(silent.number(), life_.number(), O_CLOEXEC);
    }
  }
}

// Once. It may be replaced in there.
void Process::tell(std::string const &how) {
  if (auto const ended = std::exchange(ended_, nullptr)) {
    ended(how);
  }
}

void Process::kill() {
  ended_ = nullptr;
  life_watch_.end();
  if (runs_) {
    ::kill(id_, SIGKILL);
  }
}

void Process::end(Clock::duration patience) {
  if (!runs_) {
    return;
  }
  life_watch_.end();
  ::kill(id_, SIGTERM);
  if (!is_gone_within(patience)) {
    kill();
    if (!is_gone_within(patience)) {
      is_left_ = true;
      return;
    }
  }
  reap();
}

bool Process::is_gone_within(Clock::duration patience) const {
  pollfd waited{.fd = descriptor_.number(), .events = POLLIN, .revents = 0};
  auto const wait = std::chrono::duration_cast<std::chrono::milliseconds>(patience).count();
  return poll(&waited, 1, static_cast<int>(wait)) == 1;
}

std::string Process::reap() {
  watch_.end();
  int status = 0;
  waitpid(id_, &status, 0);
  runs_ = false;
  return how_it_ended(status);
}

bool is_ending(int process) {
  return is_killed(process) || status_of_ending(process).has_value() ||
         (::kill(process, 0) != 0 && errno == ESRCH);
}

void run(Command const &command) {
  auto output = pipe_for_child();
  auto const child = started(command, {.output = output.write.number()});
  output.write.close();
  std::string said;
  std::array<char, 4096> part{};
  ssize_t size = 0;
  while ((size = read(output.read.number(), part.data(), part.size())) > 0) {
    said.append(part.data(), static_cast<std::size_t>(size));
  }
  int status = 0;
  waitpid(child, &status, 0);
  if (status != 0) {
    throw std::runtime_error(command.program + " " + how_it_ended(status) +
                             (said.empty() ? "" : ": " + said));
  }
}

}  // namespace simhost::events
