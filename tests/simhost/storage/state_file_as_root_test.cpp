// What the host makes of files of other users, which only root can make.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <string>

#include "state_files.h"
#include "storage/state_file.h"
#include "storage/store.h"
#include "temporary_folder.h"

namespace {

using simhost::storage::Store;

constexpr uid_t kSomebody = 12345;

std::string of_somebody(uid_t us) {
  return "belongs to the user 12345, and this program runs as the user " + std::to_string(us) +
         ": all programs on one state run as one user";
}

struct StateFileAsRoot : testing::Test {
  static void give_away(std::filesystem::path const &file) {
    ASSERT_EQ(lchown(file.c_str(), kSomebody, kSomebody), 0);
  }

  /// Whether `work` comes true in a child that is another user.
  template <typename Work>
  static bool true_for_somebody(Work const &work) {
    auto const child = fork();
    if (child == 0) {
      _exit(setegid(kSomebody) == 0 && seteuid(kSomebody) == 0 && work() ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
  }
};

TEST_F(StateFileAsRoot, OfAnotherUserIsRefused) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  give_away(file);
  EXPECT_EQ(refusal_of(file), refused(file, "it " + of_somebody(0)));
  EXPECT_FALSE(std::filesystem::exists(folder.file("host.db-shm")));
}

TEST_F(StateFileAsRoot, OfAnotherUserIsRefusedThroughALinkToo) {
  TemporaryFolder const folder;
  give_away(made(folder));
  std::filesystem::create_symlink("host.db", folder.file("link"));
  EXPECT_EQ(refusal_of(folder.file("link")), refused(folder.file("link"), "it " + of_somebody(0)));
}

TEST_F(StateFileAsRoot, IsNotFoundByALinkOfAnotherUser) {
  TemporaryFolder const folder;
  made(folder);
  std::filesystem::create_symlink("host.db", folder.file("link"));
  give_away(folder.file("link"));
  EXPECT_EQ(refusal_of(folder.file("link")),
            refused(folder.file("link"), "it is a symbolic link that " + of_somebody(0)));
}

TEST_F(StateFileAsRoot, WithAFileOfAnotherUserBesideItIsRefused) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  for (auto const *name : {"host.db-wal", "host.db-shm", "host.db-journal"}) {
    write_file(folder.file(name), "");
    give_away(folder.file(name));
    EXPECT_EQ(refusal_of(file), refused(file, std::string(name) + " beside it " + of_somebody(0)));
    std::filesystem::remove(folder.file(name));
  }
}

TEST_F(StateFileAsRoot, OfRootMayBeLookedAtAndNotChanged) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  std::filesystem::permissions(file.parent_path(), std::filesystem::perms::all);
  std::filesystem::permissions(file, std::filesystem::perms(0666));
  EXPECT_TRUE(true_for_somebody([&] {
    Store store(file, populate_nothing);
    try {
      add(store, "b");
      return false;
    } catch (simhost::storage::StateFailure const &failure) {
      return failure.kind() == simhost::storage::FailureKind::read_only &&
             failure.what() == "the state file " + file.string() + " cannot be written" &&
             has(store, "a");
    }
  }));
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(file.parent_path()), {}), 1)
      << "who looks leaves nothing beside it";
}

TEST_F(StateFileAsRoot, OfRootIsNotLookedAtWhileItIsInUse) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  std::filesystem::permissions(file.parent_path(), std::filesystem::perms::all);
  std::filesystem::permissions(file, std::filesystem::perms(0666));
  Store const user(file, populate_nothing);
  EXPECT_TRUE(true_for_somebody([&] {
    return refusal_of(file) == refused(file,
                                       "host.db-wal beside it holds changes, and this program may "
                                       "only look at the state");
  }));
}

TEST_F(StateFileAsRoot, InAFolderThatCannotBeWrittenMayBeLookedAt) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  give_away(file);
  std::filesystem::permissions(file.parent_path(), std::filesystem::perms(0755));
  EXPECT_TRUE(true_for_somebody([&] {
    Store store(file, populate_nothing);
    return has(store, "a");
  }));
}

TEST_F(StateFileAsRoot, ThatIsOnlyLookedAtIsToBeOpenedAgainWhenItChanges) {
  TemporaryFolder const folder;
  auto const file = made(folder);
  give_away(file);
  std::filesystem::permissions(file.parent_path(), std::filesystem::perms(0755));
  EXPECT_TRUE(true_for_somebody([&] {
    Store const store(file, populate_nothing);
    bool const before = store.is_current();
    std::filesystem::last_write_time(file, std::filesystem::file_time_type::clock::now());
    return before && !store.is_current();
  }));
}

}  // namespace
