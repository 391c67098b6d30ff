#include "b_factory.h"

#include "b_attribute_desc.h"
#include "b_exception.h"
#include "log_capture.h"

#include <gtest/gtest.h>
#include <memory>

namespace base {
namespace {

using namespace test_support;

name_id named(string_view text) {
    return nameServer().id(text);
}

int living = 0;

/// An object that is counted.
class Thing : public IPlugin {
public:
    Thing(ref<IPluginDesc> desc, PluginFactory* factory, u32 number)
        : IPlugin(std::move(desc), factory, number) {
        ++living;
    }
    ~Thing() override { --living; }
    void afterLoad(i32 version) override { loadedVersion = version; }
    i32 loadedVersion = 0;
};

class ThingDesc : public IPluginDesc {
public:
    explicit ThingDesc(string_view typeName = "thing") { type = named(typeName); }
    IPlugin* create(PluginFactory& factory, u32 number) override {
        if (fails)
            return nullptr;
        if (makesChild)
            factory.create(named("child"), createLocked);
        return new Thing(ref<IPluginDesc>(this), &factory, number);
    }
    bool fails = false, makesChild = false;
};

class Listener : public PluginCallback {
public:
    void added(PluginFactory&, u32 number) override { heard += format("+{}", number); }
    void removed(PluginFactory&, u32 number) override { heard += format("-{}", number); }
    void cleared(PluginFactory&) override { heard += "!"; }
    string heard;
};

class FactoryTest : public testing::Test {
protected:
    FactoryTest() { factory->registerDesc(desc); }
    ~FactoryTest() override {
        factory.reset();
        EXPECT_EQ(living, 0);
    }
    ref<IPlugin> make(string_view name = {}) {
        const ref<IPlugin> made = factory->create(named("thing"));
        if (!name.empty())
            made->attribute<string>(named("name")) = name;
        return made;
    }
    static ref<IPlugin>& reference(IPlugin& holder, string_view name = "target") {
        return holder.attribute<ref<IPlugin>>(named(name));
    }

