// Talking to real clusters of ovsdb-servers, some of whose servers are killed.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>

#include "cluster_lab.h"
#include "fabric/cluster/cluster.h"
#include "soon.h"

namespace simhost::fabric {
namespace {

using openvswitch::soon;
using openvswitch::tcp_address;
using openvswitch::TcpAddress;
using testing::HasSubstr;

Cluster::Database changes() {
  return {.name = "fabric", .version = "1.", .selected = {{"Change", {"id"}}}};
}

Json insertion(std::string const &id) {
  return Json::array({{{"op", "insert"}, {"table", "Change"}, {"row", {{"id", id}}}}});
}

std::vector<std::string> ids(Cluster const &cluster) {
  std::vector<std::string> all;
  for (auto const &[uuid, row] : cluster.replica().rows("Change")) {
    all.push_back(row.at("id"));
  }
  return all;
}

template <typename Error, typename Work>
std::string refusal(Work const &work) {
  try {
    work();
  } catch (Error const &error) {
    return error.what();
  }
  return "nothing is refused";
}

void wait_for_news(Cluster &cluster) {
  do {
    auto const [one, other] = cluster.descriptors();
    std::array<pollfd, 2> polled{{{one, POLLIN, 0}, {other, POLLIN, 0}}};
    ASSERT_GT(::poll(polled.data(), polled.size(), 20'000), 0);
  } while (cluster.receive().empty());
}

/// Tries again and again, as a service does.
void connect_sometime(Cluster &cluster) {
  auto const deadline = soon();
  while (!cluster.is_connected() && Deadline::clock::now() < deadline) {
    try {
      cluster.connect();
    } catch (Unreachable const &) {
      ::poll(nullptr, 0, 50);
    }
  }
  ASSERT_TRUE(cluster.is_connected());
}

TEST(TcpAddresses, AreNumbers) {
  EXPECT_EQ(tcp_address("192.0.2.1:6641"), (TcpAddress{"192.0.2.1", 6641}));
  EXPECT_EQ(tcp_address("[2001:db8::1]:1"), (TcpAddress{"2001:db8::1", 1}));
  EXPECT_EQ(text_of(TcpAddress{"2001:db8::1", 1}), "[2001:db8::1]:1");
  for (auto const *const text :
       {"", ":", "192.0.2.1", "192.0.2.1:", "192.0.2.1:0", "192.0.2.1:65536", "192.0.2.1:x",
        "192.0.2.1:1x", "2001:db8::1:6641", "localhost:6641", ":6641"}) {
    EXPECT_EQ(tcp_address(text), std::nullopt) << text;
  }
}

TEST(Servers, AreNamedWithHowTheyAreReached) {
  Server const plain{.address = {"192.0.2.1", 6641}};
  Server const encrypted{.address = {"2001:db8::1", 1}, .is_encrypted = true};
  EXPECT_THAT(servers_in("tcp:192.0.2.1:6641,ssl:[2001:db8::1]:1"),
              testing::ElementsAre(plain, encrypted));
  EXPECT_EQ(text_of(plain), "tcp:192.0.2.1:6641");
  EXPECT_EQ(text_of(encrypted), "ssl:[2001:db8::1]:1");
  for (auto const *const text :
       {"", "192.0.2.1:6641", "pssl:192.0.2.1:6641", "ssl:", "ssl", "ssl:db-1:6641",
        "ssl:192.0.2.1:6641,", "ssl:192.0.2.1:6641,,", "tcp:192.0.2.1:1 "}) {
    EXPECT_THAT(servers_in(text), testing::IsEmpty()) << text;
  }
}

TEST(ACluster, IsFoundWhereverSomebodyListens) {
  ClusterLab lab(FABRIC_SCHEMA, 1);
  auto servers = lab.servers();
  servers.all.insert(servers.all.begin(), {.address = {"127.0.0.1", 1}});
  Cluster cluster(servers, changes());
  cluster.connect();
  cluster.transact(insertion("mine"), soon());
  EXPECT_THAT(ids(cluster), testing::ElementsAre("mine"));
  EXPECT_EQ(refusal<ovsdb::TransactionRefused>([&] {
              cluster.transact(insertion("mine"), soon());
            }).find("the database refuses the transaction: constraint violation"),
            0U);
  EXPECT_TRUE(cluster.is_connected());
  lab.transact(0, R"(["fabric", {"op": "insert", "table": "Change", "row": {"id": "theirs"}}])");
  wait_for_news(cluster);
  EXPECT_THAT(ids(cluster), testing::UnorderedElementsAre("mine", "theirs"));
}

TEST(ACluster, IsRefusedWithAnotherVersionOrDatabase) {
  ClusterLab lab(FABRIC_SCHEMA, 1);
  auto other = changes();
  other.version = "2.";
  EXPECT_THAT(
      refusal<WrongVersion>([&] { Cluster(lab.servers(), other).connect(); }),
      HasSubstr("its database 'fabric' has a schema of version 1.0.0, which is none of 2.x"));
  other.name = "other";
  EXPECT_THAT(refusal<Unreachable>([&] { Cluster(lab.servers(), other).connect(); }),
              HasSubstr("it has no database 'other'"));
}

TEST(ACluster, GoesOnWhenOneOfThreeIsKilledAndStopsWithoutAMajority) {
  ClusterLab lab(FABRIC_SCHEMA, 3);
  Cluster cluster(lab.servers(), changes());
  cluster.connect();
  cluster.transact(insertion("first"), soon());
  // The one that it talks to, which leads as well.
  lab.kill(0);
  EXPECT_THROW(
      {
        while (true) {
          wait_for_news(cluster);
        }
      },
      Unreachable);
  EXPECT_FALSE(cluster.is_connected());
  connect_sometime(cluster);
  cluster.transact(insertion("second"), soon());
  EXPECT_THAT(ids(cluster), testing::UnorderedElementsAre("first", "second"));

  lab.kill(cluster.server().find(lab.servers().all[1].address.host) == std::string::npos ? 1 : 2);
  EXPECT_THROW(
      {
        while (true) {
          wait_for_news(cluster);
        }
      },
      Unreachable);
  EXPECT_THAT(refusal<Unreachable>([&] { cluster.connect(); }),
              HasSubstr("it has lost the majority of its cluster"));

  lab.start(0);
  connect_sometime(cluster);
  EXPECT_THAT(ids(cluster), testing::UnorderedElementsAre("first", "second"));
}

}  // namespace
}  // namespace simhost::fabric
