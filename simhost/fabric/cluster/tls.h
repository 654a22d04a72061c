// Streams to servers that are encrypted, and on which each side proves who it is by a certificate.
#pragma once

#include <filesystem>
#include <string>

#include "planes/openvswitch/transport/tcp.h"

namespace simhost::fabric {

/// Files of PEM.
struct Credentials {
  std::filesystem::path private_key;
  std::filesystem::path certificate;     ///< of that key
  std::filesystem::path ca_certificate;  ///< whose servers are trusted
};

/// As connected_to() does; throws Disconnected also for files that will not do, and where one side
/// does not trust the other. The files are read each time, so that they may be renewed.
openvswitch::Stream encrypted_to(openvswitch::TcpAddress const &address,
                                 Credentials const &credentials, openvswitch::Deadline deadline);

}  // namespace simhost::fabric