    ref<ThingDesc> desc = makeRef<ThingDesc>();
    ref<PluginFactory> factory = makeRef<PluginFactory>("doc");
    LogCapture log;
};

TEST_F(FactoryTest, UnknownTypesBecomeDummies) {
    const name_id unknown = named("unheard of");
    EXPECT_EQ(factory->create(unknown, createNoDummy), nullptr);
    const ref<IPlugin> dummy = factory->create(unknown, createWarn);
    EXPECT_EQ(dummy->typeName(), unknown);
    EXPECT_TRUE(isDummy(*dummy));
    EXPECT_EQ(dummy->desc()->version, static_cast<i32>(0x80000000));
    EXPECT_EQ(factory->create(unknown, createWarn | createNoDummy)->desc(), dummy->desc());
    EXPECT_EQ(
        linesOf(log),
        "2 plugin factory doc| Unable to create plugin of type unheard of!\n"
        "2 plugin factory doc| Unable to create plugin of type unheard of! Creating a general "
        "plugin with limited functionality...\n");
    EXPECT_FALSE(isDummy(*make()));
    EXPECT_FALSE(factory->registerDesc(makeRef<ThingDesc>())) << "the first of a type stays";
    EXPECT_EQ(factory->findDesc(named("thing")), desc.get());
    vector<ref<IPluginDesc>> found;
    desc->group = 3;
    EXPECT_FALSE(factory->findDescs(found, 4));
    EXPECT_TRUE(factory->findDescs(found, 3) && found[0] == desc);
    desc->fails = true;
    EXPECT_EQ(factory->create(named("thing")), nullptr);
    EXPECT_EQ(factory->createPatched(named("thing"), true), nullptr);
}

TEST_F(FactoryTest, IdsArePlacesAndStayTaken) {
    for (u32 i = 0; i < 5; ++i)
        EXPECT_EQ(make()->id(), i);
    const ref<IPlugin> third = factory->plugin(3);
    EXPECT_TRUE(factory->remove(3, false));
    EXPECT_EQ(third->id(), IPlugin::noId);
    EXPECT_EQ(third->pluginFactory(), factory.get());
    EXPECT_EQ(factory->plugin(3), nullptr);
    EXPECT_EQ(factory->plugin(5), nullptr);
    EXPECT_EQ(make()->id(), 5u);

    EXPECT_EQ(factory->createAt(named("thing"), 2), nullptr);
    EXPECT_EQ(factory->createAt(named("thing"), 6), nullptr);
    EXPECT_EQ(factory->createAt(named("thing"), 3)->id(), 3u);
    EXPECT_EQ(factory->pluginCount(), 6u);

    const ref<IPlugin> loose = factory->create(named("thing"), createLoose);
    EXPECT_EQ(loose->id(), IPlugin::noId);
    EXPECT_EQ(factory->pluginCount(), 6u);
    factory->addPlugin(loose);
    EXPECT_EQ(loose->id(), 6u);
    EXPECT_THROW(factory->addPlugin(nullptr), invalid_argument);

    // An object whose making makes another one first
    factory->registerDesc(makeRef<ThingDesc>("child"));
    desc->makesChild = true;
    const ref<IPlugin> outer = factory->create(named("thing"), createLocked);
    EXPECT_EQ(outer->id(), 8u);
    EXPECT_EQ(factory->plugin(8), outer);
}

TEST_F(FactoryTest, RemovingNothingIsToldApart) {
    make();
    factory->remove(0, false);
    EXPECT_FALSE(factory->remove(IPlugin::noId, false));
    EXPECT_TRUE(log.entries().empty());
    EXPECT_FALSE(factory->remove(0, false));
    EXPECT_FALSE(factory->remove(7, false));
    EXPECT_FALSE(factory->replace(0, IPlugin::noId));
    make();
    EXPECT_FALSE(factory->replace(1, 2));
    EXPECT_EQ(linesOf(log),
              "5 plugin factory| Attempt to remove already removed plugin 0!\n"
              "5 plugin factory| Attempt to remove non existing plugin 7!\n"
              "5 plugin factory| Attempt to replace non existing plugin 0 detected!\n"
              "5 plugin factory| Attempt to replace non existing plugin 1 detected!\n");
}

/// Refers to `target` in every way, also from inside arrays of maps; `other` stays untouched.
void referTo(IPlugin& holder, IPlugin& target, IPlugin& other) {
    AttribMap& inner = *holder.attribute(1, named("maps"));
    inner.attribute<ref<IPlugin>>(named("one")) = ref<IPlugin>(&target);
    inner.vecAttribute<ref<IPlugin>>(named("many")) = {ref<IPlugin>(&target), ref<IPlugin>(&other)};
    inner.attribute(named("link"), new AttribLink(AttribPath(target, named("x"))));
}

/// The ids that `referTo` left: of the reference, of both elements and of the link's root.
string referencesOf(IPlugin& holder) {
    const auto number = [](const IPlugin* p) { return p ? std::to_string(p->id()) : "null"; };
    AttribMap& inner = *holder.findArray(named("maps"))->item(0)->asMap();
    const auto& many = *inner.findVecAttribute<ref<IPlugin>>(named("many"));
    const AttribPath& path = inner.findAttribute(named("link"), false)->asLink()->path();
    return format("{} {} {} {}{}", number(inner.findAttribute<ref<IPlugin>>(named("one"))->get()),
                  number(many[0].get()), number(many[1].get()), number(path.root()),
                  path.empty() ? " empty" : "");
}

TEST_F(FactoryTest, ReplaceAndRemoveReachEveryReference) {
    const ref<IPlugin> holder = make(), other = make();
    ref<IPlugin> target = make();
    make()->attribute<i32>(named("x")) = 4;
    referTo(*holder, *target, *other);
    EXPECT_EQ(referencesOf(*holder), "2 2 1 2");
    EXPECT_TRUE(factory->replace(2, 3));
    EXPECT_EQ(referencesOf(*holder), "3 3 1 3");
    EXPECT_EQ(
        *holder->findArray(named("maps"))->item(0)->asMap()->findAttribute<i32>(named("link")), 4);
    EXPECT_TRUE(factory->replace(3, IPlugin::noId));
    EXPECT_EQ(referencesOf(*holder), "null null 1 null empty");

    referTo(*holder, *target, *other);
    target.reset();
    EXPECT_TRUE(factory->remove(2, false));
    EXPECT_EQ(referencesOf(*holder), "null null 1 null empty");
    EXPECT_EQ(living, 3);
}

TEST_F(FactoryTest, AnUnreferencedObjectDiesWithItsRemoval) {
    make();
    reference(*factory->plugin(0)) = factory->plugin(0);
    EXPECT_TRUE(factory->remove(0, false));
    EXPECT_EQ(living, 0);
}

TEST_F(FactoryTest, ObjectsOutliveTheFactoryWithoutIt) {
    ref<IPlugin> held = make(), removed = make(),
                 loose = factory->create(named("thing"), createLoose);
    factory->remove(removed->id(), false);
    reference(*held) = make();
    reference(*reference(*held)) = held;
    factory.reset();
    EXPECT_EQ(living, 3);
    for (const ref<IPlugin>& object : {held, removed, loose}) {
        EXPECT_EQ(object->pluginFactory(), nullptr);
        EXPECT_EQ(object->id(), IPlugin::noId);
        EXPECT_EQ(object->typeName(), named("thing"));
    }
    EXPECT_EQ(reference(*held), nullptr);
}

TEST_F(FactoryTest, LongChainsAndRingsEndWithoutRecursion) {
    constexpr int count = 300000;
    ref<IPlugin> head = makeRef<Thing>(nullptr, nullptr, IPlugin::noId);
    for (int i = 1; i < count; ++i) {
        ref<IPlugin> next = makeRef<Thing>(nullptr, nullptr, IPlugin::noId);
        reference(*next) = std::move(head);
        head = std::move(next);
    }
    EXPECT_EQ(living, count);
    head.reset();
    EXPECT_EQ(living, 0);

    for (int i = 0; i < 100000; ++i)
        reference(*make()) = factory->plugin(static_cast<u32>(std::max(i - 1, 0)));
    reference(*factory->plugin(0)) = factory->plugin(99999);
}

TEST_F(FactoryTest, ADyingObjectIsOutOfReach) {
    struct Watcher : IPlugin {
        using IPlugin::IPlugin;
        ~Watcher() override { EXPECT_EQ(watched.resolve(), nullptr); }
        AttribPath watched;
    };
    const auto loose = [] { return makeRef<IPlugin>(nullptr, nullptr, IPlugin::noId); };
    ref<IPlugin> holder = loose(), held = loose();
    auto watcher = makeRef<Watcher>(nullptr, nullptr, IPlugin::noId);
    watcher->watched = AttribPath(*held);
    // Both die with the holder, the one that is let go last first.
    holder->vecAttribute<ref<IPlugin>>(named("all")) = {std::move(held), std::move(watcher)};
    holder.reset();
}

TEST_F(FactoryTest, AddedInterfacesAreFoundByName) {
    struct Extra : IPluginInterface {
        name_id name() const override { return named("IExtra"); }
    } first, second;
    const ref<IPlugin> object = make();
    object->addInterface(&first);
    object->addInterface(&second);
    EXPECT_EQ(object->queryInterface(named("IExtra")), &second);
    EXPECT_EQ(object->queryInterface(named("IUnknown")), nullptr);
}

TEST(AttribDescManager, KnowsTheWholeChain) {
    AttribDescManager& manager = attribDescManager();
    const name_id animal = named("animal"), cat = named("cat"), lion = named("lion"),
                  rock = named("rock"), ring = named("ring");
    manager.addClass(lion, cat);
    manager.addClass(cat, animal);
    manager.addClass(lion, rock); // another claim changes nothing
    manager.addClass(ring, ring);
    for (const name_id base : {animal, cat, lion})
        EXPECT_TRUE(manager.derivesFrom(lion, base)) << base.text();
    EXPECT_FALSE(manager.derivesFrom(lion, rock));
    EXPECT_FALSE(manager.derivesFrom(animal, lion));
    EXPECT_FALSE(manager.derivesFrom(ring, rock));
}

TEST_F(FactoryTest, ClonesAreObjectsOrPlainMaps) {
    const ref<IPlugin> original = make("lamp");
    original->setFlags(attribAnimated);
    Attribute* copy = original->clone();
    EXPECT_EQ(factory->plugin(1).get(), copy);
    EXPECT_EQ(copy->toString(), "lamp");
    EXPECT_EQ(copy->flags(), original->flags());
    EXPECT_TRUE(dynamic_cast<Thing*>(copy));

    const ref<IPlugin> homeless = makeRef<IPlugin>(nullptr, nullptr, IPlugin::noId);
    homeless->attribute<string>(named("name")) = "map";
    const auto plain = std::unique_ptr<Attribute>(homeless->clone());
    EXPECT_EQ(dynamic_cast<IPlugin*>(plain.get()), nullptr);
    EXPECT_EQ(*plain->asMap()->findAttribute<string>(named("name")), "map");
}

TEST_F(FactoryTest, FindsByNameAndTypeInIdOrder) {
    const auto otherDesc = makeRef<ThingDesc>("other");
    factory->registerDesc(otherDesc);
    make();
    factory->remove(0, false);
    make()->attribute<i32>(named("name")) = 1;
    make("b"), make("b");
    factory->create(named("other"));
    EXPECT_EQ(factory->findByName("b"), 2);
    EXPECT_TRUE(log.has(logWarning, "map attribute| Detected invalid access to attribute 'name'. "
                                    "Expected 'string', actual attribute type - 'i32'"));
    EXPECT_EQ(factory->findByName(""), -1);
    EXPECT_EQ(factory->findByType(named("thing")), 1);
    EXPECT_EQ(factory->firstOfType(named("other"))->id(), 4u);
    EXPECT_EQ(factory->findByType(named("nothing")), -1);
    // Counts of four bytes for four maps; a number; two texts of a length and one byte
    EXPECT_EQ(factory->memorySize(), 4u * 4 + 4 + 2 * 5);
    EXPECT_EQ(factory->afterLoadAll(9, 2), 5u);
    EXPECT_EQ(dynamic_cast<Thing&>(*factory->plugin(1)).loadedVersion, 0);
    EXPECT_EQ(dynamic_cast<Thing&>(*factory->plugin(4)).loadedVersion, 9);
}

TEST_F(FactoryTest, PatchesRecordAndListenersHear) {
    Listener listener;
    factory->addCallback(&listener);
    const ref<IPlugin> patched = factory->createPatched(named("thing"), true);
    EXPECT_TRUE(patched->hasFlag(attribPluginMark));
    EXPECT_FALSE(make()->hasFlag(attribPluginMark));
    PluginPatch& root = factory->rootPatch();
    EXPECT_TRUE(root.remove(1));
    EXPECT_FALSE(root.remove(1));
    ASSERT_EQ(root.records().size(), 2u);
    EXPECT_EQ(root.records()[1].operation, PluginPatch::Operation::remove);
    EXPECT_EQ(root.records()[1].id, 1u);
    EXPECT_EQ(listener.heard, "+0+1-1");
    factory.reset();
    EXPECT_EQ(listener.heard, "+0+1-1!");
}

TEST_F(FactoryTest, MergeCopiesAndRewires) {
    PluginFactory source("source");
    source.registerDesc(makeRef<ThingDesc>());
    source.registerDesc(makeRef<ThingDesc>("new here"));
    const ref<IPlugin> shared = source.create(named("thing")),
                       holder = source.create(named("new here")),
                       twin = source.create(named("new here")),
                       nameless = source.create(named("thing"));
    shared->attribute<string>(named("name")) = "shared";
    holder->attribute<string>(named("name")) = "holder";
    twin->attribute<string>(named("name")) = "holder";
    referTo(*holder, *shared, *nameless);
    reference(*nameless) = nameless;

    make("shared"), make();
    factory->merge(source);
    factory->merge(*factory);
    // 0 and 1 were here; 2 is the holder, 3 its twin, 4 the nameless one.
    ASSERT_EQ(factory->pluginCount(), 5u);
    EXPECT_EQ(referencesOf(*factory->plugin(2)), "0 0 4 0");
    EXPECT_EQ(reference(*factory->plugin(4)), factory->plugin(4));
    EXPECT_EQ(factory->plugin(3)->getName(), "holder");
    EXPECT_FALSE(isDummy(*factory->plugin(2)));
    EXPECT_EQ(referencesOf(*holder), "0 0 3 0");
    EXPECT_EQ(linesOf(log), "3 plugin factory| Plugin shared from type thing already exists in the "
                            "original factory!\n");
}

} // namespace
} // namespace base
