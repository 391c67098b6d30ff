#include "host/crash_guard.h"

#include "host/exit_code.h"
#include "host/printing.h"

#include <cstring>
#include <unistd.h>

namespace host {

namespace {

constexpr std::size_t stackSize = std::size_t(64) << 10;

/// The handler's own stack: a reader that recurses too deep has used up the other one.
alignas(16) char handlerStack[stackSize];
const char* messageText = nullptr;
std::size_t messageLength = 0;

// Nothing but async-signal-safe calls from here on.

void writeToStderr(const char* text, std::size_t length) {
    while (length > 0) {
        const ssize_t written = write(STDERR_FILENO, text, length);
        if (written <= 0)
            return;
        text += written;
        length -= static_cast<std::size_t>(written);
    }
}

void onFatalSignal(int signal) {
    writeToStderr(messageText, messageLength);
    const char digits[] = {static_cast<char>('0' + signal / 10 % 10),
                           static_cast<char>('0' + signal % 10)};
    const std::size_t unused = signal < 10 ? 1 : 0;
    writeToStderr(digits + unused, sizeof digits - unused);
    constexpr char end[] = "), expected a file that it can read.\n";
    writeToStderr(end, sizeof end - 1);
    _exit(static_cast<int>(ExitCode::input));
}

} // namespace

CrashGuard::CrashGuard(const base::string& path) {
    if (isatty(STDERR_FILENO) != 0)
        message_ = "\r\x1b[K"; // a bar may stand there
    message_.append(programName).append(": error: ").append(printable(path));
    message_.append(": the reader crashed (signal ");
    messageText = message_.data();
    messageLength = message_.size();

    stack_t stack{};
    stack.ss_sp = handlerStack;
    stack.ss_size = stackSize;
    sigaltstack(&stack, &stackBefore_);

    struct sigaction action {};
    action.sa_handler = onFatalSignal;
    action.sa_flags = SA_ONSTACK | SA_RESETHAND; // a fault in the handler ends the process
    sigemptyset(&action.sa_mask);
    for (std::size_t i = 0; i < std::size(signals); ++i)
        sigaction(signals[i], &action, &before_[i]);
}

CrashGuard::~CrashGuard() {
    for (std::size_t i = 0; i < std::size(signals); ++i)
        sigaction(signals[i], &before_[i], nullptr);
    sigaltstack(&stackBefore_, nullptr);
}

} // namespace host
