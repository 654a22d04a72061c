// simhost_*: looking into the host of this process, and changing it from outside.
#include "abi/simhost_api/simhost.h"

#include <array>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "abi/fresh_host.h"
#include "abi/host.h"
#include "abi/outcome.h"
#include "base/api.h"
#include "base/outcomes.h"
#include "base/utf8.h"
#include "clock/clock.h"
#include "fabric/caller/fabric_sharing.h"
#include "faults/faults.h"
#include "model/counters/counters.h"
#include "model/devices/devices.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "scenario/document.h"
#include "scenario/lifecycle.h"
#include "scenario/scenario.h"
#include "scenario/texts.h"
#include "storage/shared.h"
#include "storage/store.h"

namespace simhost {
namespace {

thread_local std::string last_error;

// Keeps the reason of the exception being handled; returns its status.
int failure() noexcept {
  auto outcome = current_outcome();
  last_error = std::move(outcome.reason);
  return outcome.status;
}

// Does `work` on the state, in one transaction of a kind.
template <typename Kind, typename Work>
int on_state(Work const &work) noexcept {
  last_error.clear();
  try {
    auto &host = this_host();
    std::scoped_lock const held(host.lock());
    Kind transaction(host.state());
    work(transaction);
    commit(transaction);
    return QEX_OK;
  } catch (...) {
    return failure();
  }
}

template <typename Work>
int reading(Work const &work) noexcept {
  return on_state<storage::ReadingTransaction>(work);
}

template <typename Work>
int changing(Work const &work) noexcept {
  return on_state<storage::ChangingTransaction>(work);
}

std::string given(char const *text) {
  if (text == nullptr) {
    throw Refused(QEX_BAD_PARAM, "a text is null");
  }
  return text;
}

size_t copy_out(std::string const &all, char *text, size_t size) {
  if (size > 0) {
    auto const length = all.copy(text, size - 1);
    text[length] = '\0';
  }
  return all.size();
}

Place place_of(storage::Transaction &transaction, char const *switch_name, char const *port) {
  auto const key = get_switch(transaction, given(switch_name)).key;
  if (port == nullptr) {
    return {.switch_key = key, .port = std::nullopt};
  }
  return {.switch_key = key, .port = get_port(transaction, key, port).number};
}

// What a frame's sender learns of what became of its address.
void refuse_unlearned(Sighting sighting) {
  switch (sighting) {
    case Sighting::learning_off:
      throw Refused(QEX_IS_DISABLED, "the port does not learn");
    case Sighting::let_through:
    case Sighting::dropped:
      throw Refused(QEX_LIMIT_EXCEEDED, "there is no room for another address");
    case Sighting::fixed_elsewhere:
      throw Refused(QEX_EXISTS, "the address is fixed elsewhere");
    case Sighting::learned:
    case Sighting::refreshed:
    case Sighting::moved:
      return;
  }
}

storage::MacBytes mac_from(std::string const &text) {
  auto const bytes = scenario::mac_from(text);
  if (!bytes) {
    throw Refused(QEX_INVALID_ADDRESS, "'" + text + "' is no address such as 02:00:00:00:00:01");
  }
  return *bytes;
}

VSMACEntry source_of(std::string const &mac, uint16_t vlan, uint32_t vni) {
  auto const bytes = mac_from(mac);
  VSMACEntry source{};
  std::memcpy(source.macAddress, bytes.data(), bytes.size());
  source.vid = vlan;
  source.vni = vni;
  return source;
}

// The state of a host that belongs to a fabric, or whose daemon is to make it; empty if it belongs
// to none.
std::filesystem::path fabric_state() {
  auto &host = this_host();
  std::scoped_lock const held(host.lock());
  storage::ReadingTransaction transaction(host.state());
  auto const &file = host.state_file();
  if (!file) {
    return {};
  }
  bool const belongs = storage::find_membership(transaction) ||
                       std::filesystem::exists(fabric::agent_socket_of(file->location()));
  return belongs ? file->location() : std::filesystem::path();
}

std::string in_force_text(openvswitch::InForce const &found) {
  auto const or_null = [](auto const &number) {
    return number ? scenario::Json(*number) : scenario::Json();
  };
  scenario::Json const said{{"change", or_null(found.wanted)},
                            {"in_force", or_null(found.done)},
                            {"said", found.wanted ? scenario::Json(found.said) : scenario::Json()}};
  return said.dump();
}

Fault fault_on(char const *function, uint32_t nth, uint32_t times) {
  Fault fault;
  fault.function = given(function);
  fault.first = nth;
  fault.last = times == 0 ? Fault::kForever : std::int64_t{nth} + times - 1;
  return fault;
}

// What the calls that are hit do, `effect` puts into the fault.
template <typename Effect>
int add_fault_on(char const *function, uint32_t nth, uint32_t times,
                 Effect const &effect) noexcept {
  return changing([&](storage::ChangingTransaction &transaction) {
    auto fault = fault_on(function, nth, times);
    effect(fault);
    add_fault(transaction, fault);
  });
}

std::vector<std::uint8_t> frame_from(unsigned char const *bytes, size_t length) {
  constexpr size_t kHeader = 14;
  constexpr size_t kLongest = 65535;
  if (bytes == nullptr || length < kHeader || length > kLongest) {
    throw Refused(QEX_BAD_PARAM, "a frame has 14 to 65535 bytes");
  }
  return {bytes, bytes + length};
}

scenario::Json setting_json(openvswitch::SettingOf const &setting) {
  if (setting.name.empty()) {
    return nullptr;
  }
  auto const port = setting.port.empty() ? scenario::Json() : scenario::Json(setting.port);
  return {{"port", port}, {"name", setting.name}};
}

std::string story_text(std::vector<openvswitch::StoryStep> const &steps) {
  constexpr std::array kDoes{"passes", "dropped", "delivered", "copied"};
  auto all = scenario::Json::array();
  for (auto const &step : steps) {
    scenario::Json said{{"does", kDoes.at(static_cast<std::size_t>(step.kind))},
                        {"text", step.text},
                        {"setting", setting_json(step.setting)}};
    if (!step.to.empty()) {
      said["to"] = step.to;
      said["vlans"] = step.vlans;
    }
    all.push_back(std::move(said));
  }
  return all.dump();
}

}  // namespace

extern "C" {

SIMHOST_API char const *simhost_version() {
  return SIMHOST_VERSION;
}

SIMHOST_API char const *simhost_error() {
  return last_error.c_str();
}

SIMHOST_API size_t simhost_state_file(char *text, size_t size) {
  last_error.clear();
  try {
    auto &host = this_host();
    std::scoped_lock const held(host.lock());
    auto const &file = host.state_file();
    return copy_out(file ? file->name().string() : std::string(), text, size);
  } catch (...) {
    failure();
    return copy_out(std::string(), text, size);
  }
}

SIMHOST_API int simhost_apply(char const *document) {
  return changing([&](storage::ChangingTransaction &transaction) {
    scenario::apply(transaction, given(document));
  });
}

SIMHOST_API size_t simhost_describe(char *text, size_t size) {
  size_t length = 0;
  reading([&](storage::Transaction &transaction) {
    length = copy_out(scenario::description(transaction), text, size);
  });
  return length;
}

SIMHOST_API int simhost_restart() {
  return changing(
      [](storage::ChangingTransaction &transaction) { scenario::restart_host(transaction); });
}

SIMHOST_API int simhost_reset() {
  return changing([](storage::ChangingTransaction &transaction) {
    scenario::empty_host(transaction);
    populate_fresh_host(transaction);
  });
}

SIMHOST_API int64_t simhost_clock_now() {
  int64_t now = -1;
  reading([&](storage::Transaction &transaction) { now = clock_now(transaction).count(); });
  return now;
}

SIMHOST_API int simhost_clock_stop() {
  return changing(
      [](storage::ChangingTransaction &transaction) { stop_clock_without_devices(transaction); });
}

SIMHOST_API int simhost_clock_run() {
  return changing([](storage::ChangingTransaction &transaction) { run_clock(transaction); });
}

SIMHOST_API int simhost_clock_step(int64_t milliseconds) {
  return changing([&](storage::ChangingTransaction &transaction) {
    step_clock(transaction, ClockTime(milliseconds));
  });
}

SIMHOST_API int simhost_clock_set(int64_t milliseconds) {
  return changing([&](storage::ChangingTransaction &transaction) {
    set_clock(transaction, ClockTime(milliseconds));
  });
}

SIMHOST_API int simhost_set_link(char const *uplink, int up) {
  return changing([&](storage::ChangingTransaction &transaction) {
    auto const name = get_uplink(transaction, given(uplink)).name;
    auto &wires = get_wires(transaction, name);
    auto link = wires.link_of(transaction, name);
    link.carrier = up != 0;
    wires.change_link(transaction, name, link);
  });
}

SIMHOST_API int simhost_connect(char const *switchName, char const *port, char const *device,
                                char const *mac) {
  return changing([&](storage::ChangingTransaction &transaction) {
    auto const key = get_switch(transaction, given(switchName)).key;
    auto const client = mac == nullptr ? std::nullopt : std::optional(mac_from(mac));
    connect(transaction, get_port(transaction, key, given(port)), given(device), client);
  });
}

SIMHOST_API int simhost_disconnect(char const *switchName, char const *port) {
  return changing([&](storage::ChangingTransaction &transaction) {
    auto const key = get_switch(transaction, given(switchName)).key;
    disconnect(transaction, get_port(transaction, key, given(port)));
  });
}

SIMHOST_API size_t simhost_plane(char *text, size_t size) {
  size_t length = 0;
  reading([&](storage::Transaction &transaction) {
    openvswitch::InForce found;
    if (auto *const plane = this_host().find_openvswitch_plane()) {
      found = plane->in_force(transaction);
    }
    length = copy_out(in_force_text(found), text, size);
  });
  return length;
}

SIMHOST_API int simhost_share(char const *switchName) {
  return changing([&](storage::ChangingTransaction &transaction) {
    fabric::share(transaction, get_switch(transaction, given(switchName)).row.identifier);
  });
}

SIMHOST_API int simhost_join(char const *switchName) {
  last_error.clear();
  try {
    fabric::join(fabric_state(), given(switchName));
    return QEX_OK;
  } catch (...) {
    return failure();
  }
}

SIMHOST_API size_t simhost_fabric(char *text, size_t size) {
  last_error.clear();
  try {
    auto const state = fabric_state();
    return copy_out(state.empty() ? std::string(R"({"host": null})") : fabric::status(state).dump(),
                    text, size);
  } catch (...) {
    failure();
    return copy_out(std::string(), text, size);
  }
}

SIMHOST_API size_t simhost_trace(char const *switchName, char const *station,
                                 unsigned char const *frame, size_t length, char *text,
                                 size_t size) {
  size_t found = 0;
  reading([&](storage::Transaction &transaction) {
    auto *const plane = this_host().find_openvswitch_plane();
    if (plane == nullptr) {
      throw Refused(QEX_NOT_SUPPORTED, "no frames move: the host is kept in memory");
    }
    auto const traced = plane->trace(transaction, get_switch(transaction, given(switchName)),
                                     given(station), frame_from(frame, length));
    found = copy_out(story_text(traced), text, size);
  });
  return found;
}

SIMHOST_API int simhost_learn(char const *switchName, char const *port, char const *mac,
                              uint16_t vlan, uint32_t vni) {
  auto sighting = Sighting::learned;
  auto const status = changing([&](storage::ChangingTransaction &transaction) {
    get_running_switch(transaction, given(switchName));
    auto const place = place_of(transaction, switchName, port);
    sighting =
        get_wires(transaction, place).learn(transaction, place, source_of(given(mac), vlan, vni));
  });
  if (status != QEX_OK) {
    return status;
  }
  // Only now, because what was counted on the way has to last.
  try {
    refuse_unlearned(sighting);
    return QEX_OK;
  } catch (...) {
    return failure();
  }
}

SIMHOST_API int simhost_set_counter(char const *switchName, char const *port, char const *session,
                                    char const *name, uint64_t value) {
  return changing([&](storage::ChangingTransaction &transaction) {
    if (port != nullptr && session != nullptr) {
      throw Refused(QEX_BAD_PARAM, "a counter is of a port or of a session, not of both");
    }
    auto const place = place_of(transaction, switchName, port);
    CounterOwner const owner{.switch_key = place.switch_key,
                             .port = place.port,
                             .session = session == nullptr ? "" : session};
    require_utf8(owner.session);
    set_counter(transaction, owner, given(name), value);
  });
}

SIMHOST_API int simhost_fail_call(char const *function, uint32_t nth, uint32_t times, int status) {
  return add_fault_on(function, nth, times,
                      [&](Fault &fault) { fault.status = static_cast<QEX_ReturnStatus>(status); });
}

SIMHOST_API int simhost_trap_call(char const *function, uint32_t nth, uint32_t times,
                                  char const *exception, char const *message) {
  return add_fault_on(function, nth, times, [&](Fault &fault) {
    fault.exception = given(exception);
    fault.message = given(message);
  });
}

SIMHOST_API int simhost_delay_call(char const *function, uint32_t nth, uint32_t times,
                                   uint32_t milliseconds) {
  return add_fault_on(function, nth, times,
                      [&](Fault &fault) { fault.delay = std::chrono::milliseconds(milliseconds); });
}

SIMHOST_API int simhost_clear_faults(char const *function) {
  return changing([&](storage::ChangingTransaction &transaction) {
    clear_faults(transaction, function == nullptr ? "" : function);
  });
}

SIMHOST_API size_t simhost_ledger_count() {
  auto &host = this_host();
  std::scoped_lock const held(host.lock());
  return host.ledger().count();
}

SIMHOST_API size_t simhost_ledger_report(char *text, size_t size) {
  auto &host = this_host();
  std::scoped_lock const held(host.lock());
  return host.ledger().report(std::span(text, size));
}

SIMHOST_API size_t simhost_ledger_summary(char *text, size_t size) {
  auto &host = this_host();
  std::scoped_lock const held(host.lock());
  return copy_out(host.ledger().summary(), text, size);
}

}  // extern "C"
}  // namespace simhost
