// What moves real frames: the devices of ports, and what becomes of a frame.
#include <iostream>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "cli/commands.h"
#include "cli/frame_words.h"

namespace simhost::cli {
namespace {

struct PortWords {
  std::string switch_name;
  std::string port;
  std::string device;
  std::string mac;
};
using AskedPort = std::shared_ptr<PortWords>;

AskedPort port_of(CLI::App &command) {
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

struct UnderlayWords {
  std::string device;
  std::string address;
  std::string gateway;
  bool none = false;
};

void set_underlay(UnderlayWords const &given) {
  if (!given.none && given.address.empty()) {
    throw CLI::RequiredError("address");
  }
  auto underlay = nlohmann::json::object();
  if (!given.none) {
    underlay = {{"device", given.device}, {"address", given.address}};
  }
  if (!given.gateway.empty()) {
    underlay["gateway"] = given.gateway;
  }
  check(simhost_apply(text_of({{"underlay", underlay}}).c_str()));
}

void add_underlay(CLI::App &app) {
  auto *const underlay =
      app.add_subcommand("underlay", "Say what carries tunnels and the copies for collectors");
  auto const given = words_of_command<UnderlayWords>();
  auto *const device =
      underlay->add_option("device", given->device, "as Linux calls it, such as eth1");
  underlay->add_option("address", given->address,
                       "of this host, with the bits of its network: 192.0.2.1/24");
  auto *const gateway =
      underlay->add_option("--gateway", given->gateway, "by which other networks are reached");
  underlay->add_flag("--none", given->none, "nothing any more")
      ->excludes(device)
      ->excludes(gateway);
  underlay->footer(
      "In place of what it was before. The device is no port's and no uplink's:\n"
      "  simhostctl underlay eth1 192.0.2.1/24 --gateway 192.0.2.254");
  underlay->callback([given] { set_underlay(*given); });
}

std::string plane_words(nlohmann::ordered_json const &plane) {
  auto const &change = plane.at("change");
  auto const &in_force = plane.at("in_force");
  if (change.is_null()) {
    return "no frames move: no simhostd ever took this host";
  }
  auto const &said = plane.at("said").get_ref<std::string const &>();
  if (change == in_force) {
    return "Open vSwitch: change " + change.dump() + " is in force" +
           (said.empty() ? "" : ", but " + said);
  }
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
    auto const text = whole_text(simhost_plane);
    std::cout << (*json ? text : printable(plane_words(nlohmann::ordered_json::parse(text))))
              << "\n";
  });
}

struct TraceWords {
  std::string station;
  std::vector<std::string> frame;
  bool json = false;
};

nlohmann::ordered_json trace_of(std::string const &switch_name, std::string const &station,
                                std::vector<std::uint8_t> const &frame) {
  return nlohmann::ordered_json::parse(whole_text([&](char *text, std::size_t size) {
    return simhost_trace(switch_name.c_str(), station.c_str(), frame.data(), frame.size(), text,
                         size);
  }));
}

// The one of a list that has this value under a key; null if none has.
nlohmann::ordered_json find_in(nlohmann::ordered_json const &list, char const *key,
                               nlohmann::ordered_json const &value) {
  for (auto const &one : list) {
    if (one.value(key, nlohmann::ordered_json()) == value) {
      return one;
    }
  }
  return nullptr;
}

// What the document of the host says of a setting that a step names; null where it is not set.
nlohmann::ordered_json value_of(nlohmann::ordered_json const &of_switch,
                                nlohmann::ordered_json const &setting) {
  auto const &port = setting.at("port");
  auto const owner = port.is_null()
                         ? of_switch
                         : find_in(of_switch.value("ports", nlohmann::ordered_json()), "id", port);
  return owner.is_object()
             ? owner.value(setting.at("name").get<std::string>(), nlohmann::ordered_json())
             : nullptr;
}

// Gives each setting its value.
void add_values(nlohmann::ordered_json &steps, std::string const &switch_name) {
  auto const host = nlohmann::ordered_json::parse(description());
  auto const of_switch =
      find_in(host.value("switches", nlohmann::ordered_json()), "alias", switch_name);
  for (auto &step : steps) {
    if (auto &setting = step.at("setting"); !setting.is_null()) {
      setting["value"] = value_of(of_switch, setting);
    }
  }
}

// Values that are longer tell nothing at a glance.
std::string value_words(nlohmann::ordered_json const &value) {
  constexpr std::size_t kLongest = 60;
  auto const text = value.is_null() ? "not set" : value.dump();
  return text.size() > kLongest ? std::string() : " " + text;
}

std::string step_words(nlohmann::ordered_json const &step, std::string const &switch_name) {
  auto text = step.at("text").get<std::string>();
  auto const &setting = step.at("setting");
  if (setting.is_null()) {
    return text;
  }
  auto const &port = setting.at("port");
  auto const owner = port.is_null() ? switch_name : switch_name + "/" + port.get<std::string>();
  return text + " (" + owner + "/" + setting.at("name").get<std::string>() +
         value_words(setting.at("value")) + ")";
}

void trace(TraceWords const &given) {
  auto const slash = given.station.find('/');
  if (slash == std::string::npos) {
    throw Failure("'" + given.station + "' is no port such as vswitch0/web-1");
  }
  auto const switch_name = given.station.substr(0, slash);
  auto const frame = frame_from(given.frame);
  auto steps = trace_of(switch_name, given.station.substr(slash + 1), frame);
  add_values(steps, switch_name);
  if (given.json) {
    std::cout << steps.dump(2) << "\n";
    return;
  }
  for (auto const &step : steps) {
    std::cout << printable(step_words(step, switch_name)) << "\n";
  }
}

void add_trace(CLI::App &app) {
  auto *const command =
      app.add_subcommand("trace", "Tell what becomes of a frame, and which settings decide it");
  auto const given = words_of_command<TraceWords>();
  command
      ->add_option(
          "place", given->station,
          "where it comes in: a switch and a port or an uplink of it, as in vswitch0/web-1")
      ->required();
  command
      ->add_option(
          "frame", given->frame,
          "in hexadecimal, or in words: dst= and src=, vlan= and priority= for a tag, type=,"
          " size=")
      ->required();
  command->add_flag("--json", given->json, "as JSON");
  command->footer(
      "Open vSwitch is asked, and sends nothing but copies for collectors. Settings are told with "
      "their values.\n"
      "  dst=ff:ff:ff:ff:ff:ff src=02:00:00:00:01:02 vlan=7  a frame in words");
  command->callback([given] { trace(*given); });
}

}  // namespace

void add_frame_commands(CLI::App &app) {
  add_connect(app);
  add_disconnect(app);
  add_underlay(app);
  add_plane(app);
  add_trace(app);
}

}  // namespace simhost::cli
