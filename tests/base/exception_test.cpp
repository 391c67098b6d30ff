#include "b_exception.h"

#include "b_log.h"

#include <gtest/gtest.h>

namespace base {
namespace {

vector<string> reported(const exception& error) {
    const ref<Log> log = makeRef<Log>();
    error.report(*log);
    vector<string> lines;
    for (const Log::HistoryEntry& entry : std::as_const(*log).history()) {
        EXPECT_EQ(entry.level, logError);
        lines.push_back(entry.text);
    }
    return lines;
}

TEST(Exception, ReportsItself) {
    EXPECT_EQ(reported(exception("{} of it", "b_file", "base::f", 12)),
              (vector<string>{"System| {} of it\n    File: b_file (12)\nFunction: base::f"}));
    EXPECT_EQ(reported(exception("alone")),
              (vector<string>{"System| alone\n    File: (null) (0)\nFunction: (null)"}));
    const api_exception api("denied", 13, "b_fs", "base::fs::f", 7);
    EXPECT_EQ(reported(api),
              (vector<string>{"System| denied(13)\n    File: b_fs (7)\nFunction: base::fs::f\n"}));
    EXPECT_EQ(api.code(), 13);

    exception traced("x");
    traced.setCallStack("f()\n{}");
    const exception copy = traced;
    EXPECT_EQ(reported(copy), (vector<string>{"System| x\n    File: (null) (0)\nFunction: (null)",
                                              "System| Call stack:", "System| f()\n{}"}));
}

} // namespace
} // namespace base
