#include "attribute_compare.h"
#include "b_exception.h"
#include "every_value.h"
#include "json_document.h"
#include "log_capture.h"

#include <bit>
#include <gtest/gtest.h>

#include <clocale>
#include <cmath>

namespace {

using namespace base;
using test_support::firstDifference;
using test_support::LogCapture;

/// Reads without capabilities but reading itself, in pieces that do not fit its text.
class PieceWorker final : public StreamWorker {
public:
    explicit PieceWorker(std::string text)
        : StreamWorker("pieces", streamReadable), text_(std::move(text)) {
        operations.read = [](StreamWorker& worker, void* target, u64 count) {
            auto& self = static_cast<PieceWorker&>(worker);
            const u64 taken = std::min({count, u64{7001}, self.text_.size() - self.at_});
            std::memcpy(target, self.text_.data() + self.at_, taken);
            self.at_ += taken;
            return taken;
        };
        operations.close = [](StreamWorker&) {};
    }

private:
    std::string text_;
    u64 at_ = 0;
};

TEST(JsonDocument, EveryValueComesBack) {
    PluginFactory original, copy, pieces;
    test_support::buildEveryValue(original);
    const std::string text = writtenJson(original);
    ASSERT_TRUE(readJsonText(copy, text));
    EXPECT_EQ(firstDifference(original, copy), "");
    EXPECT_EQ(writtenJson(copy), text);

    // With a byte order mark, from a stream that can only be read and complains of short reads.
    Stream stream(new PieceWorker("\xEF\xBB\xBF" + text));
    stream.setFlags(streamThrowOnShortRead);
    ASSERT_TRUE(pieces.readJson(stream));
    EXPECT_EQ(firstDifference(original, pieces), "");
}

TEST(JsonDocument, EveryValueComesBackInTheLocaleOfTheHost) {
    // A decimal comma, where the host has such a locale.
    const std::string before = std::setlocale(LC_ALL, nullptr);
    std::setlocale(LC_ALL, "de_DE.UTF-8");
    PluginFactory original, copy;
    test_support::buildEveryValue(original);
    const std::string text = writtenJson(original);
    const bool isRead = readJsonText(copy, text);
    std::setlocale(LC_ALL, before.c_str());
    ASSERT_TRUE(isRead);
    EXPECT_EQ(firstDifference(original, copy), "");
    EXPECT_EQ(text, writtenJson(original));
}

// The text was written by hand from the description of the form.
constexpr const char* smallDocument = R"({
  "@version": 1,
  "@attributes": {
    "title": "a \"b\" \\ \u0001\n"
  },
  "@objects": [
    {
      "@type": "node",
      "@flags": 3,
      "@@at": true,
      "count": -7,
      "items": [
        null,
        {
          "@map": "own type",
          "w": 0.5
        }
      ],
      "link": {
        "@type": "link",
        "@value": [
          {"name": "lamp", "index": 2, "type": 0},
          {"name": "name", "index": 0, "type": 1},
          {"name": "", "index": 5, "type": 3}
        ]
      },
      "normals": {"@type": "normal[]", "@value": [0, 0.1, -0.0, 1e+10, 3.4028234663852886e+38, NaN]},
      "one": 1.0,
      "target": {"@type": "plugin", "@value": "Plugin[0]"},
      "targets": {"@type": "plugin[]", "@value": ["lamp", "~null"]},
      "transform": {"@type": "mat43[]", "@value": [1, 2, 3, 4, 5, 6, 7, 8, 0.1, 10, 11, 0.1]}
    },
    null,
    {
      "@type": "light",
      "name": "lamp",
      "raw": {"@type": "string", "@value": [65, 255]},
      "time": {"@type": "timecode", "@flags": 128, "@value": -46186158000}
    }
  ]
}
)";

