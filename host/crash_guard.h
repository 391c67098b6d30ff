#pragma once

#include "b_containers.h"

#include <csignal>

namespace host {

/// While it lives, a fatal signal ends the process in order: one line on the standard error
/// stream tells that the reader of `path` crashed, and the exit code is that of an input that
/// could not be read. Libraries that read foreign files crash on some of them. One at a time.
class CrashGuard {
public:
    explicit CrashGuard(const base::string& path);
    ~CrashGuard();
    CrashGuard(const CrashGuard&) = delete;
    CrashGuard& operator=(const CrashGuard&) = delete;

private:
    static constexpr int signals[] = {SIGSEGV, SIGABRT, SIGBUS, SIGFPE, SIGILL};
    base::string message_; ///< up to the number of the signal
    struct sigaction before_[std::size(signals)];
    stack_t stackBefore_;
};

} // namespace host
