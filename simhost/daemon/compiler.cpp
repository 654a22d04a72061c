#include "daemon/compiler.h"

#include <utility>

namespace simhost::daemon {

CompiledSwitch const &Compiler::compile(storage::SwitchKey key, openvswitch::Network network) {
  auto const found = kept_.find(key);
  if (found != kept_.end() && found->second.made.network == network) {
    found->second.is_asked_for = true;
    return found->second.made;
  }
  auto flows = std::make_shared<openvswitch::Compiled const>(openvswitch::compile(network));
  auto &kept = kept_[key];
  replaced_.push_back(std::move(kept.made.flows));
  kept = {.made = {.network = std::move(network), .flows = std::move(flows)}};
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
