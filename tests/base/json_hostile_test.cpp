#include "attribute_compare.h"
#include "b_exception.h"
#include "every_value.h"
#include "json_document.h"
#include "log_capture.h"

#include <gtest/gtest.h>

namespace {

using namespace base;
using test_support::LogCapture;

struct Message {
    const char* members; ///< of the object, from line 2 on
    const char* line;
};

/// The lines above the level of text that reading gives, but that of the unknown type.
std::string linesOfReading(PluginFactory& factory, const std::string& text, bool expected) {
    factory.create(nameOf("kind"));
    LogCapture log;
    EXPECT_EQ(readJsonText(factory, text), expected) << text;
    return linesOf(log);
}

TEST(JsonMessages, FaultsOfAttributes) {
    const Message rows[] = {
        {R"("a": {"@type": "nothing", "@value": 1})",
         "2 json parser a file| Trying to create an attribute 'it::a' from unknown type 'nothing' "
         "at line 2!\n"},
        {R"("a": [{"@type": "nothing", "@value": 1}])",
         "2 json parser a file| Trying to create an attribute from unknown type 'nothing' at line "
         "2!\n"},
        {"\"a\": {\"@type\": \"u8\",\n\"@value\": 256}",
         "2 json parser a file| Unable to read the value of attribute 'it::a' with type 'u8' at "
         "line 3!\n"},
        {R"("a": {"@type": "vec3f", "@value": [1, 2]})", "'vec3f'"},
        {R"("a": {"@type": "vec3f[]", "@value": [1, 2, 3, 4]})", "'vec3f[]'"},
        {R"("a": {"@type": "float[]", "@value": [1, 2, "3"]})", "'float[]'"},
        {R"("a": {"@type": "float[]", "@value": [[1], 2]})", "'float[]'"},
        {R"("a": {"@type": "float", "@value": 3.5e38})", "'float'"},
        {R"("a": {"@type": "u32", "@value": 1.0})", "'u32'"},
        {R"("a": {"@type": "i8[]", "@value": [-129]})", "'i8[]'"},
        {R"("a": {"@type": "timecode", "@value": 9223372036854775808})", "'timecode'"},
        {R"("a": {"@type": "bool", "@value": 1})", "'bool'"},
        {R"("a": {"@type": "string", "@value": [256]})", "'string'"},
        {R"("a": {"@type": "plugin", "@value": null})", "'plugin'"},
        {R"("a": {"@type": "map", "@value": []})", "'map'"},
        {R"("a": {"@type": "float"})", "'float'"},
        {R"("a": {"@type": 5, "@value": 5})", "''"},
        {R"("a": {"@type": "i32", "@flags": 256, "@value": 5})", "'@flags'"},
        {R"("a": 2147483648)", "'i32'"},
        {R"("a": 18446744073709551616)", "'i32'"},
        {R"("a": -100000000000000000000000)", "'i32'"},
        {R"("a": 1e39)", "'float'"},
        {R"("a": -Infinity)", "'float'"},
        {R"("a": null)", "'null'"},
        {R"("a": {"@type": "float[]", "@value": 5})",
         "2 json parser a file| Expected an array value at line 2!\n"
         "2 json parser a file| Unable to read the value of attribute 'it::a' with type 'float[]' "
         "at line 2!\n"},
        {R"("a": {"@type": "link", "@value": [{"index": 0, "name": "", "type": 0}]})",
         "Expected path entry name at line 2!"},
        {R"("a": {"@type": "link", "@value": [5]})", "Expected path entry name at line 2!"},
        {R"("a": {"@type": "link", "@value": [{"name": "", "index": -1, "type": 0}]})",
         "Expected path entry index at line 2!"},
        {R"("a": {"@type": "link", "@value": [{"name": "", "index": 0, "type": 4}]})",
         "Expected path entry type at line 2!"},
        {R"("a": {"@type": "link", "@value": [{"name": "", "index": 0, "type": 0, "x": 0}]})",
         "json parser a file| Unable to read end of object at line 2! Check for extra ','."},
        {R"("": 5)", "2 json parser a file| Invalid name of an attribute of 'it' at line 2!\n"},
        {R"("a\u0000": 5)", "Invalid name of an attribute of 'it' at line 2!"},
    };
    for (const Message& row : rows) {
        PluginFactory factory;
        const std::string lines =
            linesOfReading(factory, documentWith(row.members + std::string(", \"b\": 1")), true);
        if (std::string_view(row.line).ends_with('\n'))
            EXPECT_EQ(lines, row.line) << row.members;
        else
            EXPECT_NE(lines.find(row.line), std::string::npos) << row.members << lines;
        // Neither the rest of the object nor a gap in an array is lost.
        const IPlugin& object = *factory.plugin(1);
        EXPECT_TRUE(object.findAttribute(nameOf("b"))) << row.members;
        const Attribute* a = object.findAttribute(nameOf("a"));
        EXPECT_TRUE(!a || (a->asArray() && a->size() == 1 && !a->asArray()->item(0)))
            << row.members;
    }
}

TEST(JsonMessages, WarningsKeepTheAttribute) {
    const Message rows[] = {
        {R"("a": 1, "a": 2)",
         "3 json parser a file| 'it::a' at line 2 is given again further on, which counts!\n"},
        {R"("a": {"@type": "i32", "@value": 2, "x": 1, "@y": 3})",
         "3 json parser a file| Ignoring the unknown member '@y' of 'it' at line 2!\n"
         "3 json parser a file| Ignoring the unknown member 'x' of 'it' at line 2!\n"},
        {R"("@map": "x", "a": 2)",
         "3 json parser a file| Ignoring the unknown member '@map' of 'it' at line 2!\n"},
        {R"("@flags": 300, "a": 2)",
         "2 json parser a file| Unable to read the value of attribute 'it::' with type '@flags' "
         "at line 2!\n"},
    };
    for (const Message& row : rows) {
        PluginFactory factory;
        EXPECT_EQ(linesOfReading(factory, documentWith(row.members), true), row.line);
        EXPECT_EQ(*factory.plugin(1)->findAttribute<i32>(nameOf("a")), 2) << row.members;
    }
}

TEST(JsonMessages, FaultsOfDocuments) {
    const struct {
        const char* text;
        bool isRead;
        const char* lines;
    } rows[] = {
        {"[]", false, "2 json parser a file(1)| Missing object opening bracket!\n"},
        {"\n\n{\"@version\": 1", false,
         "2 json parser a file(3)| Missing a comma or '}' after an object member.\n"},
        {"{\"@version\": 1}\n}", false,
         "2 json parser a file(2)| The document root must not be followed by other values.\n"},
        {"", false, "2 json parser a file(1)| The document is empty.\n"},
        {"{\"@version\": 2}", false,
         "2 json parser a file(1)| Unsupported document version! Current version 1, needed 2.\n"},
        {"{}", false, "2 json parser a file(1)| Missing document version!\n"},
        {R"({"@version": 1, "@objects": {}})", false,
         "2 json parser a file| Expected an array value at line 1!\n"},
        {R"({"@version": 1, "@attributes": 5})", true,
         "2 json parser a file| Unable to read the value of attribute 'document::@attributes' "
         "with type 'map' at line 1!\n"},
        {R"({"@version": 1, "@more": 5, "more": 6})", true,
         "3 json parser a file| Ignoring the unknown member '@more' of 'document' at line 1!\n"
         "3 json parser a file| Ignoring the unknown member 'more' of 'document' at line 1!\n"},
        {"{\"@version\": 1, \"@objects\": [\n5,\n{},\n{\"@type\": 7}, null, {\"@type\": "
         "\"kind\"}]}",
         true,
         "2 json parser a file(2)| Missing object opening bracket!\n"
         "2 json parser a file(2)| Error reading plugin!\n"
         "2 json parser a file(3)| Error reading plugin!\n"
         "2 json parser a file(4)| Error reading plugin!\n"},
        {R"({"@version": 1, "@objects": [{"@type": "new kind"}, {"@type": "new kind"}]})", true,
         "3 plugin factory| Unsupported plugin type new kind! Objects of this type will have "
         "limited functionality.\n"},
        {R"({"@version": 1, "@attributes": {"a": [NaNe-320]}})", false,
         "2 json parser a file(1)| Invalid value.\n"},
        {R"({"@version": 1, "@attributes": {"a": -Infinity.5}})", false,
         "2 json parser a file(1)| Invalid value.\n"},
        {R"({"@version": 1e999})", false,
         "2 json parser a file(1)| Number too big to be stored in double.\n"},
        {R"({"@version": 1, "x": 1.8e308})", false,
         "2 json parser a file(1)| Number too big to be stored in double.\n"},
        {R"({"@version": "\ud800"})", false,
         "2 json parser a file(1)| The surrogate pair in string is invalid.\n"},
    };
    for (const auto& row : rows) {
        PluginFactory factory;
        EXPECT_EQ(linesOfReading(factory, row.text, row.isRead), row.lines);
        EXPECT_TRUE(row.isRead || factory.pluginCount() == 1) << row.text;
    }
    PluginFactory factory;
    EXPECT_EQ(linesOfReading(factory, std::string("{\"@version\": 1}\0 ", 17), false),
              "2 json parser a file(1)| Zero byte in the text.\n");
}

TEST(JsonMessages, OddReferences) {
    PluginFactory factory;
    const std::string lines = linesOfReading(factory, R"({"@version": 1, "@objects": [
        {"@type": "kind", "refs": {"@type": "plugin[]", "@value":
            ["twice", "Plugin[1]", "Plugin[9]", "Plugin[01", "", "~null", "odd"]},
         "link": {"@type": "link", "@value": [{"name": "nobody", "index": 9, "type": 0}]},
         "second": {"@type": "link", "@value": [{"name": "nobody", "index": 2, "type": 0}]}},
        {"@type": "kind", "name": "twice"},
        {"@type": "kind", "name": "twice"},
        {"@type": "kind", "name": "other", "name": "odd"}]})",
                                             true);
    EXPECT_EQ(lines,
              "3 json parser a file(3)| Several plugins have the name 'twice', taking the first!\n"
              "2 json parser a file(3)| Unable to find plugin with name 'Plugin[9]'!\n"
              "2 json parser a file(3)| Unable to find plugin with name 'Plugin[01'!\n"
              "2 json parser a file(3)| Unable to find plugin with name ''!\n"
              "2 json parser a file(4)| Unable to find plugin with name 'nobody'!\n"
              "3 json parser a file| 'odd::name' at line 8 is given again further on, which "
              "counts!\n");
    const IPlugin& object = *factory.plugin(1);
    const vector<ref<IPlugin>> expected = {factory.plugin(2), factory.plugin(2), nullptr,
                                           nullptr,           nullptr,           nullptr,
                                           factory.plugin(4)};
    EXPECT_EQ(*object.findVecAttribute<ref<IPlugin>>(nameOf("refs")), expected);
    EXPECT_EQ(object.findAttribute(nameOf("link"), false)->toString(), "Plugin[10]"); // shifted
    EXPECT_EQ(object.findAttribute(nameOf("second"), false)->asLink()->path().root(),
              factory.plugin(3).get());
}