void buildSmallDocument(PluginFactory& factory) {
    factory.attributes().attribute<string>(nameOf("title")) = "a \"b\" \\ \x01\n";
    IPlugin& node = *factory.create(nameOf("node"));
    factory.create(nameOf("node"));
    IPlugin& lamp = *factory.create(nameOf("light"));
    factory.remove(1, false);
    node.setFlags(3 | attribPluginMark);
    node.attribute<bool>(nameOf("@at")) = true;
    node.attribute<i32>(nameOf("count")) = -7;
    AttribArray& items = node.arrayAttribute(nameOf("items"));
    items.setTypeName(nameOf("own type"));
    items.append(nullptr);
    auto* item = new AttribMap(attribFactory(), nameOf("own type"));
    item->attribute<float>(nameOf("w")) = 0.5f;
    items.append(item);
    node.attribute(nameOf("link"), new AttribLink(AttribPath(lamp, nameOf("name")).component(5)));
    node.vecAttribute<normal>(nameOf("normals")) = {
        {0, 0.1f, -0.0f}, {1e10f, std::numeric_limits<float>::max(), std::nanf("")}};
    node.attribute<float>(nameOf("one")) = 1;
    node.attribute<ref<IPlugin>>(nameOf("target")) = ref<IPlugin>(&node);
    node.vecAttribute<ref<IPlugin>>(nameOf("targets")) = {ref<IPlugin>(&lamp), nullptr};
    mat43 matrix;
    matrix.m = {{1, 2, 3}, {4, 5, 6}, {7, 8, 0.1f}};
    matrix.t = {10, 11, 0.1};
    node.vecAttribute<mat43>(nameOf("transform")) = {matrix};
    lamp.attribute<string>(nameOf("name")) = "lamp";
    lamp.attribute<string>(nameOf("raw")) = "A\xFF";
    lamp.attribute<TimeCode>(nameOf("time")).ticks = -TimeCode::ticksPerSecond;
    lamp.findAttribute(nameOf("time"), false)->setFlags(128 | attribAnimated);
}

TEST(JsonDocument, SmallOneHasItsText) {
    PluginFactory built, read;
    buildSmallDocument(built);
    EXPECT_EQ(writtenJson(built), smallDocument);
    ASSERT_TRUE(readJsonText(read, smallDocument));
    const auto& normals = *read.plugin(0)->findVecAttribute<normal>(nameOf("normals"));
    EXPECT_EQ(normals[1].y, std::numeric_limits<float>::max());
    EXPECT_TRUE(std::isnan(normals[1].z));
    read.plugin(0)->vecAttribute<normal>(nameOf("normals"))[1].z = 0;
    built.plugin(0)->vecAttribute<normal>(nameOf("normals"))[1].z = 0;
    EXPECT_EQ(firstDifference(built, read), "");
}

/// The short texts of floats, which a reader takes for doubles first.
TEST(JsonDocument, FloatsComeBackToTheBit) {
    PluginFactory written, read;
    auto& floats = written.create(nameOf("kind"))->vecAttribute<float>(nameOf("floats"));
    // 7.038531e-26 is the one float whose shortest text a double rounds to its neighbour.
    for (const float value : {7.038531e-26f, std::numeric_limits<float>::max(), 1e-45f, 1e-38f})
        for (const float sign : {1.0f, -1.0f})
            floats.push_back(value * sign);
    for (u32 bits = 0; bits < 0x7f800000; bits += 9973)
        floats.push_back(std::bit_cast<float>(bits));
    ASSERT_TRUE(readJsonText(read, writtenJson(written)));
    EXPECT_EQ(firstDifference(written, read), "");
}

TEST(JsonDocument, LongTextsComeBack) {
    PluginFactory written, read;
    string text;
    for (int i = 0; i < 200000; ++i)
        text += "a\x01\"";
    written.create(nameOf("kind"))->attribute<string>(nameOf("text")) = text;
    ASSERT_TRUE(readJsonText(read, writtenJson(written)));
    EXPECT_EQ(firstDifference(written, read), "");
}

