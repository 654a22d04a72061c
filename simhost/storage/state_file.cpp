// Looking at the file and what is beside it, without links and without opening it.
#include "storage/state_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <optional>
#include <system_error>
#include <utility>

namespace simhost::storage {
namespace {

// What SQLite puts beside a file while processes use it, or after one was killed.
constexpr std::array kCompanions{"-wal", "-shm", "-journal"};
// No database is shorter. SQLite takes a single byte for an empty file, and would write over it.
constexpr off_t kLeastSize = 512;

std::string reason_of(int error) {
  return std::generic_category().message(error);
}

std::filesystem::path beside(std::filesystem::path file, char const *suffix) {
  file += suffix;
  return file;
}

// Of the name itself, not of what a link leads to; nothing if there is none.
std::optional<struct stat> look_at(std::filesystem::path const &file) {
  struct stat found {};
  if (lstat(file.c_str(), &found) == 0) {
    return found;
  }
  if (errno != ENOENT) {
    throw UnusableState(reason_of(errno));
  }
  return std::nullopt;
}

std::string of_user(uid_t user) {
  return "belongs to the user " + std::to_string(user) + ", and this program runs as the user " +
         std::to_string(geteuid()) + ": all programs on one state run as one user";
}

bool is_trusted(uid_t user) {
  return user == geteuid() || user == 0;
}

// The name without links, of which the last may lead elsewhere only if a trusted user made it.
std::filesystem::path located(std::filesystem::path const &name) {
  auto const found = look_at(name);
  if (found && S_ISLNK(found->st_mode) && !is_trusted(found->st_uid)) {
    throw UnusableState("it is a symbolic link that " + of_user(found->st_uid));
  }
  std::error_code error;
  auto location =
      found ? std::filesystem::canonical(name, error)
            : std::filesystem::canonical(name.has_parent_path() ? name.parent_path() : ".", error) /
                  name.filename();
  if (error) {
    throw UnusableState(error.message());
  }
  return location;
}

// Makes the file unless somebody has made it meanwhile.
void make(std::filesystem::path const &location) {
  int const made = open(location.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR);
  if (made >= 0) {
    close(made);
  } else if (errno != EEXIST) {
    throw UnusableState(reason_of(errno));
  }
}

// A descriptor that keeps the file from passing its number on to another, and through which nothing
// can be read or written.
int pinned(std::filesystem::path const &location) {
  constexpr int kOnlyItself = O_PATH | O_NOFOLLOW | O_CLOEXEC;
  int descriptor = open(location.c_str(), kOnlyItself);
  if (descriptor < 0 && errno == ENOENT) {
    make(location);
    descriptor = open(location.c_str(), kOnlyItself);
  }
  if (descriptor < 0) {
    throw UnusableState(reason_of(errno));
  }
  return descriptor;
}

void check_file(struct stat const &file) {
  if (!S_ISREG(file.st_mode)) {
    throw UnusableState("it is no regular file");
  }
  if (!is_trusted(file.st_uid)) {
    throw UnusableState("it " + of_user(file.st_uid));
  }
  if (file.st_size != 0 && file.st_size < kLeastSize) {
    throw UnusableState("file is not a database");
  }
}

bool may_be_written(std::filesystem::path const &location, struct stat const &file) {
  auto const may_write = [](std::filesystem::path const &path) {
    return faccessat(AT_FDCWD, path.c_str(), W_OK, AT_EACCESS) == 0;
  };
  return file.st_uid == geteuid() && may_write(location) && may_write(location.parent_path());
}

// Throws for something beside the file that would keep SQLite from using it as it should.
void check_companions(std::filesystem::path const &location, bool writable) {
  for (auto const *suffix : kCompanions) {
    auto const companion = beside(location, suffix);
    auto const found = look_at(companion);
    if (!found) {
      continue;
    }
    auto const named = companion.filename().string() + " beside it ";
    if (!S_ISREG(found->st_mode)) {
      throw UnusableState(named + "is no regular file");
    }
    if (!writable) {
      throw UnusableState(named + "holds changes, and this program may only look at the state");
    }
    if (found->st_uid != geteuid()) {
      throw UnusableState(named + of_user(found->st_uid));
    }
  }
}

bool is_same(struct stat const &left, struct stat const &right) {
  return left.st_dev == right.st_dev && left.st_ino == right.st_ino;
}

bool is_as_old(struct stat const &left, struct stat const &right) {
  return left.st_mtim.tv_sec == right.st_mtim.tv_sec &&
         left.st_mtim.tv_nsec == right.st_mtim.tv_nsec && left.st_size == right.st_size;
}

std::string failure_text(FailureKind kind, std::string const &file) {
  switch (kind) {
    case FailureKind::busy:
      return "another process keeps the state file " + file + " locked";
    case FailureKind::full:
      return "there is no room for the state file " + file;
    case FailureKind::io:
      return "the state file " + file + " cannot be read or written";
    case FailureKind::memory:
      return "there is no memory left for the state file " + file;
    case FailureKind::read_only:
      return "the state file " + file + " cannot be written";
  }
  return "the state file " + file + " cannot be used";
}

}  // namespace

void refuse_file(std::filesystem::path const &file, std::string const &why) {
  throw UnusableState("the state file " + file.string() + " cannot be used: " + why);
}

StateFailure::StateFailure(FailureKind kind, std::filesystem::path const &file)
    : std::runtime_error(failure_text(kind, file.string())), kind_(kind) {}

struct StateFile::Taken {
  explicit Taken(std::filesystem::path given) : name(std::move(given)) {}
  ~Taken() { drop(); }
  Taken(Taken const &) = delete;
  Taken &operator=(Taken const &) = delete;

