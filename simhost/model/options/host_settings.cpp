// The global MAC learning: its names, defaults and bounds.
#include "model/options/host_settings.h"

#include "base/outcomes.h"
#include "storage/running/host_settings.h"
#include "vswitch/mac_learning.h"

namespace simhost {
namespace {

constexpr std::string_view kAgingTime = "macLearning.agingTime";
constexpr std::string_view kMacLimit = "macLearning.macLimit";
constexpr std::string_view kLearnStatic = "macLearning.learnStatic";

}  // namespace

VSMACLearningGlobalProps global_mac_learning(storage::Transaction &transaction) {
  auto const number = [&](std::string_view name, std::int64_t otherwise) {
    return storage::find_host_number(transaction, name).value_or(otherwise);
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
  storage::put_host_number(transaction, kAgingTime, props.agingTime);
  storage::put_host_number(transaction, kMacLimit, props.macLimit);
  storage::put_host_number(transaction, kLearnStatic, props.learnStatic != 0 ? 1 : 0);
}

}  // namespace simhost
