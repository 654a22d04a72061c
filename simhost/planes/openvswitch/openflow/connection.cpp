#include "planes/openvswitch/openflow/connection.h"

#include <algorithm>
#include <utility>

#include "planes/openvswitch/openflow/codec/messages.h"
#include "planes/openvswitch/openflow/codec/replies.h"
#include "planes/openvswitch/openflow/codec/requests.h"

namespace simhost::openflow {
namespace {

Header header_of(BytesView message) {
  Reader in(message);
  return take_header(in);
}

Reader payload_of(BytesView message) {
  return Reader(message.subspan(kHeaderSize));
}

ErrorReply error_of(BytesView message) {
  auto in = payload_of(message);
  return take_error(in, header_of(message).xid);
}

bool is_flow_update(BytesView message) {
  auto in = payload_of(message);
  return take_multipart_header(in).type == MultipartType::flow_monitor;
}

}  // namespace

Connection::Connection(std::filesystem::path const &socket, Deadline deadline,
                       openvswitch::Lives lives)
    : stream_(socket, deadline, std::move(lives)) {
  Writer out;
  put_hello(out, next_xid());
  send(out);
}

void Connection::require_hello(BytesView message) {
  auto const header = header_of(message);
  if (header.type == MessageType::error) {
    throw Refused(error_of(message));
  }
  if (header.type != MessageType::hello) {
    throw Malformed("the switch does not begin with a hello");
  }
  if (header.version < kVersion) {
    throw Refused(ErrorReply{});
  }
}

void Connection::send(Writer const &out) {
  stream_.send(out.bytes());
}

std::optional<Connection::Message> Connection::take_message() {
  auto const left = BytesView(received_).subspan(taken_);
  if (left.size() < kHeaderSize) {
    return std::nullopt;
  }
  auto const header = header_of(left);
  if (header.length < kHeaderSize) {
    throw Malformed("a message is shorter than its header");
  }
  if (left.size() < header.length) {
    return std::nullopt;
  }
  auto const message = left.first(header.length);
  taken_ += header.length;
  if (!std::exchange(is_greeted_, true)) {
    require_hello(message);
    return take_message();
  }
  return Message(message.begin(), message.end());
}

void Connection::receive() {
  received_.erase(received_.begin(), received_.begin() + static_cast<std::ptrdiff_t>(taken_));
  taken_ = 0;
  stream_.send({});
  stream_.receive(received_);
}

Connection::Message Connection::wait_for_message(Deadline deadline) {
  while (true) {
    if (auto message = take_message()) {
      return std::move(*message);
    }
    stream_.wait_to_receive(deadline);
    receive();
  }
}

bool Connection::is_handled(Message const &message, Xid first_xid, Xid last_xid) {
  auto const header = header_of(message);
  auto in = payload_of(message);
  // Open vSwitch sends some errors as if they were of OpenFlow 1.0.
  if (header.version != kVersion && header.type != MessageType::error) {
    throw Malformed("a message is of another version of OpenFlow");
  }
  switch (header.type) {
    case MessageType::echo_request: {
      Writer out;
      put_echo_reply(out, header.xid, in.rest());
      send(out);
      return true;
    }
    case MessageType::packet_in:
      events_.emplace_back(take_packet_in(in));
      return true;
    case MessageType::flow_removed:
      events_.emplace_back(take_flow_removed(in));
      return true;
    case MessageType::request_forward:
      events_.emplace_back(GroupsOrMetersChanged{});
      return true;
    case MessageType::port_status:
      events_.emplace_back(take_port_status(in));
      return true;
    default:
      break;
  }
  if (header.xid >= first_xid && header.xid <= last_xid) {
    return false;
  }
  if (header.type == MessageType::error) {
    events_.emplace_back(take_error(in, header.xid));
  } else if (header.type == MessageType::multipart_reply && is_flow_update(message)) {
    take_multipart_header(in);
    while (!in.empty()) {
      events_.emplace_back(take_flow_update(in));
    }
  }
  // Whatever else it is, nobody waits for it any more.
  return true;
}

std::optional<Event> Connection::next_event() {
  while (events_.empty()) {
    auto const message = take_message();
    if (!message) {
      return std::nullopt;
    }
    is_handled(*message, 1, 0);
  }
  auto event = std::move(events_.front());
  events_.pop_front();
  return event;
}

Connection::Message Connection::wait_for_reply(Xid xid, Deadline deadline) {
  while (true) {
    auto message = wait_for_message(deadline);
    if (is_handled(message, xid, xid)) {
      continue;
    }
    if (header_of(message).type == MessageType::error) {
      throw Refused(error_of(message));
    }
    return message;
  }
}

void Connection::send(PacketOut const &packet) {
  Writer out;
  put_packet_out(out, next_xid(), packet);
  send(out);
}

void Connection::barrier(Deadline deadline) {
  order([](Writer &, Xid) {}, deadline);
}

void Connection::order(std::function<void(Writer &, Xid)> const &put, Deadline deadline) {
  // It has no reply but the error, which comes before that of the barrier.
  Writer out;
  auto const xid = next_xid();
  put(out, xid);
  put_barrier_request(out, xid);
  send(out);
  wait_for_reply(xid, deadline);
}

void Connection::have_meters(std::map<std::uint32_t, std::uint32_t> const &rates,
                             Deadline deadline) {
  auto const there = ask<std::uint32_t>([](Writer &out, Xid xid) { put_meters_request(out, xid); },
                                        take_meter, deadline);
  order(
      [&](Writer &out, Xid xid) {
        for (auto const meter : there) {
          if (!rates.contains(meter)) {
            put_no_meter(out, xid, meter);
          }
        }
        for (auto const &[meter, rate] : rates) {
          bool const is_there = std::ranges::find(there, meter) != there.end();
          put_meter(out, xid, is_there ? MeterCommand::modify : MeterCommand::add, meter, rate);
        }
      },
      deadline);
}

void Connection::add_meters(std::span<std::uint32_t const> meters, std::uint32_t rate,
                            Deadline deadline) {
  order(
      [&](Writer &out, Xid xid) {
        for (auto const meter : meters) {
          put_meter(out, xid, MeterCommand::add, meter, rate);
        }
      },
      deadline);
}

void Connection::set_async(AsyncMessages const &wanted, Deadline deadline) {
  order([&](Writer &out, Xid xid) { put_set_async(out, xid, wanted); }, deadline);
}

Connection::Outcome Connection::wait_for_outcome(Xid first, Xid last, Deadline deadline) {
  Outcome outcome;
  while (true) {
    auto const message = wait_for_message(deadline);
    if (is_handled(message, first, last)) {
      continue;
    }
    auto const header = header_of(message);
    bool const is_error = header.type == MessageType::error;
    if (is_error && !outcome.error) {
      outcome.error = error_of(message);
    }
    if (header.xid == last) {
      outcome.is_refused = is_error;
      return outcome;
    }
  }
}

void Connection::control(std::uint32_t bundle, BundleControl control) {
  Writer out;
  put_bundle_control(out, next_xid(), bundle, control);
  send(out);
}

void Connection::change(Changes const &changes, Deadline deadline,
                        std::function<void()> const &meanwhile) {
  auto const bundle = ++bundle_;
  auto const open = next_xid();
  Writer out;
  put_bundle_control(out, open, bundle, BundleControl::open);
  for (auto const &change : changes) {
    put_bundle_add(out, next_xid(), bundle, change);
  }
  // The reply to this comes after the errors of the changes; a commit that did not wait for it
  // would make those that are no error. Each wait is a turn of Open vSwitch's loop.
  put_bundle_control(out, next_xid(), bundle, BundleControl::close);
  std::optional<ErrorReply> error;
  bool const are_known = known_forms_.include(changes);
  if (are_known) {
    put_bundle_control(out, next_xid(), bundle, BundleControl::commit);
    send(out);
  } else {
    send(out);
    error = wait_for_outcome(open, xid_, deadline).error;
    control(bundle, error ? BundleControl::discard : BundleControl::commit);
  }
  if (!error && meanwhile) {
    meanwhile();
  }
  auto const end = wait_for_outcome(open, xid_, deadline);
  if (!error && !end.error) {
    if (!are_known) {
      known_forms_.add(changes);
    }
    return;
  }
  error = error ? error : end.error;
  auto const index = error->xid - open - 1;
  if (index >= changes.size()) {
    throw Refused(*error);
  }
  auto const refused = to_text(changes[index]);
  if (are_known && !end.is_refused) {
    known_forms_ = {};
    throw HalfMade(refused, *error);
  }
  throw ChangeRefused(index, refused, *error);
}

void Connection::add(std::span<Flow const *const> flows, Deadline deadline) {
  Writer out;
  auto const first = xid_ + 1;
  for (auto const *const flow : flows) {
    put_added_flow(out, next_xid(), *flow);
  }
  put_barrier_request(out, next_xid());
  send(out);
  if (auto const error = wait_for_outcome(first, xid_, deadline).error) {
    auto const index = error->xid - first;
    if (index >= flows.size()) {
      throw Refused(*error);
    }
    throw HalfMade(to_text(FlowChange{.flow = *flows[index]}), *error);
  }
}

template <typename Item, typename Take>
void Connection::take_items(Xid xid, Take const &take, std::vector<Item> &items,
                            Deadline deadline) {
  while (true) {
    auto const message = wait_for_reply(xid, deadline);
    auto in = payload_of(message);
    if (header_of(message).type != MessageType::multipart_reply) {
      throw Malformed("the reply is of another kind than the request");
    }
    auto const header = take_multipart_header(in);
    while (!in.empty()) {
      items.push_back(take(in));
    }
    if (!header.has_more) {
      return;
    }
  }
}

std::size_t Connection::take_count(Xid xid, Deadline deadline) {
  std::vector<Aggregate> all;
  take_items(xid, take_aggregate, all, deadline);
  std::size_t count = 0;
  for (auto const &one : all) {
    count += one.flows;
  }
  return count;
}

template <typename Item, typename Asked, typename Put, typename Take>
std::vector<Item> Connection::ask_each(std::span<Asked const> all, Put const &put, Take const &take,
                                       Deadline deadline) {
  Writer out;
  auto xid = xid_;
  for (auto const &asked : all) {
    put(out, next_xid(), asked);
  }
  send(out);
  std::vector<Item> items;
  while (xid != xid_) {
    take_items(++xid, take, items, deadline);
  }
  return items;
}

template <typename Item, typename Put, typename Take>
std::vector<Item> Connection::ask(Put const &put, Take const &take, Deadline deadline) {
  return ask_each<Item>(
      std::span<Put const>(&put, 1), [](Writer &out, Xid xid, Put const &one) { one(out, xid); },
      take, deadline);
}

bool Connection::is_bare(Deadline deadline) {
  Writer out;
  auto const flows = next_xid();
  put_flows_request(out, flows, MultipartType::aggregate, {});
  auto const groups = next_xid();
  put_groups_request(out, groups, MultipartType::groups, kAllGroups);
  send(out);
  auto const flow_count = take_count(flows, deadline);
  std::vector<GroupEntry> all_groups;
  take_items(groups, take_group, all_groups, deadline);
  return flow_count == 0 && all_groups.empty();
}

Contents Connection::follow(AsyncMessages const &wanted, std::span<FlowMonitor const> monitors,
                            PresentFlows present, Deadline deadline) {
  Writer out;
  auto const begin = next_xid();
  put_set_async(out, begin, wanted);
  put_barrier_request(out, begin);
  for (auto const &monitor : monitors) {
    put_flow_monitor_request(out, next_xid(), monitor);
  }
  bool const are_told = present == PresentFlows::told;
  auto const flows = next_xid();
  put_flows_request(out, flows, are_told ? MultipartType::flows : MultipartType::aggregate, {});
  auto const groups = next_xid();
  put_groups_request(out, groups, MultipartType::groups, kAllGroups);
  auto const ports = next_xid();
  put_ports_request(out, ports, MultipartType::ports, kAnyPort);
  auto const statistics = next_xid();
  put_ports_request(out, statistics, MultipartType::port_statistics, kAnyPort);
  send(out);
  wait_for_reply(begin, deadline);
  Contents all;
  for (auto monitor = begin + 1; monitor != flows; ++monitor) {
    take_items(monitor, take_flow_update, all.monitored, deadline);
  }
  if (are_told) {
    take_items(flows, take_flow, all.flows, deadline);
    all.flow_count = all.flows.size();
  } else {
    all.flow_count = take_count(flows, deadline);
  }
  take_items(groups, take_group, all.groups, deadline);
  take_items(ports, take_port_description, all.ports, deadline);
  take_items(statistics, take_port_statistics, all.port_statistics, deadline);
  return all;
}

std::vector<FlowEntry> Connection::flows(FlowFilter const &filter, Deadline deadline) {
  return flows_of(std::span(&filter, 1), deadline);
}

std::vector<FlowEntry> Connection::flows_of(std::span<FlowFilter const> filters,
                                            Deadline deadline) {
  return ask_each<FlowEntry>(
      filters,
      [](Writer &out, Xid xid, FlowFilter const &filter) {
        put_flows_request(out, xid, MultipartType::flows, filter);
      },
      take_flow, deadline);
}

Sums Connection::sums_of(std::span<FlowFilter const> filters, bool are_ports_asked,
                         Deadline deadline) {
  Writer out;
  auto xid = xid_;
  for (auto const &filter : filters) {
    put_flows_request(out, next_xid(), MultipartType::aggregate, filter);
  }
  auto const ports = xid_ + 1;
  if (are_ports_asked) {
    put_ports_request(out, next_xid(), MultipartType::port_statistics, kAnyPort);
  }
  send(out);
  Sums sums;
  while (++xid != ports) {
    take_items(xid, take_aggregate, sums.flows, deadline);
  }
  if (sums.flows.size() != filters.size()) {
    throw Malformed("the sums of flows are not those that were asked for");
  }
  if (are_ports_asked) {
    take_items(ports, take_port_statistics, sums.ports, deadline);
  }
  return sums;
}

std::vector<PortStatistics> Connection::port_statistics(Port port, Deadline deadline) {
  return ask<PortStatistics>(
      [&](Writer &out, Xid xid) {
        put_ports_request(out, xid, MultipartType::port_statistics, port);
      },
      take_port_statistics, deadline);
}

std::vector<PortDescription> Connection::ports(Deadline deadline) {
  return ask<PortDescription>(
      [&](Writer &out, Xid xid) { put_ports_request(out, xid, MultipartType::ports, kAnyPort); },
      take_port_description, deadline);
}

std::vector<GroupEntry> Connection::groups(Deadline deadline) {
  return ask<GroupEntry>(
      [&](Writer &out, Xid xid) {
        put_groups_request(out, xid, MultipartType::groups, kAllGroups);
      },
      take_group, deadline);
}

std::vector<GroupStatistics> Connection::group_statistics(Deadline deadline) {
  return ask<GroupStatistics>(
      [&](Writer &out, Xid xid) {
        put_groups_request(out, xid, MultipartType::group_statistics, kAllGroups);
      },
      take_group_statistics, deadline);
}

std::vector<FlowUpdate> Connection::monitor_flows(std::span<FlowMonitor const> monitors,
                                                  Deadline deadline) {
  return ask_each<FlowUpdate>(monitors, put_flow_monitor_request, take_flow_update, deadline);
}

void Connection::cancel_monitor(std::uint32_t monitor, Deadline deadline) {
  ask<FlowUpdate>([&](Writer &out, Xid xid) { put_flow_monitor_cancel(out, xid, monitor); },
                  take_flow_update, deadline);
}

}  // namespace simhost::openflow
