#pragma once

#include "b_format.h"
#include "b_name.h"
#include "b_refcnt.h"

#include <array>
#include <atomic>
#include <cstdio>
#include <mutex>

/// The process-wide log and its outputs.
///
/// Levels: 0 text, 1 critical, 2 error, 3 warning, 4 information, 5 debug.
namespace base {

enum LogLevel : u8 {
    logText = 0,
    logCritical = 1,
    logError = 2,
    logWarning = 3,
    logInformation = 4,
    logDebug = 5,
};

/// Channels.
BASE1_API extern const name_id logAll;    ///< "All": an output on it takes every channel
BASE1_API extern const name_id logSystem; ///< "System"
BASE1_API extern const name_id logScene;  ///< "Scene"
BASE1_API extern const name_id logIO;     ///< "IO"

/// Takes messages. Calls never throw: a formatting failure logs the raw pattern.
class BASE1_API ILog : public RefCntAtomic {
public:
    ~ILog() override;
    /// `text` as it stands, without placeholders.
    virtual void message(name_id channel, int level, string_view text) = 0;
    virtual void hook();
    /// Reports that a task stands at `percent` (clamped to 100).
    virtual void progress(u32 percent, string_view text) = 0;
    virtual void progressEnd() = 0;

    /// Formats and logs a message; costs one comparison if `level` is above the limit. Without
    /// arguments the pattern is the text. An empty pattern logs nothing.
    template <class... Args>
    void log(name_id channel, int level, string_view pattern, const Args&... args) noexcept {
        if (level > levelLimit() || pattern.empty())
            return;
        if constexpr (sizeof...(Args) == 0) {
            logFormatted(channel, level, pattern, {}, false);
        } else {
            const FormatArg list[] = {FormatArg(args)...};
            logFormatted(channel, level, pattern, list, true);
        }
    }

    /// Greatest level let through.
    int levelLimit() const noexcept { return levelLimit_.load(std::memory_order_relaxed); }
    void setLevelLimit(int level) noexcept {
        levelLimit_.store(level, std::memory_order_relaxed);
    }

private:
    void logFormatted(name_id channel, int level, string_view pattern,
                      std::span<const FormatArg> args, bool hasArgs) noexcept;
    std::atomic<int> levelLimit_{logInformation};
};

/// An output. It takes messages of its own channel, or of all if that is `logAll`, up to its own
/// limit. Outputs are called with the log's lock held and must not log.
class BASE1_API ICustomLog : public ILog {
public:
    ~ICustomLog() override;
    name_id channel = logAll;
    u32 indent = 0; ///< in units of two blanks
};

/// The log: keeps a short history and passes each message to the outputs.
class BASE1_API Log final : public ILog {
public:
    Log();
    ~Log() override;
    void message(name_id channel, int level, string_view text) override;
    void progress(u32 percent, string_view text) override;
    void progressEnd() override;

    void addOutput(ref<ICustomLog> output);
    /// False if it was not attached. An output that writes an end to its file does so now.
    bool removeOutput(const ICustomLog* output);

    struct HistoryEntry {
        u64 timeMs = 0;
        int level = -1; ///< -1 marks a free slot
        string text;    ///< channel, "| ", message
    };
    static constexpr std::size_t historyLength = 64;
    /// The history, oldest first.
    vector<HistoryEntry> history() const;
    bool hasErrors() const noexcept { return sawError_; }
    bool hasWarnings() const noexcept { return sawWarning_; }
    /// Empties the history and the two marks.
    void reset();
    /// Replaces the clock of the history (monotonic milliseconds); null restores it.
    void setClock(u64 (*nowMs)());

    u32 progressPercent() const;
    string progressText() const;

private:
    void store(int level, u64 now, string text);

    mutable std::mutex lock_;
    vector<ref<ICustomLog>> outputs_;
    u32 historyMask_;
    std::array<HistoryEntry, historyLength> slots_;
    u64 (*clock_)();
    std::atomic<bool> sawError_{false};
    std::atomic<bool> sawWarning_{false};
    std::atomic<i32> progressCount_{0};
    u32 progressPercent_ = 0;
    string progressText_;
};

/// Plain text into a C file stream, one line a message, flushed at once.
class BASE1_API StdLog : public ICustomLog {
public:
    /// Writes to `file`, which stays the caller's; with null, opens `name` + ".log" and owns it.
    explicit StdLog(const string& name, std::FILE* file = nullptr);
    ~StdLog() override;
    void message(name_id channel, int level, string_view text) override;
    void progress(u32 percent, string_view text) override;
    void progressEnd() override;

    bool levelPrefix = true; ///< "[erro] " and the like before the text

protected:
    std::FILE* file() const noexcept { return file_; }

private:
    std::FILE* file_;
    bool ownsFile_;
    bool terminal_;
};

/// A table in `name` + ".html"; an older file is kept as `name` + "-old.html".
class BASE1_API HtmlLog : public ICustomLog {
public:
    explicit HtmlLog(const string& name);
    ~HtmlLog() override;
    void message(name_id channel, int level, string_view text) override;
    void progress(u32 percent, string_view text) override;
    void progressEnd() override;

private:
    std::FILE* file_;
};

/// The process-wide log. Outputs that are attached at the end of the process are removed then,
/// so that they can finish their files.
BASE1_API Log& log();

/// A `StdLog` on the standard error stream, made at first use and attached to nothing.
BASE1_API StdLog& console();

class ThreadPool;
class StackWalker;
/// Both are null in this build: exports run on one thread, exceptions carry no stack.
BASE1_API ThreadPool* globalThreadPool();
BASE1_API StackWalker* stackWalker();

} // namespace base
