// Of what changes meanwhile the last is put.
#include "daemon/devices/saved_links.h"

#include <chrono>
#include <exception>
#include <utility>

#include "storage/running/frames.h"

namespace simhost::daemon {
namespace {

// Of somebody who writes to the state, and of a disk that is full.
constexpr auto kUntilFree = std::chrono::milliseconds(10);
constexpr auto kUntilRoom = std::chrono::milliseconds(500);

}  // namespace

SavedLinks::SavedLinks(events::Loop &loop, storage::Store &store, NetworkDevices const &devices,
                       HeardAt heard_at, std::function<void()> saved)
    : loop_(loop),
      store_(store),
      devices_(devices),
      heard_at_(std::move(heard_at)),
      saved_(std::move(saved)) {}

std::optional<std::string> SavedLinks::follow() {
  bool differ = false;
  {
    storage::ReadingTransaction transaction(store_);
    differ = links_differ(transaction, devices_, heard_at_);
  }
  next_.end();
  try {
    if (differ && !save()) {
      save_later(kUntilFree);
    }
  } catch (std::exception const &error) {
    save_later(kUntilRoom);
    return error.what();
  }
  return std::nullopt;
}

bool SavedLinks::save() {
  return storage::commit_if_free(store_, [this](storage::ChangingTransaction &transaction) {
    put_links(transaction, devices_, heard_at_);
    storage::advance_frames_change(transaction);
  });
}

// From a timer, so that nothing is thrown.
void SavedLinks::save_later(events::Clock::duration wait) {
  next_ = loop_.after(wait, [this] {
    try {
      if (!save()) {
        save_later(kUntilFree);
        return;
      }
    } catch (std::exception const &) {
      // Whoever follows them next is told why.
    }
    saved_();
  });
}

}  // namespace simhost::daemon
