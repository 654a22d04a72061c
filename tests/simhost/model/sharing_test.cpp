// What becomes of a change that others are told of while the state does not take it.
#include "model/sharing.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <optional>

#include "largest_file.h"
#include "memory_state.h"
#include "model/plane.h"
#include "model/switches/switches.h"
#include "planes/stored/stored_plane.h"
#include "storage/store.h"
#include "storage/switches.h"
#include "temporary_folder.h"

namespace {

using simhost::storage::ChangingTransaction;
using simhost::storage::StateFailure;
using simhost::storage::Store;
using simhost::storage::SwitchName;

// Others, after whom the disk is full.
class Others : public simhost::Sharing {
 public:
  Others(std::filesystem::path state, bool are_told)
      : state_(std::move(state)), are_told_(are_told) {}

  bool prepare(ChangingTransaction &) override {
    full_.emplace(bytes_of_log(state_));
    return are_told_;
  }

 private:
  std::filesystem::path state_;
  bool are_told_;
  std::optional<LargestFile> full_;
};

struct FullDisk : testing::Test {
  FullDisk() { simhost::run_on(simhost::stored::plane()); }
  ~FullDisk() override { simhost::share_through(nullptr); }
  FullDisk(FullDisk const &) = delete;
  FullDisk &operator=(FullDisk const &) = delete;

  void change_with(bool others_are_told) {
    Others others(file, others_are_told);
    simhost::share_through(&others);
    ChangingTransaction transaction(store);
    simhost::create_switch(transaction, {.alias = "s"});
    simhost::commit(transaction);
  }
  bool is_made() {
    simhost::storage::ReadingTransaction transaction(store);
    return simhost::storage::find_switch(transaction, SwitchName::alias, "s").has_value();
  }

  TemporaryFolder folder;
  std::filesystem::path file = folder.file("host.db");
  Store store{file, MemoryState::populate};
};

TEST_F(FullDisk, IsNoFailureOfAChangeThatOthersHave) {
  EXPECT_EQ(status_of([&] { change_with(true); }), QEX_TIMEOUT);
  EXPECT_FALSE(is_made());
}

TEST_F(FullDisk, FailsAChangeOfWhichNobodyWasTold) {
  EXPECT_THROW(change_with(false), StateFailure);
  EXPECT_FALSE(is_made());
}

}  // namespace
