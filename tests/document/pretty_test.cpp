#include "document_support.h"

#include <random>

namespace document_test {
namespace {

struct Collector : TextSink {
    void write(string_view piece) override { text += piece; }
    string text;
};

string pretty(string_view compact) {
    Collector sink;
    writePretty(compact, sink);
    return sink.text;
}

/// Without the blanks outside of strings.
string compactOf(string_view text) {
    string out;
    bool inString = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (inString || (text[i] != '\n' && text[i] != '\t' && text[i] != ' '))
            out += text[i];
        if (inString && text[i] == '\\')
            out += text[++i];
        else if (text[i] == '"')
            inString = !inString;
    }
    return out;
}

TEST(PrettyText, LaysOutAnExample) {
    EXPECT_EQ(pretty(R"({"a":[1,2.5,-3e-7],"b":{},"c":[],"d":[{"e":"x, y: {[\"\\"},{"f":null}],)"
                     R"("g":{"h":[[1,2],[]],"i":true}})"),
              "{\n"
              "\t\"a\": [1,2.5,-3e-7\n"
              "\t],\n"
              "\t\"b\": {},\n"
              "\t\"c\": [],\n"
              "\t\"d\": [{\n"
              "\t\t\t\"e\": \"x, y: {[\\\"\\\\\"\n"
              "\t\t},{\n"
              "\t\t\t\"f\": null\n"
              "\t\t}\n"
              "\t],\n"
              "\t\"g\": {\n"
              "\t\t\"h\": [[1,2\n"
              "\t\t\t],[]\n"
              "\t\t],\n"
              "\t\t\"i\": true\n"
              "\t}\n"
              "}");
}

string randomValue(std::mt19937& random, int depth) {
    const auto below = [&](u32 n) { return static_cast<u32>(random()) % n; };
    const u32 kind = below(depth > 40 ? 2 : 5);
    if (kind == 0)
        return std::to_string(static_cast<i32>(random()));
    if (kind == 1) {
        // Around the lengths at which the printer changes its way of copying.
        static constexpr u32 lengths[] = {0, 5, 8, 16, 120, 126, 127, 128, 300, 4090, 4096, 70000};
        string text = "\"";
        for (u32 i = lengths[below(std::size(lengths))] + below(4); i > 0; --i) {
            static constexpr const char* units[] = {"{", "}", "[",    "]",    ",",
                                                    ":", " ", "\\\"", "\\\\", "\\n"};
            text += below(30) ? "x" : units[below(std::size(units))];
        }
        return text + '"';
    }
    const bool isObject = kind % 2 == 0;
    string text(1, isObject ? '{' : '[');
    for (u32 i = 0, count = below(depth < 4 ? 8 : 3); i < count; ++i) {
        if (i != 0)
            text += ',';
        if (isObject)
            text.append("\"key").append(std::to_string(i)).append("\":");
        text += randomValue(random, depth + 1);
    }
    return text + (isObject ? '}' : ']');
}

TEST(PrettyText, AddsBlanksAlone) {
    std::mt19937 random(7);
    for (int i = 0; i < 300; ++i) {
        const string compact = "{\"root\":" + randomValue(random, 0) + "}";
        ASSERT_EQ(compactOf(pretty(compact)), compact) << compact.substr(0, 2000);
    }
    // A name whose block ends at or near the end of the printer's buffer of 64 KiB.
    string filled = "[";
    for (int i = 0; i < 15; ++i)
        filled.append("\"").append(4094, 'x').append("\",");
    for (std::size_t length = 4040; length < 4090; ++length) {
        const string compact = filled + "{\"" + string(length, 'y') + "\":1}]";
        ASSERT_EQ(compactOf(pretty(compact)), compact) << length;
    }
    const string deep = string(100, '[') + "{\"a\":1}" + string(100, ']');
    const string inner = "{\n" + string(101, '\t') + "\"a\": 1\n" + string(100, '\t') + "}\n";
    EXPECT_NE(pretty(deep).find(inner + string(99, '\t') + "]"), string::npos);
    EXPECT_EQ(compactOf(pretty(deep)), deep);
}

} // namespace
} // namespace document_test
