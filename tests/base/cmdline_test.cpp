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

template <class T>
string parsedText(string_view token, const T& defaultValue) {
    CmdLineOptions options;
    CmdLineOption* option = options.add("group", "o", "", "", defaultValue);
    vector<string> errors;
    option->parse("o", {string(token)}, errors);
    return errors.empty() ? option->toString() : "refused";
}

TEST(CmdLine, ConvertsEveryType) {
    EXPECT_EQ(parsedText("YES", false), "o true");
    EXPECT_EQ(parsedText("maybe", false), "refused");
    EXPECT_EQ(parsedText("2.50", 1.0f), "o 2.5");
    EXPECT_EQ(parsedText("2,5", 1.0f), "refused");
    EXPECT_EQ(parsedText("255", u8{0}), "o 255");
    EXPECT_EQ(parsedText("256", u8{0}), "refused");
    EXPECT_EQ(parsedText("4294967296", u32{0}), "refused");
    EXPECT_EQ(parsedText("a b", string()), "o a b");
}

TEST(CmdLine, AddsEachNameOnce) {
    CmdLineOptions options;
    ASSERT_NE(options.add("exporter", "-lights", "-l", "", true), nullptr);
    ASSERT_NE(options.add("importer", "hair", "", "", true), nullptr);
    const std::pair<string_view, string_view> taken[] = {
        {"-lights", ""}, {"lights", ""}, {"l", ""},        {"-hair", ""},
        {"-new", "-l"},  {"-new", "l"},  {"-new", "hair"}, {"-new", "-lights"},
    };
    for (const auto& [name, shortName] : taken)
        EXPECT_EQ(options.add("third", name, shortName, "", true), nullptr) << name << shortName;
    EXPECT_NE(options.add("exporter", "-Lights", "", "", true), nullptr);

    test_support::LogCapture log;
    EXPECT_EQ(options.add("exporter", "", "-x", "", true), nullptr);
    EXPECT_EQ(log.take(),
              (vector<test_support::LogCapture::Entry>{
                  {logAll, logError, "Command line option without a name detected, skipping..."}}));

    ASSERT_EQ(options.groups().size(), 2u);
    EXPECT_EQ(options.groups()[0].name, "exporter");
    EXPECT_EQ(options.groups()[0].options.size(), 2u);
    EXPECT_EQ(options.find("l"), options.find("-lights"));
    EXPECT_EQ(options.find("-hair"), options.groups()[1].options[0].get());
    EXPECT_EQ(options.find(""), nullptr);
    EXPECT_EQ(options.find("-x"), nullptr);
}

TEST(CmdLine, HelpShowsNamesDefaultAndText) {
    CmdLineOptions options;
    auto* factor = options.add("importer", "-factor", "-f", "Scales it.", 0.25f);
    factor->syntax = "NUMBER";
    EXPECT_EQ(factor->help(), "-factor, -f NUMBER (default: 0.25)\n    Scales it.\n");
    EXPECT_EQ(options.add("importer", "-path", "", "", string())->help(), "-path\n");
}

} // namespace
} // namespace base
