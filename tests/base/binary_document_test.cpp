#include "b_attribute_binary.h"
#include "b_exception.h"

#include "attribute_compare.h"
#include "binary_stream.h"
#include "every_value.h"
#include "log_capture.h"

#include <gtest/gtest.h>

using namespace base;
using namespace test_support;

namespace {

name_id named(string_view text) {
    return nameServer().id(text);
}

/// A document of one object with one attribute, and a place without object.
ByteList smallDocument() {
    ByteList file;
    file.raw("BPF1").u32(1).u32(1);
    file.u32(2).text("count").text("i32");
    file.u32(1).u32(1).text("i32");
    file.u32(1).text("thing");
    file.text("kind").u32(5).u8(0).u32(0);
    file.u32(2).u32(0).u32(0).u32(0xffffffff).u32(1);
    file.u32(18).u8(0).u32(1);
    file.u16(0).u16(1).u32(5).u8(0x80).u32(258);
    return file;
}

TEST(BinaryDocument, HasTheseBytes) {
    PluginFactory factory;
    factory.attributes().setTypeName(named("kind"));
    IPlugin& thing = *factory.create(named("thing"));
    thing.attribute<i32>(named("count")) = 258;
    thing.findAttribute(named("count"))->setFlags(attribSilentLink | attribAnimated);
    factory.remove(factory.create(named("other"))->id(), false);
    EXPECT_EQ(written(factory), smallDocument().bytes());

    const ByteList file = smallDocument();
    ByteList more = file;
    more.raw("more");
    PluginFactory read;
    Stream stream = viewOf(more.bytes(), true);
    ASSERT_TRUE(read.read(stream));
    EXPECT_EQ(stream.position(), file.size());
    EXPECT_EQ(read.attributes().typeName(), named("kind"));
    ASSERT_EQ(read.pluginCount(), 2u);
    EXPECT_FALSE(read.plugin(1));
    ASSERT_TRUE(read.plugin(0));
    EXPECT_EQ(read.plugin(0)->typeName(), named("thing"));
    EXPECT_EQ(read.plugin(0)->id(), 0u);
    ASSERT_TRUE(read.plugin(0)->findAttribute<i32>(named("count")));
    EXPECT_EQ(*read.plugin(0)->findAttribute<i32>(named("count")), 258);
    EXPECT_EQ(read.plugin(0)->findAttribute(named("count"))->flags(), 0x80u);
}

TEST(BinaryDocument, ComesBackFromAnyStream) {
    PluginFactory factory;
    buildEveryValue(factory);
    const Bytes bytes = written(factory);
    EXPECT_EQ(written(factory), bytes) << "a second time";

    Bytes piped;
    Stream pipe = pipeOf(piped);
    factory.write(pipe);
    EXPECT_EQ(piped, bytes);
    PluginFactory fromPipe;
    ASSERT_TRUE(fromPipe.read(pipe));
    EXPECT_EQ(firstDifference(factory, fromPipe), "");

    // A window between other bytes, which must stay.
    constexpr std::size_t margin = 7;
    Bytes framed(bytes.size() + 2 * margin, u8(0xAA));
    Stream frame = vectorStream(framed);
    Stream window = subStream(frame, margin, bytes.size());
    factory.write(window);
    EXPECT_EQ(window.position(), bytes.size());
    EXPECT_TRUE(std::equal(bytes.cbegin(), bytes.cend(), framed.cbegin() + margin));
    for (std::size_t i = 0; i < margin; ++i)
        EXPECT_TRUE(framed[i] == 0xAA && framed[framed.size() - 1 - i] == 0xAA);
    window.setPosition(0);
    PluginFactory fromWindow;
    ASSERT_TRUE(fromWindow.read(window));
    EXPECT_EQ(window.position(), bytes.size());
    EXPECT_EQ(firstDifference(factory, fromWindow), "");
    EXPECT_EQ(written(fromWindow), bytes);
}

/// Names beside each other in one table would need more than the 16 bits of their numbers.
TEST(BinaryDocument, WithTooManyNamesForTheTableHoldsThemAsText) {
    constexpr u32 tableOffset = 8;
    constexpr u32 namesInTable = 65535 - 1; // one is that of the type
    for (const u32 nameCount : {namesInTable, namesInTable + 1}) {
        PluginFactory factory;
        IPlugin& object = *factory.create(named("thing"));
        for (u32 i = 0; i < nameCount; ++i)
            object.attribute<u8>(named(format("n{}", i))) = static_cast<u8>(i);
        const Bytes bytes = written(factory);
        EXPECT_EQ(bytes[tableOffset], nameCount == namesInTable ? 1 : 0);
        PluginFactory read;
        Stream stream = viewOf(bytes, true);
        ASSERT_TRUE(read.read(stream));
        EXPECT_EQ(firstDifference(factory, read), "") << nameCount;
    }
}

TEST(BinaryDocument, LeavesNamesAsTheyWere) {
    PluginFactory factory;
    IPlugin& object = *factory.create(named("thing"));
    object.attribute<i32>(named("count")) = 1;
    written(factory);
    EXPECT_EQ(named("count").record()->extra, nullptr);

    // A type whose name is too long to be read again.
    factory.create(named(string(2049, 't')));
    EXPECT_THROW(written(factory), exception);
    EXPECT_EQ(named("count").record()->extra, nullptr);
}

/// What is transient is left out with all that leads to it; places in the list stay.
TEST(BinaryDocument, LeavesOutWhatIsTransient) {
    PluginFactory factory, other;
    IPlugin& kept = *factory.create(named("kept"));
    IPlugin& passing = *factory.create(named("passing"));
    IPlugin& foreign = *other.create(named("foreign"));
    passing.setFlags(attribTransient);
    const auto transient = [](Attribute* a) {
        a->setFlags(attribTransient);
        return a;
    };
    kept.attribute(named("value"), transient(new TypedAttribute<i32>(1)));
    kept.attribute(named("link"), new AttribLink(AttribPath(passing, named("x"))));
    kept.attribute<ref<IPlugin>>(named("one")) = &passing;
    kept.vecAttribute<ref<IPlugin>>(named("many")) = {&kept, &passing, nullptr, &foreign};
    AttribArray& items = kept.arrayAttribute(named("items"));
    items.append(transient(new TypedAttribute<i32>(1)));
    items.append(new TypedAttribute<i32>(2));

    PluginFactory read;
    {
        const LogCapture log;
        const Bytes bytes = written(factory);
        const string suffix = "of plugin 0 refers to a plugin that is not stored with it, the "
                              "reference is left empty.";
        EXPECT_TRUE(log.has(logWarning, "plugin factory| Attribute 'one' " + suffix));
        EXPECT_EQ(log.entries().size(), 3u);
        Stream stream = viewOf(bytes, true);
        ASSERT_TRUE(read.read(stream));
    }
    ASSERT_EQ(read.pluginCount(), 2u);
    EXPECT_FALSE(read.plugin(1));
    const ref<IPlugin> object = read.plugin(0);
    EXPECT_EQ(object->size(), 3u);
    EXPECT_FALSE(*object->findAttribute<ref<IPlugin>>(named("one")));
    const auto& many = *object->findVecAttribute<ref<IPlugin>>(named("many"));
    ASSERT_EQ(many.size(), 4u);
    EXPECT_TRUE(many[0] == object && !many[1] && !many[2] && !many[3]);
    ASSERT_EQ(object->findArray(named("items"))->size(), 2u);
    EXPECT_FALSE(object->findArray(named("items"))->item(0));
    EXPECT_EQ(object->findArray(named("items"))->item(1)->toString(), "2");
}

TEST(BinaryDocument, GoesBehindTheObjectsThatAreThere) {
    PluginFactory factory;
    buildEveryValue(factory);
    const Bytes bytes = written(factory);
    const u32 count = factory.pluginCount();

    PluginFactory twice;
    for (int i = 0; i < 2; ++i) {
        Stream stream = viewOf(bytes, true);
        ASSERT_TRUE(twice.read(stream));
    }
    ASSERT_EQ(twice.pluginCount(), 2 * count);
    const ref<IPlugin> object = twice.plugin(count + 1);
    EXPECT_EQ(*object->findAttribute<ref<IPlugin>>(named("object 3")), twice.plugin(count + 3));
    const auto& all = *object->findVecAttribute<ref<IPlugin>>(named("all objects"));
    EXPECT_EQ(all[2], twice.plugin(count + 2));
    const AttribLink* link = object->findAttribute(named("link 2"), false)->asLink();
    EXPECT_EQ(link->path().root(), twice.plugin(count + 2).get());
    EXPECT_EQ(link->path().resolve(), twice.plugin(count + 2)->findAttribute(named("name")));
    EXPECT_EQ(*twice.attributes().findAttribute<ref<IPlugin>>(named("main object")), object);
}

/// A plugin whose attributes its constructor makes.
class Prepared final : public IPlugin {
public:
    Prepared(ref<IPluginDesc> desc, PluginFactory* factory, u32 id)
        : IPlugin(std::move(desc), factory, id) {
        vecAttribute<float>(named("floats")) = {1, 2, 3};
        findAttribute(named("floats"))->setFlags(attribMergeOnAssign);
        vecAttribute<ref<IPlugin>>(named("objects"));
        mapAttribute(named("map"), {}).attribute<i32>(named("default")) = 1;
    }
    void afterLoad(i32 version) override {
        loadedVersion = version;
        if (failsAfterLoad)
            throw exception("after load");
    }
    static inline bool failsAfterLoad = false;
    i32 loadedVersion = 0;
};

class PreparedDesc final : public IPluginDesc {
public:
    PreparedDesc() { type = nameServer().id("prepared"); }
    IPlugin* create(PluginFactory& factory, u32 id) override {
        return new Prepared(ref<IPluginDesc>(this), &factory, id);
    }
};

TEST(BinaryDocument, FillsTheAttributesThatObjectsAreMadeWith) {
    PluginFactory factory, read;
    factory.registerDesc(makeRef<PreparedDesc>());
    read.registerDesc(makeRef<PreparedDesc>());
    IPlugin& object = *factory.create(named("prepared"));
    object.vecAttribute<float>(named("floats")) = {4, 5};
    object.vecAttribute<ref<IPlugin>>(named("objects")) = {&object};
    object.findMap(named("map"))->clear();
    const Bytes bytes = written(factory);
    Stream stream = viewOf(bytes, true);
    ASSERT_TRUE(read.read(stream));
    EXPECT_EQ(firstDifference(factory, read), "");
    const ref<IPlugin> back = read.plugin(0);
    EXPECT_TRUE(back->findAttribute(named("floats"))->hasFlag(attribMergeOnAssign));
    EXPECT_TRUE(back->findAttribute(named("objects"))->hasFlag(attribMergeOnAssign));
    EXPECT_EQ(static_cast<Prepared&>(*back).loadedVersion, 1);
}

TEST(BinaryDocument, ThatFailsLeavesTheFactoryAsItWas) {
    PluginFactory factory;
    factory.registerDesc(makeRef<PreparedDesc>());
    IPlugin& object = *factory.create(named("prepared"));
    object.vecAttribute<ref<IPlugin>>(named("objects")) = {&object};
    factory.attributes().attribute<i32>(named("count")) = 2;
    const Bytes bytes = written(factory);

    PluginFactory read;
    read.registerDesc(makeRef<PreparedDesc>());
    read.create(named("thing"));
    read.attributes().attribute<i32>(named("count")) = 1;
    Prepared::failsAfterLoad = true;
    Stream stream = viewOf(bytes, true);
    EXPECT_THROW(read.read(stream), exception);
    Prepared::failsAfterLoad = false;
    EXPECT_EQ(read.pluginCount(), 1u);
    EXPECT_EQ(*read.attributes().findAttribute<i32>(named("count")), 1);
}

class ProgressLog final : public ICustomLog {
public:
    void message(name_id, int, string_view) override {}
    void progress(u32 percent, string_view text) override {
        steps.push_back(format("{} {}", text, percent));
    }
    void progressEnd() override { steps.push_back("end"); }
    vector<string> steps;
};

/// Not for each object, and to an end.
TEST(BinaryDocument, ReportsHowFarItIs) {
    PluginFactory factory;
    for (int i = 0; i < 200; ++i)
        factory.create(named("thing"));
    const ref<ProgressLog> output = makeRef<ProgressLog>();
    log().addOutput(output);
    const Bytes bytes = written(factory);
    Stream stream = viewOf(bytes);
    PluginFactory().read(stream);
    log().removeOutput(output.get());
    ASSERT_EQ(output->steps.size(), 2u * 101);
    EXPECT_EQ(output->steps[99], "Writing plugins 99");
    EXPECT_EQ(output->steps[100], "end");
    EXPECT_EQ(output->steps[101], "Reading plugins 0");
    EXPECT_EQ(output->steps[201], "end");
}

} // namespace