TEST(JsonMessages, NamesThatAreNoText) {
    PluginFactory factory, read;
    factory.create(nameOf("kind"))->attribute<i32>(nameOf("a\xFF")) = 1;
    LogCapture log;
    const std::string text = writtenJson(factory);
    EXPECT_EQ(linesOf(log), "3 json writer| Name 'a\xFF' in 'kind' is no valid UTF-8!\n");
    ASSERT_TRUE(readJsonText(read, text));
    EXPECT_TRUE(read.plugin(0)->findAttribute(nameOf("a\xEF\xBF\xBD")));
}

TEST(JsonHostile, EveryBeginningOfADocumentIsRefused) {
    PluginFactory built;
    test_support::detail::addStructures(*built.create(nameOf("kind")));
    test_support::detail::addStructures(built.attributes());
    const std::string text = writtenJson(built);
    PluginFactory factory;
    factory.create(nameOf("kind"));
    const std::size_t end = text.rfind('}');
    for (std::size_t length = 0; length <= end; ++length) {
        // In memory of its own, so that a read past its end is noticed.
        const vector<char> part(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(length));
        Stream stream = memStreamView(part.data(), part.size(), "part");
        ASSERT_FALSE(factory.readJson(stream)) << length;
        ASSERT_EQ(factory.pluginCount(), 1u) << length;
        ASSERT_EQ(factory.attributes().size(), 0u) << length;
    }
}

