// A question holds the lock of the state, so that there is one at a time.
#include "fabric/caller/fabric_sharing.h"

#include <array>
#include <chrono>
#include <random>

#include <fmt/format.h>

#include "base/outcomes.h"
#include "fabric/shared/records.h"
#include "planes/openvswitch/line/line.h"
#include "storage/store.h"

namespace simhost::fabric {
namespace {

using namespace std::chrono_literals;

// The agent says after ten seconds that nobody knows.
constexpr auto kPatience = 12s;
constexpr auto *kNoFabric =
    "this host belongs to no fabric: simhostd --fabric makes it belong to one";

std::string new_change() {
  std::random_device random;
  return fmt::format("{:08x}{:08x}{:08x}{:08x}", random(), random(), random(), random());
}

Json asked(std::filesystem::path const &state, Json const &question) {
  try {
    auto reply = openvswitch::ask_at(agent_socket_of(state), question, kPatience);
    if (reply.contains("unknown")) {
      throw Refused(QEX_TIMEOUT, reply["unknown"].get<std::string>());
    }
    if (reply.contains("refused")) {
      throw Refused(QEX_BUSY, reply["refused"].get<std::string>());
    }
    return reply;
  } catch (openvswitch::NobodyListens const &) {
    throw Refused(QEX_BUSY, "this is shared with other hosts, and no simhostd --fabric is there");
  } catch (openvswitch::NoDaemon const &none) {
    throw Refused(QEX_TIMEOUT, none.what());
  } catch (Json::exception const &error) {
    throw Refused(QEX_TIMEOUT,
                  fmt::format("simhostd says what nobody understands: {}", error.what()));
  }
}

}  // namespace

std::filesystem::path agent_socket_of(std::filesystem::path const &state) {
  auto socket = state;
  socket += "-fabric";
  return socket;
}

void share(storage::ChangingTransaction &transaction, std::string const &switch_identifier) {
  if (!storage::find_membership(transaction)) {
    throw Refused(QEX_NOT_SUPPORTED, kNoFabric);
  }
  if (storage::is_shared(transaction, switch_identifier)) {
    throw Refused(QEX_EXISTS, "the switch is shared already");
  }
  storage::put_shared(transaction, {.name = {.switch_identifier = switch_identifier, .port = {}},
                                    .fabric = {},
                                    .image = std::nullopt});
  storage::touch(transaction, switch_identifier);
}

void join(std::filesystem::path const &state, std::string const &alias) {
  if (state.empty()) {
    throw Refused(QEX_NOT_SUPPORTED, kNoFabric);
  }
  asked(state, {{"ask", "join"}, {"alias", alias}});
}

Json status(std::filesystem::path const &state) {
  return asked(state, {{"ask", "status"}});
}

bool FabricSharing::prepare(storage::ChangingTransaction &transaction) {
  auto const membership = storage::find_membership(transaction);
  if (!membership) {
    return false;
  }
  auto const changes = changes_of(transaction, *membership);
  agree(transaction, changes);
  storage::forget_touched(transaction);
  if (changes.empty()) {
    return false;
  }
  // A state that takes nothing says so before others are told.
  transaction.flush();
  asked(state_, {{"ask", "commit"}, {"change", new_change()}, {"rows", changes}});
  return true;
}

}  // namespace simhost::fabric