TEST(JsonDocument, NamesCountInBothForms) {
    PluginFactory read;
    ASSERT_TRUE(readJsonText(read, R"({"@version": 1, "@objects": [
        {"@type": "kind", "name": {"@type": "plugin", "@value": "gate"}},
        {"@type": "kind", "name": {"@type": "string", "@flags": 1, "@value": "gate"}},
        {"@type": "", "of": {"@type": "plugin", "@value": "gate"}}]})"));
    EXPECT_EQ(*read.plugin(2)->findAttribute<ref<IPlugin>>(nameOf("of")), read.plugin(1));

    // A name with flags makes that of another object as ambiguous as one without.
    PluginFactory again;
    read.plugin(2)->attribute<string>(nameOf("name")) = "gate";
    read.plugin(2)->attribute<ref<IPlugin>>(nameOf("of")) = read.plugin(2);
    ASSERT_TRUE(readJsonText(again, writtenJson(read)));
    EXPECT_EQ(firstDifference(read, again), "");
}

TEST(JsonDocument, MembersComeInAnyOrder) {
    PluginFactory inOrder, shuffled;
    const std::string value = R"("a": {"@type": "array", "@flags": 4, "@of": "k", "@value": [1]})";
    ASSERT_TRUE(readJsonText(inOrder, documentWith(value)));
    ASSERT_TRUE(readJsonText(shuffled,
                             R"({"@objects": [{"a": {"@value": [1], "@of": "k", "@flags": 4,
                             "@type": "array"}, "name": "it", "@type": "kind"}], "@version": 1})"));
    EXPECT_EQ(firstDifference(inOrder, shuffled), "");
    const AttribArray* array = shuffled.plugin(0)->findArray(nameOf("a"));
    EXPECT_EQ(array->typeName(), nameOf("k"));
    EXPECT_EQ(array->flags(), 4u);
}

TEST(JsonDocument, ReadingAppends) {
    PluginFactory factory;
    factory.create(nameOf("first"))->attribute<string>(nameOf("name")) = "lamp";
    factory.attributes().attribute<i32>(nameOf("kept")) = 1;
    ASSERT_TRUE(readJsonText(factory, smallDocument));
    ASSERT_EQ(factory.pluginCount(), 4u);
    const IPlugin& node = *factory.plugin(1);
    EXPECT_EQ(factory.plugin(2), nullptr);
    EXPECT_EQ(*node.findAttribute<ref<IPlugin>>(nameOf("target")), factory.plugin(1));
    EXPECT_EQ((*node.findVecAttribute<ref<IPlugin>>(nameOf("targets")))[0], factory.plugin(3));
    const AttribPath& path = node.findAttribute(nameOf("link"), false)->asLink()->path();
    EXPECT_EQ(path.toString(), "Plugin[3].name{5}");
    EXPECT_EQ(node.flags() & 0xff, 3u);
    EXPECT_EQ(*factory.attributes().findAttribute<i32>(nameOf("kept")), 1);
    EXPECT_EQ(*factory.attributes().findAttribute<string>(nameOf("title")), "a \"b\" \\ \x01\n");
}

TEST(JsonDocument, WhatIsNotWrittenIsNotReferredTo) {
    PluginFactory factory, other, read;
    IPlugin& holder = *factory.create(nameOf("kind"));
    IPlugin& hidden = *factory.create(nameOf("kind"));
    hidden.setFlags(attribTransient);
    hidden.attribute<string>(nameOf("name")) = "hidden";
    holder.attribute<string>(nameOf("name")) = "hidden"; // unique among those that are written
    const ref<IPlugin> foreign = other.create(nameOf("kind"));
    const ref<IPlugin> removed = factory.create(nameOf("kind"));
    factory.remove(2, false);
    holder.vecAttribute<ref<IPlugin>>(nameOf("all")) = {
        ref<IPlugin>(&holder), ref<IPlugin>(&hidden), foreign, removed, nullptr};
    holder.attribute(nameOf("to hidden"), new AttribLink(AttribPath(hidden)));
    holder.attribute(nameOf("to foreign"), new AttribLink(AttribPath(*foreign)));
    AttribArray& array = holder.arrayAttribute(nameOf("array"));
    array.append(new AttribLink(AttribPath(hidden)));

    LogCapture log;
    const std::string text = writtenJson(factory);
    const std::string line =
        "3 json writer| Attribute 'hidden::all' refers to an object that is not written!\n";
    EXPECT_EQ(linesOf(log), line + line + line);
    ASSERT_TRUE(readJsonText(read, text));
    EXPECT_EQ(read.pluginCount(), 3u);
    EXPECT_EQ(read.plugin(1), nullptr);
    const IPlugin& copy = *read.plugin(0);
    const vector<ref<IPlugin>> expected = {read.plugin(0), nullptr, nullptr, nullptr, nullptr};
    EXPECT_EQ(*copy.findVecAttribute<ref<IPlugin>>(nameOf("all")), expected);
    EXPECT_FALSE(copy.findAttribute(nameOf("to hidden"), false));
    EXPECT_EQ(copy.findAttribute(nameOf("to foreign"), false)->asLink()->path().root(), nullptr);
    EXPECT_EQ(copy.findArray(nameOf("array"))->item(0), nullptr);
}

