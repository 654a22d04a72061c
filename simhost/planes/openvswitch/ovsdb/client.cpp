#include "planes/openvswitch/ovsdb/client.h"

#include <fmt/format.h>

#include <string_view>
#include <utility>
#include <vector>

namespace simhost::ovsdb {
namespace {

// What a client tells its monitors apart by; there is one.
constexpr char const *kMonitor = "replica";

std::string member_text(Json const &object, char const *name) {
  auto const found = object.is_object() ? object.find(name) : object.end();
  return found != object.end() && found->is_string() ? found->get<std::string>() : "";
}

// RFC 7047's errors are texts or objects.
std::string error_text(Json const &error) {
  if (error.is_string()) {
    return error.get<std::string>();
  }
  auto const name = member_text(error, "error");
  auto const details = member_text(error, "details");
  return name + (name.empty() || details.empty() ? "" : ": ") + details;
}

bool is_error(Json const &result) {
  return result.is_object() && result.contains("error") && !result["error"].is_null();
}

void require_results(Json const &operations, Json const &results) {
  if (!results.is_array()) {
    throw Malformed("the result of a transaction is no list");
  }
  for (std::size_t index = 0; index < results.size(); ++index) {
    if (!is_error(results[index])) {
      continue;
    }
    auto const words = error_text(results[index]);
    if (index >= operations.size()) {
      throw TransactionRefused(operations.size(), "the database refuses the transaction: " + words);
    }
    auto const &operation = operations[index];
    throw TransactionRefused(
        index, fmt::format("the database refuses to {} {}: {}", member_text(operation, "op"),
                           member_text(operation, "table"), words));
  }
  if (results.size() < operations.size()) {
    throw Malformed("a transaction has fewer results than operations");
  }
}

std::string text_of(Json const &message) {
  try {
    return message.dump();
  } catch (Json::type_error const &) {
    throw std::invalid_argument("a text for the database is no UTF-8");
  }
}

}  // namespace

Client::Client(std::filesystem::path const &socket, std::string database, Deadline deadline,
               openvswitch::Lives lives)
    : stream_(socket, deadline, std::move(lives)), database_(std::move(database)) {}

void Client::send(Json const &message) {
  auto const text = text_of(message);
  stream_.send({reinterpret_cast<std::uint8_t const *>(text.data()), text.size()});
}

void Client::receive() {
  std::vector<std::uint8_t> received;
  stream_.send({});
  stream_.receive(received);
  splitter_.append(received);
}

bool Client::is_handled(Json const &message) {
  auto const method = member_text(message, "method");
  if (method.empty()) {
    return false;
  }
  auto const params = message.value("params", Json::array());
  if (method == "echo") {
    send({{"id", message.value("id", Json())}, {"result", params}, {"error", nullptr}});
  } else if (method == "update2" && params.is_array() && params.size() == 2) {
    events_.emplace_back(Changed{replica_.apply(params[1])});
  } else if ((method == "locked" || method == "stolen") && params.is_array() &&
             params.size() == 1 && params[0].is_string()) {
    auto const name = params[0].get<std::string>();
    if (method == "locked") {
      events_.emplace_back(LockGained{name});
    } else {
      events_.emplace_back(LockLost{name});
    }
  }
  return true;
}

std::optional<Event> Client::next_event() {
  while (events_.empty()) {
    auto const message = splitter_.next();
    if (!message) {
      return std::nullopt;
    }
    // A reply that nobody waits for any more is nothing.
    is_handled(*message);
  }
  auto event = std::move(events_.front());
  events_.pop_front();
  return event;
}

Json Client::wait_for_message(Deadline deadline) {
  while (true) {
    if (auto message = splitter_.next()) {
      return std::move(*message);
    }
    stream_.wait_to_receive(deadline);
    receive();
  }
}

void Client::wait_for_news(Deadline deadline) {
  while (!is_handled(wait_for_message(deadline))) {
  }
}

Client::Called Client::begin_call(std::string const &method, Json params) {
  auto const id = ++id_;
  send({{"method", method}, {"params", std::move(params)}, {"id", id}});
  return {.method = method, .id = id};
}

Json Client::end_call(Called const &called, Deadline deadline) {
  while (true) {
    auto const message = wait_for_message(deadline);
    if (is_handled(message) || message.value("id", Json()) != called.id) {
      continue;
    }
    if (is_error(message)) {
      throw Refused(fmt::format("the database refuses to {}: {}", called.method,
                                error_text(message["error"])));
    }
    return message.value("result", Json());
  }
}

Json Client::call(std::string const &method, Json params, Deadline deadline) {
  return end_call(begin_call(method, std::move(params)), deadline);
}

Json Client::transact(Json const &operations, Deadline deadline) {
  auto params = Json::array({database_});
  params.insert(params.end(), operations.begin(), operations.end());
  auto results = call("transact", std::move(params), deadline);
  require_results(operations, results);
  return results;
}

void Client::monitor(Selected const &selected, Deadline deadline) {
  begin_monitor(selected);
  end_monitor(deadline);
}

void Client::begin_monitor(Selected selected) {
  auto tables = Json::object();
  for (auto const &[table, columns] : selected) {
    tables[table] = Json::array({{{"columns", columns}}});
  }
  begun_ = Monitor{
      .selected = std::move(selected),
      .schema = begin_call("get_schema", Json::array({database_})),
      .rows = begin_call("monitor_cond", Json::array({database_, kMonitor, std::move(tables)}))};
}

void Client::end_monitor(Deadline deadline) {
  if (auto const begun = std::exchange(begun_, std::nullopt)) {
    replica_ = Replica(selected_schema(end_call(begun->schema, deadline), begun->selected));
    replica_.apply(end_call(begun->rows, deadline));
  }
}

std::string Client::version(Deadline deadline) {
  return member_text(call("get_schema", Json::array({database_}), deadline), "version");
}

void Client::echo(Deadline deadline) {
  call("echo", Json::array(), deadline);
}

bool Client::lock(std::string const &name, Deadline deadline) {
  auto const result = call("lock", Json::array({name}), deadline);
  auto const found = result.is_object() ? result.find("locked") : result.end();
  if (found == result.end() || !found->is_boolean()) {
    throw Malformed("the result of a lock does not say whether it is held");
  }
  return found->get<bool>();
}

void Client::steal(std::string const &name, Deadline deadline) {
  call("steal", Json::array({name}), deadline);
}

void Client::unlock(std::string const &name, Deadline deadline) {
  call("unlock", Json::array({name}), deadline);
}

}  // namespace simhost::ovsdb
