// From one name of a switch to another.
#include "nebpublic/names.h"

#include <algorithm>
#include <string>

#include "abi/boundary.h"
#include "model/lookup.h"
#include "model/switches/switches.h"

namespace simhost {
namespace {

// Every name that the host accepts fits the field that the caller has for its kind.
void copy_text(std::string const &text, char *output) {
  *std::copy(text.begin(), text.end(), output) = '\0';
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSAliasToSwitchId(char const *alias, char switchId[64]) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const name = require_text(alias);
    auto *const output = &require(switchId);
    copy_text(identifier_of(call.transaction(), name), output);
  });
}

QEX_ReturnStatus DVSPortsetNameToAlias(char const *portsetName, char alias[128]) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const name = require_text(portsetName);
    auto *const output = &require(alias);
    copy_text(alias_of_portset(call.transaction(), name), output);
  });
}

QEX_ReturnStatus DVSAliasToPortsetName(char const *alias, char *portsetBuffer) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const name = require_text(alias);
    auto *const output = &require(portsetBuffer);
    copy_text(portset_of(call.transaction(), name), output);
  });
}

char DVPortExist(char const *switchId, char const *port) {
  return reading_or_trap(__func__, [&](ReadingCall &call) {
    return static_cast<char>(
        switchId != nullptr && port != nullptr &&
        find_port(call.transaction(), storage::SwitchName::identifier, switchId, port).has_value());
  });
}

}  // extern "C"
}  // namespace simhost
