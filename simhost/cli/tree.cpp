// Lines and branches.
#include "cli/tree.h"

#include <fmt/format.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>
#include <utility>
#include <vector>

#include "cli/commands.h"

namespace simhost::cli {
namespace {

using Json = nlohmann::ordered_json;

// A line and what hangs on it.
struct Branch {
  std::string line;
  std::vector<Branch> branches = {};
};

void draw(std::string &text, std::vector<Branch> const &branches, std::string const &indent) {
  for (std::size_t at = 0; at < branches.size(); ++at) {
    bool const last = at + 1 == branches.size();
    text += indent + (last ? "`-- " : "|-- ") + printable(branches[at].line) + "\n";
    draw(text, branches[at].branches, indent + (last ? "    " : "|   "));
  }
}

std::string joined(Json const &texts) {
  std::string all;
  for (auto const &text : texts) {
    all += (all.empty() ? "" : ", ") + text.get<std::string>();
  }
  return all;
}

Branch uplink_branch(Json const &uplink) {
  auto const observed = uplink.value("observed", Json::object());
  // What a device says of its link is observed, and told otherwise.
  auto const &link = uplink.contains("link") ? uplink : observed;
  auto line = fmt::format("{:<10} link {}", uplink["name"].get<std::string>(),
                          link["link"].get<std::string>());
  if (link["admin"] == "down") {
    line += ", switched off";
  }
  line += fmt::format(", {} Mbit/s {} duplex", link["speed"].get<std::uint32_t>(),
                      link["duplex"].get<std::string>());
  if (uplink.contains("device")) {
    line += fmt::format(", device {}", uplink["device"].get<std::string>());
  }
  if (observed.contains("port")) {
    line += fmt::format(", at {} of {}", observed["port"].get<std::string>(),
                        observed["switch"].get<std::string>());
  } else {
    line += ", free";
  }
  return {line};
}

Branch address_branch(Json const &address) {
  auto line =
      fmt::format("{} {}", address["mac"].get<std::string>(), address["type"].get<std::string>());
  if (address["vlan"] != 0) {
    line += fmt::format(", VLAN {}", address["vlan"].get<unsigned>());
  }
  if (address["vni"] != 0) {
    line += fmt::format(", network {}", address["vni"].get<unsigned>());
  }
  if (address["ages"].get<bool>()) {
    line += fmt::format(", seen {} s ago", address["age"].get<unsigned>());
  }
  return {line};
}

Branch group_branch(Json const &group) {
  auto line = "joined " + group["address"].get<std::string>();
  if (!group["sources"].empty()) {
    line +=
        fmt::format(", {} {}", group["source_mode"].get<std::string>(), joined(group["sources"]));
  }
  return {line};
}

Branch session_branch(Json const &session) {
  auto line = "mirror session " + session["sid"].get<std::string>();
  if (session["disabled"].get<bool>()) {
    line += ", disabled";
  }
  if (session["promiscuous"].get<bool>()) {
    line += ", promiscuous";
  }
  return {line};
}

std::string teaming_line(Json const &teaming) {
  auto line = "teaming " + teaming["balance"].get<std::string>();
  if (!teaming["active"].empty()) {
    line += ": active " + joined(teaming["active"]);
  }
  if (!teaming["standby"].empty()) {
    line += ", standby " + joined(teaming["standby"]);
  }
  if (!teaming["flags"].empty()) {
    line += " (" + joined(teaming["flags"]) + ")";
  }
  return line;
}

// A setting whose value has no words of its own.
std::string setting_line(std::string const &name, Json const &value) {
  auto spaced = name;
  std::replace(spaced.begin(), spaced.end(), '_', ' ');
  if (value.is_string()) {
    return spaced + " " + value.get<std::string>();
  }
  bool const are_texts =
      value.is_array() &&
      std::all_of(value.begin(), value.end(), [](Json const &item) { return item.is_string(); });
  return spaced + " " + (are_texts ? joined(value) : value.dump());
}

using Names = std::set<std::string_view>;

// What is no setting, and the settings that other lines tell.
Names const kToldOfSwitches{"alias",      "id",
                            "portset",    "max_ports",
                            "persistent", "version",
                            "running",    "mtu",
                            "fabric",     "uplink_ports",
                            "uplinks",    "lags",
                            "teaming",    "mac_learning",
                            "ports",      "addresses",
                            "counters",   "mirror_counters",
                            "properties", "host_properties",
                            "observed"};
Names const kToldOfPorts{"id",           "external_id", "teaming",         "uplink",
                         "addresses",    "groups",      "mirror_sessions", "counters",
                         "mac_learning", "properties",  "observed"};

void add_settings(std::vector<Branch> &branches, Json const &described, Names const &told) {
  for (auto const &[name, value] : described.items()) {
    if (!told.contains(name)) {
      branches.push_back({setting_line(name, value)});
    }
  }
}

void add_counters(std::vector<Branch> &branches, std::string const &what, Json const &counters) {
  for (auto const &[name, value] : counters.items()) {
    branches.push_back({fmt::format("{}{} = {}", what, name, value.get<std::uint64_t>())});
  }
}

Branch port_branch(Json const &port) {
  auto const &observed = port["observed"];
  Branch branch{fmt::format("port {:<8} number {}", port["id"].get<std::string>(),
                            observed["number"].get<std::uint32_t>())};
  branch.line += observed["uplink"].is_string()
                     ? ", sends over " + observed["uplink"].get<std::string>()
                     : ", sends nowhere: " + observed["why"].get<std::string>();
  if (port.contains("teaming")) {
    branch.branches.push_back({teaming_line(port["teaming"])});
  }
  if (port.contains("uplink")) {
    branch.branches.push_back({"bound to " + port["uplink"].get<std::string>()});
  }
  add_settings(branch.branches, port, kToldOfPorts);
  for (auto const &address : port["addresses"]) {
    branch.branches.push_back(address_branch(address));
  }
  for (auto const &group : port["groups"]) {
    branch.branches.push_back(group_branch(group));
  }
  for (auto const &session : port.value("mirror_sessions", Json::array())) {
    branch.branches.push_back(session_branch(session));
  }
  add_counters(branch.branches, "", port["counters"]);
  return branch;
}

Branch switch_branch(Json const &host_switch) {
  Branch branch{fmt::format("switch {}: {} of {} ports, MTU {}{}",
                            host_switch["alias"].get<std::string>(), host_switch["ports"].size(),
                            host_switch["max_ports"].get<std::uint32_t>(),
                            host_switch["mtu"].get<std::uint32_t>(),
                            host_switch["persistent"].get<bool>() ? "" : ", not persistent")};
  auto &branches = branch.branches;
  branches.push_back({"identifier " + host_switch["id"].get<std::string>()});
  branches.push_back({"portset " + host_switch["portset"].get<std::string>()});
  branches.push_back(
      {"uplinks " +
       (host_switch["uplinks"].empty() ? std::string("none") : joined(host_switch["uplinks"]))});
  if (host_switch.contains("fabric")) {
    auto const &fabric = host_switch["fabric"];
    branches.push_back(
        {fmt::format("{}: {} with the key {} among {}", fabric["uplink"].get<std::string>(),
                     fabric["encapsulation"].get<std::string>(), fabric["key"].get<std::int64_t>(),
                     fabric["peers"].empty() ? "nobody" : joined(fabric["peers"]))});
  }
  for (auto const &lag : host_switch["lags"]) {
    branches.push_back(
        {fmt::format("group {} {}: {}", lag["name"].get<std::string>(),
                     lag["observed"]["up"].get<bool>() ? "up" : "down", joined(lag["uplinks"]))});
  }
  if (host_switch.contains("teaming")) {
    branches.push_back({teaming_line(host_switch["teaming"])});
  }
  add_settings(branches, host_switch, kToldOfSwitches);
  for (auto const &port : host_switch["ports"]) {
    branches.push_back(port_branch(port));
  }
  if (!host_switch["addresses"].empty()) {
    Branch team{"beyond the uplinks"};
    for (auto const &address : host_switch["addresses"]) {
      team.branches.push_back(address_branch(address));
    }
    branches.push_back(std::move(team));
  }
  add_counters(branches, "", host_switch["counters"]);
  for (auto const &[sid, counters] : host_switch["mirror_counters"].items()) {
    add_counters(branches, "mirror session " + sid + ": ", counters);
  }
  return branch;
}

std::string fault_line(Json const &fault) {
  auto const times = fault["times"].get<std::int64_t>();
  auto line = fmt::format("{} from call {} on, {}", fault["call"].get<std::string>(),
                          fault["nth"].get<std::int64_t>(),
                          times == 0 ? std::string("for good") : fmt::format("{} x", times));
  if (fault.contains("delay")) {
    line += fmt::format(": waits {} s", fault["delay"].get<double>());
  }
  if (fault.contains("status")) {
    line += ": returns " + fault["status"].get<std::string>();
  }
  if (fault.contains("exception")) {
    line += fmt::format(": {}: {}", fault["exception"].get<std::string>(),
                        fault["message"].get<std::string>());
  }
  return line + fmt::format("; {} made", fault["observed"]["calls"].get<std::int64_t>());
}

}  // namespace

std::string tree(std::string_view document) {
  auto const host = Json::parse(document);
  std::vector<Branch> branches;
  branches.push_back({fmt::format("clock {} at {:.3f} s",
                                  host["clock"]["stopped"].get<bool>() ? "stopped" : "running",
                                  host["clock"]["now"].get<double>())});
  if (host.contains("underlay")) {
    auto const &underlay = host["underlay"];
    branches.push_back({fmt::format("underlay {} at {}", underlay["address"].get<std::string>(),
                                    underlay["device"].get<std::string>())});
  }
  Branch uplinks{"uplinks"};
  for (auto const &uplink : host["uplinks"]) {
    uplinks.branches.push_back(uplink_branch(uplink));
  }
  branches.push_back(std::move(uplinks));
  for (auto const &host_switch : host["switches"]) {
    branches.push_back(switch_branch(host_switch));
  }
  for (auto const &fault : host["faults"]) {
    branches.push_back({"fault " + fault_line(fault)});
  }
  std::string text = "host\n";
  draw(text, branches, "");
  return text;
}

std::string fault_document(FaultWords const &words) {
  Json fault{{"call", words.function}, {"nth", words.nth}, {"times", words.times}};
  if (!words.status.empty()) {
    fault["status"] = words.status;
  }
  if (!words.exception.empty()) {
    fault["exception"] = words.exception;
    fault["message"] = words.message;
  }
  if (words.delay > 0) {
    fault["delay"] = words.delay;
  }
  return text_of(Json{{"faults", Json::array({fault})}});
}

std::string fault_list(std::string_view document) {
  auto const host = Json::parse(document);
  std::string text;
  for (auto const &fault : host["faults"]) {
    text += printable(fault_line(fault)) + "\n";
  }
  return text;
}

}  // namespace simhost::cli
