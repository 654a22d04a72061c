// Starting and watching ovsdb-server(1) and ovs-vswitchd(8).
#include "planes/openvswitch/processes/private_openvswitch.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/socket.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <stdexcept>
#include <system_error>
#include <utility>

#include "events/unix_address.h"
#include "planes/openvswitch/processes/left_devices.h"

namespace simhost::openvswitch {
namespace {

using namespace std::chrono_literals;

constexpr auto *kTool = "/usr/bin/ovsdb-tool";
constexpr auto *kDatabase = "/usr/sbin/ovsdb-server";
constexpr auto *kSwitch = "/usr/sbin/ovs-vswitchd";
constexpr auto *kSchema = "/usr/share/openvswitch/vswitch.ovsschema";
constexpr auto kPatience = 1s;
// Between two starts of what does not stay up.
constexpr events::Clock::duration kFirstPause = 50ms;
constexpr events::Clock::duration kLongestPause = 500ms;
// What ran for so long did stay up: whatever ended it then, its start did not.
constexpr auto kSteady = 2s;

// In each turn of its loop the switch allocates room for frames, and a node to wait for, for each
// of its devices, and releases all of it: at 1,000 devices that is half of what a turn costs while
// the C library keeps as little at hand as it does by itself.
constexpr auto *kTunables = "GLIBC_TUNABLES";
constexpr auto *kMuchAtHand = "glibc.malloc.tcache_count=512";

std::filesystem::path made(std::filesystem::path const &folder) {
  std::error_code error;
  std::filesystem::create_directories(folder, error);
  auto absolute = error ? folder : std::filesystem::canonical(folder, error);
  if (error) {
    throw std::runtime_error(fmt::format("the folder {} of the Open vSwitch cannot be used: {}",
                                         folder.string(), error.message()));
  }
  return absolute;
}

events::Descriptor locked(std::filesystem::path const &folder) {
  auto const file = folder / "lock";
  events::Descriptor lock(open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (!lock) {
    throw std::runtime_error(fmt::format("the folder {} of the Open vSwitch cannot be used: {}",
                                         folder.string(), std::strerror(errno)));
  }
  struct flock wanted {};
  wanted.l_type = F_WRLCK;
  wanted.l_whence = SEEK_SET;
  if (fcntl(lock.number(), F_SETLK, &wanted) != 0) {
    fcntl(lock.number(), F_GETLK, &wanted);
    throw std::runtime_error(
        fmt::format("the process {} runs an Open vSwitch in {}", wanted.l_pid, folder.string()));
  }
  return lock;
}

bool takes_connections(std::filesystem::path const &socket_file) try {
  events::UnixAddress const address(socket_file);
  events::Descriptor const client(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  return connect(client.number(), address.get(), address.size()) == 0;
} catch (std::system_error const &) {
  return false;  // without its folder the database ends, which is seen
}

}  // namespace

void require_package() {
  for (auto const *const file : {kTool, kDatabase, kSwitch, kSchema}) {
    std::error_code error;
    if (!std::filesystem::is_regular_file(file, error)) {
      throw std::runtime_error(fmt::format(
          "a private Open vSwitch needs Debian's package openvswitch-switch: there is no {}",
          file));
    }
  }
}

PrivateOpenVswitch::PrivateOpenVswitch(events::Loop &loop, std::filesystem::path const &folder,
                                       Datapath datapath, Told told)
    : loop_(loop),
      folder_(made(folder)),
      datapath_(datapath),
      told_(std::move(told)),
      lock_(locked(folder_)),
      devices_of_others_(devices_of_others(folder_)) {
  // One that ended with its owner a moment ago may still be taken down.
  if (datapath_ == Datapath::netdev) {
    remove_left(folder_, devices_of_others_);
  }
  create_database();
}

PrivateOpenVswitch::~PrivateOpenVswitch() {
  if (switch_) {
    switch_->end(kPatience);
  }
  if (database_) {
    database_->end(kPatience);
  }
}

events::Command PrivateOpenVswitch::command(std::string const &program,
                                            std::vector<std::string> words) const {
  auto const folder = folder_.string();
  for (auto &word : words) {
    if (word == "conf.db") {
      word = folder + "/conf.db";
    }
  }
  return {.program = program,
          .words = std::move(words),
          .environment = {{"OVS_RUNDIR", folder}, {"OVS_LOGDIR", folder}, {"OVS_DBDIR", folder}}};
}

// What is to be there is told anew, so that nothing of a former run is believed; nor does a switch
// begin with ports that have no flows yet, which takes it longer.
void PrivateOpenVswitch::create_database() {
  std::filesystem::remove(folder_ / "conf.db");
  std::filesystem::remove(folder_ / ".conf.db.~lock~");
  events::run(command(kTool, {"create", "conf.db", kSchema}));
}

void PrivateOpenVswitch::start() {
  started_ = events::Clock::now();
  start_database();
  next_ = loop_.after(0ms, [this] { start_switch_when_database_is_there(); });
}

void PrivateOpenVswitch::start_database() {
  std::filesystem::remove(folder_ / "db.sock");
  auto const folder = folder_.string();
  database_ = std::make_unique<events::Process>(
      loop_,
      command(kDatabase,
              {"-vconsole:off", "-vsyslog:off", "conf.db", "--remote=punix:" + folder + "/db.sock",
               "--unixctl=" + folder + "/ovsdb-server.ctl",
               "--log-file=" + folder + "/ovsdb-server.log"}),
      [this](std::string const &how) { restart("ovsdb-server " + how); });
}

void PrivateOpenVswitch::start_switch_when_database_is_there() {
  if (takes_connections(folder_ / "db.sock")) {
    try {
      start_switch();
    } catch (std::runtime_error const &error) {
      start_later(error);
    }
    return;
  }
  constexpr auto kLookAgain = 2ms;
  next_ = loop_.after(kLookAgain, [this] { start_switch_when_database_is_there(); });
}

void PrivateOpenVswitch::start_switch() {
  auto const folder = folder_.string();
  std::vector<std::string> words{"-vconsole:off", "-vsyslog:off", "unix:" + folder + "/db.sock",
                                 "--unixctl=" + folder + "/ovs-vswitchd.ctl",
                                 "--log-file=" + folder + "/ovs-vswitchd.log"};
  if (datapath_ == Datapath::netdev) {
    words.emplace_back("--disable-system");
  }
  auto started = command(kSwitch, std::move(words));
  // What somebody tuned is not to be replaced.
  if (std::getenv(kTunables) == nullptr) {
    started.environment.emplace(kTunables, kMuchAtHand);
  }
  switch_ = std::make_unique<events::Process>(
      loop_, started, [this](std::string const &how) { restart("ovs-vswitchd " + how); });
  told_.started();
}

std::vector<int> PrivateOpenVswitch::lives() const {
  return {database_->life(), switch_->life()};
}

void PrivateOpenVswitch::restart(std::string const &why) {
  auto const lasted = events::Clock::now() - started_;
  pause_ = lasted > kSteady ? events::Clock::duration{}
                            : std::clamp(pause_ * 2, kFirstPause, kLongestPause);
  told_.said(why + ": both processes of Open vSwitch start anew");
  told_.ended();
  leave_both();
  if (datapath_ == Datapath::netdev) {
    remove_left(folder_, devices_of_others_);
  }
  next_ = loop_.after(pause_, [this] { start_anew(); });
}

void PrivateOpenVswitch::start_anew() {
  try {
    create_database();
    start();
  } catch (std::runtime_error const &error) {
    start_later(error);
  }
}

// The machine may have no room for another process just now.
void PrivateOpenVswitch::start_later(std::runtime_error const &obstacle) {
  told_.said(fmt::format("Open vSwitch cannot be started: {}", obstacle.what()));
  leave_both();
  next_ = loop_.after(kLongestPause, [this] { start_anew(); });
}

void PrivateOpenVswitch::leave_both() {
  std::erase_if(left_, [](auto const &process) { return process->is_gone(); });
  leave(std::move(switch_));
  leave(std::move(database_));
}

// Nobody waits until the kernel has closed what it had open: that may take many seconds, for all of
// which no frame moves.
void PrivateOpenVswitch::leave(std::unique_ptr<events::Process> process) {
  if (process != nullptr) {
    process->kill();
    left_.push_back(std::move(process));
  }
}

}  // namespace simhost::openvswitch
