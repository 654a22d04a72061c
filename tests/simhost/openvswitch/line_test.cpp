// Lines taken apart, and daemons that are none.
#include "planes/openvswitch/line/line.h"

#include <gmock/gmock.h>
#include <sys/socket.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <thread>

#include "events/unix_address.h"
#include "planes/openvswitch/caller/asking.h"
#include "temporary_folder.h"

namespace {

using simhost::openvswitch::ask;
using simhost::openvswitch::Asking;
using simhost::openvswitch::Lines;
using simhost::openvswitch::NoDaemon;
using testing::HasSubstr;
using testing::Optional;
using testing::StrEq;
using namespace std::chrono_literals;

TEST(Lines, AreTakenApartHoweverTheyCome) {
  Lines lines;
  lines.add("{\"a\"");
  EXPECT_FALSE(lines.next());
  lines.add(": 1}\n{}\nx");
  EXPECT_THAT(lines.next(), Optional(StrEq("{\"a\": 1}")));
  EXPECT_THAT(lines.next(), Optional(StrEq("{}")));
  EXPECT_FALSE(lines.next());
}

TEST(Lines, ThatNeverEndAreRefused) {
  Lines lines;
  lines.add(std::string(simhost::openvswitch::kLongestLine + 1, ' '));
  EXPECT_THROW(lines.next(), NoDaemon);
}

// Whoever listens there says `said` to the first who connects, and ends.
class Peer {
 public:
  Peer(std::filesystem::path const &state, std::string said)
      : socket_(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    simhost::events::UnixAddress const address(simhost::openvswitch::socket_of(state));
    EXPECT_EQ(bind(socket_, address.get(), address.size()), 0);
    EXPECT_EQ(listen(socket_, 1), 0);
    thread_ = std::thread([this, said = std::move(said)] {
      int const client = accept(socket_, nullptr, nullptr);
      char byte = 0;
      while (read(client, &byte, 1) == 1 && byte != '\n') {
      }
      static_cast<void>(write(client, said.data(), said.size()));
      close(client);
    });
  }
  ~Peer() {
    thread_.join();
    close(socket_);
  }
  Peer(Peer const &) = delete;
  Peer &operator=(Peer const &) = delete;

 private:
  int socket_;
  std::thread thread_;
};

std::string refusal(std::filesystem::path const &state) {
  try {
    ask(state, {{"ask", "status"}}, 10s);
  } catch (NoDaemon const &none) {
    return none.what();
  }
  return {};
}

TEST(AQuestion, IsRepliedTo) {
  TemporaryFolder const folder;
  Peer const peer(folder.file("h.db"), "{\"change\": 7}\n");
  EXPECT_EQ(ask(folder.file("h.db"), {{"ask", "status"}}, 10s)["change"], 7);
}

TEST(AQuestion, ToNobodyIsToldAtOnce) {
  TemporaryFolder const folder;
  EXPECT_THAT(refusal(folder.file("h.db")), StrEq("no simhostd: No such file or directory"));
  EXPECT_THAT(refusal(folder.file("none") / "h.db"),
              StrEq("no simhostd: No such file or directory"));
  EXPECT_THAT(refusal(folder.file(std::string(120, 'h').c_str())),
              StrEq("no simhostd: File name too long"));
}

TEST(AQuestion, ToOneThatEndsOrSaysAnythingIsTold) {
  TemporaryFolder const folder;
  {
    Peer const peer(folder.file("a.db"), "");
    EXPECT_THAT(refusal(folder.file("a.db")), StrEq("simhostd ended"));
  }
  Peer const peer(folder.file("b.db"), "[1]\n");
  EXPECT_THAT(refusal(folder.file("b.db")), StrEq("simhostd says what nobody understands"));
}

TEST(AQuestion, GoesToASocketWhateverItsFolderIsCalled) {
  TemporaryFolder const folder;
  auto const deep = folder.file("x") / std::string(120, 'd');
  std::filesystem::create_directories(deep);
  EXPECT_THAT(refusal(deep / "h.db"), HasSubstr("No such file"));
  // No address of a socket is that long.
  Peer const peer(deep / "h.db", "{\"change\": 7}\n");
  EXPECT_EQ(ask(deep / "h.db", {{"ask", "status"}}, 10s)["change"], 7);
}

std::string refusal(Asking &asking) {
  try {
    asking.said({{"ask", "status"}});
  } catch (NoDaemon const &none) {
    return none.what();
  }
  return {};
}

TEST(ACall, IsToldTheSameAgainOfADaemonThatSaidNothing) {
  TemporaryFolder const folder;
  Asking asking(folder.file("h.db"));
  {
    Peer const peer(folder.file("h.db"), "");
    EXPECT_THAT(refusal(asking), StrEq("simhostd ended"));
  }
  EXPECT_THAT(refusal(asking), StrEq("simhostd ended"));
  asking.begin();
  EXPECT_THAT(refusal(asking), StrEq("no simhostd: Connection refused"));
}

}  // namespace
