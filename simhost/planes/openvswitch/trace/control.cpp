// One question in JSON-RPC over a connection of its own.
#include "planes/openvswitch/trace/control.h"

#include <fmt/format.h>

#include <cstdint>
#include <fstream>
#include <nlohmann/json.hpp>
#include <span>
#include <stdexcept>

#include "planes/openvswitch/transport/stream.h"

namespace simhost::openvswitch {
namespace {

using Json = nlohmann::json;

// More is no reply of a program in its right mind.
constexpr std::size_t kLongestReply = std::size_t{16} << 20;

Json reply_from(Stream &stream, Deadline deadline) {
  std::vector<std::uint8_t> bytes;
  while (bytes.size() < kLongestReply) {
    stream.wait_to_receive(deadline);
    if (stream.receive(bytes)) {
      // It says no more than this one text.
      auto reply = Json::parse(bytes, nullptr, false);
      if (reply.is_object()) {
        return reply;
      }
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

std::string ask_control(std::filesystem::path const &socket, std::string const &command,
                        std::vector<std::string> const &words, Deadline deadline) {
  Stream stream(socket, deadline);
  auto const question = Json{{"id", 0}, {"method", command}, {"params", words}}.dump();
  stream.send(std::span(reinterpret_cast<std::uint8_t const *>(question.data()), question.size()));
  auto const reply = reply_from(stream, deadline);
  auto const error = reply.find("error");
  if (error != reply.end() && !error->is_null()) {
    throw std::runtime_error("ovs-vswitchd: " +
                             (error->is_string() ? error->get<std::string>() : error->dump()));
  }
  auto const result = reply.find("result");
  if (result == reply.end() || !result->is_string()) {
    throw std::runtime_error("ovs-vswitchd says what nobody understands");
  }
  return result->get<std::string>();
}

}  // namespace simhost::openvswitch
