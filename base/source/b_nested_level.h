#pragma once

#include "b_types.h"

namespace base {

/// Counts a map or array in `depth` others. Throws `exception`, naming `function`, beyond 256
/// levels, since whatever walks over them recurses.
void enterLevel(u32& depth, const char* function);

} // namespace base
