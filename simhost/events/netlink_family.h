// What parts the kernel has beside those that everybody has, modules of it or not.
#pragma once

#include <string_view>

namespace simhost::events {

/// Whether it has a family of generic netlink; a module that has it is loaded if there is one.
/// Throws std::system_error or std::runtime_error.
bool has_netlink_family(std::string_view name);

}  // namespace simhost::events
