// The global MAC learning: each member is a number under a name of its own.
#include "model/options/host_settings.h"

#include <string_view>

#include "base/outcomes.h"
#include "storage/running/host_settings.h"
#include "storage/store.h"

namespace simhost {
namespace {

// In the order of the members.
constexpr std::array<std::string_view, kGlobalLearningMembers.size()> kNames{
    "macLearning.agingTime", "macLearning.macLimit", "macLearning.learnStatic"};

}  // namespace

VSMACLearningGlobalProps global_mac_learning(storage::Transaction &transaction) {
  auto props = kGlobalLearning;
  for (std::size_t at = 0; at < kNames.size(); ++at) {
    auto const &form = kGlobalLearningMembers[at].form;
    if (auto const number =
            storage::find_host_number(transaction, kNames[at], form.least, form.greatest)) {
      form.store(&props, *number);
    }
  }
  return props;
}

void set_global_mac_learning(storage::ChangingTransaction &transaction,
                             VSMACLearningGlobalProps const &given) {
  auto props = given;
  props.learnStatic = given.learnStatic != 0 ? 1 : 0;
  for (std::size_t at = 0; at < kNames.size(); ++at) {
    auto const &form = kGlobalLearningMembers[at].form;
    auto const number = form.load(&props);
    if (number < form.least || number > form.greatest) {
      throw Refused(QEX_BAD_PARAM);
    }
    storage::put_host_number(transaction, kNames[at], number);
  }
}

}  // namespace simhost