  // Finds the file, and looks at it if it is found already.
  void find() {
    if (pin < 0) {
      location = located(name);
      pin = pinned(location);
    } else {
      static_cast<void>(look_in_place());
    }
    if (fstat(pin, &found) != 0) {
      throw UnusableState(reason_of(errno));
    }
    check_file(found);
    writable = may_be_written(location, found);
    check_companions(location, writable);
    usable = true;
  }
  // What is at the place of the file, which is to be the file.
  [[nodiscard]] struct stat look_in_place() const {
    struct stat in_place {};
    if (lstat(location.c_str(), &in_place) != 0) {
      throw UnusableState(errno == ENOENT ? "it was removed after this program had opened it"
                                          : reason_of(errno));
    }
    if (!is_same(in_place, found)) {
      throw UnusableState("another file took its place after this program had opened it");
    }
    return in_place;
  }
  void drop() {
    if (pin >= 0) {
      close(pin);
      pin = -1;
    }
  }

  std::filesystem::path name;
  std::filesystem::path location;
  int pin = -1;
  struct stat found {};
  bool writable = false;
  bool usable = false;
};

StateFile::StateFile(std::filesystem::path name)
    : taken_(std::make_shared<Taken>(std::move(name))) {}

void StateFile::take() {
  try {
    taken_->find();
  } catch (UnusableState const &error) {
    if (!taken_->usable) {
      taken_->drop();
    }
    refuse_file(name(), error.what());
  }
}

void StateFile::require_in_place() const {
  try {
    if (taken_->look_in_place().st_size < kLeastSize) {
      throw UnusableState("it was emptied after this program had opened it");
    }
  } catch (UnusableState const &error) {
    refuse_file(name(), error.what());
  }
}

bool StateFile::is_unchanged() const {
  struct stat found {};
  return fstat(taken_->pin, &found) == 0 && is_as_old(found, taken_->found);
}

std::filesystem::path const &StateFile::name() const {
  return taken_->name;
}

std::filesystem::path const &StateFile::location() const {
  return taken_->location;
}

bool StateFile::is_writable() const {
  return taken_->writable;
}

std::uint64_t StateFile::bytes_on_disk() const {
  // Where blocks are counted late, files of up to this size are believed to be as large as they
  // say.
  constexpr off_t kBelieved = off_t{16} << 20;
  constexpr off_t kBlock = 512;
  off_t bytes = 0;
  for (auto const *suffix : {"", "-wal"}) {
    struct stat found {};
    if (lstat(beside(location(), suffix).c_str(), &found) == 0) {
      bytes += std::max(found.st_blocks * kBlock, std::min(found.st_size, kBelieved));
    }
  }
  return static_cast<std::uint64_t>(bytes);
}

}  // namespace simhost::storage
