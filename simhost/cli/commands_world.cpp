// Looking at the host, and what comes to it from outside.
#include <fstream>
#include <iostream>
#include <iterator>
#include <limits>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "cli/commands.h"
#include "cli/tree.h"

namespace simhost::cli {
namespace {

using Json = nlohmann::ordered_json;

std::string content(std::string const &file) {
  if (file == "-") {
    return {std::istreambuf_iterator<char>(std::cin), {}};
  }
  std::ifstream stream(file);
  if (!stream) {
    throw Failure(file + ": cannot be read");
  }
  return {std::istreambuf_iterator<char>(stream), {}};
}

void add_show(CLI::App &app) {
  auto *const show = app.add_subcommand("show", "Show the host as a tree");
  static bool json = false;
  show->add_flag("--json", json, "as a scenario document, which apply reads");
  show->callback([] {
    auto const document = description();
    std::cout << (json ? document + "\n" : tree(document));
  });
}

void add_apply(CLI::App &app) {
  auto *const apply =
      app.add_subcommand("apply", "Change the host as scenario documents say: each whole or not");
  static std::vector<std::string> files;
  apply->add_option("document", files, "JSON files; - is standard input")->required();
  apply->footer(
      "SCENARIOS.md describes every key:\n"
      "  echo '{\"switches\": [{\"alias\": \"lab\", \"mtu\": 9000}]}' | simhostctl apply -");
  apply->callback([] {
    for (auto const &file : files) {
      if (simhost_apply(content(file).c_str()) != 0) {
        throw Failure(file + ": " + simhost_error());
      }
    }
  });
}

void add_link(CLI::App &app) {
  auto *const link = app.add_subcommand("link", "Plug the cable of an uplink in, or pull it");
  static std::string uplink;
  static std::string state;
  link->add_option("uplink", uplink, "its name, such as nic0")->required();
  link->add_option("state", state, "up or down")->required()->check(CLI::IsMember({"up", "down"}));
  link->footer("The teams of its switch follow at once:\n  simhostctl link nic4 down");
  link->callback([] { check(simhost_set_link(uplink.c_str(), state == "up" ? 1 : 0)); });
}

// What of an uplink is to change, as the document names it.
Json given_uplink = Json::object();

void add_up_or_down(CLI::App &command, std::string const &key, std::string const &what) {
  command
      .add_option_function<std::string>(
          "--" + key, [key](std::string const &state) { given_uplink[key] = state; }, what)
      ->check(CLI::IsMember({"up", "down"}));
}

// The document has its own bounds.
void add_number(CLI::App &command, std::string const &option, std::string const &key,
                std::string const &what) {
  command
      .add_option_function<std::uint64_t>(
          "--" + option, [key](std::uint64_t number) { given_uplink[key] = number; }, what)
      ->check(whole_number());
}

void add_uplink(CLI::App &app) {
  auto *const uplink =
      app.add_subcommand("uplink", "Change what an uplink is like, or add one to the host");
  uplink
      ->add_option_function<std::string>(
          "uplink", [](std::string const &name) { given_uplink["name"] = name; },
          "its name, such as nic0; an unknown one is added")
      ->required();
  add_up_or_down(*uplink, "link", "the cable");
  add_up_or_down(*uplink, "admin", "the host's own switch");
  add_up_or_down(*uplink, "lacp", "whether the other end answers link aggregation");
  add_up_or_down(*uplink, "beacons", "whether the beacons of the other uplinks arrive");
  add_number(*uplink, "speed", "speed", "Mbit/s");
  uplink->add_option_function<std::string>(
      "--duplex", [](std::string const &duplex) { given_uplink["duplex"] = duplex; },
      "full or half");
  add_number(*uplink, "error-percent", "error_percent",
             "how many of its frames are damaged, of 100");
  uplink->add_option_function<bool>(
      "--driver", [](bool loaded) { given_uplink["driver"] = loaded; },
      "whether the driver of the card is loaded: true or false");
  uplink->footer(
      "Teams whose criteria look at it follow at once:\n"
      "  simhostctl uplink nic4 --beacons down --error-percent 12");
  uplink->callback([] {
    check(simhost_apply(Json{{"uplinks", Json::array({given_uplink})}}.dump().c_str()));
  });
}

void add_learn(CLI::App &app) {
  auto *const learn = app.add_subcommand("learn", "Let a frame from an address arrive");
  static std::string switch_name;
  static std::string mac;
  static std::string port;
  static std::uint16_t vlan = 0;
  static std::uint32_t vni = 0;
  learn->add_option("switch", switch_name, "alias of the switch")->required();
  learn->add_option("mac", mac, "such as 02:00:00:00:00:01")->required();
  learn->add_option("--port", port, "where it arrives; the team of uplinks unless given");
  learn->add_option("--vlan", vlan, "0 unless given")
      ->check(whole_number(0, std::numeric_limits<std::uint16_t>::max()));
  learn->add_option("--vni", vni, "the virtual network; 0 unless given")
      ->check(whole_number(0, std::numeric_limits<std::uint32_t>::max()));
  learn->footer(
      "A port learns while its policy says so, up to its limit:\n"
      "  simhostctl learn vswitch0 02:00:00:00:01:02 --port web-1 --vlan 10");
  learn->callback(
      [] { check(simhost_learn(switch_name.c_str(), or_null(port), mac.c_str(), vlan, vni)); });
}

void add_counter(CLI::App &app) {
  auto *const counter = app.add_subcommand("counter", "Set a counter");
  static std::string switch_name;
  static std::string port;
  static std::string session;
  static std::string name;
  static std::uint64_t value = 0;
  counter->add_option("switch", switch_name, "alias of the switch")->required();
  counter->add_option("name", name, "the field in which callers see it, such as txErrors")
      ->required();
  counter->add_option("value", value, "what it shows from now on")
      ->required()
      ->check(whole_number());
  auto *const of_port = counter->add_option("--port", port, "of this port");
  counter->add_option("--session", session, "of this mirror session")->excludes(of_port);
  counter->footer(
      "SCENARIOS.md lists the names:\n"
      "  simhostctl counter vswitch0 txErrors 3\n"
      "  simhostctl counter vswitch0 pktsInUnicast 1000 --port web-1");
  counter->callback([] {
    check(simhost_set_counter(switch_name.c_str(), or_null(port), or_null(session), name.c_str(),
                              value));
  });
}

}  // namespace

std::string description() {
  // Room for most hosts: to ask for the size alone takes as long as to have the text.
  std::string text(std::size_t{1} << 20, '\0');
  while (true) {
    auto const size = simhost_describe(text.data(), text.size());
    if (size == 0) {
      throw Failure(simhost_error());
    }
    if (size < text.size()) {
      text.resize(size);
      return text;
    }
    // Until it is asked again, another process may have made more of the host.
    text.resize(size * 2);
  }
}

void add_world_commands(CLI::App &app) {
  add_show(app);
  add_apply(app);
  add_link(app);
  add_uplink(app);
  add_learn(app);
  add_counter(app);
}

}  // namespace simhost::cli
