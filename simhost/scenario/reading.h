// Reading values of a document, with what the host refuses told by the path of the key.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "base/outcomes.h"
#include "scenario/document.h"
#include "scenario/forms.h"
#include "scenario/keys.h"
#include "scenario/texts.h"

namespace simhost::scenario {

/// Makes of the object what a document says of its members. The document may also have what a
/// description adds.
template <typename Object>
Object read_object(std::span<Member const> members, Node const &node, Object object) {
  auto keys = names_of(members);
  keys.push_back(kObserved);
  node.only(keys);
  read_members(members, node, &object);
  return object;
}

/// Does `work`; what the host refuses is told with the path of `node`.
template <typename Work>
auto do_at(Node const &node, Work const &work) {
  try {
    return work();
  } catch (Refused const &refused) {
    node.fail("the host refuses it: " + refusal_text(refused));
  }
}

template <typename Each>
void for_each_in(Node const &node, std::string_view key, Each const &each) {
  if (auto const list = node.find(key)) {
    for (auto const &item : list->items()) {
      do_at(item, [&] { each(item); });
    }
  }
}

template <typename Each>
void for_each_member(Node const &object, Each const &each) {
  for (auto const &member : object.members()) {
    do_at(member.value, [&] { each(member.key, member.value); });
  }
}

template <typename Use>
void if_there(Node const &node, std::string_view key, Use const &use) {
  if (auto const found = node.find(key)) {
    do_at(*found, [&] { use(*found); });
  }
}

}  // namespace simhost::scenario
