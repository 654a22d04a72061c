// The daemon's end of the line to the processes that use its state.
#pragma once

#include <chrono>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>

#include "events/loop.h"
#include "events/unix_address.h"
#include "planes/openvswitch/line/line.h"

namespace simhost::daemon {

using openvswitch::Json;

/// Replies to a question, at once or later. The process that asked may be gone by then.
class Reply {
 public:
  using Say = std::function<void(Json const &)>;

  Reply() = default;
  Reply(Say say, std::function<bool()> is_awaited)
      : say_(std::move(say)), is_awaited_(std::move(is_awaited)) {}

  void operator()(Json const &said) const { say_(said); }
  explicit operator bool() const { return static_cast<bool>(say_); }
  /// Whether the process that asked is still there.
  [[nodiscard]] bool is_awaited() const { return is_awaited_(); }

 private:
  Say say_;
  std::function<bool()> is_awaited_;
};

/// What is done with each kind of question, by what its member "ask" says. What it throws is the
/// reply: of a std::exception the text, and a Json::exception says that it was no question.
using Questions =
    std::map<std::string, std::function<void(Json const &question, Reply const &reply)>>;

class Server {
 public:
  /// Listens at `socket`, in place of a daemon that is gone. Who does not take what is said to them
  /// in the time of `patience` is dropped. Throws std::runtime_error.
  Server(events::Loop &loop, std::filesystem::path socket, Questions questions,
         events::Clock::duration patience = std::chrono::seconds(10));
  ~Server();
  Server(Server const &) = delete;
  Server &operator=(Server const &) = delete;

 private:
  struct Client;

  void accept_some();
  void accept_one();
  void serve(std::shared_ptr<Client> const &client);
  void send(std::shared_ptr<Client> const &client, Json const &said);
  void wait_for(std::shared_ptr<Client> const &client);
  void handle(std::shared_ptr<Client> const &client, std::string const &line);

  events::Loop &loop_;
  std::filesystem::path path_;
  Questions questions_;
  events::Clock::duration patience_;
  events::UnixAddress address_;
  events::Descriptor socket_;
  events::Loop::Watch watch_;
  events::Loop::Timer next_accepting_;
  std::set<std::shared_ptr<Client>> clients_;
};

}  // namespace simhost::daemon
