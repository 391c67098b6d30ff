#pragma once

/// Marks what the shared library `base1` exports. Everything else is hidden: the libraries are
/// compiled with hidden visibility, so that a process holds one copy of each exported symbol.
/// Classes that are thrown or cast across module borders carry it too: their type information
/// must be one object per process.
#define BASE1_API __attribute__((visibility("default")))
