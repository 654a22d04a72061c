// What a switch says when it refuses a message.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace simhost::openflow {

struct ErrorReply {
  std::uint16_t type = 0;
  std::uint16_t code = 0;
  std::uint32_t xid = 0;                // of the message that it is about
  std::vector<std::uint8_t> message{};  // how that begins
};

/// "OFPBMC_BAD_PREREQ: a field of the match needs another one, which the match lacks"; the numbers
/// of an error that has no name here.
std::string to_text(ErrorReply const &error);

/// A kind of error that has a name.
struct ErrorName {
  std::uint16_t type;
  std::uint16_t code;
  std::string_view name;
  std::string_view words;
};
std::vector<ErrorName> const &error_names();

/// The switch refuses a request.
class Refused : public std::runtime_error {
 public:
  explicit Refused(ErrorReply const &error)
      : runtime_error("the switch refuses: " + to_text(error)), error_(error) {}

  [[nodiscard]] ErrorReply const &error() const { return error_; }

 protected:
  Refused(std::string const &what, ErrorReply const &error) : runtime_error(what), error_(error) {}

 private:
  ErrorReply error_;
};

/// The switch refuses a change, and so made none of those that came with it.
class ChangeRefused : public Refused {
 public:
  /// `change` is its text, `index` its place among them.
  ChangeRefused(std::size_t index, std::string const &change, ErrorReply const &error)
      : Refused("the switch refuses to " + change + ": " + to_text(error), error), index_(index) {}

  [[nodiscard]] std::size_t index() const { return index_; }

 private:
  std::size_t index_;
};

/// The switch refuses a change, but made others that came with it.
class HalfMade : public Refused {
 public:
  /// `change` is the text of what it refuses.
  HalfMade(std::string const &change, ErrorReply const &error)
      : Refused("the switch makes some changes, but refuses to " + change + ": " + to_text(error),
                error) {}
};

}  // namespace simhost::openflow
