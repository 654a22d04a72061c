// simhostd: moves the frames of a simulated host through Open vSwitch.
#include <fmt/chrono.h>
#include <fmt/format.h>

#include <malloc.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "daemon/daemon.h"
#include "daemon/notify.h"
#include "events/loop.h"
#include "events/signals.h"
#include "fabric/agent/agent.h"
#include "planes/openvswitch/processes/private_openvswitch.h"

namespace simhost::daemon {
namespace {

using openvswitch::Datapath;
using openvswitch::PrivateOpenVswitch;

constexpr std::string_view kPrivate = "private:";
constexpr std::string_view kUnix = "unix:";
constexpr auto *kSystemSocket = "/var/run/openvswitch/db.sock";

struct Words {
  std::string state;
  std::string openvswitch;
  std::string datapath = "netdev";
  std::string fabric;
  fabric::Credentials credentials;
  std::string host;
};

// The journal has times of its own. What cannot be said, as on a full disk, is no reason to end.
void say(std::string const &text) {
  std::string line;
  if (std::getenv("JOURNAL_STREAM") == nullptr) {
    auto const now = std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now());
    line = fmt::format("{:%FT%TZ} ", fmt::gmtime(now));
  }
  line += fmt::format("simhostd: {}\n", text);
  std::fputs(line.c_str(), stderr);
}

void tell_ready(Words const &words) {
  notify(fmt::format("READY=1\nSTATUS=moves the frames of {}", words.state));
  fmt::print("ready\n");
  std::fflush(stdout);
}

std::optional<std::filesystem::path> folder_of_own(Words const &words) {
  if (words.openvswitch.starts_with(kPrivate)) {
    return words.openvswitch.substr(kPrivate.size());
  }
  return std::nullopt;
}

std::filesystem::path socket_of(Words const &words) {
  if (auto const folder = folder_of_own(words)) {
    return std::filesystem::absolute(*folder) / "db.sock";
  }
  return words.openvswitch.starts_with(kUnix) ? words.openvswitch.substr(kUnix.size())
                                              : std::string(kSystemSocket);
}

std::string wrong_fabric(std::string const &text) {
  return fabric::servers_in(text).empty()
             ? "must be servers such as ssl:192.0.2.1:6641,ssl:192.0.2.2:6641"
             : std::string();
}

// What encryption needs, whole where it is used, and nowhere else.
void require_credentials(Words const &words) {
  auto const servers = fabric::servers_in(words.fabric);
  bool const encrypts = std::ranges::any_of(servers, &fabric::Server::is_encrypted);
  for (auto const &[option, file] : {std::pair{"--private-key", words.credentials.private_key},
                                     std::pair{"--certificate", words.credentials.certificate},
                                     std::pair{"--ca-cert", words.credentials.ca_certificate}}) {
    if (encrypts && file.empty()) {
      throw std::runtime_error(fmt::format("--fabric ssl: takes {} FILE", option));
    }
    if (!encrypts && !file.empty()) {
      throw std::runtime_error(fmt::format("{}: --fabric names no server as ssl:", option));
    }
  }
}

fabric::Servers servers_of(Words const &words) {
  auto const &[key, certificate, ca] = words.credentials;
  auto const absolute = [](auto const &file) {
    return file.empty() ? file : std::filesystem::absolute(file);
  };
  return {.all = fabric::servers_in(words.fabric),
          .credentials = {.private_key = absolute(key),
                          .certificate = absolute(certificate),
                          .ca_certificate = absolute(ca)}};
}

void serve(Words const &words) {
  auto const own_folder = folder_of_own(words);
  if (own_folder) {
    openvswitch::require_package();
  }
  events::Loop loop;
  events::Signals const signals(loop, {SIGTERM, SIGINT, SIGHUP}, [&](int number) {
    if (number != SIGHUP) {
      loop.stop();
    }
  });
  Daemon daemon(loop,
                {.state = std::filesystem::absolute(words.state),
                 .database = socket_of(words),
                 .datapath = words.datapath},
                say);
  daemon.when_ready([&] { tell_ready(words); });
  std::optional<fabric::Agent> agent;
  // Ends before the daemon does.
  std::optional<PrivateOpenVswitch> own;
  if (own_folder) {
    own.emplace(loop, *own_folder, words.datapath == "netdev" ? Datapath::netdev : Datapath::system,
                PrivateOpenVswitch::Told{.started = [&] { daemon.connect(own->lives()); },
                                         .ended = [&] { daemon.disconnect(); },
                                         .said = say});
  }
  // Not before all is there that it takes: what changes waits then until a daemon is there.
  daemon.begin();
  // Whoever asks it has the state, and may wait for longer than the daemon does to begin.
  if (!words.fabric.empty()) {
    agent.emplace(fabric::Options{.state = std::filesystem::absolute(words.state),
                                  .servers = servers_of(words),
                                  .host = words.host},
                  say, [] { kill(getpid(), SIGTERM); });
    daemon.when_settled([&](std::uint64_t change, std::string const &troubles) {
      agent->tell({.change = change, .troubles = troubles});
    });
  }
  if (own) {
    own->start();
  } else {
    daemon.connect();
  }
  loop.run();
  notify("STOPPING=1");
  daemon.save();
  if (own) {
    daemon.disconnect();
    own.reset();
    daemon.leave_devices();
  }
  say("ends");
}

std::string wrong_openvswitch(std::string const &text) {
  bool const is_known = text == "system" ||
                        (text.starts_with(kPrivate) && text.size() > kPrivate.size()) ||
                        (text.starts_with(kUnix) && text.size() > kUnix.size());
  return is_known ? std::string() : "must be private:DIR, system or unix:SOCKET";
}

// What one change releases the next one allocates again: to ask the kernel for it each time is a
// fifth of what it costs to compile a switch.
void keep_memory() {
  constexpr int kKept = 64 << 20;
  constexpr int kLargestPiece = 32 << 20;
  mallopt(M_TRIM_THRESHOLD, kKept);
  mallopt(M_MMAP_THRESHOLD, kLargestPiece);
}

int run(int count, char **given) {
  CLI::App app("Moves the frames of a simulated host through Open vSwitch.", "simhostd");
  // Room for the longest option, from which what is said of it is to be told.
  constexpr std::size_t kColumn = 42;
  app.get_formatter()->column_width(kColumn);
  Words words;
  app.add_option("--state", words.state, "the file that holds the state of the host")->required();
  app.add_option("--openvswitch", words.openvswitch,
                 "private:DIR runs one of its own in DIR; system uses the one of the machine, and "
                 "unix:SOCKET the one whose database listens there")
      ->required()
      ->check(wrong_openvswitch);
  app.add_option("--datapath", words.datapath,
                 "netdev moves frames in ovs-vswitchd, system in the kernel")
      ->check(CLI::IsMember({"netdev", "system"}));
  auto *const fabric =
      app.add_option("--fabric", words.fabric,
                     "ssl:ADDRESS:PORT,... are the servers of the database in which this host "
                     "shares switches with others; tcp: instead of ssl: encrypts nothing")
          ->check(wrong_fabric);
  app.add_option("--host", words.host, "what the host is called there")->needs(fabric);
  app.add_option("-p,--private-key", words.credentials.private_key,
                 "file with the host's key (PEM), for servers of ssl:")
      ->needs(fabric);
  app.add_option("-c,--certificate", words.credentials.certificate,
                 "file with the certificate of that key")
      ->needs(fabric);
  app.add_option("-C,--ca-cert", words.credentials.ca_certificate,
                 "file with the certificates of those who vouch for the servers")
      ->needs(fabric);
  app.set_version_flag("--version", std::string("simhostd ") + SIMHOST_VERSION);
  CLI11_PARSE(app, count, given);
  if (!words.fabric.empty() && words.host.empty()) {
    throw std::runtime_error("--fabric takes a name for this host: --host NAME");
  }
  require_credentials(words);
  keep_memory();
  // A file that may not grow is one that cannot be written to, as on a full disk.
  std::signal(SIGXFSZ, SIG_IGN);
  serve(words);
  return 0;
}

}  // namespace
}  // namespace simhost::daemon

int main(int count, char **words) try {
  return simhost::daemon::run(count, words);
} catch (std::exception const &error) {
  fmt::print(stderr, "simhostd: {}\n", error.what());
  return 1;
}
