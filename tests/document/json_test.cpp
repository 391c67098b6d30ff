#include "document_support.h"

#include "b_exception.h"

#include <charconv>
#include <cmath>
#include <random>

namespace document_test {
namespace {

string floatText(float value) {
    TextBuffer text;
    JsonWriter(text).floatValue(value);
    return {text.GetString(), text.GetSize()};
}

string stringText(string_view value) {
    TextBuffer text;
    JsonWriter(text).textValue(value);
    return {text.GetString(), text.GetSize()};
}

TEST(JsonNumbers, HaveTheShortestFormOfTheWidenedFloat) {
    using Row = std::pair<float, const char*>;
    constexpr float infinity = std::numeric_limits<float>::infinity();
    const Row rows[] = {{0.0f, "0"},
                        {-0.0f, "0"},
                        {1.0f, "1.0"},
                        {-1.0f, "-1.0"},
                        {100.0f, "100.0"},
                        {65536.0f, "65536.0"},
                        {16777216.0f, "16777216.0"},
                        {0.5f, "0.5"},
                        {-1.5f, "-1.5"}};
    for (const auto& [value, text] : rows)
        EXPECT_EQ(floatText(value), text);
    const Row longRows[] = {{0.1f, "0.10000000149011612"},
                            {0.12f, "0.11999999731779099"},
                            {1e-5f, "0.000009999999747378752"},
                            {1e-7f, "1.0000000116860974e-7"},
                            {0x1p69f, "590295810358705700000.0"},
                            {0x1p-149f, "1.401298464324817e-45"},
                            // No JSON number: the text must at least stay well-formed.
                            {infinity, "1.797693134862316e308"},
                            {-infinity, "-1.797693134862316e308"},
                            {NAN, "2.696539702293474e308"}};
    for (const auto& [value, text] : longRows)
        EXPECT_EQ(floatText(value), text);
}

// A shortcut for some values must not give them another form than the library's.
TEST(JsonNumbers, AgreeWithThePlainWriterAndReadBack) {
    std::mt19937 random(1);
    for (int i = 0; i < 200000; ++i) {
        float value = std::bit_cast<float>(static_cast<u32>(random()));
        if (i % 2)
            value = static_cast<float>(i - 100000) / static_cast<float>(1 << (i % 5));
        if (!std::isfinite(value) || value == 0)
            continue;
        rapidjson::StringBuffer plain;
        rapidjson::Writer<rapidjson::StringBuffer>(plain).Double(value);
        const string text = floatText(value);
        ASSERT_EQ(text, plain.GetString());
        double read = 0;
        std::from_chars(text.data(), text.data() + text.size(), read);
        ASSERT_EQ(read, value);
    }
}

TEST(JsonText, EscapesAndRepairsStrings) {
    using Row = std::pair<string, string>;
    const Row rows[] = {{"", R"("")"},
                        {"plain / text", R"("plain / text")"},
                        {"a\"b\\c", R"("a\"b\\c")"},
                        {string("\n\t\x01\x1f\0!", 6), R"("\n\t\u0001\u001F\u0000!")"},
                        {"\x7f", "\"\x7f\""},
                        {"K\xc3\xa4se \xf0\x9f\xa7\x80", "\"K\xc3\xa4se \xf0\x9f\xa7\x80\""},
                        {"a\xffz", "\"a\xef\xbf\xbdz\""},
                        {"\"\xc3", "\"\\\"\xef\xbf\xbd\""}};
    for (const auto& [value, text] : rows)
        EXPECT_EQ(stringText(value), text);
}

TEST(JsonText, RefusesStringsThatTheLibraryCanNotMeasure) {
    TextBuffer text;
    JsonWriter writer(text);
    EXPECT_THROW(writer.textValue(string((std::size_t(1) << 28) + 1, 'x')), base::exception);
}

TEST(ObjectBase, WritesNameExtensionsAndExtrasInOrder) {
    Object object;
    EXPECT_EQ(written(object), "{}");
    object.extras["z"] = makeRef<Object>();
    object.extensions["B"] = makeRef<Extension>();
    object.extensions["A\"\n"] = makeRef<Extension>();
    object.extensions["B"]->name = "inner";
    object.name = "n";
    EXPECT_EQ(written(object),
              R"({"name":"n","extensions":{"A\"\n":{},"B":{"name":"inner"}},"extras":{"z":{}}})");
}

TEST(ObjectBase, CloneSharesReferencesAndKeepsTheStringId) {
    Node node, copy;
    node.id = 4;
    node.stringId = "s";
    node.children.push_back(namedNode("child"));
    node.mesh = makeRef<Mesh>();
    node.extras["e"] = makeRef<Object>();
    node.clone(&copy);
    EXPECT_EQ(copy.extras["e"], node.extras["e"]);
    EXPECT_EQ(copy.getStringId(), "node_4");
    EXPECT_EQ(copy.mesh, node.mesh);
    ASSERT_EQ(copy.children.size(), 1u);
    EXPECT_NE(copy.children[0], node.children[0]);
    EXPECT_EQ(copy.children[0]->name, "child");

    Mesh mesh, meshCopy;
    auto primitive = makeRef<Primitive>();
    primitive->attributes["P"] = makeRef<Accessor>(Accessor::Type::vec3, componentFloat);
    primitive->attributes["P"]->id = 7;
    primitive->mode = 4;
    mesh.primitives.push_back(primitive);
    mesh.weights.push_back(0.5f);
    mesh.clone(&meshCopy);
    primitive->mode = 1;
    EXPECT_EQ(written(meshCopy),
              R"({"primitives":[{"attributes":{"P":7},"mode":4}],"weights":[0.5]})");
}

} // namespace
} // namespace document_test
