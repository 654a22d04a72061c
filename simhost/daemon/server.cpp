// Accepting connections and reading questions from them; who does not take a reply loses it.
#include "daemon/server.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <array>
#include <utility>

namespace simhost::daemon {
namespace {

using events::Descriptor;

// The folder is looked at through a descriptor, because an address of a socket is short.
Descriptor listening(Descriptor const &folder, std::filesystem::path const &path) {
  auto socket_ =
      events::owned(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0), "socket");
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  openvswitch::short_path(folder.number(), path)
      .string()
      .copy(static_cast<char *>(address.sun_path), sizeof address.sun_path - 1);
  unlinkat(folder.number(), path.filename().c_str(), 0);
  auto const before = umask(S_IRWXG | S_IRWXO);
  auto const bound =
      bind(socket_.number(), reinterpret_cast<sockaddr const *>(&address), sizeof address);
  umask(before);
  if (bound != 0 || listen(socket_.number(), SOMAXCONN) != 0) {
    events::fail_with_errno(path.string());
  }
  return socket_;
}

}  // namespace

struct Server::Client {
  Descriptor socket;
  events::Loop::Watch watch;
  openvswitch::Lines lines;
};

Server::Server(events::Loop &loop, std::filesystem::path socket, Handle handle)
    : loop_(loop),
      path_(std::move(socket)),
      handle_(std::move(handle)),
      folder_(events::owned(open(path_.parent_path().c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC),
                            path_.c_str())),
      socket_(listening(folder_, path_)),
      watch_(loop_.watch(socket_.number(), [this] { accept_one(); })) {}

Server::~Server() {
  unlinkat(folder_.number(), path_.filename().c_str(), 0);
}

void Server::accept_one() {
  Descriptor accepted(accept4(socket_.number(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
  if (!accepted) {
    return;  // gone again, or the next turn finds it
  }
  auto const client = std::make_shared<Client>();
  client->socket = std::move(accepted);
  client->watch =
      loop_.watch(client->socket.number(), [this, weak = std::weak_ptr<Client>(client)] {
        if (auto const alive = weak.lock()) {
          read_from(alive);
        }
      });
  clients_.insert(client);
}

void Server::read_from(std::shared_ptr<Client> const &client) {
  std::array<char, 16384> part{};
  auto const size = recv(client->socket.number(), part.data(), part.size(), 0);
  if (size < 0 && (errno == EAGAIN || errno == EINTR)) {
    return;
  }
  if (size <= 0) {
    clients_.erase(client);
    return;
  }
  client->lines.add({part.data(), static_cast<std::size_t>(size)});
  try {
    while (auto const line = client->lines.next()) {
      handle(client, *line);
    }
  } catch (openvswitch::NoDaemon const &) {
    clients_.erase(client);
  }
}

void Server::handle(std::shared_ptr<Client> const &client, std::string const &line) {
  auto const question = Json::parse(line, nullptr, false);
  auto const reply = [weak = std::weak_ptr<Client>(client)](Json const &said) {
    if (auto const alive = weak.lock()) {
      auto const text = said.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
      static_cast<void>(
          send(alive->socket.number(), text.data(), text.size(), MSG_NOSIGNAL | MSG_DONTWAIT));
    }
  };
  if (question.is_object()) {
    handle_(question, reply);
  } else {
    reply({{"refused", "that is no question"}});
  }
}

}  // namespace simhost::daemon
