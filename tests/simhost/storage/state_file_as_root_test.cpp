// What the host makes of files of other users and of a read-only medium, which only root can make.
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
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

  template <typename Work>
  static bool true_in_a_child(Work const &work) {
    auto const child = fork();
    if (child == 0) {
      _exit(work() ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
  }

  /// Whether `work` comes true in a child that is another user.
  template <typename Work>
  static bool true_for_somebody(Work const &work) {
    return true_in_a_child(
        [&] { return setegid(kSomebody) == 0 && seteuid(kSomebody) == 0 && work(); });
  }

  /// Whether `work` comes true in a child for which a folder is a medium that, once `fill` has put
  /// on it what there is, can only be read.
  template <typename Fill, typename Work>
  static bool true_on_a_read_only_medium(TemporaryFolder const &folder, Fill const &fill,
                                         Work const &work) {
    auto const path = folder.file("").string();
    return true_in_a_child([&] {
      if (unshare(CLONE_NEWNS) != 0 || mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) ||
          mount("medium", path.c_str(), "tmpfs", 0, nullptr) != 0) {
        return false;
      }
      fill();
      return mount(nullptr, path.c_str(), nullptr, MS_REMOUNT | MS_RDONLY, nullptr) == 0 && work();
    });
  }
};

/// Whether a state has the switch of made() and refuses another as one that cannot be written.
bool may_only_be_looked_at(std::filesystem::path const &file) {
  Store store(file, populate_nothing);
  try {
    add(store, "b");
    return false;
  } catch (simhost::storage::StateFailure const &failure) {
    return failure.kind() == simhost::storage::FailureKind::read_only &&
           failure.what() == "the state file " + file.string() + " cannot be written" &&
           has(store, "a");
  }
}

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
  EXPECT_TRUE(true_for_somebody([&] { return may_only_be_looked_at(file); }));
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

TEST_F(StateFileAsRoot, OnAReadOnlyMediumMayBeLookedAtAndNotChanged) {
  TemporaryFolder const folder;
  EXPECT_TRUE(true_on_a_read_only_medium(
      folder, [&] { made(folder); },
      [&] { return may_only_be_looked_at(folder.file("host.db")); }));
}

TEST_F(StateFileAsRoot, OnAReadOnlyMediumIsRefusedWithTheChangesOfAKilledProcessBesideIt) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  EXPECT_TRUE(true_on_a_read_only_medium(
      folder,
      [&] {
        made(folder);
        write_file(folder.file("host.db-wal"), "");
      },
      [&] {
        return refusal_of(file) ==
               refused(file,
                       "host.db-wal beside it holds changes, and this program may only look at the "
                       "state");
      }));
}

TEST_F(StateFileAsRoot, OnAReadOnlyMediumIsNotMade) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  EXPECT_TRUE(true_on_a_read_only_medium(
      folder, [] {}, [&] { return refusal_of(file) == refused(file, "Read-only file system"); }));
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
