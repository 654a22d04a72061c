#include "recordings/player/holdings.h"

#include <algorithm>
#include <cstring>
#include <stdexcept>

namespace recordings {
namespace {

constexpr std::size_t most_released_bytes = std::size_t{64} << 20U;

}  // namespace

std::uint64_t Holdings::address_of(std::uint64_t number) {
  if (auto const given = addresses_.find(number); given != addresses_.end()) {
    return given->second;
  }
  if (auto const own = own_.find(number); own != own_.end()) {
    return own->second;
  }
  // What it is nobody but the host knows: an address of nothing else.
  auto const address = allocate(1);
  remember(number, address, 1);
  return address;
}

std::uint64_t Holdings::give(std::uint64_t number, Bytes const &bytes, bool is_new) {
  auto const given = addresses_.find(number);
  auto address = given == addresses_.end() ? 0 : given->second;
  bool const is_tools = address != 0 && !blocks_.contains(address);
  if (is_tools && held_.at(address).size < bytes.size()) {
    throw Misfit("the tool allocated " + std::to_string(held_.at(address).size) +
                 " bytes, and there are " + std::to_string(bytes.size()) + " for them");
  }
  if (address == 0 || (!is_tools && (is_new || held_.at(address).size != bytes.size()))) {
    address = allocate(bytes.size());
    remember(number, address, bytes.size());
  }
  std::ranges::copy(bytes, reinterpret_cast<char *>(address));
  return address;
}

void Holdings::adopt(std::uint64_t number, std::uint64_t address, std::size_t size) {
  remember(number, address, size);
}

std::optional<std::uint64_t> Holdings::number_of(std::uint64_t address) const {
  auto const found = held_.find(address);
  return found == held_.end() ? std::nullopt : std::optional(found->second.number);
}

void Holdings::release(std::uint64_t address) {
  if (auto const number = forget(address)) {
    functions_.erase(*number);
    retire(address);
  }
}

std::optional<std::uint64_t> Holdings::forget(std::uint64_t address) {
  auto const number = number_of(address);
  if (number) {
    held_.erase(address);
    if (auto const known = addresses_.find(*number);
        known != addresses_.end() && known->second == address) {
      addresses_.erase(known);
    }
  }
  return number;
}

void Holdings::retire(std::uint64_t address) {
  auto const block = blocks_.find(address);
  if (block == blocks_.end()) {
    return;
  }
  released_.push_back(address);
  released_bytes_ += block->second.size;
  while (released_bytes_ > most_released_bytes) {
    auto const oldest = blocks_.find(released_.front());
    released_.pop_front();
    released_bytes_ -= oldest->second.size;
    blocks_.erase(oldest);
  }
}

char const *Holdings::text(std::string const &text) {
  return texts_.insert(text).first->c_str();
}

void Holdings::keep_functions(std::uint64_t list, ListFunctions functions) {
  functions_[list] = functions;
  last_functions_ = functions;
}

ListFunctions Holdings::functions_of(std::uint64_t list) const {
  auto const found = functions_.find(list);
  return found == functions_.end() ? last_functions_ : found->second;
}

std::uint64_t Holdings::allocate(std::size_t size) {
  // Of its exact size, so that whoever watches over memory sees what is read beyond it.
  auto bytes = std::make_unique<char[]>(std::max<std::size_t>(size, 1));
  auto const address = reinterpret_cast<std::uint64_t>(bytes.get());
  blocks_.insert_or_assign(address, Block{std::move(bytes), size});
  return address;
}

void Holdings::remember(std::uint64_t number, std::uint64_t address, std::size_t size) {
  // A tool may have released memory of its own that nobody saw it release, and get it again.
  forget(address);
  addresses_[number] = address;
  held_.emplace(address, Held{number, size});
}

}  // namespace recordings
