#pragma once

namespace test_support {

/// Bytes that the whole program has asked for so far, given back or not; always 0 where that can't
/// be counted, as under a sanitizer that brings its own allocator.
long allocatedBytes();

} // namespace test_support
