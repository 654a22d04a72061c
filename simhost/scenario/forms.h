// Values as documents say them: what a form tells, in both directions.
#pragma once

#include <span>
#include <string_view>
#include <vector>

#include "model/properties/form.h"
#include "scenario/document.h"

namespace simhost::scenario {

/// Makes the object what a document says; what is not said stays. Throws DocumentError for what is
/// no such value.
void read(Form const &form, Node const &node, void *object);

/// Likewise for members alone: other keys are left alone.
void read_members(std::span<Member const> members, Node const &node, void *object);
std::vector<std::string_view> names_of(std::span<Member const> members);

/// What documents say of the object.
Json to_json(Form const &form, void const *object);

/// Likewise for members alone, which are added to an object.
void add_members(Json &said, std::span<Member const> members, void const *object);

/// What there is to say: kinds, bounds and words, and the defaults that members have in the object.
Json form_to_json(Form const &form, void const *defaults);

}  // namespace simhost::scenario
