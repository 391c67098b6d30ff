#include "b_format.h"

#include <clocale>
#include <gtest/gtest.h>

namespace base {
namespace {

enum Unscoped { first };
static_assert(!std::is_constructible_v<FormatArg, int*>, "a pointer would print as a truth value");
static_assert(!std::is_constructible_v<FormatArg, Unscoped>);

TEST(Format, ReplacesPlaceholdersInOnePass) {
    const struct {
        string_view pattern;
        vector<FormatArg> args;
        string_view expected;
    } rows[] = {{"{} and {}", {1, 2}, "1 and 2"},
                {"{}{}", {"{}", "b"}, "{}b"},
                {"{} {}", {"only"}, "only {}"},
                {"{,4}{,4}", {"a"}, "   a{,4}"},
                {"none", {1, 2}, "none"},
                {"|{,6}|{,-6}|", {"ab", "cd"}, "|    ab|cd    |"},
                {"|{,2}|{,0}|", {"long", "x"}, "|long|x|"},
                {"{,4}", {"\xC3\xA9\xE2\x82\xAC"}, "  \xC3\xA9\xE2\x82\xAC"},
                {"{0} {:x} { } {,} {,x} {,+3} {,3", {7}, "{0} {:x} { } {,} {,x} {,+3} {,3"},
                {"{{}} {", {"x"}, "{x} {"},
                {"}{}{", {"x"}, "}x{"},
                {"{,99999999999}", {"x"}, "{,99999999999}"},
                {"", {1}, ""}};
    for (const auto& row : rows)
        EXPECT_EQ(formatArgs(row.pattern, {row.args.begin(), row.args.end()}), row.expected)
            << row.pattern;
}

TEST(Format, PrintsEveryKindOfArgument) {
    const char* null = nullptr;
    const string text = "text";
    EXPECT_EQ(format("{} {} {}", static_cast<u8>(65), static_cast<i8>(-1), 'A'), "65 -1 65");
    EXPECT_EQ(format("{} {}", std::numeric_limits<i64>::min(), std::numeric_limits<u64>::max()),
              "-9223372036854775808 18446744073709551615");
    EXPECT_EQ(format("{} {} {}", true, 0.1f, -2.0), "true 0.1 -2");
    EXPECT_EQ(format("{} {} {}", text, string_view("ab\0c", 4), null),
              string_view("text ab\0c (null)", 16));
    EXPECT_EQ(format("{}|{}", nameServer().id("node"), name_id()), "node|");
}

TEST(Format, IgnoresTheLocale) {
    const string before = std::setlocale(LC_ALL, nullptr);
    const char* used = nullptr;
    for (const char* name : {"", "de_DE.UTF-8", "fr_FR.UTF-8"}) {
        if (std::setlocale(LC_ALL, name) && *std::localeconv()->decimal_point == ',')
            used = name;
        if (used)
            break;
    }
    const string printed = format("{} {}", 0.5, 1234567);
    std::setlocale(LC_ALL, before.c_str());
    if (!used)
        GTEST_SKIP() << "no locale with a decimal comma is installed";
    EXPECT_EQ(printed, "0.5 1234567");
}

} // namespace
} // namespace base
