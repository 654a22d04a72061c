#include "daemon/compiler.h"

#include <utility>

namespace simhost::daemon {

CompiledSwitch const &Compiler::compile(storage::SwitchKey key, openvswitch::Network network) {
  auto &kept = kept_[key];
  if (kept.made.flows && kept.made.network == network) {
    kept.is_asked_for = true;
    return kept.made;
  }
  auto flows = std::make_shared<openvswitch::Compiled const>(
      openvswitch::compile(network, kept.made_of_ports));
  replaced_.push_back(std::move(kept.made.flows));
  kept.made = {.network = std::move(network), .flows = std::move(flows)};
  kept.is_asked_for = true;
  return kept.made;
}

void Compiler::begin() {
  for (auto &[key, kept] : kept_) {
    kept.is_asked_for = false;
  }
  has_begun_ = true;
}

void Compiler::forget_others() {
  replaced_.clear();
  if (std::exchange(has_begun_, false)) {
    std::erase_if(kept_, [](auto const &kept) { return !kept.second.is_asked_for; });
  }
}

}  // namespace simhost::daemon
