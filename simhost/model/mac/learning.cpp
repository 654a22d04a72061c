// What holds of two settings.
#include "model/mac/learning.h"

#include "model/mac/properties.h"
#include "model/options/host_settings.h"
#include "model/properties/properties.h"

namespace simhost::mac {

VSMACLearning learning_of(storage::Transaction &transaction, storage::SwitchKey key) {
  auto const owner = storage::PropertyOwner::global(key);
  if (auto const own = find_value(transaction, learning, owner)) {
    return *own;
  }
  auto const global = global_mac_learning(transaction);
  VSMACLearning made{};
  made.agingTime = global.agingTime;
  made.learnStatic = global.learnStatic != 0 ? 1 : 0;
  made.macLimit = global.macLimit;
  return made;
}

}  // namespace simhost::mac
