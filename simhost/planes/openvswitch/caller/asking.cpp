// Whoever waits in vain has waited as long as any call does.
#include "planes/openvswitch/caller/asking.h"

#include <fmt/format.h>

#include <utility>

#include "base/outcomes.h"
#include "planes/openvswitch/caller/patience.h"

namespace simhost::openvswitch {

Asking::Asking(std::filesystem::path state) : state_(std::move(state)) {}

Json Asking::said(Json const &question) {
  if (none_) {
    throw NoDaemon(*none_);
  }
  try {
    return ask(state_, question, kPatience);
  } catch (NobodyListens const &) {
    // To ask again costs nothing, and a daemon may have come.
    throw;
  } catch (NoDaemon const &none) {
    none_ = none;
    throw;
  }
}

Json Asking::reply(Json const &question) {
  try {
    auto reply = said(question);
    if (reply.contains("refused")) {
      throw Refused(QEX_IO_ERROR, reply["refused"].get<std::string>());
    }
    return reply;
  } catch (NoDaemon const &none) {
    throw Refused(QEX_TIMEOUT, none.what());
  } catch (Json::exception const &error) {
    throw Refused(QEX_IO_ERROR,
                  fmt::format("simhostd says what nobody understands: {}", error.what()));
  }
}

std::optional<Json> Asking::reply_if_there(Json const &question) {
  try {
    return reply(question);
  } catch (Refused const &refused) {
    if (refused.status() != QEX_TIMEOUT) {
      throw;
    }
    return std::nullopt;
  }
}

}  // namespace simhost::openvswitch
