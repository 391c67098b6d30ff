#include "b_cmdline.h"

#include "log_capture.h"

#include <gtest/gtest.h>

namespace base {
namespace {

TEST(CmdLine, ParsesOrTellsWhatIsWrong) {
    CmdLineOptions options;
    auto* size = options.add("exporter", "-size", "-s", "The size.", u32{4096});
    ASSERT_NE(size, nullptr);
    vector<string> errors;
    size->parse("-size", {}, errors);
    size->parse("-size", {"12", "x"}, errors);
    EXPECT_EQ(errors, (vector<string>{"option '-size': wrong number of values.",
                                      "option '-size': type mismatch."}));
    EXPECT_FALSE(size->seen);
    EXPECT_TRUE(size->values.empty());

    size->syntax = "NUMBER";
    size->valueCount = 2;
    errors.clear();
    size->parse("-s", {"1"}, errors);
    size->parse("-s", {"-1", "2"}, errors);
    EXPECT_EQ(errors, (vector<string>{"option '-s': wrong number of values.\n syntax: -s NUMBER\n",
                                      "option '-s': type mismatch.\n syntax: -s NUMBER\n"}));

    errors.clear();
    size->parse("-size", {"1", " 2"}, errors);
    EXPECT_TRUE(errors.empty());
    size->parse("-s", {"3", "4"}, errors);
    EXPECT_EQ(errors,
              (vector<string>{"option '-s' already specified, ignoring this definition.\n"}));
    EXPECT_EQ(size->toString(), "-size 1 2");
    EXPECT_EQ(size->tokens, (vector<string>{"1", " 2"}));

    size->flags = CmdLineOption::mayRepeat;
    size->parse("-s", {"3", "4"}, errors);
    EXPECT_EQ(size->toString(), "-size 1 2 3 4");
}

TEST(CmdLine, AddsEachNameOnce) {
    CmdLineOptions options;
    ASSERT_NE(options.add("exporter", "-lights", "-l", "", true), nullptr);
    ASSERT_NE(options.add("importer", "hair", "", "", true), nullptr);
    const std::pair<string_view, string_view> taken[] = {
        {"-lights", ""}, {"lights", ""}, {"l", ""},        {"-hair", ""},
        {"-new", "-l"},  {"-new", "l"},  {"-new", "hair"}, {"-new", "-lights"}};
    for (const auto& [name, shortName] : taken)
        EXPECT_EQ(options.add("third", name, shortName, "", true), nullptr) << name << shortName;
    EXPECT_NE(options.add("exporter", "-Lights", "", "", true), nullptr);

    test_support::LogCapture log;
    EXPECT_EQ(options.add("exporter", "", "-x", "", true), nullptr);
    EXPECT_EQ(linesOf(log), "2 Command line option without a name detected, skipping...\n");
    EXPECT_EQ(options.find("l"), options.find("-lights"));
    EXPECT_EQ(options.find("-hair"), options.groups()[1].options[0].get());
    EXPECT_EQ(options.find(""), nullptr);
    EXPECT_EQ(options.find("-x"), nullptr);
}

} // namespace
} // namespace base
