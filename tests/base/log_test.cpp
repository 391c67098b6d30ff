#include "b_log.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <sstream>
#include <unistd.h>

namespace base {
namespace {

/// Keeps what it is told, one text for each call.
class Recorder final : public ICustomLog {
public:
    void message(name_id, int level, string_view text) override {
        calls.push_back(format("{} {}", level, text));
    }
    void progress(u32 percent, string_view text) override {
        calls.push_back(format("{}% {}", percent, text));
    }
    void progressEnd() override { calls.push_back("end"); }
    void finish() override { calls.push_back("finish"); }

    vector<string> calls;
};

u64 testTime = 0;

/// A log of its own with a clock that stands until it is moved.
class LogTest : public testing::Test {
protected:
    LogTest() {
        log_->setClock([] { return testTime; });
        log_->addOutput(recorder_);
    }
    void TearDown() override { std::filesystem::remove_all(folder_); }

    void fillHistory(int level, u64 startMs) {
        for (std::size_t i = 0; i < Log::historyLength; ++i) {
            testTime = startMs + i;
            log_->log(logScene, level, "old {}", i);
        }
    }
    string path(const string& name) {
        std::filesystem::create_directories(folder_);
        return folder_ + "/" + name;
    }
    static string contentOf(const string& path) {
        std::ostringstream text;
        text << std::ifstream(path).rdbuf();
        return text.str();
    }

    /// With a zero for every digit, so that times compare.
    static string withZeros(string text) {
        std::replace_if(
            text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; }, '0');
        return text;
    }

