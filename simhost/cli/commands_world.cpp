// Looking at the host, and what comes to it from outside.
#include <fstream>
#include <iostream>
#include <iterator>
#include <limits>
#include <memory>
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
  auto const json = words_of_command<bool>();
  show->add_flag("--json", *json, "as a scenario document, which apply reads");
  show->callback([json] {
    auto const document = description();
    std::cout << (*json ? document + "\n" : tree(document));
  });
}

void add_apply(CLI::App &app) {
  auto *const apply =
      app.add_subcommand("apply", "Change the host as scenario documents say: each whole or not");
  auto const files = words_of_command<std::vector<std::string>>();
  apply->add_option("document", *files, "JSON files; - is standard input")->required();
  apply->footer(
      "SCENARIOS.md describes every key:\n"
      "  echo '{\"switches\": [{\"alias\": \"lab\", \"mtu\": 9000}]}' | simhostctl apply -");
  apply->callback([files] {
    for (auto const &file : *files) {
      if (simhost_apply(content(file).c_str()) != 0) {
        throw Failure(file + ": " + simhost_error());
      }
    }
  });
}

struct LinkWords {
  std::string uplink;
  std::string state;
};

void add_link(CLI::App &app) {
  auto *const link = app.add_subcommand("link", "Plug the cable of an uplink in, or pull it");
  auto const given = words_of_command<LinkWords>();
  link->add_option("uplink", given->uplink, "its name, such as nic0")->required();
  link->add_option("state", given->state, "up or down")->required()->check(one_of("up", "down"));
  link->footer("The teams of its switch follow at once:\n  simhostctl link nic4 down");
  link->callback(
      [given] { check(simhost_set_link(given->uplink.c_str(), given->state == "up" ? 1 : 0)); });
}

// What of an uplink is to change, as the document names it.
using UplinkWords = std::shared_ptr<Json>;

void add_up_or_down(CLI::App &command, UplinkWords const &given, std::string const &key,
                    std::string const &what) {
  command
      .add_option_function<std::string>(
          "--" + key, [given, key](std::string const &state) { (*given)[key] = state; }, what)
      ->check(one_of("up", "down"));
}

// The document has its own bounds.
void add_number(CLI::App &command, UplinkWords const &given, std::string const &option,
                std::string const &key, std::string const &what) {
  command
      .add_option_function<std::uint64_t>(
          "--" + option, [given, key](std::uint64_t number) { (*given)[key] = number; }, what)
      ->check(whole_number());
}

void add_uplink(CLI::App &app) {
  auto *const uplink =
      app.add_subcommand("uplink", "Change what an uplink is like, or add one to the host");
  auto const given = words_of_command<Json>();
  uplink
      ->add_option_function<std::string>(
          "uplink", [given](std::string const &name) { (*given)["name"] = name; },
          "its name, such as nic0; an unknown one is added")
      ->required();
  add_up_or_down(*uplink, given, "link", "the cable");
  add_up_or_down(*uplink, given, "admin", "the host's own switch");
  add_up_or_down(*uplink, given, "lacp", "whether the other end speaks link aggregation");
  add_up_or_down(*uplink, given, "beacons", "whether the beacons of the other uplinks arrive");
  add_number(*uplink, given, "speed", "speed", "Mbit/s");
  uplink->add_option_function<std::string>(
      "--duplex", [given](std::string const &duplex) { (*given)["duplex"] = duplex; },
      "full or half");
  add_number(*uplink, given, "error-percent", "error_percent",
             "how many of its frames are damaged, of 100");
  uplink
      ->add_option_function<bool>(
          "--driver", [given](bool loaded) { (*given)["driver"] = loaded; },
          "whether the driver of the card is loaded: true or false")
      ->check(one_of("true", "false"));
  uplink->add_option_function<std::string>(
      "--device", [given](std::string const &device) { (*given)["device"] = device; },
      "the network device that it is, such as eth1; empty for none");
  uplink->footer(
      "Teams whose criteria look at it follow at once:\n"
      "  simhostctl uplink nic4 --beacons down --error-percent 12");
  uplink->callback([given] {
    check(simhost_apply(text_of(Json{{"uplinks", Json::array({*given})}}).c_str()));
  });
}

struct LearnWords {
  std::string switch_name;
  std::string mac;
  std::string port;
  std::uint16_t vlan = 0;
  std::uint32_t vni = 0;
};

void add_learn(CLI::App &app) {
  auto *const learn = app.add_subcommand("learn", "Let a frame from an address arrive");
  auto const given = words_of_command<LearnWords>();
  learn->add_option("switch", given->switch_name, "alias of the switch")->required();
  learn->add_option("mac", given->mac, "such as 02:00:00:00:00:01")->required();
  learn->add_option("--port", given->port, "where it arrives; the team of uplinks unless given");
  learn->add_option("--vlan", given->vlan, "0 unless given")
      ->check(whole_number(0, std::numeric_limits<std::uint16_t>::max()));
  learn->add_option("--vni", given->vni, "the virtual network; 0 unless given")
      ->check(whole_number(0, std::numeric_limits<std::uint32_t>::max()));
  learn->footer(
      "A port learns while its policy says so, up to its limit:\n"
      "  simhostctl learn vswitch0 02:00:00:00:01:02 --port web-1 --vlan 10");
  learn->callback([given] {
    check(simhost_learn(given->switch_name.c_str(), or_null(given->port), given->mac.c_str(),
                        given->vlan, given->vni));
  });
}

struct CounterWords {
  std::string switch_name;
  std::string port;
  std::string session;
  std::string name;
  std::uint64_t value = 0;
};

void add_counter(CLI::App &app) {
  auto *const counter = app.add_subcommand("counter", "Set a counter");
  auto const given = words_of_command<CounterWords>();
  counter->add_option("switch", given->switch_name, "alias of the switch")->required();
  counter->add_option("name", given->name, "the field in which callers see it, such as txErrors")
      ->required();
  counter->add_option("value", given->value, "what it shows from now on")
      ->required()
      ->check(whole_number());
  auto *const of_port = counter->add_option("--port", given->port, "of this port");
  counter->add_option("--session", given->session, "of this mirror session")->excludes(of_port);
  counter->footer(
      "SCENARIOS.md lists the names:\n"
      "  simhostctl counter vswitch0 txErrors 3\n"
      "  simhostctl counter vswitch0 pktsInUnicast 1000 --port web-1");
  counter->callback([given] {
    check(simhost_set_counter(given->switch_name.c_str(), or_null(given->port),
                              or_null(given->session), given->name.c_str(), given->value));
  });
}

}  // namespace

std::string description() {
  return whole_text(simhost_describe);
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
