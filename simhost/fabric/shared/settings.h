// What hosts share of a switch and of a port, in the words of documents, and this host made so.
#pragma once

#include <map>
#include <string>

#include "base/bytes.h"
#include "scenario/document.h"
#include "storage/ports.h"

namespace simhost::fabric {

/// The members of a switch or of a port, each with its value as JSON. What a restart takes away,
/// what wires bring and what is at the uplinks is the host's own.
using Settings = std::map<std::string, std::string>;

Settings settings_of(storage::Transaction &transaction, storage::FoundSwitch const &found);
Settings settings_of(storage::Transaction &transaction, storage::Port const &port);

/// Another one whenever the settings are, or the alias of the switch, or whether the port has a
/// device: made in a small part of the time that settings take.
Bytes image_of(storage::Transaction &transaction, storage::FoundSwitch const &found);
Bytes image_of(storage::Transaction &transaction, storage::Port const &port);

/// Makes the settings these, and no others. Throws what the host refuses (Refused), and
/// scenario::DocumentError for what is no such setting.
void apply_settings(storage::ChangingTransaction &transaction, storage::FoundSwitch const &found,
                    Settings const &settings);
void apply_settings(storage::ChangingTransaction &transaction, storage::Port const &port,
                    Settings const &settings);

}  // namespace simhost::fabric