    ref<Log> log_ = makeRef<Log>();
    ref<Recorder> recorder_ = makeRef<Recorder>();

private:
    string folder_ = testing::TempDir() + "log_test_" + std::to_string(getpid());
};

TEST_F(LogTest, FormatsAndFilters) {
    log_->log(logSystem, logWarning, "{} of {}", 1, "{}");
    log_->log(logSystem, logWarning, "{} as it stands");
    log_->log(logSystem, logDebug, "above the limit");
    log_->log(logSystem, logText, "");
    log_->setLevelLimit(logDebug);
    log_->log(logSystem, logDebug, "above the output's limit");
    recorder_->setLevelLimit(logDebug);
    log_->log(logAll, logDebug, "any channel");
    recorder_->channel = logIO;
    log_->log(logScene, logError, "another channel");
    log_->log(logAll, logError, "not even the one that takes all");
    log_->log(logIO, logError, "own channel");
    EXPECT_EQ(recorder_->calls,
              (vector<string>{"3 1 of {}", "3 {} as it stands", "5 any channel", "2 own channel"}));
}

TEST_F(LogTest, KeepsProblemsInTheHistory) {
    for (const int level : {0, 1, 2, 3, 4})
        log_->log(logIO, level, "level {}", level);
    testTime = 5;
    log_->log(name_id(), logError, "no channel");
    const auto history = log_->history();
    ASSERT_EQ(history.size(), 4u);
    EXPECT_EQ(history[0].text, "IO| level 1");
    EXPECT_EQ(history[3].text, "| no channel");
    EXPECT_EQ(history[3].timeMs, 5u);

    for (const int level : {0, 1, 2, 3, 4}) {
        log_->reset();
        log_->log(logIO, level, "x");
        EXPECT_EQ(log_->hasErrors(), level == logCritical || level == logError) << level;
        EXPECT_EQ(log_->hasWarnings(), level == logWarning) << level;
    }
}

TEST_F(LogTest, WarningsDoNotDisplaceRecentErrors) {
    const struct {
        const char* name;
        int heldLevel, newLevel;
        u64 ageMs; ///< of the oldest entry; each other one is 1 ms younger
        const char* first;
        const char* last;
    } rows[] = {{"recent errors stay", 2, 3, 19'999, "Scene| old 0", "Scene| old 63"},
                {"an old error goes", 2, 3, 20'000, "Scene| old 1", "Scene| new"},
                {"a warning goes at once", 3, 3, 100, "Scene| old 1", "Scene| new"},
                {"errors take the oldest", 2, 2, 100, "Scene| old 1", "Scene| new"},
                {"critical ones too", 3, 1, 100, "Scene| old 1", "Scene| new"}};
    for (const auto& row : rows) {
        log_->reset();
        fillHistory(row.heldLevel, 1000);
        testTime = 1000 + row.ageMs;
        log_->log(logScene, row.newLevel, "new");
        const auto history = log_->history();
        ASSERT_EQ(history.size(), 64u) << row.name;
        EXPECT_EQ(history.front().text, row.first) << row.name;
        EXPECT_EQ(history.back().text, row.last) << row.name;
    }
    // A warning among errors is found although it is not the oldest.
    log_->reset();
    log_->log(logScene, logError, "oldest");
    log_->log(logScene, logWarning, "goes");
    fillHistory(logError, testTime);
    log_->log(logScene, logWarning, "new");
    EXPECT_EQ(log_->history()[0].text, "Scene| old 0");
    EXPECT_EQ(log_->history()[63].text, "Scene| old 63");
}

TEST_F(LogTest, TellsOutputsOfProgressOnce) {
    log_->progressEnd();
    log_->progress(0, "start");
    log_->progress(0, "same");
    log_->progress(150, "clamped");
    log_->progress(200, "same");
    EXPECT_EQ(log_->progressPercent(), 100u);
    EXPECT_EQ(log_->progressText(), "clamped");
    log_->progressEnd();
    log_->progressEnd();
    log_->progress(100, "new task");
    EXPECT_EQ(recorder_->calls,
              (vector<string>{"0% start", "100% clamped", "end", "100% new task"}));
}

TEST_F(LogTest, SurvivesOutputsThatThrowOrLog) {
    struct Unruly final : ICustomLog {
        explicit Unruly(Log& owner) : owner_(owner) {}
        void message(name_id, int, string_view text) override {
            owner_.log(logScene, logError, "from inside: {}", text);
            owner_.progress(1, "from inside");
            throw std::runtime_error("full");
        }
        void progress(u32, string_view) override { throw 1; }
        void progressEnd() override { throw 1; }
        void finish() override { throw 1; }
        Log& owner_;
    };
    log_->removeOutput(recorder_.get());
    const ref<Unruly> unruly = makeRef<Unruly>(*log_);
    log_->addOutput(unruly);
    log_->addOutput(recorder_);
    log_->addOutput(nullptr);
    recorder_->calls.clear();
    testing::internal::CaptureStderr();
    log_->log(logIO, logError, "outer");
    log_->progress(3, "task");
    log_->progressEnd();
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "Scene| from inside: outer\n");
    EXPECT_EQ(log_->history().size(), 1u);
    EXPECT_TRUE(log_->removeOutput(unruly.get()));
    EXPECT_FALSE(log_->removeOutput(unruly.get()));
    EXPECT_EQ(recorder_->calls, (vector<string>{"2 outer", "3% task", "end"}));
}

TEST_F(LogTest, WritesPlainLines) {
    const string name = path("plain");
    {
        const ref<StdLog> output = makeRef<StdLog>(name);
        log_->addOutput(output);
        log_->setLevelLimit(logDebug);
        output->setLevelLimit(logDebug);
        for (int level = 0; level <= 5; ++level)
            log_->log(logIO, level, "a <b> & {}", level);
        output->indent = 2;
        output->levelPrefix = false;
        log_->log(logIO, logError, "indented");
        log_->removeOutput(output.get());
    }
    const string text = withZeros(contentOf(name + ".log"));
    const std::size_t first = text.find('\n') + 1;
    EXPECT_TRUE(text.starts_with("Build from "));
    EXPECT_TRUE(text.substr(0, first).ends_with(" 0000 00:00:00\n")) << text;
    EXPECT_EQ(text.substr(first),
              "00:00:00 a <b> & 0\n00:00:00 [crit] a <b> & 0\n00:00:00 [erro] a <b> & 0\n"
              "00:00:00 [warn] a <b> & 0\n00:00:00 [info] a <b> & 0\n"
              "00:00:00 [debg] a <b> & 0\n00:00:00     indented\n");
}

TEST_F(LogTest, WritesAnHtmlTable) {
    const string name = path("a&b");
    std::ofstream(name + ".html") << "older";
    const ref<HtmlLog> output = makeRef<HtmlLog>(name);
    log_->addOutput(output);
    output->indent = 1;
    log_->log(logIO, logError, "<i> & \"x\"");
    const string open = contentOf(name + ".html");
    log_->removeOutput(output.get());
    output->message(logIO, logError, "late");
    const string closed = contentOf(name + ".html");

    EXPECT_EQ(contentOf(name + "-old.html"), "older");
    EXPECT_TRUE(open.starts_with("<html>\n<head>\n<meta "));
    for (const char* part :
         {"charset=utf-8", "<title>Application Log</title>\n", "</head>\n\n<body>\n",
          "<h2>a&amp;b log</h2>\n<div>Compilation date ",
          "</div>\n<div class=\"box\">\n<table width=\"100%\">\n<tr>\n<td class=\"time\">"})
        EXPECT_NE(open.find(part), string::npos) << part;
    EXPECT_TRUE(open.ends_with("</td>\n<td class=\"err\"><pre>  &lt;i&gt; &amp; \"x\"</pre></td>\n"
                               "</tr>\n"));
    ASSERT_TRUE(closed.starts_with(open));
    EXPECT_EQ(withZeros(closed.substr(open.size())),
              "</table>\n</div><div>Terminated at 00:00:00</div>\n");
}

TEST_F(LogTest, FilesThatCannotBeOpenedAreReported) {
    testing::internal::CaptureStderr();
    log_->addOutput(makeRef<StdLog>("/nowhere/log"));
    log_->addOutput(makeRef<HtmlLog>("/nowhere/log"));
    log_->log(logIO, logError, "still here");
    log_->removeOutputs();
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "Cannot open '/nowhere/log.log' for writing!\n"
              "Cannot open '/nowhere/log.html' for writing!\n");
    EXPECT_EQ(recorder_->calls, (vector<string>{"2 still here", "finish"}));
}

TEST_F(LogTest, FilesAreFinishedAtTheEndOfTheProcess) {
    const string name = path("exit");
    const auto exitWithOutput = [&] {
        log().addOutput(makeRef<HtmlLog>(name));
        std::exit(0);
    };
    EXPECT_EXIT(exitWithOutput(), testing::ExitedWithCode(0), "");
    EXPECT_NE(contentOf(name + ".html").find("</table>"), string::npos);
}

} // namespace
} // namespace base