TEST(JsonHostile, BracketsWithoutEnd) {
    PluginFactory factory;
    EXPECT_FALSE(readJsonText(factory, std::string(1000000, '[')));
    std::string nested = "{\"@version\": 1, \"ignored\": ";
    nested.append(1000000, '[').append(1000000, ']').append("}");
    EXPECT_TRUE(readJsonText(factory, nested));
}

/// `levels` maps and arrays in turn within each other, the outermost an attribute.
Attribute* nestedAttribute(u32 levels) {
    Attribute* inner = new TypedAttribute<i32>(1);
    for (u32 i = 0; i < levels; ++i) {
        if (i % 2 == 0) {
            auto* array = new AttribArray;
            array->append(inner);
            inner = array;
        } else {
            auto* map = new AttribMap;
            map->attribute(nameOf("a"), inner);
            inner = map;
        }
    }
    return inner;
}

TEST(JsonHostile, DepthHasALimit) {
    PluginFactory deep, deeper, read;
    deep.create(nameOf("kind"))->attribute(nameOf("a"), nestedAttribute(255));
    deeper.create(nameOf("kind"))->attribute(nameOf("a"), nestedAttribute(256));
    ASSERT_TRUE(readJsonText(read, writtenJson(deep)));
    EXPECT_EQ(test_support::firstDifference(deep, read), "");
    EXPECT_THROW(writtenJson(deeper), exception);

    std::string value = "\"a\": ";
    value.append(256, '[').append(256, ']');
    EXPECT_THROW(readJsonText(read, documentWith(value)), exception);
    EXPECT_EQ(read.pluginCount(), 1u);
}

TEST(JsonHostile, TextsAboveAGibibyteAreRefused) {
    struct HugeWorker final : StreamWorker {
        HugeWorker() : StreamWorker("huge", streamReadable) {
            // The mapped text is never looked at.
            operations.map = [](StreamWorker&, u64& start, u64& size) -> void* {
                static char text[8] = "{}     ";
                start = 0;
                size = (u64{1} << 30) + 1;
                return text;
            };
            operations.getPosition = [](StreamWorker&) { return u64{0}; };
            operations.setPosition = [](StreamWorker&, i64, StreamOrigin) { return u64{0}; };
            operations.close = [](StreamWorker&) {};
        }
    };
    PluginFactory factory;
    LogCapture log;
    Stream stream(new HugeWorker);
    EXPECT_FALSE(factory.readJson(stream));
    EXPECT_EQ(linesOf(log), "2 json parser huge| The text is longer than 1 GiB!\n");
}

} // namespace
