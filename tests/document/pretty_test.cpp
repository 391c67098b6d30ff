#include "document_support.h"

#include <random>

namespace document_test {
namespace {

/// Keeps what it is given, and the pieces themselves.
struct Collector : TextSink {
    void write(string_view piece) override {
        text += piece;
        pieces.push_back(piece);
    }
    string text;
    std::vector<string_view> pieces;
};

string pretty(string_view compact) {
    Collector sink;
    writePretty(compact, sink);
    return sink.text;
}

/// The layout rules, one letter at a time.
string slowPretty(string_view compact) {
    string out, levels;
    bool inString = false;
    const auto newLine = [&] { out += '\n' + string(levels.size(), '\t'); };
    for (std::size_t i = 0; i < compact.size(); ++i) {
        const char c = compact[i];
        if (inString) {
            out += c;
            if (c == '\\')
                out += compact[++i];
            inString = c != '"';
            continue;
        }
        const bool wasEmpty = i > 0 && (compact[i - 1] == '{' || compact[i - 1] == '[');
        if (c == '}' || c == ']') {
            levels.pop_back();
            if (!wasEmpty)
                newLine();
        }
        if (!levels.empty() && levels.back() == '{' && compact[i - 1] == '{' && c != '}')
            newLine();
        out += c;
        inString = c == '"';
        if (c == '{' || c == '[')
            levels += c;
        if (c == ':')
            out += ' ';
        if (c == ',' && levels.back() == '{')
            newLine();
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

TEST(PrettyText, AgreesWithTheRulesAppliedLetterByLetter) {
    std::mt19937 random(7);
    for (int i = 0; i < 300; ++i) {
        const string compact = "{\"root\":" + randomValue(random, 0) + "}";
        ASSERT_EQ(pretty(compact), slowPretty(compact)) << compact.substr(0, 2000);
    }
    // A name whose block ends at or near the end of the printer's buffer of 64 KiB.
    string filled = "[";
    for (int i = 0; i < 15; ++i)
        filled.append("\"").append(4094, 'x').append("\",");
    for (std::size_t length = 4040; length < 4090; ++length) {
        const string compact = filled + "{\"" + string(length, 'y') + "\":1}]";
        ASSERT_EQ(pretty(compact), slowPretty(compact)) << length;
    }
    const string deep = string(100, '[') + "{\"a\":1}" + string(100, ']');
    EXPECT_EQ(pretty(deep), slowPretty(deep));
}

TEST(PrettyText, HandsLongStringsOnWhereTheyLie) {
    const string data(500000, 'A');
    const string compact = "{\"uri\":\"" + data + "\",\"n\":1}";
    Collector sink;
    writePretty(compact, sink);
    EXPECT_EQ(sink.text, "{\n\t\"uri\": \"" + data + "\",\n\t\"n\": 1\n}");
    bool found = false;
    for (const string_view piece : sink.pieces)
        found |= piece.size() > data.size() / 2 && piece.data() > compact.data() &&
                 piece.data() < compact.data() + compact.size();
    EXPECT_TRUE(found);
}

} // namespace
} // namespace document_test
