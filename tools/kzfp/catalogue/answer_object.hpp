/// @file
/// An answer as part of a JSON object, for those who put more into it.
#pragma once

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp {

/// Sets everything that an answer says but the name of its file.
void set_answer(JsonObject& object, const Answer& answer, const Lookup& lookup);

} // namespace kzfp
