#include "recordings/player/comparison.h"

#include <algorithm>

namespace recordings {
namespace {

constexpr std::size_t longest_value = 60;
constexpr char const *unknown = "unknown";

std::uint64_t address_itself(std::uint64_t address) noexcept {
  return address;
}

bool is_pointer(Json const &value) {
  return value.is_object() && value.size() == 1 && value.contains("at");
}

bool crosses_as_pointer(Argument const &argument) {
  return argument.passing == Passing::handle || argument.passing == Passing::released ||
         argument.passing == Passing::function;
}

/// Of two pointers neither of which is null.
bool is_same_pointer(Argument const &argument, Json const &recorded, Json const &asked,
                     Holdings const &holdings) {
  if (argument.passing == Passing::function) {
    return true;
  }
  Json const &number = recorded["at"];
  if (asked["at"] == unknown) {
    return number.is_number_integer() && !holdings.has(number.get<std::uint64_t>());
  }
  return number == asked["at"];
}

std::string value_shown(Json const &value) {
  if (is_pointer(value)) {
    Json const &number = value["at"];
    return number == unknown ? "a pointer of the tool's own" : "pointer " + number.dump();
  }
  auto text = value.dump(-1, ' ', false, Json::error_handler_t::replace);
  if (text.size() <= longest_value) {
    return text;
  }
  // Not in the middle of a character.
  auto end = longest_value;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U) {
    --end;
  }
  return text.substr(0, end) + "...";
}

/// Collects what differs of two values, from the outside in.
class Differing {
 public:
  explicit Differing(Names const &names) : names_(names) {}

  std::vector<std::string> lines;

  void compare(std::string const &where, Json const &recorded, Json const &asked) {
    if (recorded == asked) {
      return;
    }
    if (recorded.is_object() && asked.is_object() && !is_pointer(recorded)) {
      members(where, recorded, asked);
    } else if (recorded.is_array() && asked.is_array() && recorded.size() == asked.size()) {
      for (std::size_t at = 0; at < recorded.size(); ++at) {
        compare(where + '[' + std::to_string(at) + ']', recorded[at], asked[at]);
      }
    } else if (!recorded.is_string() || !asked.is_string() ||
               !names_.are_same(recorded.get_ref<std::string const &>(),
                                asked.get_ref<std::string const &>())) {
      tell(where, recorded, asked);
    }
  }

  void tell(std::string const &where, Json const &recorded, Json const &asked) {
    lines.push_back(where + ": " + value_shown(recorded) + " was recorded, and " +
                    value_shown(asked) + " asked");
  }

 private:
  Names const &names_;

  void members(std::string const &where, Json const &recorded, Json const &asked) {
    auto all = recorded;
    all.update(asked);
    for (auto const &one : all.items()) {
      auto inside = where + '.';
      inside += one.key();
      compare(inside, member_of(recorded, one.key()), member_of(asked, one.key()));
    }
  }
};

}  // namespace

Json asked_inputs(Call const &call, Words words, Holdings const &holdings) {
  Line line;
  line.raw("{");
  write_inputs(line, call, words, address_itself);
  line.raw("}");
  auto inputs = Json::parse(line.text())["in"];
  for (Argument const &argument : call.arguments) {
    auto const found = inputs.find(argument.name);
    if (found != inputs.end() && is_pointer(*found) && crosses_as_pointer(argument)) {
      auto const number = holdings.number_of((*found)["at"].get<std::uint64_t>());
      (*found)["at"] = number ? Json(*number) : Json(unknown);
    }
  }
  return inputs;
}

bool are_same(Call const &call, Json const &recorded, Json const &asked, Holdings const &holdings,
              Names const &names) {
  return differences(call, recorded, asked, holdings, names).empty();
}

std::vector<std::string> differences(Call const &call, Json const &recorded, Json const &asked,
                                     Holdings const &holdings, Names const &names) {
  Differing differing(names);
  for (Argument const &argument : call.arguments) {
    auto const before = member_of(recorded, argument.name);
    auto const now = member_of(asked, argument.name);
    std::string const where(argument.name);
    if (is_output(argument)) {
      if (recorded.contains(argument.name) != asked.contains(argument.name)) {
        differing.lines.push_back(where + (asked.contains(argument.name)
                                               ? ": a place for it was recorded, and none asked"
                                               : ": no place for it was recorded, and one asked"));
      }
    } else if (crosses_as_pointer(argument) && is_pointer(before) && is_pointer(now)) {
      if (!is_same_pointer(argument, before, now, holdings)) {
        differing.tell(where, before, now);
      }
    } else {
      differing.compare(where, before, now);
    }
  }
  return differing.lines;
}

std::string without_pointers(Json const &inputs) {
  auto alike = inputs;
  for (auto &value : alike) {
    if (is_pointer(value)) {
      value["at"] = 0;
    }
  }
  return alike.dump(-1, ' ', false, Json::error_handler_t::replace);
}

std::string shown(Call const &call, Json const &inputs) {
  std::string text(call.name);
  char const *before = "(";
  for (Argument const &argument : call.arguments) {
    if (!is_output(argument)) {
      auto const value = member_of(inputs, argument.name);
      bool const is_function = argument.passing == Passing::function && !value.is_null();
      text += before + std::string(argument.name) + '=';
      text += is_function ? "a function" : value_shown(value);
      before = ", ";
    }
  }
  return text + (*before == '(' ? "()" : ")");
}

}  // namespace recordings
