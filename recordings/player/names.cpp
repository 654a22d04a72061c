#include "recordings/player/names.h"

#include <algorithm>
#include <cctype>

namespace recordings {
namespace {

bool is_digit(char one) {
  return std::isdigit(static_cast<unsigned char>(one)) != 0;
}

/// A text in which a number is another one, wherever no digit is beside it.
std::string with_number(std::string_view text, std::string_view number, std::string_view other) {
  std::string made;
  while (!text.empty()) {
    auto const end = std::ranges::find_if_not(text, is_digit) - text.begin();
    auto const digits = text.substr(0, static_cast<std::size_t>(end));
    made += digits == number ? other : digits;
    text.remove_prefix(digits.size());
    if (!text.empty()) {
      made += text.front();
      text.remove_prefix(1);
    }
  }
  return made;
}

template <typename Change>
void change_texts(Json &value, Change change) {
  if (value.is_string()) {
    value = change(value.get_ref<std::string const &>());
  } else if (value.is_structured()) {
    for (auto &one : value) {
      change_texts(one, change);
    }
  }
}

}  // namespace

void Names::note_process(std::int64_t recorded, std::int64_t now) {
  if (recorded != now) {
    processes_.emplace_back(std::to_string(recorded), std::to_string(now));
  }
}

bool Names::are_same(std::string_view recorded, std::string_view asked) const {
  return recorded == asked || std::ranges::any_of(processes_, [&](auto const &process) {
           return with_number(recorded, process.first, process.second) == asked;
         });
}

void Names::learn(Json const &recorded, Json const &asked) {
  if (recorded.is_string() && asked.is_string() && recorded != asked) {
    now_[recorded.get<std::string>()] = asked.get<std::string>();
  } else if (recorded.is_object() && asked.is_object()) {
    for (auto const &[name, value] : recorded.items()) {
      if (auto const found = asked.find(name); found != asked.end()) {
        learn(value, *found);
      }
    }
  } else if (recorded.is_array() && asked.is_array()) {
    for (std::size_t at = 0; at < std::min(recorded.size(), asked.size()); ++at) {
      learn(recorded[at], asked[at]);
    }
  }
}

Json Names::of_now(Json const &recorded) const {
  auto made = recorded;
  if (!now_.empty()) {
    change_texts(made, [this](std::string const &text) {
      auto const found = now_.find(text);
      return found == now_.end() ? text : found->second;
    });
  }
  return made;
}

Json Names::as_recorded(Json const &asked) const {
  auto made = asked;
  change_texts(made, [this](std::string text) {
    for (auto const &[recorded, now] : processes_) {
      text = with_number(text, now, recorded);
    }
    return text;
  });
  return made;
}

}  // namespace recordings
