// Children, watched by descriptors of processes.
#include "events/process.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <array>
#include <csignal>
#include <cstdlib>
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

// In the child, between fork and exec: only what may be called there.
[[noreturn]] void become(char const *program, char **words, char **environment, pid_t parent,
                         int output) {
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  // The parent may have ended before that.
  if (getppid() == parent) {
    if (output >= 0) {
      dup2(output, STDOUT_FILENO);
      dup2(output, STDERR_FILENO);
    }
    execvpe(program, words, environment);
  }
  _exit(127);
}

pid_t started(Command const &command, int output) {
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
           const_cast<char **>(environment_pointers.data()), parent, output);
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

}  // namespace

Process::Process(Loop &loop, Command const &command, std::function<void(std::string)> ended)
    : id_(started(command, -1)),
      descriptor_(owned(static_cast<int>(syscall(SYS_pidfd_open, id_, 0)), "pidfd_open")),
      ended_(std::move(ended)),
      watch_(loop.watch(descriptor_.number(), [this] {
        // It may be replaced in there.
        auto const tell = ended_;
        auto const how = reap();
        tell(how);
      })) {}

Process::~Process() {
  if (runs_) {
    kill(id_, SIGKILL);
    reap();
  }
}

void Process::end(Clock::duration patience) {
  if (!runs_) {
    return;
  }
  kill(id_, SIGTERM);
  if (!is_gone_within(patience)) {
    kill(id_, SIGKILL);
    // Of a thousand sockets that take whole frames, the kernel closes some seventy a second, and
    // needs nobody who waits for it.
    if (!is_gone_within(patience)) {
      watch_.end();
      runs_ = false;
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

void run(Command const &command) {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    fail_with_errno("pipe2");
  }
  Descriptor const output(ends[0]);
  Descriptor input(ends[1]);
  auto const child = started(command, input.number());
  input.close();
  std::string said;
  std::array<char, 4096> part{};
  ssize_t size = 0;
  while ((size = read(output.number(), part.data(), part.size())) > 0) {
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
