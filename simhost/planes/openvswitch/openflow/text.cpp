#include "planes/openvswitch/openflow/text.h"

#include <fmt/format.h>

#include <array>
#include <string_view>

#include "planes/openvswitch/openflow/field_text.h"

namespace simhost::openflow {
namespace {

constexpr std::uint16_t kUsualPriority = 0x8000;

std::string priority_text(std::uint16_t priority) {
  return priority == kUsualPriority ? "" : fmt::format("priority={},", priority);
}

std::string bytes_text(std::vector<std::uint8_t> bytes) {
  constexpr std::size_t kStep = 8;
  constexpr std::size_t kFirst = 6;
  auto const more = bytes.size() < kFirst ? 0 : (bytes.size() - kFirst + kStep - 1) / kStep;
  bytes.resize(kFirst + more * kStep);
  return fmt::format("{:02x}", fmt::join(bytes, "."));
}

struct LearnedText {
  std::string operator()(LearnedMatch const &match) const {
    auto const name = part_text(match.field);
    if (auto const *const source = std::get_if<SubField>(&match.content)) {
      return *source == match.field ? name : name + '=' + part_text(*source);
    }
    auto const number = std::get<Value>(match.content);
    auto const field = match.field.field;
    return match.field == whole(field)
               ? fmt::format("{}={}", info(field).name, content_text(field, number))
               : name + '=' + hexadecimal(number);
  }
  std::string operator()(LearnedLoad const &load) const {
    auto const *const source = std::get_if<SubField>(&load.content);
    return fmt::format("load:{}->{}",
                       source ? part_text(*source) : hexadecimal(std::get<Value>(load.content)),
                       part_text(load.destination));
  }
  std::string operator()(LearnedOutput const &output) const {
    return "output:" + part_text(output.port);
  }
};

struct ActionText {
  std::string operator()(Output const &output) const {
    auto const name = port_text(output.port);
    return output.port > 0xffff ? name : "output:" + name;
  }
  std::string operator()(OutputFrom const &output) const {
    return "output:" + part_text(output.port);
  }
  std::string operator()(OutputTruncated const &output) const {
    return fmt::format("output(port={},max_len={})", port_text(output.port), output.most_bytes);
  }
  std::string operator()(ToController const &output) const {
    return fmt::format("CONTROLLER:{}", output.most_bytes);
  }
  std::string operator()(ToGroup const &group) const {
    return fmt::format("group:{}", group.group);
  }
  std::string operator()(ToMeter const &meter) const {
    return fmt::format("meter:{}", meter.meter);
  }
  std::string operator()(Resubmit const &resubmit) const {
    auto const port = resubmit.in_port ? port_text(*resubmit.in_port) : "";
    return fmt::format("resubmit({},{})", port, resubmit.table);
  }
  std::string operator()(PushVlan const &push) const {
    return fmt::format("push_vlan:{:#06x}", push.ether_type);
  }
  std::string operator()(PopVlan const & /*pop*/) const { return "pop_vlan"; }
  std::string operator()(SetField const &set) const {
    return fmt::format("set_field:{}->{}", masked_text(set.field, {set.value, set.mask}),
                       info(set.field).name);
  }
  std::string operator()(Move const &move) const {
    return fmt::format("move:{}->{}", part_text(move.source), part_text(move.destination));
  }
  std::string operator()(Push const &push) const { return "push:" + part_text(push.source); }
  std::string operator()(Pop const &pop) const { return "pop:" + part_text(pop.destination); }
  std::string operator()(Learn const &learn) const {
    auto text = fmt::format("learn(table={}", learn.table);
    auto const add = [&text](bool is_there, std::string_view name, auto const &content) {
      if (is_there) {
        text += fmt::format(",{}={}", name, content);
      }
    };
    add(learn.idle_timeout != 0, "idle_timeout", learn.idle_timeout);
    add(learn.hard_timeout != 0, "hard_timeout", learn.hard_timeout);
    add(learn.priority != kUsualPriority, "priority", learn.priority);
    text += learn.tells_removal ? ",send_flow_rem" : "";
    text += learn.deletes_learned ? ",delete_learned" : "";
    add(learn.cookie != 0, "cookie", hexadecimal(learn.cookie));
    add(learn.limit != 0, "limit", learn.limit);
    if (learn.result) {
      add(true, "result_dst", part_text(*learn.result));
    }
    for (auto const &spec : learn.specs) {
      text += ',' + std::visit(LearnedText{}, spec);
    }
    return text + ')';
  }
  std::string operator()(Clone const &clone) const {
    return "clone(" + to_text(clone.actions) + ')';
  }
  std::string operator()(CheckPacketLarger const &check) const {
    return fmt::format("check_pkt_larger({})->{}", check.bytes, part_text(check.result));
  }
  std::string operator()(Note const &note) const { return "note:" + bytes_text(note.bytes); }
};

std::string to_text(Bucket const &bucket, GroupType type) {
  auto text = fmt::format("bucket=bucket_id:{},", bucket.id);
  if (type == GroupType::select && bucket.weight != 1) {
    text += fmt::format("weight:{},", bucket.weight);
  }
  if (bucket.watch_port != kAnyPort) {
    text += fmt::format("watch_port:{},", port_text(bucket.watch_port));
  }
  if (bucket.watch_group != kAnyGroup) {
    text += fmt::format("watch_group:{},", bucket.watch_group);
  }
  return text + "actions=" + to_text(bucket.actions);
}

std::string to_text(Selection const &selection) {
  if (selection.method.empty()) {
    return {};
  }
  auto text = ",selection_method=" + selection.method;
  if (selection.parameter != 0) {
    text += fmt::format(",selection_method_param={}", selection.parameter);
  }
  std::string fields;
  for (auto const &[field, mask] : selection.fields) {
    fields += fields.empty() ? "" : ",";
    fields += info(field).name;
    if (mask != settable_bits(field)) {
      fields += '=' + content_text(field, mask);
    }
  }
  switch (selection.fields.size()) {
    case 0:
      return text;
    case 1:
      return text + ",fields=" + fields;
    default:
      return text + ",fields(" + fields + ')';
  }
}

std::string_view type_name(GroupType type) {
  constexpr std::array<std::string_view, 4> kNames{"all", "select", "indirect", "ff"};
  return kNames.at(static_cast<std::size_t>(type));
}

}  // namespace

std::string to_text(Actions const &actions) {
  std::string text;
  for (auto const &action : actions) {
    text += text.empty() ? "" : ",";
    text += std::visit(ActionText{}, static_cast<Action::variant const &>(action));
  }
  return text.empty() ? "drop" : text;
}

std::string to_text(Flow const &flow) {
  std::string text;
  auto const add = [&text](bool is_there, std::string_view name, auto const &content) {
    if (is_there) {
      text += fmt::format("{}={}, ", name, content);
    }
  };
  add(flow.cookie != 0, "cookie", hexadecimal(flow.cookie));
  add(flow.table != 0, "table", flow.table);
  add(flow.idle_timeout != 0, "idle_timeout", flow.idle_timeout);
  add(flow.hard_timeout != 0, "hard_timeout", flow.hard_timeout);
  text += flow.tells_removal ? "send_flow_rem " : "";
  // What no match follows ends with the priority.
  auto place = priority_text(flow.priority) + to_text(flow.match);
  if (!place.empty() && place.back() == ',') {
    place.pop_back();
  }
  text += place;
  return text + (place.empty() ? "" : " ") + "actions=" + to_text(flow.actions);
}

std::string to_text(Group const &group) {
  auto text = fmt::format("group_id={},type={}{}", group.id, type_name(group.type),
                          to_text(group.selection));
  for (auto const &bucket : group.buckets) {
    text += ',' + to_text(bucket, group.type);
  }
  return text;
}

}  // namespace simhost::openflow
