// One function for each direction, with a case for each kind of form.
#include "scenario/forms.h"

#include <fmt/format.h>

#include <algorithm>
#include <charconv>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "scenario/members.h"
#include "scenario/texts.h"

namespace simhost::scenario {
namespace {

Member const *find_member(std::span<Member const> members, std::string_view name) {
  auto const found = std::find_if(members.begin(), members.end(),
                                  [&](Member const &member) { return member.name == name; });
  return found == members.end() ? nullptr : &*found;
}

std::int64_t bits_from(Form const &form, Node const &node) {
  std::int64_t bits = 0;
  for (auto const &item : node.items()) {
    bits |= item.choice(form.words);
  }
  return bits;
}

Json bits_to_json(Form const &form, std::int64_t bits) {
  Json names = Json::array();
  for (auto const &word : form.words) {
    if ((bits & word.value) != 0) {
      names.push_back(word.text);
    }
  }
  return names;
}

std::string text_from(Form const &form, Node const &node) {
  auto text = node.text();
  if (text.size() > form.most) {
    node.fail(fmt::format("has more than {} bytes", form.most));
  }
  return text;
}

std::optional<std::int64_t> number_in(std::string_view digits) {
  std::int64_t number = 0;
  auto const *const end = digits.data() + digits.size();
  auto const [stopped, error] = std::from_chars(digits.data(), end, number);
  return error == std::errc() && stopped == end ? std::optional(number) : std::nullopt;
}

std::pair<std::int64_t, std::int64_t> range_from(Form const &form, Node const &node) {
  if (!node.is_text()) {
    auto const number = node.integer(form.least, form.greatest);
    return {number, number};
  }
  auto const text = node.text();
  auto const dash = text.find('-');
  if (dash != std::string::npos) {
    auto const first = number_in(std::string_view(text).substr(0, dash));
    auto const last = number_in(std::string_view(text).substr(dash + 1));
    auto const is_within = [&](std::int64_t number) {
      return number >= form.least && number <= form.greatest;
    };
    if (first && last && is_within(*first) && is_within(*last)) {
      return {*first, *last};
    }
  }
  node.fail(fmt::format("must be a number or a range such as \"10-12\", {} to {}", form.least,
                        form.greatest));
}

Json range_to_json(std::int64_t first, std::int64_t last) {
  return first == last ? Json(first) : Json(fmt::format("{}-{}", first, last));
}

Bytes address_of(Form const &form, Node const &node) {
  auto address = address_from(node.text());
  bool const is_mac = address && address->size() == kMacBytes;
  if (form.kind == FormKind::mac && !is_mac) {
    node.fail("must be six bytes such as 02:00:00:00:00:01");
  }
  if (form.kind == FormKind::ip && (!address || is_mac)) {
    node.fail("must be an IPv4 or IPv6 address");
  }
  if (!address) {
    node.fail("must be an address of Ethernet, IPv4 or IPv6");
  }
  return *std::move(address);
}

void read_record(Form const &form, Node const &node, void *object) {
  if (form.first_alone && !node.is_object()) {
    read(form.members.front().form, node, object);
    return;
  }
  node.only(names_of(form.members));
  read_members(form.members, node, object);
}

void read_one_of(Form const &form, Node const &node, void *object) {
  auto const names = names_of(form.members);
  node.only(names);
  auto const given = node.members();
  if (given.size() != 1) {
    node.fail(fmt::format("must have one of the keys {}", fmt::join(names, ", ")));
  }
  auto const *const member = find_member(form.members, given.front().key);
  form.store(object, member - form.members.data());
  read(member->form, given.front().value, object);
}

void read_list(Form const &form, Node const &node, void *object) {
  for (auto const &item : node.items()) {
    auto *const element = form.count(object) < form.most ? form.append(object) : nullptr;
    if (element == nullptr) {
      node.fail(fmt::format("there is room for {} at most", form.most));
    }
    read(*form.element, item, element);
  }
}

// Whether a record is said without the member.
bool is_absent(Member const &member, void const *object) {
  auto const &form = member.form;
  if (member.presence != Presence::unless_absent) {
    return false;
  }
  switch (form.kind) {
    case FormKind::list:
      return form.count(object) == 0;
    case FormKind::text:
      return form.text(object).empty();
    case FormKind::record:
      return std::all_of(form.members.begin(), form.members.end(),
                         [&](Member const &inner) { return is_absent(inner, object); });
    default:
      return form.load(object) == member.absent;
  }
}

Json record_to_json(Form const &form, void const *object) {
  Json said = Json::object();
  add_members(said, form.members, object);
  auto const &first = form.members.front();
  bool const is_first_alone =
      said.empty() || (said.size() == 1 && said.contains(std::string(first.name)));
  return form.first_alone && is_first_alone ? to_json(first.form, object) : said;
}

Json list_to_json(Form const &form, void const *object) {
  Json list = Json::array();
  for (std::size_t at = 0; at < form.count(object); ++at) {
    list.push_back(to_json(*form.element, form.element_at(object, at)));
  }
  return list;
}

std::string_view name_of(FormKind kind) {
  switch (kind) {
    case FormKind::none:
      return "none";
    case FormKind::number:
      return "number";
    case FormKind::seconds:
      return "seconds";
    case FormKind::boolean:
      return "boolean";
    case FormKind::choice:
      return "choice";
    case FormKind::bits:
      return "bits";
    case FormKind::text:
      return "text";
    case FormKind::range:
      return "range";
    case FormKind::mac:
      return "mac";
    case FormKind::ip:
      return "ip";
    case FormKind::address:
      return "address";
    case FormKind::record:
      return "record";
    case FormKind::one_of:
      return "one_of";
    case FormKind::list:
      return "list";
  }
  return "";
}

// Members of an element, which no object has yet, are said without their defaults.
Json members_to_json(Form const &form, void const *defaults) {
  Json members = Json::array();
  for (auto const &member : form.members) {
    Json said{{"name", member.name}};
    said.update(form_to_json(member.form, defaults));
    if (member.presence == Presence::required) {
      said["required"] = true;
    } else if (defaults != nullptr && form.kind == FormKind::record &&
               !is_absent(member, defaults)) {
      said["default"] = to_json(member.form, defaults);
    }
    if (member.presence == Presence::always) {
      said["always"] = true;
    }
    said["words"] = member.says;
    members.push_back(std::move(said));
  }
  return members;
}

void add_bound(Json &said, std::string_view name, std::size_t most) {
  if (most != kUnbounded) {
    said[std::string(name)] = most;
  }
}

}  // namespace

std::vector<std::string_view> names_of(std::span<Member const> members) {
  std::vector<std::string_view> names;
  for (auto const &member : members) {
    names.push_back(member.name);
  }
  return names;
}

void read_members(std::span<Member const> members, Node const &node, void *object) {
  for (auto const &member : members) {
    if (auto const given = node.find(member.name)) {
      read(member.form, *given, object);
    } else if (member.presence == Presence::required) {
      node.fail(fmt::format("'{}' is missing", member.name));
    }
  }
}

void add_members(Json &said, std::span<Member const> members, void const *object) {
  for (auto const &member : members) {
    if (!is_absent(member, object)) {
      said[std::string(member.name)] = to_json(member.form, object);
    }
  }
}

void read(Form const &form, Node const &node, void *object) {
  switch (form.kind) {
    case FormKind::none:
      node.fail("can be said by its bytes only");
    case FormKind::number:
      form.store(object, node.integer(form.least, form.greatest));
      break;
    case FormKind::seconds:
      form.store(object, node.milliseconds());
      break;
    case FormKind::boolean:
      form.store(object, node.flag() ? 1 : 0);
      break;
    case FormKind::choice:
      form.store(object, node.choice(form.words));
      break;
    case FormKind::bits:
      form.store(object, bits_from(form, node));
      break;
    case FormKind::text:
      form.put_text(object, text_from(form, node));
      break;
    case FormKind::range: {
      auto const [first, last] = range_from(form, node);
      form.store(object, first);
      form.store_end(object, last);
      break;
    }
    case FormKind::mac:
    case FormKind::ip:
    case FormKind::address:
      form.put_bytes(object, address_of(form, node));
      break;
    case FormKind::record:
      read_record(form, node, object);
      break;
    case FormKind::one_of:
      read_one_of(form, node, object);
      break;
    case FormKind::list:
      read_list(form, node, object);
      break;
  }
}

Json to_json(Form const &form, void const *object) {
  switch (form.kind) {
    case FormKind::none:
      return {};
    case FormKind::number:
      return form.load(object);
    case FormKind::seconds:
      return static_cast<double>(form.load(object)) / 1000;
    case FormKind::boolean:
      return form.load(object) != 0;
    case FormKind::choice:
      return word_to_json(form.load(object), form.words);
    case FormKind::bits:
      return bits_to_json(form, form.load(object));
    case FormKind::text:
      return form.text(object);
    case FormKind::range:
      return range_to_json(form.load(object), form.load_end(object));
    case FormKind::mac:
    case FormKind::ip:
    case FormKind::address:
      return address_text(form.bytes(object));
    case FormKind::record:
      return record_to_json(form, object);
    case FormKind::one_of: {
      auto const &member = form.members[static_cast<std::size_t>(form.load(object))];
      return {{std::string(member.name), to_json(member.form, object)}};
    }
    case FormKind::list:
      return list_to_json(form, object);
  }
  return {};
}

Json form_to_json(Form const &form, void const *defaults) {
  Json said{{"form", name_of(form.kind)}};
  switch (form.kind) {
    case FormKind::number:
    case FormKind::range:
      said["least"] = form.least;
      said["greatest"] = form.greatest;
      break;
    case FormKind::choice:
    case FormKind::bits: {
      auto &words = said["choices"] = Json::object();
      for (auto const &word : form.words) {
        words[std::string(word.text)] = word.value;
      }
      break;
    }
    case FormKind::text:
      add_bound(said, "most_bytes", form.most);
      if (form.of_uplinks) {
        said["names"] = "uplinks";
      }
      break;
    case FormKind::record:
    case FormKind::one_of:
      said["members"] = members_to_json(form, defaults);
      if (form.first_alone) {
        said["alone"] = form.members.front().name;
      }
      break;
    case FormKind::list:
      add_bound(said, "most", form.most);
      said["element"] = form_to_json(*form.element, nullptr);
      break;
    default:
      break;
  }
  return said;
}

}  // namespace simhost::scenario
