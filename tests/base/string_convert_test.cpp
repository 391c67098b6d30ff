#include "b_string_convert.h"

#include "b_exception.h"

#include <cmath>
#include <gtest/gtest.h>

namespace base {
namespace {

TEST(StringConvert, PrintsRealsByTheRuleOfAttributes) {
    constexpr double infinity = std::numeric_limits<double>::infinity();
    using Row = std::pair<double, string_view>;
    const Row rows[] = {{0, "0"},
                        {-0.0, "-0"},
                        {1, "1"},
                        {100, "100"},
                        {0.5, "0.5"},
                        {-12.25, "-12.25"},
                        {1.0 / 3, "0.333333"},
                        {2.0 / 3, "0.666667"},
                        {4e-7, "0"},
                        {6e-7, "0.000001"},
                        {1234567.8, "1234567.8"},
                        {1.5e30, "1.5e+30"},
                        {1e40, "1e+40"},
                        {-1.23456e300, "-1.23e+300"},
                        {infinity, "inf"},
                        {-infinity, "-inf"},
                        {-std::nan(""), "nan"}};
    for (const auto& [value, text] : rows)
        EXPECT_EQ(toString(value), text);
    EXPECT_EQ(toString(1e22), "10000000000000000000000");
    EXPECT_EQ(toString(1e30), "1000000000000000019884624838656");
}

template <class T>
string readBack(string_view text) {
    T value{};
    if (!tryFromString(text, value))
        return "";
    if constexpr (std::is_integral_v<T>)
        return std::to_string(value);
    else
        return toString(value);
}

TEST(StringConvert, ReadsWholeNumbersInRangeOnly) {
    // An empty text where the number is refused.
    struct Row {
        string_view text, asU8, asI32, asFloat;
    };
    const Row rows[] = {{"0", "0", "0", "0"},
                        {" \t42\r\n", "42", "42", "42"},
                        {"255", "255", "255", "255"},
                        {"256", "", "256", "256"},
                        {"-1", "", "-1", "-1"},
                        {"+1", "", "", ""},
                        {"1 2", "", "", ""},
                        {"1x", "", "", ""},
                        {"0x10", "", "", ""},
                        {"", "", "", ""},
                        {"-", "", "", ""},
                        {"  ", "", "", ""},
                        {"1.5", "", "", "1.5"},
                        {".5", "", "", "0.5"},
                        {"1,5", "", "", ""},
                        {"-25e-2", "", "", "-0.25"},
                        {"3.4028234e38", "", "", "3.4e+38"},
                        {"3.5e38", "", "", ""},
                        {"1e-60", "", "", "0"},
                        {"nan", "", "", ""},
                        {"-inf", "", "", ""}};
    for (const auto& row : rows) {
        EXPECT_EQ(readBack<u8>(row.text), row.asU8) << row.text;
        EXPECT_EQ(readBack<i32>(row.text), row.asI32) << row.text;
        EXPECT_EQ(readBack<float>(row.text), row.asFloat) << row.text;
    }
    EXPECT_EQ(from_string<u64>("18446744073709551615"), std::numeric_limits<u64>::max());
    EXPECT_EQ(from_string<double>("0.1"), 0.1);
    EXPECT_EQ(readBack<double>("1e999"), "");
    EXPECT_EQ(readBack<i32>("-2147483648"), "-2147483648");
    EXPECT_EQ(readBack<i32>("2147483648"), "");
}

TEST(StringConvert, ReadsTruthValuesAndText) {
    for (const char* text : {"1", "true", "YES", " True "})
        EXPECT_TRUE(from_string<bool>(text)) << text;
    for (const char* text : {"0", "false", "No"})
        EXPECT_FALSE(from_string<bool>(text)) << text;
    for (const char* text : {"", "2", "on", "tru", "true false"})
        EXPECT_THROW(from_string<bool>(text), string_conversion_exception) << text;
    EXPECT_EQ(from_string<string>(" as it is "), " as it is ");
    u32 kept = 7;
    EXPECT_FALSE(tryFromString("8x", kept));
    EXPECT_EQ(kept, 7u);
}

TEST(StringConvert, LowersAsciiAlone) {
    EXPECT_EQ(toLower("GLB@Z[`"), "glb@z[`");
    EXPECT_EQ(toLower("\xC3\x84\xC4\xB0I"), "\xC3\x84\xC4\xB0i");
}

TEST(StringConvert, TrimsAndSplits) {
    EXPECT_EQ(trimmed(" \t a b\r\n"), "a b");
    EXPECT_EQ(trimmed(" \n"), "");
    const std::pair<string_view, vector<string_view>> rows[] = {
        {"", {""}}, {"gltf;glb", {"gltf", "glb"}}, {";a;;b;", {"", "a", "", "b", ""}}};
    for (const auto& [text, parts] : rows)
        EXPECT_EQ(split(text, ';'), parts) << text;
}

TEST(StringConvert, ReplacesBrokenUtf8) {
    const std::pair<string_view, string_view> rows[] = {
        {"plain", "plain"},
        {"\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80", "\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80"},
        {string_view("a\0b", 3), string_view("a\0b", 3)},
        {"\xED\x9F\xBF\xEE\x80\x80\xF4\x8F\xBF\xBF", "\xED\x9F\xBF\xEE\x80\x80\xF4\x8F\xBF\xBF"},
        // The examples of the Unicode standard: overlong forms, surrogates, what no sequence
        // begins with, and cut sequences.
        {"\xC0\xAF\xE0\x80\xBF\xF0\x81\x82\x41", "????????A"},
        {"\xED\xA0\x80\xED\xBF\xBF\xED\xAF\x41", "????????A"},
        {"\xF4\x91\x92\x93\xFF\x41\x80\xBF\x42", "?????A??B"},
        {"\xE1\x80\xE2\xF0\x91\x92\xF1\xBF\x41", "????A"},
        {"end\xE2\x82", "end?"}};
    for (const auto& [text, marked] : rows) {
        string expected;
        for (const char c : marked)
            expected += c == '?' ? string("\xEF\xBF\xBD") : string(1, c);
        EXPECT_EQ(toValidUtf8(text), expected);
    }
}

} // namespace
} // namespace base
