#include "cluster_lab.h"

#include <fmt/format.h>
#include <unistd.h>

#include <fstream>
#include <iterator>
#include <stdexcept>

#include "soon.h"

namespace simhost::fabric {
namespace {

constexpr std::uint16_t kPort = 6641;
// So soon a server notices that the leader is gone, in milliseconds.
constexpr auto *kElections = "--election-timer=300";

bool listens(openvswitch::TcpAddress const &server) {
  try {
    openvswitch::connected_to(server, openvswitch::soon());
    return true;
  } catch (openvswitch::Disconnected const &) {
    return false;
  }
}

}  // namespace

ClusterLab::ClusterLab(std::filesystem::path const &schema, std::size_t servers)
    : network_(static_cast<unsigned>(getpid())), servers_(servers) {
  events::run(
      {"ovsdb-tool", {kElections, "create-cluster", file(0, ".db"), schema.native(), peer(0)}, {}});
  start(0);
  for (std::size_t server = 1; server < servers; ++server) {
    events::run(
        {"ovsdb-tool", {"join-cluster", file(server, ".db"), "fabric", peer(server), peer(0)}, {}});
    start(server);
  }
  for (std::size_t server = 0; server < servers; ++server) {
    wait_for(server);
  }
}

// All of 127.0.0.0/8 is this machine, so that programs that run at once have addresses of their
// own.
std::string ClusterLab::host(std::size_t server) const {
  return fmt::format("127.{}.{}.{}", 1 + (network_ >> 8U) % 254, network_ % 256, server + 1);
}

std::string ClusterLab::remote(std::size_t server) const {
  return fmt::format("tcp:{}:{}", host(server), kPort);
}

std::string ClusterLab::peer(std::size_t server) const {
  return fmt::format("tcp:{}:{}", host(server), kPort + 2);
}

std::string ClusterLab::file(std::size_t server, char const *suffix) const {
  return folder_.file((std::to_string(server) + suffix).c_str()).native();
}

Servers ClusterLab::servers() const {
  std::vector<Server> all;
  for (std::size_t server = 0; server < servers_.size(); ++server) {
    all.push_back({.address = {.host = host(server), .port = kPort}});
  }
  return {.all = std::move(all), .credentials = {}};
}

void ClusterLab::start(std::size_t server) {
  servers_[server] = std::make_unique<events::Process>(
      loop_,
      events::Command{"/usr/sbin/ovsdb-server",
                      {file(server, ".db"), fmt::format("--remote=ptcp:{}:{}", kPort, host(server)),
                       "--unixctl=" + file(server, ".ctl"), "--log-file=" + file(server, ".log"),
                       "-vconsole:off", "-vsyslog:off"},
                      {}},
      [](std::string const &how) { throw std::runtime_error("ovsdb-server " + how); });
}

void ClusterLab::kill(std::size_t server) {
  servers_[server].reset();
}

void ClusterLab::wait_for(std::size_t server) {
  // The client itself waits for a second before it tries a second time.
  auto const deadline = openvswitch::soon();
  while (!listens(servers().all[server].address) &&
         openvswitch::Deadline::clock::now() < deadline) {
    loop_.turn(std::chrono::milliseconds(5));
  }
  events::run(
      {"ovsdb-client", {"--timeout=20", "wait", remote(server), "fabric", "connected"}, {}});
}

std::string ClusterLab::transact(std::size_t server, std::string const &transaction) {
  auto const output = file(server, ".output");
  events::run({"sh",
               {"-c", R"(out=$1; shift; ovsdb-client --timeout=20 transact "$@" >"$out")", "sh",
                output, remote(server), transaction},
               {}});
  std::ifstream printed(output);
  return {std::istreambuf_iterator<char>(printed), {}};
}

}  // namespace simhost::fabric
