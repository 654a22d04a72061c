#include "planes/openvswitch/openflow/change.h"

#include <array>
#include <string_view>

#include "planes/openvswitch/openflow/text.h"

namespace simhost::openflow {
namespace {

template <std::size_t Size, typename Command>
std::string named(std::array<std::string_view, Size> const &names, Command command,
                  std::string const &what) {
  return std::string(names.at(static_cast<std::size_t>(command))) + ' ' + what;
}

struct ChangeText {
  std::string operator()(FlowChange const &change) const {
    constexpr std::array<std::string_view, 5> kNames{"add flow", "modify flows", "modify flow",
                                                     "remove flows", "remove flow"};
    return named(kNames, change.command, to_text(change.flow));
  }
  std::string operator()(GroupChange const &change) const {
    constexpr std::array<std::string_view, 3> kNames{"add group", "modify group", "remove group"};
    return named(kNames, change.command, to_text(change.group));
  }
};

}  // namespace

std::string to_text(Change const &change) {
  return std::visit(ChangeText{}, change);
}

}  // namespace simhost::openflow
