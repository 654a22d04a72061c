// A loop does what is waited for, and no more once nobody waits.
#include "events/loop.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <string>
#include <vector>

#include "events/signals.h"

namespace {

using simhost::events::Descriptor;
using simhost::events::Loop;
using testing::ElementsAre;
using testing::StrEq;
using namespace std::chrono_literals;

struct Pipe {
  Pipe() {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC | O_NONBLOCK) == 0) {
      out = Descriptor(ends[0]);
      in = Descriptor(ends[1]);
    }
  }
  void write_one() const { ASSERT_EQ(write(in.number(), "x", 1), 1); }
  [[nodiscard]] char read_one() const {
    char one = 0;
    return read(out.number(), &one, 1) == 1 ? one : '\0';
  }
  Descriptor out;
  Descriptor in;
};

TEST(ALoop, DoesWhatADescriptorIsWatchedFor) {
  Loop loop;
  Pipe const pipe;
  int seen = 0;
  auto watch = loop.watch(pipe.out.number(), [&] {
    EXPECT_EQ(pipe.read_one(), 'x');
    ++seen;
  });
  loop.turn(0ms);
  EXPECT_EQ(seen, 0);
  pipe.write_one();
  loop.turn(10s);
  EXPECT_EQ(seen, 1);
  watch.end();
  pipe.write_one();
  loop.turn(0ms);
  EXPECT_EQ(seen, 1);
}

TEST(ALoop, WaitsForWhatAWatchIsToWaitFor) {
  Loop loop;
  Pipe const pipe;
  int seen = 0;
  auto watch = loop.watch(pipe.in.number(), [&] { ++seen; });
  loop.turn(0ms);
  EXPECT_EQ(seen, 0);
  watch.wait_for(Loop::Ready::to_write);
  loop.turn(10s);
  EXPECT_EQ(seen, 1);
  watch.wait_for(Loop::Ready::to_read);
  loop.turn(0ms);
  EXPECT_EQ(seen, 1);
}

TEST(ALoop, LeavesOneAloneThatAnotherEndedInTheSameTurn) {
  Loop loop;
  Pipe const one;
  Pipe const other;
  std::vector<int> seen;
  Loop::Watch watches[2];
  auto const ends_the_other = [&](int own) {
    return [&, own] {
      seen.push_back(own);
      watches[1 - own].end();
    };
  };
  watches[0] = loop.watch(one.out.number(), ends_the_other(0));
  watches[1] = loop.watch(other.out.number(), ends_the_other(1));
  one.write_one();
  other.write_one();
  loop.turn(10s);
  EXPECT_EQ(seen.size(), 1U);
}

TEST(ALoop, TakesNoDescriptorForOneThatHadItsNumberInTheSameTurn) {
  Loop loop;
  Pipe pipes[2];
  Pipe const empty;
  int seen = 0;
  Loop::Watch watches[2];
  auto const replaces_the_other = [&](int own) {
    return [&, own] {
      watches[1 - own].end();
      ASSERT_GE(dup2(empty.out.number(), pipes[1 - own].out.number()), 0);
      watches[1 - own] = loop.watch(pipes[1 - own].out.number(), [&] { ++seen; });
    };
  };
  watches[0] = loop.watch(pipes[0].out.number(), replaces_the_other(0));
  watches[1] = loop.watch(pipes[1].out.number(), replaces_the_other(1));
  pipes[0].write_one();
  pipes[1].write_one();
  loop.turn(10s);
  EXPECT_EQ(seen, 0);
}

TEST(ALoop, MayReplaceAWatchWithinItsOwnWork) {
  Loop loop;
  Pipe const pipe;
  std::string seen;
  Loop::Watch watch;
  watch = loop.watch(pipe.out.number(), [&] {
    watch.end();
    watch = loop.watch(pipe.out.number(), [&] { seen += pipe.read_one(); });
  });
  pipe.write_one();
  loop.turn(10s);
  loop.turn(10s);
  EXPECT_THAT(seen, StrEq("x"));
}

TEST(ALoop, DoesWhatIsDueInItsOrderAndOnce) {
  Loop loop;
  std::vector<int> seen;
  auto const second = loop.after(2ms, [&] {
    seen.push_back(2);
    loop.stop();
  });
  auto const first = loop.after(1ms, [&] { seen.push_back(1); });
  auto never = loop.after(1ms, [&] { seen.push_back(3); });
  EXPECT_TRUE(static_cast<bool>(never));
  never.end();
  loop.run();
  EXPECT_THAT(seen, ElementsAre(1, 2));
  EXPECT_FALSE(static_cast<bool>(first));
}

TEST(ALoop, HasNothingToComeWithinTheWorkThatWasTheLast) {
  Loop loop;
  int seen = 0;
  Loop::Timer next;
  Loop::Work const work = [&] {
    ++seen;
    EXPECT_FALSE(static_cast<bool>(next));
    if (seen == 1) {
      next = loop.after(0ms, work);
    } else {
      loop.stop();
    }
  };
  next = loop.after(0ms, work);
  loop.run();
  EXPECT_EQ(seen, 2);
}

TEST(Signals, AreTakenByTheLoop) {
  Loop loop;
  int seen = 0;
  simhost::events::Signals const signals(loop, {SIGUSR1}, [&](int number) { seen = number; });
  raise(SIGUSR1);
  loop.turn(10s);
  EXPECT_EQ(seen, SIGUSR1);
}

}  // namespace
