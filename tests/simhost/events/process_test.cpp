// Programs that run as children: how they end is told once, and nobody waits for what takes long.
#include "events/process.h"

#include <gmock/gmock.h>
#include <poll.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <system_error>
#include <vector>

#include "refused_calls.h"
#include "temporary_folder.h"

namespace {

using simhost::events::Command;
using simhost::events::Loop;
using simhost::events::Process;
using testing::HasSubstr;
using testing::StrEq;
using namespace std::chrono_literals;

std::string how_it_ends(std::string const &script) {
  Loop loop;
  std::string said;
  Process const process(loop,
                        {.program = "sh", .words = {"-c", script}, .environment = {{"A", "7"}}},
                        [&](std::string const &how) {
                          said = how;
                          loop.stop();
                        });
  loop.run();
  return said;
}

TEST(AProcess, TellsHowItEnded) {
  EXPECT_THAT(how_it_ends("exit $A"), StrEq("ended with status 7"));
  EXPECT_THAT(how_it_ends("kill -9 $$"), StrEq("was ended by signal 9"));
}

TEST(AProcess, EndsWithItsOwner) {
  Loop loop;
  int id = 0;
  {
    Process const process(loop, {.program = "sleep", .words = {"600"}, .environment = {}},
                          [](std::string const &) {});
    id = process.id();
    EXPECT_EQ(kill(id, 0), 0);
  }
  EXPECT_EQ(kill(id, 0), -1);
}

TEST(AProcess, ThatDoesNotEndWhenItIsAskedIsEnded) {
  Loop loop;
  Process process(loop,
                  {.program = "sh",
                   .words = {"-c", "trap '' TERM; while :; do sleep 1; done"},
                   .environment = {}},
                  [](std::string const &) { ADD_FAILURE() << "it ended by itself"; });
  process.end(10ms);
  EXPECT_EQ(kill(process.id(), 0), -1);
}

TEST(AProgram, ThatFailsIsToldWithWhatItSaid) {
  try {
    simhost::events::run(
        {.program = "sh", .words = {"-c", "echo no luck; exit 3"}, .environment = {}});
    ADD_FAILURE() << "it did not fail";
  } catch (std::runtime_error const &error) {
    EXPECT_THAT(error.what(), HasSubstr("sh ended with status 3: no luck"));
  }
  EXPECT_THROW(simhost::events::run({.program = "/nowhere/x", .words = {}, .environment = {}}),
               std::runtime_error);
}

// It has so much open that takes the kernel a while to close that nobody should wait for it.
Command with_many_sockets(std::string const &then) {
  auto const program =
      "import os, signal, socket\n"
      "held = [socket.socket(socket.AF_PACKET, socket.SOCK_RAW, 0x0300)"
      " for _ in range(150)]\n" +
      then;
  std::vector<std::string> words{"--net", "/usr/bin/python3", "-c", program};
  if (geteuid() != 0) {
    words.insert(words.begin(), {"--user", "--map-root-user"});
  }
  return {.program = "unshare", .words = words, .environment = {}};
}

TEST(AProcessWithManySockets, IsToldToHaveEndedBeforeAllThatItHadOpenIsClosed) {
  Loop loop;
  std::string said;
  bool was_gone = true;
  Process const process(loop, with_many_sockets("os.kill(os.getpid(), signal.SIGKILL)"),
                        [&](std::string const &how) {
                          said = how;
                          was_gone = process.is_gone();
                          loop.stop();
                        });
  loop.run();
  EXPECT_EQ(said, "was ended by signal 9");
  EXPECT_FALSE(was_gone);
  // And once only, with nothing left over.
  while (!process.is_gone()) {
    loop.turn(10s);
  }
  EXPECT_EQ(kill(process.id(), 0), -1);
}

TEST(AProcessWithManySockets, IsLeftToTheKernelIfItsEndTakesLong) {
  TemporaryFolder const folder;
  auto const there = folder.file("there");
  Loop loop;
  Process process(loop, with_many_sockets("open('" + there.string() + "', 'w')\nsignal.pause()"),
                  [](std::string const &how) { ADD_FAILURE() << "it " << how; });
  while (!std::filesystem::exists(there)) {
    loop.turn(1ms);
  }
  process.end(1ms);
  EXPECT_EQ(kill(process.id(), 0), 0);
  EXPECT_FALSE(process.is_gone());
  while (!process.is_gone()) {
    loop.turn(10s);
  }
  EXPECT_EQ(kill(process.id(), 0), -1);
}

TEST(AProcess, ThatIsKilledIsGoneSoonerOrLaterAndNobodyIsTold) {
  Loop loop;
  Process process(loop, {.program = "sleep", .words = {"600"}, .environment = {}},
                  [](std::string const &how) { ADD_FAILURE() << "it " << how; });
  process.kill();
  while (!process.is_gone()) {
    loop.turn(10s);
  }
  EXPECT_EQ(kill(process.id(), 0), -1);
}

TEST(AProcess, TellsNothingOfItsEndOnceItHasClosedWhatTellsIt) {
  Loop loop;
  Process const process(
      loop,
      {.program = "/usr/bin/python3",
       .words = {"-c", "import os, signal; os.closerange(3, 65536); signal.pause()"},
       .environment = {}},
      [](std::string const &how) { ADD_FAILURE() << "it " << how; });
  pollfd life{.fd = process.life(), .events = POLLIN, .revents = 0};
  ASSERT_EQ(poll(&life, 1, 30'000), 1) << "it has closed it";
  loop.turn(1s);
  EXPECT_EQ(poll(&life, 1, 0), 0);
  EXPECT_EQ(kill(process.id(), 0), 0);
}

void start_where_processes_cannot_be_watched() {
  Loop loop;
  refuse_calls({SYS_pidfd_open}, EMFILE);
  try {
    Process const process(loop, {.program = "sleep", .words = {"600"}, .environment = {}},
                          [](std::string const &) {});
  } catch (std::system_error const &) {
    // The test has no other child.
    std::_Exit(waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD ? 0 : 2);
  }
  std::_Exit(1);
}

TEST(AProcess, ThatCannotBeWatchedIsNotLeftRunning) {
  EXPECT_EXIT(start_where_processes_cannot_be_watched(), testing::ExitedWithCode(0), "");
}

TEST(AProcess, MayCloseWhatItDidNotOpen) {
  Loop loop;
  std::string said;
  Process const process(loop,
                        {.program = "/usr/bin/python3",
                         .words = {"-c", "import os; os.closerange(3, 65536); os._exit(3)"},
                         .environment = {}},
                        [&](std::string const &how) {
                          said = how;
                          loop.stop();
                        });
  loop.run();
  EXPECT_EQ(said, "ended with status 3");
}

}  // namespace
