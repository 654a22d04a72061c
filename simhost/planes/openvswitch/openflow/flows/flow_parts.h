// Many flows, in parts that stay what they are: what two lists have in common is not looked into.
#pragma once

#include <cstddef>
#include <iterator>
#include <memory>
#include <vector>

#include "planes/openvswitch/openflow/flow.h"

namespace simhost::openflow {

/// Some flows, which nobody changes; in any order.
using FlowPart = std::shared_ptr<std::vector<Flow> const>;

/// The flows of a switch, no two of which have one place.
class FlowParts {
 public:
  class Iterator {
   public:
    using value_type = Flow;
    using reference = Flow const &;
    using pointer = Flow const *;
    using difference_type = std::ptrdiff_t;
    using iterator_category = std::forward_iterator_tag;

    Iterator() = default;
    Iterator(FlowPart const *part, FlowPart const *end) : part_(part), end_(end) { skip_empty(); }

    reference operator*() const { return (**part_)[at_]; }
    pointer operator->() const { return &**this; }
    Iterator &operator++() {
      if (++at_ == (*part_)->size()) {
        ++part_;
        at_ = 0;
        skip_empty();
      }
      return *this;
    }
    Iterator operator++(int) {
      auto const before = *this;
      ++*this;
      return before;
    }
    bool operator==(Iterator const &) const = default;

   private:
    void skip_empty() {
      while (part_ != end_ && (*part_)->empty()) {
        ++part_;
      }
    }

    FlowPart const *part_ = nullptr;
    FlowPart const *end_ = nullptr;
    std::size_t at_ = 0;
  };

  FlowParts() = default;
  /// All of them as one part.
  FlowParts(std::vector<Flow> flows);

  void add(FlowPart part) { parts_.push_back(std::move(part)); }

  /// Those of one part after those of another.
  [[nodiscard]] Iterator begin() const { return {parts_.data(), end_of_parts()}; }
  [[nodiscard]] Iterator end() const { return {end_of_parts(), end_of_parts()}; }
  [[nodiscard]] std::size_t size() const;

  /// Those of the parts that `other` has not; in the order of flows.
  [[nodiscard]] std::vector<Flow const *> beside(FlowParts const &other) const;

 private:
  [[nodiscard]] FlowPart const *end_of_parts() const { return parts_.data() + parts_.size(); }

  std::vector<FlowPart> parts_;
};

/// All of them, in their order.
std::vector<Flow> in_order(FlowParts const &flows);

}  // namespace simhost::openflow