/// Objects that know when they were loaded, and one type that throws then.
class LoadedDesc final : public IPluginDesc {
public:
    explicit LoadedDesc(vector<string>& calls) : calls_(calls) { type = nameOf("loaded"); }
    IPlugin* create(PluginFactory& factory, u32 id) override {
        struct Loaded final : IPlugin {
            using IPlugin::IPlugin;
            void afterLoad(i32 version) override {
                auto& calls = static_cast<const LoadedDesc*>(desc())->calls_;
                calls.push_back(getName() + " " + std::to_string(version));
                if (getName() == "bad")
                    throw exception("no");
            }
        };
        IPlugin* made = new Loaded(ref<IPluginDesc>(this), &factory, id);
        made->attribute<i32>(nameOf("count")) = 5; // of the schema
        made->findAttribute(nameOf("count"))->setFlags(attribAnimated);
        return made;
    }

private:
    vector<string>& calls_;
};

TEST(JsonDocument, TellsObjectsThatTheyAreLoaded) {
    vector<string> calls;
    PluginFactory factory;
    factory.registerDesc(makeRef<LoadedDesc>(calls));
    ASSERT_TRUE(readJsonText(factory, R"({"@version": 1, "@objects": [
        {"@type": "loaded", "name": "a", "count": {"@type": "i32", "@flags": 9, "@value": 8}},
        {"@type": "loaded", "name": "b"}]})"));
    EXPECT_EQ(calls, (vector<string>{"a 1", "b 1"}));
    const Attribute* count = factory.plugin(0)->findAttribute(nameOf("count"));
    EXPECT_EQ(count->toString(), "8");
    EXPECT_EQ(count->flags(), attribAnimated | 9u);
    EXPECT_EQ(factory.plugin(1)->findAttribute(nameOf("count"))->toString(), "5");
}

TEST(JsonDocument, ExceptionTakesEverythingBack) {
    vector<string> calls;
    PluginFactory factory;
    factory.registerDesc(makeRef<LoadedDesc>(calls));
    const ref<IPlugin> before = factory.create(nameOf("kind"));
    factory.attributes().attribute<i32>(nameOf("kept")) = 1;
    EXPECT_THROW(readJsonText(factory, R"({"@version": 1, "@attributes": {"kept": 2, "new": 3},
        "@objects": [{"@type": "loaded", "me": {"@type": "plugin", "@value": "bad"},
        "name": "bad"}]})"),
                 exception);
    EXPECT_EQ(factory.pluginCount(), 1u);
    EXPECT_EQ(factory.attributes().size(), 1u);
    EXPECT_EQ(*factory.attributes().findAttribute<i32>(nameOf("kept")), 1);
}

TEST(JsonDocument, LongNumbersAreWrapped) {
    PluginFactory factory;
    auto& values = factory.create(nameOf("kind"))->vecAttribute<u32>(nameOf("values"));
    for (u32 i = 0; i < 100000; ++i)
        values.push_back(i * 40503u);
    const std::string text = writtenJson(factory);
    std::size_t longest = 0;
    for (std::size_t at = 0; at < text.size(); at = text.find('\n', at) + 1)
        longest = std::max(longest, text.find('\n', at) - at);
    EXPECT_GT(longest, 95u);
    EXPECT_LE(longest, 111u); // one number more than the limit
    PluginFactory read;
    ASSERT_TRUE(readJsonText(read, text));
    EXPECT_EQ(firstDifference(factory, read), "");
}

} // namespace
