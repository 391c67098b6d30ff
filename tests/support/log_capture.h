#pragma once

#include "b_log.h"

#include <ostream>

namespace test_support {

/// Collects what the process-wide log receives, of all channels and levels, while it lives.
class LogCapture {
public:
    struct Entry {
        base::name_id channel;
        int level;
        base::string text;
        friend bool operator==(const Entry&, const Entry&) = default;
    };

    LogCapture() : limitBefore_(base::log().levelLimit()) {
        output_->setLevelLimit(base::logDebug);
        base::log().setLevelLimit(base::logDebug);
        base::log().addOutput(output_);
    }
    ~LogCapture() {
        base::log().removeOutput(output_.get());
        base::log().setLevelLimit(limitBefore_);
    }
    LogCapture(const LogCapture&) = delete;
    LogCapture& operator=(const LogCapture&) = delete;

    const base::vector<Entry>& entries() const { return output_->entries; }
    /// What came since the last call.
    base::vector<Entry> take() {
        base::vector<Entry> taken;
        taken.swap(output_->entries);
        return taken;
    }
    bool has(int level, base::string_view text) const {
        for (const Entry& entry : entries())
            if (entry.level == level && entry.text == text)
                return true;
        return false;
    }

private:
    class Output final : public base::ICustomLog {
    public:
        void message(base::name_id channel, int level, base::string_view text) override {
            entries.push_back({channel, level, base::string(text)});
        }
        void progress(base::u32, base::string_view) override {}
        void progressEnd() override {}
        base::vector<Entry> entries;
    };

    base::ref<Output> output_ = base::makeRef<Output>();
    int limitBefore_;
};

inline void PrintTo(const LogCapture::Entry& entry, std::ostream* out) {
    *out << entry.channel.view() << ' ' << entry.level << ' ' << entry.text;
}

/// The messages up to a level as lines, each with its level in front.
inline base::string linesOf(const LogCapture& log, int level = base::logDebug) {
    base::string text;
    for (const LogCapture::Entry& entry : log.entries())
        if (entry.level <= level)
            text += base::format("{} {}\n", entry.level, entry.text);
    return text;
}
inline base::string problems(const LogCapture& log) {
    return linesOf(log, base::logWarning);
}

} // namespace test_support
