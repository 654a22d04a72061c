// Host settings in SQL.
#include "model/options/host_settings.h"

#include "base/outcomes.h"
#include "storage/store.h"
#include "vswitch/mac_learning.h"

namespace simhost {
namespace {

constexpr std::string_view kAgingTime = "macLearning.agingTime";
constexpr std::string_view kMacLimit = "macLearning.macLimit";
constexpr std::string_view kLearnStatic = "macLearning.learnStatic";

template <typename Value>
void set_host_value(storage::Transaction &transaction, std::string_view name, Value const &value) {
  transaction
      .query(
          "INSERT INTO host_setting (name, value) VALUES (?, ?)"
          " ON CONFLICT (name) DO UPDATE SET value = excluded.value")
      .with(name)
      .with(value)
      .run();
}

template <typename Read>
auto host_value(storage::Transaction &transaction, std::string_view name, Read const &read) {
  auto select = transaction.query("SELECT value FROM host_setting WHERE name = ?");
  return select.with(name).next() ? std::optional(read(select)) : std::nullopt;
}

}  // namespace

std::optional<std::int64_t> host_number(storage::Transaction &transaction, std::string_view name) {
  return host_value(transaction, name, [](storage::Query const &row) { return row.integer(0); });
}

std::optional<std::string> host_text(storage::Transaction &transaction, std::string_view name) {
  return host_value(transaction, name, [](storage::Query const &row) { return row.text(0); });
}

void set_host_number(storage::Transaction &transaction, std::string_view name, std::int64_t value) {
  set_host_value(transaction, name, value);
}

void set_host_text(storage::Transaction &transaction, std::string_view name,
                   std::string_view value) {
  set_host_value(transaction, name, value);
}

void forget_host_settings(storage::Transaction &transaction) {
  transaction.query("DELETE FROM host_setting").run();
}

VSMACLearningGlobalProps global_mac_learning(storage::Transaction &transaction) {
  auto const number = [&](std::string_view name, std::int64_t otherwise) {
    return host_number(transaction, name).value_or(otherwise);
  };
  VSMACLearningGlobalProps props{};
  props.agingTime = static_cast<qex_uint32>(number(kAgingTime, VS_MAC_LEARNING_AGING_TIME_DEFAULT));
  props.macLimit =
      static_cast<qex_uint32>(number(kMacLimit, VS_MAC_LEARNING_LIMIT_ENTRIES_DEFAULT));
  props.learnStatic =
      static_cast<qex_Bool>(number(kLearnStatic, VS_MAC_LEARNING_LEARN_STATIC_DEFAULT) != 0);
  return props;
}

void set_global_mac_learning(storage::Transaction &transaction,
                             VSMACLearningGlobalProps const &props) {
  if (props.agingTime == 0 || props.agingTime > VS_MAC_LEARNING_AGING_TIME_MAX) {
    throw Refused(QEX_BAD_PARAM);
  }
  set_host_number(transaction, kAgingTime, props.agingTime);
  set_host_number(transaction, kMacLimit, props.macLimit);
  set_host_number(transaction, kLearnStatic, props.learnStatic != 0 ? 1 : 0);
}

}  // namespace simhost
