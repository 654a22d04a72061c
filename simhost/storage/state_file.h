// The file of a state in the file system: whose it is, whether it may be used, and that it stays.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <string>

namespace simhost::storage {

/// A state file that cannot be used; what() says which file and why.
class UnusableState : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// What keeps work on a state that can be used from being done now.
enum class FailureKind {
  busy,       ///< another process keeps it locked
  full,       ///< there is no room for it
  io,         ///< it cannot be read or written
  memory,     ///< there is no memory left
  read_only,  ///< it cannot be written
};

/// Work on a state failed for something that a caller may wait out or put right; what() says of
/// which file.
class StateFailure : public std::runtime_error {
 public:
  StateFailure(FailureKind kind, std::filesystem::path const &file);
  [[nodiscard]] FailureKind kind() const { return kind_; }

 private:
  FailureKind kind_;
};

/// Throws UnusableState.
[[noreturn]] void refuse_file(std::filesystem::path const &file, std::string const &why);

/// A name at first, and from take() on the one file that had it then: copies share that file, and
/// it stays theirs when it is closed and opened again. Only names are looked at: nothing is opened
/// for reading or writing, because to close such a descriptor would undo SQLite's locks.
class StateFile {
 public:
  // Implicit, because a path is all that it takes to say which state.
  StateFile(std::filesystem::path name);  // NOLINT(google-explicit-constructor)

  /// Finds the file, or makes an empty one that only this user may use. Throws UnusableState for
  /// what is no regular file or another user's, and for what has taken the place of the file.
  void take();
  /// Throws UnusableState if the file was removed, replaced or emptied since it was taken.
  void require_in_place() const;
  /// Whether nobody wrote to a file that only is looked at since it was taken.
  [[nodiscard]] bool is_unchanged() const;

  /// As it was given.
  [[nodiscard]] std::filesystem::path const &name() const;
  /// Without links.
  [[nodiscard]] std::filesystem::path const &location() const;
  /// Whether this process may change the state, and not only look at it.
  [[nodiscard]] bool is_writable() const;
  /// How many bytes it takes on the disk, with what SQLite keeps beside it.
  [[nodiscard]] std::uint64_t bytes_on_disk() const;

 private:
  struct Taken;

  std::shared_ptr<Taken> taken_;
};

}  // namespace simhost::storage
