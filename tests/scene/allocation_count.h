#pragma once

#include <cstddef>

namespace test_support {

/// Calls for memory by the whole program so far; -1 where they can't be counted, as under a
/// sanitizer that brings its own allocator.
long allocationCount();

} // namespace test_support
