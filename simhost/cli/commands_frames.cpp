// What moves real frames: the devices of ports.
#include <iostream>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "cli/commands.h"

namespace simhost::cli {
namespace {

struct PortWords {
  std::string switch_name;
  std::string port;
  std::string device;
  std::string mac;
};
using Words = std::shared_ptr<PortWords>;

Words port_of(CLI::App &command) {
  auto given = words_of_command<PortWords>();
  command.add_option("switch", given->switch_name, "alias of the switch")->required();
  command.add_option("port", given->port, "identifier of the port")->required();
  return given;
}

void add_connect(CLI::App &app) {
  auto *const connect = app.add_subcommand("connect", "Give a port a network device");
  auto const given = port_of(*connect);
  connect->add_option("device", given->device, "as Linux calls it, such as tap0")->required();
  connect->add_option("--mac", given->mac, "the address of its client");
  connect->footer(
      "What frames go through it, simhostd moves as the settings say:\n"
      "  simhostctl connect vswitch0 web-1 tap0 --mac 02:00:00:00:01:02");
  connect->callback([given] {
    check(simhost_connect(given->switch_name.c_str(), given->port.c_str(), given->device.c_str(),
                          or_null(given->mac)));
  });
}

void add_disconnect(CLI::App &app) {
  auto *const disconnect = app.add_subcommand("disconnect", "Take its device from a port");
  auto const given = port_of(*disconnect);
  disconnect->footer(
      "The device stays as it is:\n"
      "  simhostctl connect vswitch0 web-1 tap0; simhostctl disconnect vswitch0 web-1");
  disconnect->callback(
      [given] { check(simhost_disconnect(given->switch_name.c_str(), given->port.c_str())); });
}

std::string plane_json() {
  constexpr std::size_t kEnough = 65536;
  std::string text(kEnough, '\0');
  auto const size = simhost_plane(text.data(), text.size());
  if (size == 0 || size >= text.size()) {
    throw Failure(simhost_error());
  }
  text.resize(size);
  return text;
}

std::string plane_words(nlohmann::ordered_json const &plane) {
  auto const &change = plane.at("change");
  auto const &in_force = plane.at("in_force");
  if (change.is_null()) {
    return "no frames move: no simhostd ever took this host";
  }
  if (change == in_force) {
    return "Open vSwitch: change " + change.dump() + " is in force";
  }
  auto const &said = plane.at("said").get_ref<std::string const &>();
  return "Open vSwitch: change " + change.dump() + " is pending" +
         (in_force.is_null() ? "" : ", " + in_force.dump() + " is in force") +
         (said.empty() ? "" : ": " + said);
}

void add_plane(CLI::App &app) {
  auto *const plane =
      app.add_subcommand("plane", "Tell what moves the frames, and what is pending");
  auto const json = words_of_command<bool>();
  plane->add_flag("--json", *json, "as JSON");
  plane->footer("A call waits two seconds for its change to be in force:\n  simhostctl plane");
  plane->callback([json] {
    auto const text = plane_json();
    std::cout << (*json ? text : printable(plane_words(nlohmann::ordered_json::parse(text))))
              << "\n";
  });
}

}  // namespace

void add_frame_commands(CLI::App &app) {
  add_connect(app);
  add_disconnect(app);
  add_plane(app);
}

}  // namespace simhost::cli
