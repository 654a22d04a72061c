// Recording what is given out, and catching what comes back wrongly.
#include "core/ledger.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdio>
#include <iterator>
#include <map>
#include <string>
#include <string_view>
#include <utility>

#include "core/giving_up.h"
#include "core/handles.h"

namespace simhost {
namespace {

constexpr std::size_t kRememberedReturns = 1024;

}  // namespace

void *Ledger::give_out(std::size_t size, char const *call) {
  blocks_.push_back({std::make_unique<std::byte[]>(size), size, call});
  auto const block = std::prev(blocks_.end());
  by_address_.emplace(block->memory.get(), block);
  return block->memory.get();
}

void Ledger::take_back(void *memory, char const *call) {
  if (memory == nullptr) {
    return;
  }
  if (auto const found = by_address_.find(memory); found != by_address_.end()) {
    auto const block = found->second;
    returns_.push_back({memory, block->giver, call});
    if (returns_.size() > kRememberedReturns) {
      returns_.pop_front();
    }
    by_address_.erase(found);
    blocks_.erase(block);
    return;
  }
  auto const last = std::find_if(returns_.rbegin(), returns_.rend(),
                                 [&](Return const &past) { return past.address == memory; });
  if (last == returns_.rend()) {
    throw HostPanic(PanicKind::runtime_error,
                    "the host never gave out the memory at " + text_of_address(memory));
  }
  throw HostPanic(PanicKind::runtime_error, "the memory at " + text_of_address(memory) +
                                                " is given back twice: " + last->giver +
                                                " gave it out, " + last->taker + " took it back");
}

std::size_t Ledger::report(std::span<char> text) const noexcept {
  std::size_t length = 0;
  for (auto const &block : blocks_) {
    auto const room = text.subspan(std::min(length, text.size()));
    length += static_cast<std::size_t>(
        std::snprintf(room.data(), room.size(), "%p %zu bytes from %s\n",
                      static_cast<void *>(block.memory.get()), block.size, block.giver));
  }
  if (length == 0 && !text.empty()) {
    text[0] = '\0';
  }
  return length;
}

std::string Ledger::summary() const {
  std::map<std::pair<std::string_view, std::size_t>, std::size_t> counts;
  for (auto const &block : blocks_) {
    ++counts[{block.giver, block.size}];
  }
  std::string lines;
  for (auto const &[what, count] : counts) {
    lines += fmt::format("{} x {} bytes from {}\n", count, what.second, what.first);
  }
  return lines;
}

}  // namespace simhost
