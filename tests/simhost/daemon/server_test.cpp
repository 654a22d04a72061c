// Replies arrive whole, and nobody who does not take one holds the daemon up.
#include "daemon/server.h"

#include <gmock/gmock.h>
#include <poll.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cstdint>
#include <filesystem>
#include <future>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "planes/openvswitch/transport/stream.h"
#include "temporary_folder.h"

namespace {

using simhost::daemon::Questions;
using simhost::daemon::Reply;
using simhost::daemon::Server;
using simhost::events::Clock;
using simhost::events::Loop;
using simhost::openvswitch::Deadline;
using simhost::openvswitch::Json;
using simhost::openvswitch::Stream;
using namespace std::chrono_literals;

constexpr auto kPatience = 20s;

// Far more than a socket holds.
std::string large_text() {
  return std::string(std::size_t{4} << 20, 'x');
}

struct AServer : testing::Test {
  void listen(Clock::duration patience = kPatience) {
    server.emplace(loop, simhost::openvswitch::socket_of(state),
                   Questions{
                       {"later", [this](Json const &, Reply const &reply) { kept = reply; }},
                       {"broken", [](Json const &,
                                     Reply const &) { throw std::runtime_error("it is broken"); }},
                       {"now",
                        [](Json const &, Reply const &reply) {
                          reply({{"text", large_text()}});
                        }},
                   },
                   patience);
  }

  [[nodiscard]] Stream client(std::string_view question) const {
    Stream stream(simhost::openvswitch::socket_of(state), Deadline::clock::now() + kPatience);
    stream.send({reinterpret_cast<std::uint8_t const *>(question.data()), question.size()});
    return stream;
  }

  // Runs the loop until then, and returns whether that came.
  template <typename Condition>
  bool comes(Condition const &condition) {
    auto const deadline = Clock::now() + kPatience;
    while (!condition() && Clock::now() < deadline) {
      loop.turn(1ms);
    }
    return condition();
  }

  std::string asked() {
    auto reply = std::async(std::launch::async, [this] {
      return simhost::openvswitch::ask(state, {{"ask", "now"}}, kPatience);
    });
    comes([&] { return reply.wait_for(0s) == std::future_status::ready; });
    return reply.get().at("text").get<std::string>();
  }

  // The line that comes back for one, which need not be a question.
  std::string reply_to(std::string_view line) {
    auto stream = client(line);
    std::vector<std::uint8_t> taken;
    comes([&] {
      stream.receive(taken);
      return !taken.empty() && taken.back() == '\n';
    });
    return {taken.begin(), taken.end()};
  }

  TemporaryFolder folder;
  std::filesystem::path state = folder.file("h.db");
  Loop loop;
  std::optional<Server> server;
  Reply kept;
};

bool is_dropped(Stream const &client) {
  pollfd polled{.fd = client.fd(), .events = 0, .revents = 0};
  return poll(&polled, 1, 0) == 1 && (polled.revents & POLLHUP) != 0;
}

TEST_F(AServer, SendsAReplyThatIsLargerThanASocketHolds) {
  listen();
  EXPECT_TRUE(asked() == large_text());
}

TEST_F(AServer, SaysWhyItHasNoReply) {
  listen();
  constexpr auto *kNoQuestion = "{\"refused\":\"that is no question\"}\n";
  EXPECT_EQ(reply_to("now\n"), kNoQuestion);
  EXPECT_EQ(reply_to("[\"ask\"]\n"), kNoQuestion);
  EXPECT_EQ(reply_to("{\"ask\": 1}\n"), kNoQuestion);
  EXPECT_EQ(reply_to("{\"ask\": \"never\"}\n"), "{\"refused\":\"nobody here knows 'never'\"}\n");
  EXPECT_EQ(reply_to("{\"ask\": \"broken\"}\n"), "{\"refused\":\"it is broken\"}\n");
}

TEST_F(AServer, DropsAClientThatTakesNothing) {
  listen(1ms);
  auto const idle = client("{\"ask\": \"now\"}\n");
  EXPECT_TRUE(comes([&] { return is_dropped(idle); }));
}

TEST_F(AServer, LetsQuestionsWaitUntilTheirClientHasTakenItsReply) {
  listen();
  auto stream = client("{\"ask\": \"now\"}\n{\"ask\": \"later\"}\n");
  std::vector<std::uint8_t> taken;
  auto const is_readable = [&] {
    pollfd polled{.fd = stream.fd(), .events = POLLIN, .revents = 0};
    return poll(&polled, 1, 0) == 1;
  };
  ASSERT_TRUE(comes(is_readable));
  EXPECT_FALSE(kept);
  EXPECT_TRUE(comes([&] {
    stream.receive(taken);
    return static_cast<bool>(kept);
  }));
}

// As many as there are now, and no more: whoever opens something next fails.
rlimit limited_to_open_descriptors() {
  rlimit before{};
  getrlimit(RLIMIT_NOFILE, &before);
  auto const next = dup(0);
  close(next);
  rlimit const limit{.rlim_cur = static_cast<rlim_t>(next), .rlim_max = before.rlim_max};
  setrlimit(RLIMIT_NOFILE, &limit);
  return before;
}

TEST_F(AServer, WaitsForDescriptorsInPeace) {
  listen();
  auto stream = client("{\"ask\": \"broken\"}\n");
  auto const before = limited_to_open_descriptors();
  int turns = 0;
  bool is_over = false;
  auto const end = loop.after(300ms, [&] { is_over = true; });
  while (!is_over) {
    loop.turn(kPatience);
    ++turns;
  }
  setrlimit(RLIMIT_NOFILE, &before);
  EXPECT_LT(turns, 100);
  std::vector<std::uint8_t> taken;
  EXPECT_TRUE(comes([&] {
    stream.receive(taken);
    return !taken.empty();
  }));
}

TEST_F(AServer, KnowsWhoAwaitsAReply) {
  listen();
  std::optional<Stream> asking(client("{\"ask\": \"later\"}\n"));
  ASSERT_TRUE(comes([&] { return static_cast<bool>(kept); }));
  EXPECT_TRUE(kept.is_awaited());
  asking.reset();
  EXPECT_TRUE(comes([&] { return !kept.is_awaited(); }));
}

TEST_F(AServer, GoesOnWhenAClientIsGoneBeforeItsReply) {
  listen();
  std::optional<Stream> gone(client("{\"ask\": \"later\"}\n"));
  ASSERT_TRUE(comes([&] { return static_cast<bool>(kept); }));
  gone.reset();
  kept({{"text", large_text()}});
  kept({{"text", "again"}});
  gone.emplace(client("{\"ask\": \"now\"}\n"));
  loop.turn(kPatience);
  gone.reset();
  EXPECT_TRUE(asked() == large_text());
}

}  // namespace
