// Recording what is allocated, and catching what is released wrongly.
#include "abi/ledger.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdio>
#include <iterator>
#include <map>
#include <string>
#include <string_view>
#include <utility>

#include "abi/handles.h"
#include "base/outcomes.h"

namespace simhost {
namespace {

constexpr std::size_t kRememberedReturns = 1024;

}  // namespace

void *Ledger::allocate(std::size_t size, char const *call) {
  auto memory = std::make_unique<std::byte[]>(size);
  auto *const address = memory.get();
  blocks_.push_back(
      {.address = address, .memory = std::move(memory), .size = size, .giver = call, .taker = ""});
  by_address_.emplace(address, std::prev(blocks_.end()));
  return address;
}

void Ledger::release(void *memory, char const *call) {
  if (memory == nullptr) {
    return;
  }
  auto const found = by_address_.find(memory);
  if (found == by_address_.end() || !found->second->memory) {
    refuse(memory);
  }
  auto const block = found->second;
  returns_.push_back({memory, block->giver, call});
  if (returns_.size() > kRememberedReturns) {
    returns_.pop_front();
  }
  by_address_.erase(found);
  blocks_.erase(block);
}

void Ledger::note(void const *address, std::size_t size, char const *call, char const *taker) {
  blocks_.push_back(
      {.address = address, .memory = nullptr, .size = size, .giver = call, .taker = taker});
  by_address_.emplace(address, std::prev(blocks_.end()));
}

void Ledger::resize(void const *address, std::size_t size) {
  by_address_.at(address)->size = size;
}

void Ledger::forget(void const *address) {
  auto const found = by_address_.find(address);
  blocks_.erase(found->second);
  by_address_.erase(found);
}

void Ledger::refuse(void const *memory) const {
  if (auto const found = by_address_.find(memory); found != by_address_.end()) {
    throw Trapped(TrapKind::runtime_error, std::string(found->second->giver) +
                                               " gave out what is at " + text_of_address(memory) +
                                               ", and " + found->second->taker + " takes it back");
  }
  auto const last = std::find_if(returns_.rbegin(), returns_.rend(),
                                 [&](Return const &past) { return past.address == memory; });
  if (last == returns_.rend()) {
    throw Trapped(TrapKind::runtime_error,
                  "the host never gave out the memory at " + text_of_address(memory));
  }
  throw Trapped(TrapKind::runtime_error, "the memory at " + text_of_address(memory) +
                                             " is given back twice: " + last->giver +
                                             " gave it out, " + last->taker + " took it back");
}

std::size_t Ledger::report(std::span<char> text) const noexcept {
  std::size_t length = 0;
  for (auto const &block : blocks_) {
    auto const room = text.subspan(std::min(length, text.size()));
    length +=
        static_cast<std::size_t>(std::snprintf(room.data(), room.size(), "%p %zu bytes from %s\n",
                                               block.address, block.size, block.giver));
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
