// One thing at a time for each connection: its questions wait until it has taken its replies.
#include "daemon/server.h"

#include <sys/socket.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdint>
#include <exception>
#include <utility>
#include <vector>

#include "planes/openvswitch/transport/stream.h"

namespace simhost::daemon {
namespace {

using events::Descriptor;

Descriptor listening(events::UnixAddress const &address, std::filesystem::path const &path) {
  auto socket_ =
      events::owned(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0), "socket");
  unlinkat(address.folder(), path.filename().c_str(), 0);
  auto const before = umask(S_IRWXG | S_IRWXO);
  auto const bound = bind(socket_.number(), address.get(), address.size());
  umask(before);
  if (bound != 0 || listen(socket_.number(), SOMAXCONN) != 0) {
    events::fail_with_errno(path.string());
  }
  return socket_;
}

}  // namespace

struct Server::Client {
  Client(std::filesystem::path const &path, Descriptor accepted)
      : stream(path.native(), std::move(accepted)) {}

  openvswitch::Stream stream;
  events::Loop::Watch watch;
  events::Loop::Timer too_late;
  openvswitch::Lines lines;
};

Server::Server(events::Loop &loop, std::filesystem::path socket, Questions questions,
               events::Clock::duration patience)
    : loop_(loop),
      path_(std::move(socket)),
      questions_(std::move(questions)),
      patience_(patience),
      address_(path_),
      socket_(listening(address_, path_)) {
  accept_some();
}

Server::~Server() {
  unlinkat(address_.folder(), path_.filename().c_str(), 0);
}

void Server::accept_some() {
  watch_ = loop_.watch(socket_.number(), [this] { accept_one(); });
}

void Server::accept_one() {
  Descriptor accepted(accept4(socket_.number(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
  if (!accepted) {
    if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM) {
      // Who comes goes on being there, and each turn of the loop would find that at once.
      constexpr auto kPause = std::chrono::milliseconds(100);
      watch_.end();
      next_accepting_ = loop_.after(kPause, [this] { accept_some(); });
    }
    return;  // gone again, or the next turn finds it
  }
  auto const client = std::make_shared<Client>(path_, std::move(accepted));
  client->watch = loop_.watch(client->stream.fd(), [this, weak = std::weak_ptr<Client>(client)] {
    if (auto const alive = weak.lock()) {
      serve(alive);
    }
  });
  clients_.insert(client);
  // Most have asked by now: what goes on meanwhile is replied to as soon as it is done.
  serve(client);
}

void Server::serve(std::shared_ptr<Client> const &client) {
  try {
    if (client->stream.has_unsent()) {
      client->stream.send({});
      wait_for(client);
    } else {
      std::vector<std::uint8_t> bytes;
      client->stream.receive(bytes);
      client->lines.add({reinterpret_cast<char const *>(bytes.data()), bytes.size()});
    }
    while (!client->stream.has_unsent()) {
      auto const line = client->lines.next();
      if (!line) {
        break;
      }
      handle(client, *line);
    }
  } catch (openvswitch::Disconnected const &) {
    clients_.erase(client);
  } catch (openvswitch::NoDaemon const &) {
    clients_.erase(client);
  }
}

void Server::send(std::shared_ptr<Client> const &client, Json const &said) {
  auto const text = said.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
  try {
    client->stream.send({reinterpret_cast<std::uint8_t const *>(text.data()), text.size()});
    wait_for(client);
  } catch (openvswitch::Disconnected const &) {
    clients_.erase(client);
  }
}

// For it to take what is left, or to say more.
void Server::wait_for(std::shared_ptr<Client> const &client) {
  if (!client->stream.has_unsent()) {
    client->too_late.end();
    client->watch.wait_for(events::Loop::Ready::to_read);
    return;
  }
  client->watch.wait_for(events::Loop::Ready::to_write);
  if (!client->too_late) {
    client->too_late = loop_.after(
        patience_, [this, weak = std::weak_ptr<Client>(client)] { clients_.erase(weak.lock()); });
  }
}

void Server::handle(std::shared_ptr<Client> const &client, std::string const &line) {
  auto const question = Json::parse(line, nullptr, false);
  std::weak_ptr<Client> const weak(client);
  Reply const reply(
      [this, weak](Json const &said) {
        if (auto const alive = weak.lock()) {
          send(alive, said);
        }
      },
      [weak] { return !weak.expired(); });
  try {
    auto const what = question.at("ask").get<std::string>();
    auto const known = questions_.find(what);
    if (known == questions_.end()) {
      reply({{"refused", "nobody here knows '" + what + "'"}});
    } else {
      known->second(question, reply);
    }
  } catch (Json::exception const &) {
    reply({{"refused", "that is no question"}});
  } catch (std::exception const &error) {
    reply({{"refused", error.what()}});
  }
}

}  // namespace simhost::daemon
