// What a tool gave to a call beside what a trace has, as words for people.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "recordings/core/decoded.h"
#include "recordings/core/values.h"
#include "recordings/player/holdings.h"
#include "recordings/player/names.h"

namespace recordings {

/// What a tool gives to a call, as a trace would have it: of what was given out its number.
Json asked_inputs(Call const &call, Words words, Holdings const &holdings);

/// Whether they are the same as those of a trace: what they say, which memory and which handles. A
/// pointer that the tool made is only told from none; it is another one in each process.
bool are_same(Call const &call, Json const &recorded, Json const &asked, Holdings const &holdings,
              Names const &names);

/// What differs, a line of words for each value: "mtu: 9000 was recorded, and 1500 asked".
std::vector<std::string> differences(Call const &call, Json const &recorded, Json const &asked,
                                     Holdings const &holdings, Names const &names);

/// Inputs in which all pointers are alike, for a look at which calls may be the same.
std::string without_pointers(Json const &inputs);

/// A call with its inputs, for people: VSDVS_SetMTU(switchName="lab", mtu=9000).
std::string shown(Call const &call, Json const &inputs);

}  // namespace recordings
