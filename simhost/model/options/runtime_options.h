// The runtime options of the host: fifteen settings, numbers and addresses.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "base/api.h"
#include "vswitch/runtime_options.h"

namespace simhost::storage {
class ChangingTransaction;
class Transaction;
}  // namespace simhost::storage

namespace simhost {

/// A number, or a text for VS_RT_OPT_IGMP_ROUTER_IP and the options after it.
using RuntimeValue = std::variant<std::int32_t, std::string>;

/// What an option is called, what it is on a fresh host, and what it may be.
struct RuntimeOption {
  std::string_view name;
  std::variant<std::int32_t, std::string_view> initial;
  std::int32_t least = 0;                                 ///< of a number
  std::int32_t greatest = 0;                              ///< of a number
  bool (*is_address)(std::string const &text) = nullptr;  ///< of a text: whether it is a value

  [[nodiscard]] bool is_number() const { return std::holds_alternative<std::int32_t>(initial); }
};

/// All options, by their types.
std::span<RuntimeOption const, VS_NUM_RT_OPT> runtime_options();

/// The value of an option; refuses a type that no option has (QEX_NOT_SUPPORTED).
RuntimeValue runtime_option(storage::Transaction &transaction, unsigned type);
/// The value of an option that is a number.
SIMHOST_API std::int32_t runtime_number(storage::Transaction &transaction,
                                        VSRuntimeOptionType type);
/// Refuses a type that no option has (QEX_NOT_SUPPORTED), a value of the other kind, a number out
/// of bounds (QEX_BAD_PARAM), and a text that is no address of the option's family
/// (QEX_INVALID_ADDRESS).
void set_runtime_option(storage::ChangingTransaction &transaction, unsigned type,
                        RuntimeValue const &value);

/// Sets the options of a packed list, in its order. Refuses a list that is malformed
/// (QEX_BAD_PARAM) and what set_runtime_option refuses; nothing past the length that the list
/// states is read.
SIMHOST_API void set_runtime_options(storage::ChangingTransaction &transaction,
                                     VSRuntimeOptions const &options);
/// The packed list of the options of those types, its length first. Refuses a type that no option
/// has (QEX_NOT_SUPPORTED) and a list longer than there may be (QEX_LIMIT_EXCEEDED).
SIMHOST_API std::vector<std::byte> packed_runtime_options(storage::Transaction &transaction,
                                                          std::span<std::uint16_t const> types);

}  // namespace simhost
