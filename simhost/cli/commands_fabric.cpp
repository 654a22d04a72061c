// What several hosts have together: switches that they share through a fabric.
#include <iostream>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "cli/commands.h"

namespace simhost::cli {
namespace {

using Json = nlohmann::ordered_json;

void add_share(CLI::App &app) {
  auto *const share = app.add_subcommand("share", "Share a switch with the hosts of the fabric");
  auto const alias = words_of_command<std::string>();
  share->add_option("switch", *alias, "alias of the switch")->required();
  share->footer(
      "Its settings and ports are the same on each host that joins it then, whichever\n"
      "host they are changed on.");
  share->callback([alias] { check(simhost_share(alias->c_str())); });
}

void add_join(CLI::App &app) {
  auto *const join = app.add_subcommand("join", "Have a switch of the fabric on this host");
  auto const alias = words_of_command<std::string>();
  join->add_option("switch", *alias, "its alias in the fabric")->required();
  join->footer("A host that destroys it leaves it to the others.");
  join->callback([alias] { check(simhost_join(alias->c_str())); });
}

std::string fabric_words(Json const &fabric) {
  if (fabric.at("host").is_null()) {
    return "this host belongs to no fabric";
  }
  auto const name = "'" + fabric.at("host").get<std::string>() + "'";
  if (fabric.at("server").is_null()) {
    return "the fabric of this host, " + name +
           ", cannot be used: " + fabric.at("trouble").get<std::string>();
  }
  return "this host is " + name + " in the fabric at " + fabric.at("server").get<std::string>() +
         ", of which change " + fabric.at("revision").dump() + " is here";
}

void add_fabric(CLI::App &app) {
  auto *const fabric = app.add_subcommand("fabric", "Tell of the fabric that the host belongs to");
  auto const json = words_of_command<bool>();
  fabric->add_flag("--json", *json, "as JSON");
  fabric->footer("A host belongs to the one that simhostd --fabric names:\n  simhostctl fabric");
  fabric->callback([json] {
    auto const text = whole_text(simhost_fabric);
    std::cout << (*json ? text : printable(fabric_words(Json::parse(text)))) << "\n";
  });
}

}  // namespace

void add_fabric_commands(CLI::App &app) {
  add_share(app);
  add_join(app);
  add_fabric(app);
}

}  // namespace simhost::cli
