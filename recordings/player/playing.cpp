#include "recordings/player/playing.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <limits>

#include "recordings/core/process.h"
#include "recordings/player/trap.h"

namespace recordings {
namespace {

bool succeeded(Call const &call, Json const &end) {
  return call.result != Result::status || end.value("status", Json()) == 0;
}

std::size_t index_of(Call const &call, std::string_view argument) {
  auto const found = std::ranges::find(call.arguments, argument, &Argument::name);
  return static_cast<std::size_t>(found - call.arguments.begin());
}

std::string text_or_empty(Json const &value) {
  return value.is_string() ? value.get<std::string>() : std::string();
}

}  // namespace

Playing::Playing(std::string const &trace, std::string const &ledger, By by)
    : trace_(trace.substr(trace.rfind('/') + 1)), script_(text_of_file(trace)), by_(by) {
  if (!ledger_.open(ledger, script_.parts().size(), script_.calls())) {
    throw Unplayable("the list of what was played does not belong to it");
  }
  if (by_ == By::arguments) {
    for (std::size_t at = 0; at < script_.events().size(); ++at) {
      Event const &event = script_.events()[at];
      if (event.call != nullptr) {
        alike_[key_of(event.part, *event.call, inputs_of(event))].events.push_back(at);
      }
    }
  }
}

Json Playing::inputs_of(Event const &event) const {
  return member_of(Json::parse(event.begin), "in");
}

std::string Playing::line_of(Event const &event) const {
  return trace_ + ": line " + std::to_string(event.line);
}

InProgress Playing::begin(ThreadPlace &place, Call const &call, Words words,
                          std::optional<std::size_t> outer) {
  auto const asked = asked_inputs(call, words, holdings_);
  claim(call, asked);
  auto found = by_ == By::order ? by_order(place, call, asked, outer) : by_arguments(call, asked);
  Event const &event = script_.events()[found.event];
  ledger_.note_made(event.number);
  auto const recorded = inputs_of(event);
  note_own_pointers(call, recorded, words);
  names_.learn(recorded, asked);
  return found;
}

void Playing::claim(Call const &call, Json const &asked) {
  if (part_) {
    return;
  }
  for (bool const must_begin : {true, false}) {
    for (std::size_t part = 0; part < script_.parts().size(); ++part) {
      if (!ledger_.is_claimed(part) && (!must_begin || can_begin(part, call, asked)) &&
          ledger_.claim(part)) {
        part_ = part;
        names_.note_process(script_.parts()[part].process, process_id());
        taken_threads_.clear();
        return;
      }
    }
  }
  throw Unplayed(shown(call, asked) + " was not recorded\n  " + trace_ + ": calls of " +
                 std::to_string(script_.parts().size()) +
                 " processes were recorded, and this is one more");
}

bool Playing::can_begin(std::size_t part, Call const &call, Json const &asked) const {
  if (by_ == By::arguments) {
    return alike_.contains(key_of(part, call, asked));
  }
  return std::ranges::any_of(script_.parts()[part].threads, [&](auto const &thread) {
    return is_it(script_.events()[thread.second.front()], call, asked);
  });
}

bool Playing::is_it(Event const &event, Call const &call, Json const &asked) const {
  return event.call == &call && are_same(call, inputs_of(event), asked, holdings_, names_);
}

void Playing::take_thread(ThreadPlace &place, Call const &call, Json const &asked) {
  auto const &threads = script_.parts()[*part_].threads;
  for (bool const must_begin : {true, false}) {
    for (auto const &[thread, calls] : threads) {
      if (!taken_threads_.contains(thread) &&
          (!must_begin || is_it(script_.events()[calls.front()], call, asked))) {
        taken_threads_.insert(thread);
        place = {thread, 0};
        return;
      }
    }
  }
  throw Unplayed(shown(call, asked) + " was not recorded\n  " + trace_ + ": calls of " +
                 std::to_string(threads.size()) +
                 " threads of this process were recorded, and this is one more");
}

InProgress Playing::by_order(ThreadPlace &place, Call const &call, Json const &asked,
                             std::optional<std::size_t> outer) {
  if (!place.thread) {
    take_thread(place, call, asked);
  }
  auto const &calls = script_.parts()[*part_].threads.at(*place.thread);
  auto const *const next =
      place.next < calls.size() ? &script_.events()[calls[place.next]] : nullptr;
  if (next == nullptr || next->outer != outer || !is_it(*next, call, asked)) {
    refuse(call, asked, next);
  }
  return {nullptr, calls[place.next++], 0, std::nullopt, false};
}

std::string Playing::key_of(std::size_t part, Call const &call, Json const &inputs) const {
  return std::to_string(part) + ' ' + std::string(call.name) + without_pointers(inputs);
}

InProgress Playing::by_arguments(Call const &call, Json const &asked) {
  std::optional<std::size_t> last;
  for (auto const &inputs : {asked, names_.as_recorded(asked)}) {
    auto const alike = alike_.find(key_of(*part_, call, inputs));
    if (alike == alike_.end()) {
      continue;
    }
    auto const &events = alike->second.events;
    auto &made = alike->second.made;
    auto const is_made = [&](std::size_t at) {
      return ledger_.is_made(script_.events()[events[at]].number);
    };
    // The last one is looked at in any case, for it is made again when none is left.
    while (made + 1 < events.size() && is_made(made)) {
      ++made;
    }
    for (auto at = made; at < events.size(); ++at) {
      bool const is_last = at + 1 == events.size();
      if ((!is_made(at) || is_last) && is_it(script_.events()[events[at]], call, asked)) {
        if (!is_made(at)) {
          return {nullptr, events[at], 0, std::nullopt, false};
        }
        last = events[at];
      }
    }
  }
  if (!last) {
    refuse(call, asked, nearest(call, asked) == nullptr ? first_that_nobody_made() : nullptr);
  }
  return {nullptr, *last, 0, std::nullopt, true};
}

Event const *Playing::nearest(Call const &call, Json const &asked) const {
  Event const *found = nullptr;
  auto fewest = std::numeric_limits<std::size_t>::max();
  for (Event const &event : script_.events()) {
    if (event.part == *part_ && event.call == &call) {
      auto const different = differences(call, inputs_of(event), asked, holdings_, names_).size();
      // Of those that are alike, one that is still to be made.
      bool const is_likelier = found != nullptr && different == fewest &&
                               ledger_.is_made(found->number) && !ledger_.is_made(event.number);
      if (different < fewest || is_likelier) {
        fewest = different;
        found = &event;
      }
    }
  }
  return found;
}

Event const *Playing::first_that_nobody_made() const {
  auto const found = std::ranges::find_if(script_.events(), [this](Event const &event) {
    return event.call != nullptr && event.part == *part_ && !ledger_.is_made(event.number);
  });
  return found == script_.events().end() ? nullptr : &*found;
}

void Playing::refuse(Call const &call, Json const &asked, Event const *next) const {
  auto words = shown(call, asked) +
               (by_ == By::order ? " was not recorded at this place" : " was not recorded");
  auto const *const near = nearest(call, asked);
  if (near != nullptr) {
    auto const different = differences(call, inputs_of(*near), asked, holdings_, names_);
    for (auto const &one : different) {
      words += "\n  " + line_of(*near) + ": " + one;
    }
    if (different.empty()) {
      words += "\n  " + line_of(*near) + ": the same call, which is not the next";
    }
  } else {
    words += "\n  " + trace_ + ": no call of " + std::string(call.name) + " was recorded";
  }
  if (next != nullptr && (next != near || near == nullptr)) {
    words += "\n  " + line_of(*next) + ": next would be " + shown(*next->call, inputs_of(*next));
  } else if (next == nullptr && by_ == By::order) {
    words += "\n  " + trace_ + ": nothing more was recorded of this thread";
  }
  throw Unplayed(words);
}

void Playing::note_own_pointers(Call const &call, Json const &recorded, Words words) {
  for (std::size_t at = 0; at < call.arguments.size(); ++at) {
    Argument const &argument = call.arguments[at];
    if (argument.passing == Passing::handle || argument.passing == Passing::released) {
      auto const given = recorded.find(argument.name);
      if (given != recorded.end() && given->is_object()) {
        auto const number = given->value("at", Json());
        if (number.is_number_integer() && !holdings_.has(number.get<std::uint64_t>())) {
          holdings_.note_own(number.get<std::uint64_t>(), words[at]);
        }
      }
    }
  }
}

std::uint64_t Playing::pointer(Json const &given) {
  if (given.is_null()) {
    return 0;
  }
  auto const number = given.is_object() ? given.value("at", Json()) : Json();
  if (!number.is_number_integer()) {
    throw Misfit("a pointer is none");
  }
  return holdings_.address_of(number.get<std::uint64_t>());
}

void *Playing::function(Event const &call, Words words, std::string_view name) {
  auto const at = index_of(*call.call, name);
  if (at < call.call->arguments.size()) {
    return reinterpret_cast<void *>(words[at]);
  }
  // A list keeps what it was made with beyond the call that it was made by.
  auto const list = call.call->arguments.empty() ? std::nullopt : holdings_.number_of(words[0]);
  auto const functions = holdings_.functions_of(list.value_or(0));
  return name == "alloc" ? functions.alloc : functions.release;
}

std::optional<Callback> Playing::next_callback(InProgress &call, Words words) {
  Event const &event = script_.events()[call.event];
  if (call.inner == event.inner.size()) {
    return std::nullopt;
  }
  call.callback = event.inner[call.inner++];
  Event const &called = script_.events()[*call.callback];
  auto const begin = Json::parse(called.begin);
  auto const argument = text_or_empty(member_of(begin, "argument"));
  auto const in = member_of(begin, "in");
  Callback callback{Callback::Kind::visit, function(event, words, argument), 0, 0};
  if (argument == "callback") {
    callback.first = pointer(member_of(in, "reached"));
    callback.second = pointer(member_of(in, "context"));
  } else if (argument == "alloc") {
    callback.kind = Callback::Kind::alloc;
    auto const size = member_of(in, "size");
    if (!size.is_number_integer()) {
      throw Unplayed(line_of(called) + ": size is no whole number");
    }
    callback.first = size.get<std::uint64_t>();
  } else if (argument == "release") {
    callback.kind = Callback::Kind::release;
    callback.first = pointer(member_of(in, "memory"));
    if (holdings_.is_of_this(callback.first)) {
      throw Unplayed(line_of(called) + ": the tool is to release what it has not allocated");
    }
    holdings_.release(callback.first);
  } else {
    throw Unplayed(line_of(called) + ": no function of a tool is called " + argument);
  }
  if (callback.function == nullptr) {
    throw Unplayed(line_of(called) +
                   ": the host called back, and the tool gave no function for it");
  }
  return callback;
}

void Playing::end_callback(ThreadPlace const &place, InProgress &call, std::uint64_t result) {
  Event const &called = script_.events()[*call.callback];
  call.callback.reset();
  if (called.end.empty()) {
    throw Unplayed(line_of(called) + ": the recording ends within this callback");
  }
  auto const begin = Json::parse(called.begin);
  auto const end = Json::parse(called.end);
  if (member_of(end, "left") == true) {
    throw Unplayed(line_of(called) + ": a jump left this callback, and now it returns");
  }
  auto const argument = text_or_empty(member_of(begin, "argument"));
  auto const recorded = member_of(end, "result");
  if (argument == "callback" && recorded != static_cast<int>(static_cast<char>(result))) {
    throw Unplayed(line_of(called) + ": the callback returned " + recorded.dump() +
                   ", and now returns " +
                   std::to_string(static_cast<int>(static_cast<char>(result))));
  }
  if (argument == "alloc") {
    if (recorded.is_null() != (result == 0)) {
      throw Unplayed(line_of(called) + ": memory was " + (recorded.is_null() ? "not " : "") +
                     "allocated, and now " + (result == 0 ? "is not" : "is"));
    }
    auto const number = recorded.is_object() ? recorded.value("at", Json()) : Json();
    if (number.is_number_integer()) {
      auto const size = member_of(member_of(begin, "in"), "size").get<std::uint64_t>();
      holdings_.adopt(number.get<std::uint64_t>(), result, size);
    }
  }
  if (by_ == By::order) {
    auto const &calls = script_.parts()[*part_].threads.at(*place.thread);
    if (place.next < calls.size()) {
      Event const &left_out = script_.events()[calls[place.next]];
      if (left_out.outer && &script_.events()[*left_out.outer] == &called) {
        throw Unplayed(line_of(left_out) + ": the callback made the call " +
                       shown(*left_out.call, inputs_of(left_out)) + ", and now does not");
      }
    }
  }
}

Ending Playing::end(InProgress const &progress, Words words) {
  Event const &event = script_.events()[progress.event];
  Call const &call = *event.call;
  auto const said = [&](std::string const &what) {
    return Unplayed(line_of(event) + ": " + shown(call, inputs_of(event)) + ": " + what);
  };
  if (event.end.empty()) {
    throw said("the recording ends within this call");
  }
  auto const end = Json::parse(event.end);
  if (member_of(end, "left") == true) {
    throw said("a jump of the tool's own left this call");
  }
  if (auto const trap = member_of(end, "trap"); trap.is_object()) {
    auto const type = member_of(trap, "type");
    auto const text = member_of(trap, "text");
    auto const value = member_of(trap, "value");
    keep_trap_text(text_or_empty(text));
    return {.way = Ending::Way::traps,
            .word = text.is_string() ? 1U : 0U,
            .value = value.is_number_integer() ? value.get<int>() : 1,
            .class_name = type.is_string() ? holdings_.text(type.get<std::string>()) : nullptr};
  }
  try {
    if (succeeded(call, end)) {
      place_outputs(call, inputs_of(event), end, words, progress.is_again);
    }
    return {Ending::Way::returns, returned(call, end), 0, nullptr};
  } catch (Misfit const &misfit) {
    throw said(misfit.what());
  }
}

void Playing::place_outputs(Call const &call, Json const &in, Json const &end, Words words,
                            bool is_again) {
  auto const left = decode_outputs(call, in, names_.of_now(end.value("out", Json::object())),
                                   member_of(end, "result"));
  // All that can be refused comes first: a call that cannot be played leaves nothing.
  std::vector<std::uint64_t> pointers(left.size());
  for (std::size_t at = 0; at < left.size(); ++at) {
    Passing const passing = call.arguments[at].passing;
    if (left[at].is_null) {
      continue;
    }
    if (passing == Passing::out_handle) {
      pointers[at] = holdings_.address_of(left[at].word);
    } else if (passing == Passing::out_memory || passing == Passing::out_pointee) {
      pointers[at] = holdings_.give(left[at].word, left[at].bytes, is_again);
    }
  }
  for (std::size_t at = 0; at < left.size(); ++at) {
    Argument const &argument = call.arguments[at];
    bool const has_place = is_output(argument) && words[at] != 0;
    auto *const place = reinterpret_cast<char *>(words[at]);
    if (has_place && argument.passing >= Passing::out_handle) {
      std::memcpy(place, &pointers[at], sizeof pointers[at]);
    } else if (has_place) {
      std::ranges::copy(left[at].bytes, place);
    } else if (argument.passing == Passing::released) {
      holdings_.release(words[at]);
    }
  }
  auto const alloc = index_of(call, "alloc");
  auto const release = index_of(call, "release");
  if (std::max(alloc, release) < call.arguments.size() && !left.empty()) {
    holdings_.keep_functions(left[0].word, {reinterpret_cast<void *>(words[alloc]),
                                            reinterpret_cast<void *>(words[release])});
  }
}

std::uint64_t Playing::returned(Call const &call, Json const &end) {
  if (call.result == Result::status) {
    auto const status = member_of(end, "status");
    if (!status.is_number_integer()) {
      throw Misfit("it has no status");
    }
    return status.get<std::uint64_t>();
  }
  auto const result = decode_result(call, names_.of_now(member_of(end, "result")));
  if (result.is_null || call.result == Result::number) {
    return result.word;
  }
  if (call.result == Result::handle) {
    return holdings_.address_of(result.word);
  }
  return call.result == Result::text
             ? reinterpret_cast<std::uint64_t>(holdings_.text(result.bytes.data()))
             : 0;
}

void Playing::note_failure(std::string const &words) {
  ledger_.note_failure();
  if (first_failure_.empty()) {
    first_failure_ = words;
  }
}

}  // namespace recordings
