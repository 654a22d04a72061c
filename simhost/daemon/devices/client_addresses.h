// The addresses that clients have now: of those whose device is the other end of a veth pair, which
// the kernel tells of in whichever namespace it is. Nobody sees it of others, such as virtual
// machines.
#pragma once

#include <functional>
#include <map>
#include <optional>
#include <set>
#include <span>

#include "events/loop.h"
#include "planes/openvswitch/openflow/value.h"

namespace simhost::daemon {

class ClientAddresses {
 public:
  /// `changed` is told when one that was asked for is another one.
  ClientAddresses(events::Loop &loop, std::function<void()> changed);

  /// Who is not asked for from now on is of no interest any more.
  void begin();
  /// Of the client at a device, by its index; nothing where nobody sees it.
  std::optional<openflow::EthernetAddress> at(unsigned device);
  /// Looks again where the kernel does not tell.
  void look();

 private:
  struct Client {
    int space = 0;        // the number that its namespace has here
    unsigned device = 0;  // its own one there, by its index; 0 for no such thing
    std::optional<openflow::EthernetAddress> address = std::nullopt;
  };

  static Client ask(unsigned device);
  void ask_again(std::set<unsigned> const &devices);
  void take_told();
  // At which devices a client may have become another one.
  void note_told(std::span<char const> messages, int space, std::set<unsigned> &devices) const;

  events::Descriptor socket_;
  bool hears_all_;
  std::function<void()> changed_;
  std::map<unsigned, Client> clients_;
  std::map<unsigned, Client> before_;  // which nobody has asked for since begin()
  events::Loop::Watch watch_;
};

}  // namespace simhost::daemon
