// Nothing here waits for the lock of the state: whoever has it may be waiting for this.
#include "fabric/agent/member.h"

#include <fmt/format.h>
#include <malloc.h>

#include <algorithm>
#include <chrono>
#include <utility>

#include "base/outcomes.h"
#include "fabric/agent/counted.h"
#include "fabric/agent/patience.h"
#include "fabric/caller/fabric_sharing.h"
#include "storage/running/frames.h"

namespace simhost::fabric {
namespace {

using namespace std::chrono_literals;

// Each attempt may have a server tell all that there is.
constexpr events::Clock::duration kFirstPause = 100ms;
constexpr events::Clock::duration kLongestPause = 1s;
constexpr events::Clock::duration kFirstWait = 2ms;
constexpr events::Clock::duration kLongestWait = 50ms;
// After so long nobody waits for an outcome.
constexpr auto kLongestDecision = 10s;
// A server is looked for that long before callers are refused.
constexpr auto kElection = 3s;
// A server that hangs tells of nothing, and one without news does not either.
constexpr events::Clock::duration kBetweenQuestions = 5s;

// Of a change that is not known to be made.
Json told(Proposal const &proposal, Decision const &decision) {
  if (decision.verdict == Verdict::refused) {
    return {{"refused", decision.why}};
  }
  return {{"unknown", fmt::format("nobody knows whether the change {} is made: {}", proposal.id,
                                  decision.why)}};
}

}  // namespace

Member::Member(events::Loop &loop, Options options, Say say)
    : loop_(loop),
      options_(std::move(options)),
      say_(std::move(say)),
      store_(options_.state, [](storage::ChangingTransaction &) {}),
      membership_(membership_in(store_, options_.host)),
      claim_({.host = options_.host, .session = random_name()}, membership_.state),
      cluster_(options_.servers,
               {.name = kDatabase, .version = kSchemaVersion, .selected = selected_columns()}),
      server_(loop, agent_socket_of(options_.state), questions()),
      lost_(events::Clock::now()),
      touched_(options_.host) {
  next_connect_ = loop_.after({}, [this] { connect(); });
  tell_counts_later();
  ask_server_later();
}

// The connection.

void Member::connect() {
  try {
    cluster_.connect();
    lost_.reset();
    begin_anew();
    counts_are_due_ = true;
    watch();
    claim_.make(cluster_);
    settle_undecided();
    say_(fmt::format("the fabric is at {}", cluster_.server()));
    trouble_.clear();
    sync_soon();
  } catch (std::runtime_error const &error) {
    lose(error.what());
  }
}

// Nobody has told of what changed before.
void Member::begin_anew() {
  touched_.add_all();
  port_rows_.begin(cluster_.replica());
}

// Said once, however often it is tried.
void Member::lose(std::string const &why) {
  watches_.clear();
  cluster_.disconnect();
  claim_.lose();
  if (!lost_) {
    lost_ = events::Clock::now();
  }
  if (std::exchange(trouble_, why) != why) {
    say_("the fabric cannot be used: " + why);
  }
  if (!claim_.gave_way()) {
    pause_ = std::clamp(2 * pause_, kFirstPause, kLongestPause);
    next_connect_ = loop_.after(pause_, [this] { connect(); });
  }
}

void Member::watch() {
  watches_.clear();
  for (auto const descriptor : cluster_.descriptors()) {
    watches_.push_back(loop_.watch(descriptor, [this] { receive(); }));
  }
}

void Member::receive() {
  try {
    if (take_news()) {
      sync_soon();
    }
  } catch (std::runtime_error const &error) {
    lose(error.what());
  }
}

void Member::ask_server_later() {
  next_question_ = loop_.after(kBetweenQuestions, [this] {
    ask_server_later();
    if (claim_.speaks()) {
      try {
        cluster_.require_reply(from_now(kPatience));
        // The reply may have come with news.
        receive();
      } catch (std::runtime_error const &error) {
        lose(error.what());
      }
    }
  });
}

bool Member::take_news() {
  auto const changes = cluster_.receive();
  if (changes.empty()) {
    return false;
  }
  touched_.add(cluster_.replica(), changes);
  port_rows_.follow(cluster_.replica(), changes);
  counts_are_due_ = counts_are_due_ || lets_any_go(cluster_.replica(), changes, options_.host);
  claim_.make(cluster_);
  return true;
}

void Member::settle_undecided() {
  while (!undecided_.empty()) {
    auto const &proposal = undecided_.back();
    bool const made = was_made(cluster_, proposal, from_now(kPatience));
    say_(fmt::format("the change {} of which nobody knew was {}made", proposal.id,
                     made ? "" : "not "));
    undecided_.pop_back();
  }
}

// From the fabric to the state.

void Member::sync_soon(events::Clock::duration wait) {
  if (!next_sync_ || wait < next_wait_) {
    next_wait_ = wait;
    next_sync_ = loop_.after(wait, [this] { sync(); });
  }
}

void Member::sync() {
  if (!claim_.speaks()) {
    return;
  }
  auto const waited = next_wait_;
  try {
    take_news();
    bool const is_much = touched_.is_all();
    if (!follow_touched()) {
      sync_soon(std::clamp<events::Clock::duration>(2 * waited, kFirstWait, kLongestWait));
      return;
    }
    if (is_much) {
      // Of all rows at once this is a third of what the process has, and may never be needed again.
      malloc_trim(0);
    }
    revision_ = revision_of(cluster_.replica());
    reply_to_drills();
    report_soon();
    pause_ = {};
    state_pause_ = {};
    tell_of_state({});
    // These decide something themselves, by which servers may be lost.
    tell_joined();
    let_go();
  } catch (Json::exception const &error) {
    lose(fmt::format("its rows are none of this version: {}", error.what()));
  } catch (storage::StateFailure const &failure) {
    // To have the servers tell all once more would be of no use.
    tell_of_state(failure.what());
    state_pause_ = std::clamp(2 * state_pause_, kFirstPause, kLongestPause);
    sync_soon(state_pause_);
  } catch (std::runtime_error const &error) {
    lose(error.what());
  }
}

// Why the state takes nothing, said once.
void Member::tell_of_state(std::string const &why) {
  if (std::exchange(trouble_of_state_, why) == why) {
    return;
  }
  if (!why.empty()) {
    say_("the fabric cannot be followed: " + why);
  }
  report_soon();
}

// Returns whether it could: not while somebody else has the state. What this host cannot bear it
// tries again with each change, and with it whatever may depend on that.
bool Member::follow_touched() {
  bool const is_changed = touched_.has_others() || revision_of(cluster_.replica()) != revision_;
  bool const tries_again = is_changed && !unborne_.empty();
  if (touched_.empty() && !tries_again) {
    return true;
  }
  auto const before = unborne_;
  if (tries_again) {
    unborne_.clear();
    touched_.add_all();
  }
  auto news = touched_.news(cluster_.replica());
  while (true) {
    try {
      storage::Patience none(0ns);
      storage::ChangingTransaction transaction(store_, none);
      bool is_other = !storage::find_membership(transaction);
      if (is_other) {
        storage::put_membership(transaction, membership_);
      }
      auto const followed = follow(transaction, membership_, news, unborne_);
      is_other = followed.is_other || is_other;
      if (is_other) {
        storage::advance_frames_change(transaction);
        change_ = storage::frames_change(transaction).value_or(0);
      }
      if (take_counts(transaction, news.counts) || is_other) {
        transaction.commit();
      }
      touched_.clear();
      is_left_ = is_left_ || followed.is_left;
      return true;
    } catch (Unborne const &why) {
      unborne_[why.name()] = why.what();
      if (!before.contains(why.name())) {
        say_(fmt::format("this host cannot bear what the fabric has of {}: {}",
                         words_of(why.name(), switches_of(cluster_.replica(), options_.host)),
                         why.what()));
      }
      touched_.add_all();
      news = touched_.news(cluster_.replica());
    } catch (storage::StateFailure const &failure) {
      if (failure.kind() == storage::FailureKind::busy) {
        unborne_ = before;
        return false;
      }
      throw;
    }
  }
}

void Member::tell_joined() {
  if (joining_.empty()) {
    return;
  }
  for (auto const &[name, record] : switches_of(cluster_.replica(), options_.host)) {
    auto const [first, end] = joining_.equal_range(record.value("alias", std::string()));
    if (first == end) {
      continue;
    }
    auto const unborne = unborne_.find(name);
    for (auto one = first; one != end; ++one) {
      one->second.reply(unborne == unborne_.end() ? Json{{"joined", name.switch_identifier}}
                                                  : unjoined(one->second, *unborne));
    }
    joining_.erase(first, end);
  }
}

// Of a switch that this host cannot bear. Whoever asked for it is told that nothing changed.
Json Member::unjoined(Joining const &joining, std::pair<SharedName const, std::string> const &why) {
  auto const &[name, words] = why;
  if (joining.is_new) {
    auto const proposal = proposed(random_name(), leave(name.switch_identifier, options_.host));
    auto const decision = decided(proposal, kPatience);
    if (decision.verdict != Verdict::made) {
      return {{"unknown", fmt::format("{}; this host may be at the switch all the same: {}", words,
                                      decision.why)}};
    }
  }
  return {{"refused", words}};
}

// Of ports that only others believe to be connected here.
void Member::let_go() {
  if (!std::exchange(is_left_, false)) {
    return;
  }
  try {
    storage::Patience none(0ns);
    storage::ChangingTransaction transaction(store_, none);
    auto const changes = changes_of(transaction, membership_);
    agree(transaction, changes);
    storage::forget_touched(transaction);
    transaction.flush();
    if (changes.empty() ||
        decided(proposed(random_name(), operations_for(changes)), kPatience).verdict ==
            Verdict::made) {
      transaction.commit();
    }
  } catch (storage::StateFailure const &failure) {
    if (failure.kind() != storage::FailureKind::busy) {
      throw;
    }
    is_left_ = true;
    sync_soon(kLongestWait);
  } catch (Refused const &) {
    // It touches what this host cannot bear, which is tried again with the next change.
  }
}

// What callers ask.

daemon::Questions Member::questions() {
  return {
      {"commit", [this](Json const &question, Reply const &reply) { commit(question, reply); }},
      {"join",
       [this](Json const &question, Reply const &reply) {
         join(question.at("alias").get<std::string>(), reply);
       }},
      {"status", [this](Json const &, Reply const &reply) { reply(status()); }},
  };
}

Decision Member::decided(Proposal const &proposal, std::chrono::milliseconds longest) {
  if (!claim_.speaks() && (!lost_ || events::Clock::now() - *lost_ > kElection)) {
    return {.verdict = Verdict::refused, .why = "the fabric cannot be used: " + trouble_};
  }
  auto const connections = cluster_.connections();
  auto decision = decide(cluster_, proposal, from_now(longest));
  if (decision.verdict == Verdict::unknown) {
    undecided_.push_back(proposal);
  }
  if (cluster_.is_connected()) {
    if (cluster_.connections() != connections) {
      begin_anew();
    }
    watch();
    sync_soon();
  } else {
    lose(decision.why);
  }
  return decision;
}

void Member::commit(Json const &question, Reply const &reply) {
  auto const changes = question.at("rows").get<std::vector<Change>>();
  auto const proposal = proposed(question.at("change").get<std::string>(), operations_for(changes));
  auto const decision = decided(proposal, kLongestDecision);
  reply(decision.verdict == Verdict::made ? Json{{"made", proposal.id}} : told(proposal, decision));
}

void Member::join(std::string const &alias, Reply const &reply) {
  auto const is_it = [&](auto const &one) { return one.second.value("alias", "") == alias; };
  bool const is_new = cluster_.is_connected() &&
                      std::ranges::none_of(switches_of(cluster_.replica(), options_.host), is_it);
  auto const proposal = proposed(random_name(), fabric::join(alias, options_.host));
  auto const decision = decided(proposal, kLongestDecision);
  if (decision.verdict == Verdict::made) {
    joining_.emplace(alias, Joining{.reply = reply, .is_new = is_new});
  } else if (cluster_.is_connected() && !has_switch(cluster_.replica(), alias)) {
    reply({{"refused", fmt::format("the fabric has no switch '{}'", alias)}});
  } else {
    reply(told(proposal, decision));
  }
}

Json Member::operations_for(std::vector<Change> const &changes) {
  RowNames ports;
  if (cluster_.is_connected()) {
    writers_ = writers_in(cluster_.replica());
    ports = port_rows_.of(cluster_.replica(), changes);
  }
  return operations_of(changes, ports, writers_);
}

// With a change id, so that it is made once, whatever a server tries again.
Proposal Member::proposed(std::string const &id, Json const &operations) const {
  return {.id = id,
          .host = options_.host,
          .operations = together({only_for(claim_.speaker()), operations, next_revision(),
                                  change_insertion(id, options_.host, false)})};
}

Json Member::status() const {
  return {{"host", options_.host},
          {"server", cluster_.is_connected() ? Json(cluster_.server()) : Json()},
          {"revision", revision_},
          {"trouble", trouble_}};
}

}  // namespace simhost::fabric
