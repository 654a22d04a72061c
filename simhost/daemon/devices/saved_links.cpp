// Of what changes meanwhile the last is put.
#include "daemon/devices/saved_links.h"

#include <chrono>
#include <exception>
#include <utility>

#include "storage/running/frames.h"

namespace simhost::daemon {

SavedLinks::SavedLinks(events::Loop &loop, storage::Store &store, NetworkDevices const &devices,
                       HeardAt heard_at, std::function<void()> saved)
    : loop_(loop),
      store_(store),
      devices_(devices),
      heard_at_(std::move(heard_at)),
      saved_(std::move(saved)) {}

void SavedLinks::follow() {
  bool differ = false;
  {
    storage::ReadingTransaction transaction(store_);
    differ = links_differ(transaction, devices_, heard_at_);
  }
  next_.end();
  if (differ && !save()) {
    save_later();
  }
}

bool SavedLinks::save() {
  return storage::commit_if_free(store_, [this](storage::ChangingTransaction &transaction) {
    put_links(transaction, devices_, heard_at_);
    storage::advance_frames_change(transaction);
  });
}

// From a timer, so that nothing is thrown.
void SavedLinks::save_later() {
  constexpr auto kUntilFree = std::chrono::milliseconds(10);
  next_ = loop_.after(kUntilFree, [this] {
    try {
      if (!save()) {
        save_later();
        return;
      }
    } catch (std::exception const &) {
      // Whoever looks at the state says what is wrong with it.
    }
    saved_();
  });
}

}  // namespace simhost::daemon
