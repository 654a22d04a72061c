// The tables of the RFCs. There, a source that is wanted is one with a timer that runs, and one
// that is excluded has a timer of zero.
#include "planes/openvswitch/multicast/filter.h"

#include <algorithm>
#include <utility>

namespace simhost::multicast {
namespace {

bool contains(std::vector<Address> const &sources, Address const &source) {
  return std::find(sources.begin(), sources.end(), source) != sources.end();
}

void sooner(std::optional<Time> &due, Time time) {
  due = due ? std::min(*due, time) : time;
}

}  // namespace

Level level_of(Family family, unsigned version) {
  auto const with_sources = family == Family::ipv4 ? 3U : 2U;
  if (version >= with_sources) {
    return Level::sources;
  }
  return version + 1 == with_sources ? Level::leaves : Level::joins;
}

void Filter::note_old_hosts(Record const &record, Level level, Timing const &timing, Time now) {
  if (record.type != RecordType::is_exclude) {
    return;
  }
  if (level == Level::joins) {
    only_joins_until_ = now + timing.membership;
  } else if (level == Level::leaves) {
    no_sources_until_ = now + timing.membership;
  }
}

// What is left of a record for one who knows no sources, and beside hosts that know none.
std::optional<Record> Filter::readable(Record record, Reading const &reading, Time now) const {
  auto const type = record.type;
  bool const is_leave = type == RecordType::to_include;
  if (reading.level != Level::sources && type != RecordType::block) {
    bool const wants_some =
        !record.sources.empty() || type == RecordType::is_exclude || type == RecordType::to_exclude;
    if (!wants_some && (!is_leave || reading.level == Level::joins)) {
      return std::nullopt;
    }
    record.type = wants_some ? RecordType::is_exclude : type;
    record.sources.clear();
  }
  auto const beside = now < only_joins_until_   ? Level::joins
                      : now < no_sources_until_ ? Level::leaves
                                                : Level::sources;
  auto const level = std::min(beside, reading.level);
  bool const says_less = record.type == RecordType::to_include && level == Level::joins;
  if (says_less || (type == RecordType::block && level != Level::sources)) {
    return std::nullopt;
  }
  if (type == RecordType::to_exclude && level != Level::sources) {
    record.sources.clear();
  }
  return record;
}

void Filter::apply(Record const &given, Level level, Reading const &reading, Timing const &timing,
                   Time now) {
  note_old_hosts(given, level, timing, now);
  auto const record = readable(given, reading, now);
  if (!record) {
    return;
  }
  auto const &sources = record->sources;
  switch (record->type) {
    case RecordType::is_include:
    case RecordType::allow:
      want(sources, now + timing.membership);
      break;
    case RecordType::to_include: {
      auto const others = wanted_but(sources);
      want(sources, now + timing.membership);
      ask_about(others, timing, now);
      if (excludes_) {
        ask_about_group(timing, now);
      }
      break;
    }
    case RecordType::is_exclude:
      exclude(*record, now + timing.membership, timing, now);
      break;
    case RecordType::to_exclude:
      exclude(*record, excludes_ ? group_until_ : now + timing.membership, timing, now);
      ask_about(sources, timing, now);
      break;
    case RecordType::block:
      if (excludes_) {
        for (auto const &source : sources) {
          sources_.emplace(source, group_until_);
        }
      }
      ask_about(sources, timing, now);
      break;
  }
  take_all_if_too_many(reading, timing, now);
}

void Filter::want(std::vector<Address> const &sources, Time until) {
  for (auto const &source : sources) {
    sources_[source] = until;
    asked_sources_.erase(source);
  }
}

// Of the sources that are listed, those that were wanted still are, until they are asked about in
// vain; others are new to a filter that excludes already, and excluded by one that begins to.
void Filter::exclude(Record const &record, Time until_for_new, Timing const &timing, Time now) {
  std::map<Address, std::optional<Time>> sources;
  for (auto const &source : record.sources) {
    auto const known = sources_.find(source);
    auto const fresh = excludes_ ? std::optional(until_for_new) : std::nullopt;
    sources.emplace(source, known != sources_.end() ? known->second : fresh);
  }
  sources_ = std::move(sources);
  std::erase_if(asked_sources_, [&](Address const &one) { return !sources_.contains(one); });
  excludes_ = true;
  group_until_ = now + timing.membership;
  group_asking_ = {};
}

std::vector<Address> Filter::wanted_but(std::vector<Address> const &sources) const {
  std::vector<Address> others;
  for (auto const &[source, until] : sources_) {
    if (until && !contains(sources, source)) {
      others.push_back(source);
    }
  }
  return others;
}

void Filter::ask_about_group(Timing const &timing, Time now) {
  group_until_ = std::min(group_until_, now + timing.last_member());
  group_asking_ = {.times_left = timing.times_asked, .next = now};
}

// Those that are wanted.
void Filter::ask_about(std::vector<Address> const &sources, Timing const &timing, Time now) {
  for (auto const &source : sources) {
    auto const known = sources_.find(source);
    if (known != sources_.end() && known->second) {
      known->second = std::min(*known->second, now + timing.last_member());
      asked_sources_.insert(source);
      source_asking_ = {.times_left = timing.times_asked, .next = now};
    }
  }
}

void Filter::take_all_if_too_many(Reading const &reading, Timing const &timing, Time now) {
  if (sources_.size() > reading.most_sources) {
    sources_.clear();
    asked_sources_.clear();
    excludes_ = true;
    group_until_ = now + timing.membership;
  }
}

void Filter::expire(Time now) {
  auto const is_expired = [&](auto const &source) {
    return source.second && *source.second <= now;
  };
  if (excludes_ && group_until_ > now) {
    for (auto &source : sources_) {
      if (is_expired(source)) {
        source.second = std::nullopt;
      }
    }
  } else {
    excludes_ = false;
    group_asking_ = {};
    std::erase_if(sources_,
                  [&](auto const &source) { return !source.second || is_expired(source); });
  }
  std::erase_if(asked_sources_, [&](Address const &one) {
    auto const known = sources_.find(one);
    return known == sources_.end() || !known->second;
  });
}

std::vector<Filter::Question> Filter::advance(Timing const &timing, Time now) {
  expire(now);
  std::vector<Question> questions;
  auto const is_due = [&](Asking &asking) {
    if (asking.times_left == 0 || asking.next > now) {
      return false;
    }
    --asking.times_left;
    asking.next += timing.between_asking;
    return true;
  };
  if (is_due(group_asking_)) {
    questions.emplace_back();
  }
  if (!asked_sources_.empty() && is_due(source_asking_)) {
    questions.emplace_back(asked_sources_.begin(), asked_sources_.end());
  }
  return questions;
}

std::optional<Time> Filter::next() const {
  std::optional<Time> due;
  if (excludes_) {
    due = group_until_;
  }
  for (auto const &[source, until] : sources_) {
    if (until) {
      sooner(due, *until);
    }
  }
  if (group_asking_.times_left > 0) {
    sooner(due, group_asking_.next);
  }
  if (source_asking_.times_left > 0 && !asked_sources_.empty()) {
    sooner(due, source_asking_.next);
  }
  return due;
}

Sources Filter::wanted() const {
  Sources sources{.are_excluded = excludes_};
  for (auto const &[source, until] : sources_) {
    if (until.has_value() != excludes_) {
      sources.listed.push_back(source);
    }
  }
  return sources;
}

}  // namespace simhost::multicast
