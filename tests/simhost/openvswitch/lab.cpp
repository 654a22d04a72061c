#include "lab.h"

#include <algorithm>
#include <chrono>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace simhost::openvswitch {
Lab::Lab() {
  auto const database = folder_.file("conf.db").native();
  auto const socket = database_socket().native();
  events::run({"ovsdb-tool", {"create", database, "/usr/share/openvswitch/vswitch.ovsschema"}, {}});
  database_ = start("ovsdb-server", {database, "--remote=punix:" + socket});
  while (!std::filesystem::exists(socket)) {
    loop_.turn(std::chrono::milliseconds(1));
  }
  switch_ = start("ovs-vswitchd", {"unix:" + socket, "--enable-dummy", "--disable-system"});
  ovs_vsctl({"--retry", "--no-wait", "init"});
}

std::unique_ptr<events::Process> Lab::start(std::string const &program,
                                            std::vector<std::string> words) {
  auto const control = folder_.file((program + ".ctl").c_str());
  auto const log = folder_.file((program + ".log").c_str());
  auto const folder = control.parent_path().native();
  for (auto const &word : {std::string("-vconsole:off"), std::string("-vsyslog:off"),
                           "--unixctl=" + control.native(), "--log-file=" + log.native()}) {
    words.push_back(word);
  }
  return std::make_unique<events::Process>(
      loop_,
      // No search finds them there for a user without privileges.
      events::Command{"/usr/sbin/" + program,
                      std::move(words),
                      {{"OVS_RUNDIR", folder}, {"OVS_LOGDIR", folder}, {"OVS_DBDIR", folder}}},
      [program](std::string const &how) { throw std::runtime_error(program + ' ' + how); });
}

std::string Lab::output_of(std::string const &program, std::vector<std::string> words) {
  auto const output = folder_.file("output").native();
  words.insert(words.begin(), {"-c", R"(out=$1; shift; "$@" >"$out")", "sh", output, program});
  events::run({"sh", words, {}});
  std::ifstream file(output);
  return {std::istreambuf_iterator<char>(file), {}};
}

Lab &Lab::shared() {
  static Lab lab;
  return lab;
}

std::string Lab::ovs_vsctl(std::vector<std::string> arguments) {
  arguments.insert(arguments.begin(), "--db=unix:" + database_socket().native());
  return output_of("ovs-vsctl", std::move(arguments));
}

std::string Lab::ovs_ofctl(std::vector<std::string> arguments) {
  arguments.insert(arguments.begin(), "-OOpenFlow15");
  return output_of("ovs-ofctl", std::move(arguments));
}

std::string Lab::ovs_appctl(std::vector<std::string> arguments) {
  arguments.insert(arguments.begin(), {"-t", folder_.file("ovs-vswitchd.ctl")});
  return output_of("ovs-appctl", std::move(arguments));
}

std::vector<std::string> Lab::dumped(std::string const &what, std::string const &bridge) {
  std::istringstream text(
      ovs_ofctl({"--no-stats", "--no-names", what, "unix:" + bridge_socket(bridge).native()}));
  std::vector<std::string> lines;
  for (std::string line; std::getline(text, line);) {
    if (line.starts_with(' ')) {
      lines.push_back(line.substr(1));
    }
  }
  std::sort(lines.begin(), lines.end());
  return lines;
}

Bridge::Bridge(unsigned ports) {
  static unsigned bridges = 0;
  name_ = "br" + std::to_string(bridges++);
  std::vector<std::string> arguments{
      "add-br", name_, "--", "set", "bridge", name_, "datapath_type=dummy", "fail_mode=secure"};
  for (unsigned number = 1; number <= ports; ++number) {
    auto const port = name_ + "p" + std::to_string(number);
    for (auto const &word :
         {std::string("--"), std::string("add-port"), name_, port, std::string("--"),
          std::string("set"), std::string("interface"), port, std::string("type=dummy"),
          "ofport_request=" + std::to_string(number)}) {
      arguments.push_back(word);
    }
  }
  Lab::shared().ovs_vsctl(arguments);
}

Bridge::~Bridge() {
  Lab::shared().ovs_vsctl({"del-br", name_});
}

std::filesystem::path Bridge::socket() const {
  return Lab::shared().bridge_socket(name_);
}

std::vector<std::string> Bridge::flows() const {
  return Lab::shared().dumped("dump-flows", name_);
}

std::vector<std::string> Bridge::groups() const {
  return Lab::shared().dumped("dump-groups", name_);
}

}  // namespace simhost::openvswitch
