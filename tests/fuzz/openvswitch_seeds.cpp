// Writes what a real Open vSwitch sends, as seeds: openvswitch_seeds openflow|ovsdb FOLDER

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "lab.h"
#include "planes/openvswitch/openflow/codec/messages.h"
#include "planes/openvswitch/openflow/codec/requests.h"
#include "planes/openvswitch/transport/stream.h"
#include "samples.h"

namespace {

using namespace simhost;
using openvswitch::Bridge;
using openvswitch::Lab;
using openvswitch::soon;
using Bytes = std::vector<std::uint8_t>;

void write_seed(std::filesystem::path const &folder, Bytes const &bytes) {
  static unsigned number = 0;
  std::ofstream(folder / ("seed-" + std::to_string(number++)), std::ios::binary)
      .write(reinterpret_cast<char const *>(bytes.data()),
             static_cast<std::streamsize>(bytes.size()));
}

/// What comes until the last request has its reply, which is `end` in it.
template <typename IsEnd>
Bytes received(openvswitch::Stream &stream, IsEnd const &is_end) {
  Bytes all;
  while (!is_end(all)) {
    stream.wait_to_receive(soon());
    stream.receive(all);
  }
  return all;
}

void put_samples(openflow::Writer &out) {
  for (auto const &group : openflow::sample_groups()) {
    openflow::put_change(out, 1, openflow::GroupChange{openflow::GroupCommand::add, group});
  }
  for (auto const &flow : openflow::sample_flows()) {
    openflow::put_change(out, 1, openflow::FlowChange{openflow::FlowCommand::add, flow});
  }
}

void put_questions(openflow::Writer &out) {
  using openflow::MultipartType;
  openflow::put_set_async(out, 1, {true, true, true});
  for (auto const &flow : openflow::sample_flows()) {
    auto const filter = openflow::FlowFilter{flow.table, 0, 0, flow.match};
    openflow::put_flows_request(out, 1, MultipartType::flows, filter);
  }
  openflow::put_flows_request(out, 1, MultipartType::aggregate, {});
  openflow::put_ports_request(out, 1, MultipartType::port_statistics, 1);
  openflow::put_ports_request(out, 1, MultipartType::ports, openflow::kAnyPort);
  openflow::put_groups_request(out, 1, MultipartType::groups, openflow::kAllGroups);
  openflow::put_groups_request(out, 1, MultipartType::group_statistics, openflow::kAllGroups);
  openflow::put_flow_monitor_request(
      out, 1, {.number = 1, .filter = {50}, .own = openflow::OwnChanges::told});
  openflow::put_packet_out(
      out, 1, {1, {openflow::set(openflow::reg(3), 4), openflow::ToController{}}, Bytes(14)});
  // An error, and a flow that tells of its removal.
  openflow::put_change(
      out, 1,
      openflow::FlowChange{openflow::FlowCommand::add,
                           {99, 1, openflow::Match().with(openflow::Field::arp_op, 1)}});
  openflow::put_change(out, 1, openflow::FlowChange{openflow::FlowCommand::remove, {50}});
}

void write_openflow(std::filesystem::path const &folder) {
  constexpr openflow::Xid kLast = 99;
  Bridge const bridge(2);
  openvswitch::Stream stream(bridge.socket(), soon());
  openflow::Writer out;
  openflow::put_hello(out, 1);
  put_samples(out);
  put_questions(out);
  openflow::put_barrier_request(out, kLast);
  stream.send(out.bytes());
  Bytes const end{openflow::kVersion, 21, 0, 8, 0, 0, 0, kLast};
  auto const end_in = [&](Bytes const &bytes) {
    return std::search(bytes.begin(), bytes.end(), end.begin(), end.end());
  };
  auto all = received(stream, [&](Bytes const &bytes) { return end_in(bytes) != bytes.end(); });
  // Events may come after it.
  all.erase(end_in(all), all.end());
  for (openflow::Reader in(all); !in.empty();) {
    auto const message = openflow::take_item(in, 2, openflow::kHeaderSize).rest();
    write_seed(folder, Bytes(message.begin(), message.end()));
  }
}

void write_ovsdb(std::filesystem::path const &folder) {
  Bridge const bridge(1);
  auto const port = bridge.name() + "p1";
  openvswitch::Stream stream(Lab::shared().database_socket(), soon());
  auto const ask = [&](std::string const &text, std::string const &end) {
    stream.send({reinterpret_cast<std::uint8_t const *>(text.data()), text.size()});
    write_seed(folder, received(stream, [&](Bytes const &bytes) {
                 return std::string(bytes.begin(), bytes.end()).find(end) != std::string::npos;
               }));
  };
  ask(R"({"method":"monitor_cond","id":1,"params":["Open_vSwitch","m",{
      "Interface":[{"columns":["name","ofport_request","external_ids"]}],
      "Port":[{"columns":["name","trunks","external_ids"]}],
      "Bridge":[{"columns":["name","external_ids"]}]}]})",
      R"("id":1)");
  Lab::shared().ovs_vsctl({"set", "interface", port, "ofport_request=9", "external_ids:a=b"});
  ask("", "update2");
  Lab::shared().ovs_vsctl({"set", "port", port, "trunks=1,2,3"});
  ask("", "update2");
  Lab::shared().ovs_vsctl({"del-port", port});
  ask("", "delete");
  ask(R"({"method":"transact","id":2,"params":["Open_vSwitch",{"op":"x"}]})", R"("id":2)");
}

}  // namespace

int main(int count, char **words) {
  if (count != 3) {
    std::cerr << "openvswitch_seeds openflow|ovsdb FOLDER\n";
    return 2;
  }
  auto const write = std::string(words[1]) == "openflow" ? write_openflow : write_ovsdb;
  write(words[2]);
}
