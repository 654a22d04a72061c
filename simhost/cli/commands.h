// The commands of simhostctl. They do everything through the functions that any program has.
#pragma once

#include <CLI/CLI.hpp>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string>
#include <string_view>

#include "abi/simhost_api/simhost.h"

namespace simhost::cli {

/// The host or the caller's input stands against what was asked for; what() says how.
class Failure : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

inline void check(int status) {
  if (status != 0) {
    throw Failure(simhost_error());
  }
}

inline char const *or_null(std::string const &text) {
  return text.empty() ? nullptr : text.c_str();
}

inline std::int64_t milliseconds(double seconds) {
  return std::llround(seconds * 1000);
}

/// What is wrong with a text that has to be a whole number in digits; empty if nothing is.
std::function<std::string(std::string const &)> whole_number(
    std::uint64_t least = 0, std::uint64_t greatest = std::numeric_limits<std::uint64_t>::max());

/// Likewise for a number of up to twelve digits and three decimals.
std::function<std::string(std::string const &)> decimal_number();

/// Likewise for one of two words.
std::function<std::string(std::string const &)> one_of(std::string const &one,
                                                       std::string const &other);

/// What a command was given, which lives as long as the app does whose callbacks keep it.
template <typename Words>
std::shared_ptr<Words> words_of_command() {
  return std::make_shared<Words>();
}

/// A document as text; fails for words that are no UTF-8.
std::string text_of(nlohmann::ordered_json const &document);
/// A text for a terminal: control characters as \xNN.
std::string printable(std::string_view text);

/// The whole of a text that a function of the host copies out, with parameters and result as of
/// simhost_describe.
std::string whole_text(std::function<std::size_t(char *text, std::size_t size)> const &copy_out);
/// The whole host as a document.
std::string description();

/// show, apply, link, uplink, learn, counter: the host and what comes to it from outside.
void add_world_commands(CLI::App &app);
/// connect, disconnect, underlay, plane, trace: the devices through which real frames go, what
/// moves them, and what becomes of one.
void add_frame_commands(CLI::App &app);
/// share, join, fabric: what several hosts have together.
void add_fabric_commands(CLI::App &app);
/// clock, restart, reset.
void add_time_commands(CLI::App &app);
/// fault, calls: the functions that programs call.
void add_call_commands(CLI::App &app);
void add_lab_commands(CLI::App &app);

}  // namespace simhost::cli
