#pragma once

#include <cstdio>
#include <cstdlib>

/// Ends the process, for the fuzzer to notice, unless `condition` holds.
inline void require(bool condition, const char* what) {
    if (condition)
        return;
    std::fprintf(stderr, "%s\n", what);
    std::abort();
}
