#pragma once

#include "b_format.h"
#include "b_name.h"
#include "b_refcnt.h"

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

/// Takes messages. Logging never throws: a formatting failure logs the raw pattern.
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
    void setLevelLimit(int level) noexcept { levelLimit_.store(level, std::memory_order_relaxed); }

private:
    void logFormatted(name_id channel, int level, string_view pattern,
                      std::span<const FormatArg> args, bool hasArgs) noexcept;
    std::atomic<int> levelLimit_{logInformation};
};

/// An output. Outputs are called with the log's lock held and must not log: what they log all
/// the same goes to the standard error stream. What they throw is dropped.
class BASE1_API ICustomLog : public ILog {
public:
    ~ICustomLog() override;
    /// Called when the log lets the output go, at the latest at the end of the process: writes
    /// what ends a file. Does nothing here.
    virtual void finish();
    /// True for a message of the output's own channel, or of any if that is `logAll`, up to its
    /// own limit. The log passes on nothing else.
    bool takes(name_id messageChannel, int level) const noexcept {
        return level <= levelLimit() && (channel == logAll || channel == messageChannel);
    }

    name_id channel = logAll;
    u32 indent = 0; ///< in units of two blanks
};

/// The log: keeps a short history and passes each message to the outputs. Everything takes one
/// lock and may be called on any thread.
class BASE1_API Log final : public ILog {
public:
    Log();
    ~Log() override;
    void message(name_id channel, int level, string_view text) override;
    /// Passed on unless a task is under way that stands at `percent` already.
    void progress(u32 percent, string_view text) override;
    /// Passed on if a task is under way.
    void progressEnd() override;

    /// Null is ignored.
    void addOutput(ref<ICustomLog> output);
    /// Finishes the output; false if it was not attached.
    bool removeOutput(const ICustomLog* output);
    void removeOutputs();

    struct HistoryEntry {
        u64 timeMs = 0;
        int level = logText;
        string text; ///< channel, "| ", message
    };
    static constexpr std::size_t historyLength = 64;
    /// The last messages of levels 1 to 3, oldest first. Recent errors are not displaced by
    /// warnings: a full history takes a warning only in the place of one, or of an error that is
    /// 20 seconds old.
    vector<HistoryEntry> history() const;
    /// True once a message of level 1 or 2 came.
    bool hasErrors() const noexcept { return sawError_; }
    /// True once a message of level 3 came.
    bool hasWarnings() const noexcept { return sawWarning_; }
    /// Empties the history and the two marks.
    void reset();
    /// Replaces the clock of the history (monotonic milliseconds); null restores it.
    void setClock(u64 (*nowMs)());

    u32 progressPercent() const;
    string progressText() const;

private:
    void store(name_id channel, int level, string_view text);

    mutable std::mutex lock_;
    vector<ref<ICustomLog>> outputs_;
    vector<HistoryEntry> history_;
    u64 (*clock_)();
    std::atomic<bool> sawError_{false};
    std::atomic<bool> sawWarning_{false};
    bool taskUnderWay_ = false; ///< between `progress` and `progressEnd`
    u32 progressPercent_ = 0;
    string progressText_;
};

/// Plain text into a C file stream, one line a message with the time in front, flushed at once;
/// coloured by level on a terminal. Progress is not shown.
class BASE1_API StdLog : public ICustomLog {
public:
    /// Writes to `file`, which stays the caller's; with null, opens `name` + ".log" and owns it.
    /// A file that can't be opened is reported on the standard error stream; messages are
    /// dropped then.
    explicit StdLog(const string& name, std::FILE* file = nullptr);
    ~StdLog() override;
    void message(name_id channel, int level, string_view text) override;
    void progress(u32 percent, string_view text) override;
    void progressEnd() override;

    bool levelPrefix = true; ///< "[erro] " and the like before the text

private:
    std::FILE* file_; ///< null if it could not be opened
    bool ownsFile_;
    bool terminal_;
};

/// A table in `name` + ".html"; an older regular file is kept as `name` + "-old.html". What can't
/// be opened is dealt with as in `StdLog`. Once finished, it drops further messages.
class BASE1_API HtmlLog : public ICustomLog {
public:
    explicit HtmlLog(const string& name);
    ~HtmlLog() override;
    void message(name_id channel, int level, string_view text) override;
    void progress(u32 percent, string_view text) override;
    void progressEnd() override;
    void finish() override;
    /// True if the file could not be opened or, as known once finished, not be written whole.
    bool hasFailed() const noexcept { return failed_; }

private:
    std::FILE* file_; ///< null if it could not be opened, and once finished
    bool failed_ = false;
};

/// The process-wide log. Outputs that are still attached at the end of the process are removed
/// then, so that they can finish their files.
BASE1_API Log& log();

/// A `StdLog` on the standard error stream, made at first use and attached to nothing.
BASE1_API StdLog& console();

class ThreadPool;
class StackWalker;
/// Both are null in this build: exports run on one thread, exceptions carry no stack.
BASE1_API ThreadPool* globalThreadPool();
BASE1_API StackWalker* stackWalker();

} // namespace base
