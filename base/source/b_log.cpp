#include "b_log.h"

#include <algorithm>
#include <chrono>
#include <cstdlib>

namespace base {

namespace {

// Only what went wrong is kept; text, information and debug would push it out.
constexpr u32 historyLevels = 1u << logCritical | 1u << logError | 1u << logWarning;
constexpr u64 protectedMs = 20000; ///< so long an error can't be displaced by a warning

u64 monotonicMs() {
    const auto now = std::chrono::steady_clock::now().time_since_epoch();
    return static_cast<u64>(std::chrono::duration_cast<std::chrono::milliseconds>(now).count());
}

bool isStored(int level) {
    return level >= 0 && level < 32 && (historyLevels >> level & 1) != 0;
}

thread_local bool insideOutputs = false;

/// Marks the thread as being inside the outputs, where the lock is held and logging would wait
/// for ever.
class OutputsMark : public NonCopyable {
public:
    OutputsMark() { insideOutputs = true; }
    ~OutputsMark() { insideOutputs = false; }
};

template <class Outputs, class Call>
void callOutputs(Outputs& outputs, Call call) {
    const OutputsMark mark;
    for (const ref<ICustomLog>& output : std::as_const(outputs)) {
        try {
            call(*output);
        } catch (...) {
            // An output's fault loses its line and nothing else.
        }
    }
}

void finishQuietly(ICustomLog& output) {
    try {
        output.finish();
    } catch (...) {
        // As for messages: the file lacks its end.
    }
}

void printToStderr(name_id channel, string_view text) {
    const string_view name = channel.view();
    std::fwrite(name.data(), 1, name.size(), stderr);
    std::fputs("| ", stderr);
    std::fwrite(text.data(), 1, text.size(), stderr);
    std::fputc('\n', stderr);
}

} // namespace

ILog::~ILog() = default;

void ILog::hook() {}

void ILog::logFormatted(name_id channel, int level, string_view pattern,
                        std::span<const FormatArg> args, bool hasArgs) noexcept {
    string formatted;
    string_view text = pattern;
    try {
        if (hasArgs) {
            formatted = formatArgs(pattern, args);
            text = formatted;
        }
    } catch (...) {
        // The raw pattern still says what happened.
    }
    try {
        message(channel, level, text);
    } catch (...) {
        // A message is never worth an exception in the code that logs it.
    }
}

ICustomLog::~ICustomLog() = default;

void ICustomLog::finish() {}

Log::Log() : clock_(monotonicMs) {}

Log::~Log() {
    removeOutputs();
}

void Log::message(name_id channel, int level, string_view text) {
    if (level > levelLimit())
        return;
    if (insideOutputs) {
        printToStderr(channel, text);
        return;
    }
    const std::lock_guard guard(lock_);
    if (level == logCritical || level == logError)
        sawError_ = true;
    else if (level == logWarning)
        sawWarning_ = true;
    if (isStored(level)) {
        try {
            store(channel, level, text);
        } catch (...) {
            // Without memory for the history the outputs still get the message.
        }
    }
    callOutputs(outputs_, [&](ICustomLog& output) {
        if (output.takes(channel, level))
            output.message(channel, level, text);
    });
}

void Log::store(name_id channel, int level, string_view text) {
    HistoryEntry entry{clock_(), level, string(channel.view())};
    entry.text.append("| ").append(text);
    if (history_.size() >= historyLength) {
        const HistoryEntry* freed = history_.cbegin();
        if (level > logError) {
            freed = std::find_if(history_.cbegin(), history_.cend(), [&](const HistoryEntry& e) {
                return e.level > logError || entry.timeMs >= e.timeMs + protectedMs;
            });
        }
        if (freed == history_.cend())
            return;
        history_.erase(freed);
    }
    history_.push_back(std::move(entry));
}

void Log::progress(u32 percent, string_view text) {
    if (insideOutputs)
        return;
    const u32 clamped = std::min(percent, 100u);
    const std::lock_guard guard(lock_);
    if (taskUnderWay_ && clamped == progressPercent_)
        return;
    taskUnderWay_ = true;
    progressPercent_ = clamped;
    progressText_ = text;
    callOutputs(outputs_, [&](ICustomLog& output) { output.progress(clamped, text); });
}

void Log::progressEnd() {
    if (insideOutputs)
        return;
    const std::lock_guard guard(lock_);
    if (!taskUnderWay_)
        return;
    taskUnderWay_ = false;
    callOutputs(outputs_, [](ICustomLog& output) { output.progressEnd(); });
}

void Log::addOutput(ref<ICustomLog> output) {
    if (!output)
        return;
    const std::lock_guard guard(lock_);
    outputs_.push_back(std::move(output));
}

bool Log::removeOutput(const ICustomLog* output) {
    ref<ICustomLog> removed;
    {
        const std::lock_guard guard(lock_);
        const auto at = std::find(outputs_.cbegin(), outputs_.cend(), output);
        if (at == outputs_.cend())
            return false;
        removed = *at;
        outputs_.erase(at);
    }
    finishQuietly(*removed);
    return true;
}

void Log::removeOutputs() {
    vector<ref<ICustomLog>> removed;
    {
        const std::lock_guard guard(lock_);
        removed.swap(outputs_);
    }
    for (const ref<ICustomLog>& output : removed)
        finishQuietly(*output);
}

vector<Log::HistoryEntry> Log::history() const {
    const std::lock_guard guard(lock_);
    return history_;
}

void Log::reset() {
    const std::lock_guard guard(lock_);
    history_.clear();
    sawError_ = false;
    sawWarning_ = false;
}

void Log::setClock(u64 (*nowMs)()) {
    const std::lock_guard guard(lock_);
    clock_ = nowMs ? nowMs : monotonicMs;
}

u32 Log::progressPercent() const {
    const std::lock_guard guard(lock_);
    return progressPercent_;
}

string Log::progressText() const {
    const std::lock_guard guard(lock_);
    return progressText_;
}

Log& log() {
    static Log& instance = *[] {
        std::atexit([] { log().removeOutputs(); });
        return new Log;
    }();
    return instance;
}

ThreadPool* globalThreadPool() {
    return nullptr;
}

StackWalker* stackWalker() {
    return nullptr;
}

} // namespace base
