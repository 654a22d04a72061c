// The table of the options, and the packed list in which they travel.
#include "model/options/runtime_options.h"

#include <arpa/inet.h>

#include <array>
#include <cstring>

#include "base/outcomes.h"
#include "storage/running/host_settings.h"
#include "storage/store.h"

namespace simhost {
namespace {

template <int kFamily>
bool is_address_of(std::string const &text) {
  std::array<std::byte, sizeof(in6_addr)> address{};
  return inet_pton(kFamily, text.c_str(), address.data()) == 1;
}

// Seconds and milliseconds as their names say; a switch is 0 or 1.
constexpr std::array<RuntimeOption, VS_NUM_RT_OPT> kOptions{{
    {.name = "IGMPQueryInterval", .initial = 125, .least = 1, .greatest = 31744},  // seconds
    {.name = "IGMPV3MaxSrcIPNum", .initial = 10, .least = 0, .greatest = 32},
    {.name = "IGMPQueries", .initial = 2, .least = 1, .greatest = 10},
    {.name = "IGMPVersion", .initial = 3, .least = 1, .greatest = 3},
    {.name = "MLDVersion", .initial = 2, .least = 1, .greatest = 2},
    {.name = "MLDV2MaxSrcIPNum", .initial = 10, .least = 0, .greatest = 32},
    {.name = "MaxRARPsPerInterval", .initial = 128, .least = 0, .greatest = 65535},
    {.name = "RARPAdvertisementDuration", .initial = 60, .least = 0, .greatest = 86400},  // seconds
    {.name = "ReversePathFwdCheck", .initial = 1, .least = 0, .greatest = 1},
    {.name = "ReversePathFwdCheckPromisc", .initial = 0, .least = 0, .greatest = 1},
    {.name = "AllowFastPath", .initial = 1, .least = 0, .greatest = 1},
    {.name = "TeamPolicyUpDelay", .initial = 0, .least = 0, .greatest = 3600000},  // milliseconds
    {.name = "AllowMirrorStats", .initial = 1, .least = 0, .greatest = 1},
    {.name = "IGMPRouterIP", .initial = "0.0.0.0", .is_address = is_address_of<AF_INET>},
    {.name = "MLDRouterIP", .initial = "::", .is_address = is_address_of<AF_INET6>},
}};

RuntimeOption const &get_option(unsigned type) {
  if (type >= kOptions.size()) {
    throw Refused(QEX_NOT_SUPPORTED);
  }
  return kOptions[type];
}

void check_number(RuntimeOption const &option, std::int32_t number) {
  if (number < option.least || number > option.greatest) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void check_address(RuntimeOption const &option, std::string const &text) {
  if (!option.is_address(text)) {
    throw Refused(QEX_INVALID_ADDRESS);
  }
}

[[noreturn]] void refuse_list() {
  throw Refused(QEX_BAD_PARAM);
}

// Takes the first `size` bytes off what is left of a list.
std::span<std::byte const> take(std::span<std::byte const> &rest, std::size_t size) {
  if (size > rest.size()) {
    refuse_list();
  }
  auto const taken = rest.first(size);
  rest = rest.subspan(size);
  return taken;
}

RuntimeValue value_in(unsigned type, std::span<std::byte const> data) {
  if (get_option(type).is_number()) {
    std::int32_t number = 0;
    if (data.size() != sizeof number) {
      refuse_list();
    }
    std::memcpy(&number, data.data(), sizeof number);
    return number;
  }
  // All of it must be one text with its NUL.
  auto const *const text = reinterpret_cast<char const *>(data.data());
  if (data.empty() || data.size() > VS_CHARDEV_MAX_RUNTIME_STRING_OPTION_LENGTH ||
      strnlen(text, data.size()) != data.size() - 1) {
    refuse_list();
  }
  return std::string(text);
}

void append(std::vector<std::byte> &list, void const *bytes, std::size_t size) {
  auto const *const first = static_cast<std::byte const *>(bytes);
  list.insert(list.end(), first, first + size);
}

void append_option(std::vector<std::byte> &list, std::uint16_t type, RuntimeValue const &value) {
  auto const *const number = std::get_if<std::int32_t>(&value);
  auto const *const text = std::get_if<std::string>(&value);
  auto const size = number != nullptr ? sizeof *number : text->size() + 1;
  VSRuntimeOptionHeader header{};
  header.type = type;
  header.length = static_cast<qex_uint16>(sizeof header + size);
  append(list, &header, sizeof header);
  append(list, number != nullptr ? static_cast<void const *>(number) : text->c_str(), size);
}

}  // namespace

std::span<RuntimeOption const, VS_NUM_RT_OPT> runtime_options() {
  return kOptions;
}

RuntimeValue runtime_option(storage::Transaction &transaction, unsigned type) {
  auto const &option = get_option(type);
  if (option.is_number()) {
    return static_cast<std::int32_t>(
        storage::find_host_number(transaction, option.name, option.least, option.greatest)
            .value_or(std::get<std::int32_t>(option.initial)));
  }
  return storage::find_host_text(transaction, option.name, option.is_address)
      .value_or(std::string(std::get<std::string_view>(option.initial)));
}

std::int32_t runtime_number(storage::Transaction &transaction, VSRuntimeOptionType type) {
  return std::get<std::int32_t>(runtime_option(transaction, type));
}

void set_runtime_option(storage::ChangingTransaction &transaction, unsigned type,
                        RuntimeValue const &value) {
  auto const &option = get_option(type);
  if (value.index() != option.initial.index()) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (auto const *const number = std::get_if<std::int32_t>(&value)) {
    check_number(option, *number);
    storage::put_host_number(transaction, option.name, *number);
  } else {
    check_address(option, std::get<std::string>(value));
    storage::put_host_text(transaction, option.name, std::get<std::string>(value));
  }
}

void set_runtime_options(storage::ChangingTransaction &transaction,
                         VSRuntimeOptions const &options) {
  auto const total = options.totalLength;
  if (total < sizeof options || total > VS_CHARDEV_MAX_RUNTIME_OPTIONS_LENGTH) {
    refuse_list();
  }
  std::span rest(reinterpret_cast<std::byte const *>(&options + 1), total - sizeof options);
  while (!rest.empty()) {
    VSRuntimeOptionHeader header;
    std::memcpy(&header, take(rest, sizeof header).data(), sizeof header);
    if (header.length < sizeof header) {
      refuse_list();
    }
    auto const data = take(rest, header.length - sizeof header);
    set_runtime_option(transaction, header.type, value_in(header.type, data));
  }
}

std::vector<std::byte> packed_runtime_options(storage::Transaction &transaction,
                                              std::span<std::uint16_t const> types) {
  VSRuntimeOptions head{};
  std::vector<std::byte> list(sizeof head);
  for (auto const type : types) {
    append_option(list, type, runtime_option(transaction, type));
    if (list.size() > VS_CHARDEV_MAX_RUNTIME_OPTIONS_LENGTH) {
      throw Refused(QEX_LIMIT_EXCEEDED);
    }
  }
  head.totalLength = static_cast<qex_uint32>(list.size());
  std::memcpy(list.data(), &head, sizeof head);
  return list;
}

}  // namespace simhost
