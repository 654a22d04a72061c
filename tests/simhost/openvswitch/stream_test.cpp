// A stream whose bytes are encrypted, from the moment on which the two sides agree.
#include "planes/openvswitch/transport/stream.h"

#include <gmock/gmock.h>
#include <sys/socket.h>

#include <array>
#include <chrono>
#include <string>

namespace {

using simhost::openvswitch::Cipher;
using simhost::openvswitch::Stream;
using testing::ElementsAreArray;
using testing::IsEmpty;
using Bytes = std::vector<std::uint8_t>;

constexpr char kAgreed = 'A';

// Agrees with a byte, and changes nothing.
class Agreeing : public Cipher {
 public:
  [[nodiscard]] bool is_agreed() const override { return is_agreed_; }
  void encrypt(std::span<std::uint8_t const> plain, Bytes &to) override {
    to.insert(to.end(), plain.begin(), plain.end());
  }
  void decrypt(std::span<std::uint8_t const> came, Bytes &to, Bytes & /*replies*/) override {
    for (auto const byte : came) {
      if (is_agreed_) {
        to.push_back(byte);
      }
      is_agreed_ = is_agreed_ || byte == kAgreed;
    }
  }

 private:
  bool is_agreed_ = false;
};

TEST(Streams, HaveWhatComesWithTheEndOfTheAgreement) {
  std::array<int, 2> ends{};
  ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends.data()), 0);
  Stream stream("the other side", simhost::events::Descriptor(ends[0]));
  simhost::events::Descriptor const other(ends[1]);
  std::string const said = "..A, and more";
  ASSERT_EQ(::send(other.number(), said.data(), said.size(), 0), said.size());

  auto const deadline = simhost::openvswitch::Deadline::clock::now() + std::chrono::seconds(30);
  stream.encrypt(std::make_unique<Agreeing>(), deadline);
  stream.wait_to_receive(deadline);
  Bytes came;
  EXPECT_TRUE(stream.receive(came));
  EXPECT_THAT(came, ElementsAreArray({',', ' ', 'a', 'n', 'd', ' ', 'm', 'o', 'r', 'e'}));
  came.clear();
  EXPECT_FALSE(stream.receive(came));
  EXPECT_THAT(came, IsEmpty());
}

}  // namespace
