// Questions in JSON-RPC over a connection of their own.
#include "planes/openvswitch/trace/control.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <fstream>
#include <iterator>
#include <nlohmann/json.hpp>
#include <span>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace simhost::openvswitch {
namespace {

using Json = nlohmann::json;

// More is no reply of a program in its right mind.
constexpr std::size_t kLongestReply = std::size_t{16} << 20;

// The objects that have come whole: nothing but their ends tells them apart.
std::vector<Json> objects_in(std::vector<std::uint8_t> const &bytes) {
  std::istringstream in(std::string(bytes.begin(), bytes.end()));
  std::vector<Json> objects;
  try {
    while (!(in >> std::ws).eof()) {
      in >> objects.emplace_back();
    }
  } catch (Json::parse_error const &) {
    objects.pop_back();
  }
  return objects;
}

std::vector<Json> replies_from(Stream &stream, std::size_t count, Deadline deadline) {
  std::vector<std::uint8_t> bytes;
  while (bytes.size() < kLongestReply) {
    stream.wait_to_receive(deadline);
    if (stream.receive(bytes)) {
      // It says no more than it is asked.
      if (auto replies = objects_in(bytes); replies.size() == count) {
        return replies;
      }
    }
  }
  throw std::runtime_error("ovs-vswitchd says what nobody understands");
}

ControlReply control_reply(Json const &reply) {
  if (reply.is_object()) {
    auto const error = reply.find("error");
    if (error != reply.end() && !error->is_null()) {
      return {.is_refused = true,
              .text = error->is_string() ? error->get<std::string>() : error->dump()};
    }
    auto const result = reply.find("result");
    if (result != reply.end() && result->is_string()) {
      return {.text = result->get<std::string>()};
    }
  }
  throw std::runtime_error("ovs-vswitchd says what nobody understands");
}

}  // namespace

std::filesystem::path find_control_socket(std::filesystem::path const &folder) {
  auto socket = folder / "ovs-vswitchd.ctl";
  if (std::filesystem::exists(socket)) {
    return socket;
  }
  // By itself it names the socket after its process.
  std::uint64_t process = 0;
  if (std::ifstream(folder / "ovs-vswitchd.pid") >> process) {
    socket = folder / fmt::format("ovs-vswitchd.{}.ctl", process);
    if (std::filesystem::exists(socket)) {
      return socket;
    }
  }
  throw std::runtime_error(
      fmt::format("no ovs-vswitchd that can be asked: {} has no control socket", folder.string()));
}

std::vector<ControlReply> ask_control(std::filesystem::path const &socket,
                                      std::vector<ControlCommand> const &commands,
                                      Deadline deadline, Lives const &lives) {
  std::string questions;
  for (std::size_t number = 0; number < commands.size(); ++number) {
    auto const &[name, words] = commands[number];
    questions += Json{{"id", number}, {"method", name}, {"params", words}}.dump();
  }
  Stream stream(socket, deadline, lives);
  stream.send(
      std::span(reinterpret_cast<std::uint8_t const *>(questions.data()), questions.size()));
  std::vector<ControlReply> replies;
  std::ranges::transform(replies_from(stream, commands.size(), deadline),
                         std::back_inserter(replies), control_reply);
  return replies;
}

std::string ask_control(std::filesystem::path const &socket, ControlCommand const &command,
                        Deadline deadline) {
  auto reply = std::move(ask_control(socket, std::vector{command}, deadline).front());
  if (reply.is_refused) {
    throw std::runtime_error("ovs-vswitchd: " + reply.text);
  }
  return std::move(reply.text);
}

}  // namespace simhost::openvswitch
