// Several processes on one state file: this one, workers that it starts, and its own children.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "temporary_folder.h"
#include "vswitch/configuration.h"

namespace {

// A worker process; it is killed, if it is still there, when this goes.
class Worker {
 public:
  Worker(std::filesystem::path const &state, std::vector<std::string> words) {
    std::array<int, 2> ends{};
    if (pipe(ends.data()) != 0) {
      throw std::runtime_error("no pipe");
    }
    words.insert(words.begin(), WORKER);
    std::vector<char *> arguments;
    arguments.reserve(words.size() + 1);
    for (auto &word : words) {
      arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    process_ = fork();
    if (process_ == 0) {
      dup2(ends[1], STDOUT_FILENO);
      close(ends[0]);
      close(ends[1]);
      setenv("SIMHOST_STATE", state.c_str(), 1);
      execv(WORKER, arguments.data());
      _exit(127);
    }
    close(ends[1]);
    output_ = fdopen(ends[0], "r");
  }
  ~Worker() {
    kill_now();
    std::fclose(output_);
  }
  Worker(Worker const &) = delete;
  Worker &operator=(Worker const &) = delete;

  /// The next line of its output without the line break; empty at the end.
  std::string line() {
    std::array<char, 256> text{};
    if (std::fgets(text.data(), text.size(), output_) == nullptr) {
      return "";
    }
    std::string line = text.data();
    line.pop_back();
    return line;
  }
  std::vector<std::string> lines() {
    std::vector<std::string> all;
    for (auto next = line(); !next.empty(); next = line()) {
      all.push_back(next);
    }
    return all;
  }
  /// Waits for its end; its exit code, or -1 if a signal ended it.
  int exit_code() {
    int status = 0;
    waitpid(process_, &status, 0);
    process_ = 0;
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }
  void kill_now() {
    if (process_ != 0) {
      kill(process_, SIGKILL);
      exit_code();
    }
  }

 private:
  pid_t process_;
  std::FILE *output_;
};

std::vector<std::string> output_of(std::filesystem::path const &state,
                                   std::vector<std::string> const &words) {
  Worker worker(state, words);
  auto lines = worker.lines();
  EXPECT_EQ(worker.exit_code(), 0);
  return lines;
}

qex_uint32 mtu_here(char const *name) {
  qex_uint32 mtu = 0;
  auto const status = VSDVS_GetMTU(name, &mtu);
  return status == QEX_OK ? mtu : 0;
}

// The state file of this process for all tests, because it is read at the first call only.
std::filesystem::path const &own_state() {
  static TemporaryFolder const folder;
  static std::filesystem::path const file = folder.file("host.db");
  setenv("SIMHOST_STATE", file.c_str(), 1);
  return file;
}

QEX_ReturnStatus create_here(char const *name) {
  return VSDVS_CreateVSwitch(name, nullptr, nullptr, 0, 1, 0, 0, 0);
}

TEST(Processes, ASwitchOutlivesItsMaker) {
  TemporaryFolder const folder;
  output_of(folder.file("host.db"), {"create", "s", "set", "s", "9000"});
  EXPECT_THAT(output_of(folder.file("host.db"), {"get", "s"}), testing::ElementsAre("9000"));
}

TEST(Processes, WithoutAStateFileAHostEndsWithItsProcess) {
  output_of("", {"create", "s"});
  EXPECT_THAT(output_of("", {"create", "s"}), testing::ElementsAre("s"));
}

TEST(Processes, SeeEachOthersSwitchesAtOnce) {
  auto const &state = own_state();
  ASSERT_EQ(create_here("mine"), QEX_OK);
  EXPECT_THAT(output_of(state, {"get", "mine", "set", "mine", "9000", "create", "theirs"}),
              testing::ElementsAre("1500", "mine", "theirs"));
  EXPECT_EQ(mtu_here("mine"), 9000U);
  EXPECT_EQ(mtu_here("theirs"), 1500U);
  EXPECT_EQ(create_here("theirs"), QEX_EXISTS);
  EXPECT_EQ(VSDVS_SetMTU("theirs", 2000), QEX_OK);
  EXPECT_THAT(output_of(state, {"get", "theirs"}), testing::ElementsAre("2000"));
  EXPECT_EQ(VSDVS_DestroyVSwitch("mine"), QEX_OK);
  EXPECT_EQ(VSDVS_DestroyVSwitch("theirs"), QEX_OK);
}

TEST(Processes, MayAllStartOnANewFileTogether) {
  TemporaryFolder const folder;
  auto const state = folder.file("host.db");
  constexpr int kWorkers = 6;
  {
    std::vector<std::unique_ptr<Worker>> workers;
    workers.reserve(kWorkers);
    for (int number = 0; number < kWorkers; ++number) {
      workers.push_back(std::make_unique<Worker>(
          state, std::vector<std::string>{"create-many", "w" + std::to_string(number), "20"}));
    }
    for (auto &worker : workers) {
      EXPECT_EQ(worker->lines().size(), 20U);
      EXPECT_EQ(worker->exit_code(), 0);
    }
  }
  std::vector<std::string> questions;
  for (int number = 0; number < kWorkers; ++number) {
    for (int at = 0; at < 20; ++at) {
      questions.insert(questions.end(),
                       {"get", "w" + std::to_string(number) + "-" + std::to_string(at)});
    }
  }
  EXPECT_THAT(output_of(state, questions),
              testing::AllOf(testing::SizeIs(kWorkers * 20), testing::Each("1500")));
}

TEST(Processes, AKilledOneLosesNothingThatItCompleted) {
  TemporaryFolder const folder;
  auto const state = folder.file("host.db");
  std::vector<std::string> completed;
  for (int round = 0; round < 8; ++round) {
    Worker worker(state, {"create-many", "r" + std::to_string(round), "1000000"});
    for (int at = 0; at <= 5 * round; ++at) {
      completed.push_back(worker.line());
      ASSERT_EQ(completed.back(), "r" + std::to_string(round) + "-" + std::to_string(at));
    }
    worker.kill_now();
    auto const rest = worker.lines();
    completed.insert(completed.end(), rest.begin(), rest.end());
  }
  std::vector<std::string> questions;
  for (auto const &name : completed) {
    questions.insert(questions.end(), {"get", name});
  }
  EXPECT_THAT(output_of(state, questions),
              testing::AllOf(testing::SizeIs(completed.size()), testing::Each("1500")));
}

// Runs `work` in a child of this process; whether it returned true.
template <typename Work>
bool true_in_child(Work const &work) {
  auto const child = fork();
  if (child == 0) {
    _exit(work() ? 0 : 1);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST(Processes, AChildSharesTheStateFile) {
  own_state();
  ASSERT_EQ(create_here("parent"), QEX_OK);
  EXPECT_TRUE(true_in_child([] {
    return mtu_here("parent") == 1500 && VSDVS_SetMTU("parent", 9000) == QEX_OK &&
           create_here("child") == QEX_OK;
  }));
  EXPECT_EQ(mtu_here("parent"), 9000U);
  EXPECT_EQ(mtu_here("child"), 1500U);
  EXPECT_EQ(VSDVS_DestroyVSwitch("parent"), QEX_OK);
  EXPECT_EQ(VSDVS_DestroyVSwitch("child"), QEX_OK);
}

// A connection carried across the fork would go on writing into a log that its parent has deleted.
TEST(Processes, AChildThatOutlivesItsParentLosesNothing) {
  TemporaryFolder const folder;
  auto const state = folder.file("host.db");
  EXPECT_THAT(output_of(state, {"create", "s", "orphan", "set", "s", "9000", "vanish"}),
              testing::ElementsAre("s", "s"));
  EXPECT_THAT(output_of(state, {"get", "s"}), testing::ElementsAre("9000"));
}

TEST(ProcessesDeathTest, AChildHasACopyOfAStateInMemory) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");  // starts over, so that no state file is open
  EXPECT_EXIT(
      {
        unsetenv("SIMHOST_STATE");
        bool const created = create_here("s") == QEX_OK;
        bool const child = true_in_child(
            [] { return mtu_here("s") == 1500 && VSDVS_SetMTU("s", 9000) == QEX_OK; });
        std::exit(created && child && mtu_here("s") == 1500 ? 0 : 1);
      },
      testing::ExitedWithCode(0), "");
}

}  // namespace
