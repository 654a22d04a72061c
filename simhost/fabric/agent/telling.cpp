// What the fabric is told of its host: what is in force there, links, errors, counts, and what
// drills find.
#include <fmt/format.h>

#include <chrono>
#include <map>
#include <stdexcept>
#include <string>
#include <utility>

#include "fabric/agent/counted.h"
#include "fabric/agent/drills.h"
#include "fabric/agent/member.h"
#include "fabric/agent/patience.h"
#include "model/plane.h"

namespace simhost::fabric {
namespace {

using namespace std::chrono_literals;

constexpr events::Clock::duration kBetweenReports = 100ms;
// What a host that is killed has counted since nobody else knows.
constexpr events::Clock::duration kBetweenCounts = 30s;

Json map_of(std::map<std::string, std::string> const &texts) {
  return ovsdb::map({texts.begin(), texts.end()});
}

}  // namespace

void Member::reply_to_drills() {
  for (auto const &drill : drills_for(cluster_.replica(), options_.host)) {
    auto const operations =
        together({only_for(claim_.speaker()), reply_to(drill, drilled(store_, drill))});
    try {
      cluster_.transact(operations, from_now(kPatience));
      // The reply may have come with news.
      sync_soon();
    } catch (ovsdb::TransactionRefused const &refusal) {
      say_(fmt::format("a drill gets no reply: {}", refusal.what()));
    }
  }
}

void Member::tell(InForce const &in_force) {
  in_force_ = in_force;
  report_soon();
}

void Member::report_soon() {
  if (!next_report_) {
    next_report_ = loop_.after(kBetweenReports, [this] { report(); });
  }
}

std::map<std::string, std::string> Member::links() {
  std::map<std::string, std::string> all;
  storage::ReadingTransaction transaction(store_);
  for (auto const &uplink : storage::all_uplinks(transaction)) {
    all[uplink.name] = running_plane().link_is_up(transaction, uplink.name) ? "up" : "down";
  }
  return all;
}

void Member::report() {
  if (!claim_.speaks()) {
    return;
  }
  try {
    // Not before a port has left in the state as well; and what is said to be in force counts there
    // no more.
    if (counts_are_due_ && touched_.empty() && !report_counts()) {
      report_soon();
      return;
    }
    auto const switches = switches_of(cluster_.replica(), options_.host);
    std::map<std::string, std::string> errors;
    for (auto const &[name, why] : unborne_) {
      errors[words_of(name, switches)] = why;
    }
    if (!in_force_.troubles.empty()) {
      errors["frames"] = in_force_.troubles;
    }
    if (!trouble_of_state_.empty()) {
      errors["state"] = trouble_of_state_;
    }
    Json row{{"links", map_of(links())}, {"errors", map_of(errors)}};
    if (in_force_.change >= change_) {
      row["in_force"] = revision_;
    }
    if (row != reported_) {
      auto operations = only_for(claim_.speaker());
      operations.push_back({{"op", "update"},
                            {"table", "Host"},
                            {"where", Json::array({Json::array({"name", "==", options_.host})})},
                            {"row", row}});
      cluster_.transact(operations, from_now(kPatience));
      reported_ = std::move(row);
      // The reply may have come with news.
      sync_soon();
    }
  } catch (std::runtime_error const &error) {
    lose(error.what());
  }
}

void Member::tell_counts_later() {
  next_counts_ = loop_.after(kBetweenCounts, [this] {
    counts_are_due_ = true;
    report_soon();
    tell_counts_later();
  });
}

// Returns whether it could: not while somebody else has the state. Of a port that went the last is
// counted when that is in force. What was refused is tried again when all are told the next time.
bool Member::report_counts() {
  std::string why;
  try {
    auto const news = untold(store_, cluster_.replica(), membership_);
    if (!news) {
      return false;
    }
    auto all = Json::array();
    for (auto const &[switch_identifier, operations] : news->operations) {
      all.insert(all.end(), operations.begin(), operations.end());
    }
    if (!all.empty() && !tell_counts(all, why)) {
      why.clear();
      // Who may not write one of the switches shall be heard of the others.
      for (auto const &[switch_identifier, operations] : news->operations) {
        tell_counts(operations, why);
      }
    }
    counts_are_due_ = news->change > in_force_.change;
  } catch (storage::StateFailure const &failure) {
    why = failure.what();
  }
  if (std::exchange(why_counts_are_untold_, why) != why && !why.empty()) {
    say_(fmt::format("what was counted is not told: {}", why));
  }
  return true;
}

// Returns whether they were taken; else the reason is in `why`.
bool Member::tell_counts(Json const &operations, std::string &why) {
  try {
    cluster_.transact(together({only_for(claim_.speaker()), operations}), from_now(kPatience));
    // The reply may have come with news.
    sync_soon();
    return true;
  } catch (ovsdb::TransactionRefused const &refusal) {
    why = refusal.what();
    return false;
  }
}

}  // namespace simhost::fabric
