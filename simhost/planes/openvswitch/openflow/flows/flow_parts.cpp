// Parts are the same if they are one, whatever is in them.
#include "planes/openvswitch/openflow/flows/flow_parts.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace simhost::openflow {

FlowParts::FlowParts(std::vector<Flow> flows) {
  add(std::make_shared<std::vector<Flow> const>(std::move(flows)));
}

std::size_t FlowParts::size() const {
  std::size_t count = 0;
  for (auto const &part : parts_) {
    count += part->size();
  }
  return count;
}

std::vector<Flow const *> FlowParts::beside(FlowParts const &other) const {
  std::vector<std::vector<Flow> const *> known;
  known.reserve(other.parts_.size());
  std::ranges::transform(other.parts_, std::back_inserter(known), &FlowPart::get);
  std::ranges::sort(known);
  std::vector<Flow const *> flows;
  for (auto const &part : parts_) {
    if (!std::ranges::binary_search(known, part.get())) {
      std::ranges::transform(*part, std::back_inserter(flows),
                             [](Flow const &flow) { return &flow; });
    }
  }
  std::ranges::sort(flows, [](Flow const *one, Flow const *two) { return *one < *two; });
  return flows;
}

std::vector<Flow> in_order(FlowParts const &flows) {
  std::vector<Flow> all(flows.begin(), flows.end());
  std::ranges::sort(all);
  return all;
}

}  // namespace simhost::openflow
