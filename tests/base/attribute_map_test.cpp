#include "b_attribute_map.h"

#include "b_exception.h"
#include "b_factory.h"
#include "log_capture.h"

#include <functional>
#include <gtest/gtest.h>
#include <memory>

namespace base {
namespace {

using namespace test_support;

name_id named(string_view text) {
    return nameServer().id(text);
}

/// What `call` throws; an empty text if nothing.
struct Thrown {
    string text, function;
};
Thrown thrownBy(const std::function<void()>& call) {
    try {
        call();
    } catch (const exception& e) {
        return {e.what(), e.function()};
    }
    return {};
}

/// A map with one value of each kind.
void fill(AttribMap& map) {
    map.attribute<float>(named("float")) = 1.5f;
    map.vecAttribute<i32>(named("ints")) = {1, 2};
    map.mapAttribute(named("map"), named("inner")).attribute<i32>(named("x")) = 3;
    map.arrayAttribute(named("array")).append(new TypedAttribute<string>("text"));
}

TEST(AttribMap, EveryAccessChecksTheName) {
    AttribMap map;
    float value = 0;
    const std::pair<const char*, std::function<void(name_id)>> cases[] = {
        {"findAttribute", [&](name_id n) { map.findAttribute(n); }},
        {"findVecAttribute", [&](name_id n) { map.findVecAttribute<float>(n); }},
        {"findAttribute", [&](name_id n) { map.findAttributeMutable(n); }},
        {"attribute", [&](name_id n) { map.attribute<float>(n); }},
        {"vecAttribute", [&](name_id n) { map.vecAttribute<float>(n); }},
        {"arrayAttribute", [&](name_id n) { map.arrayAttribute(n); }},
        {"mapAttribute", [&](name_id n) { map.mapAttribute(n, {}); }},
        {"attribute", [&](name_id n) { map.attribute(n, nullptr); }},
        {"attribute", [&](name_id n) { map.attribute(0, n); }},
        {"syncAttribute", [&](name_id n) { map.syncAttribute(n, value); }},
        {"removeAttribute", [&](name_id n) { map.removeAttribute(n); }}};
    for (const auto& [function, call] : cases)
        for (const name_id empty : {name_id(), nameServer().emptyName()}) {
            const Thrown thrown = thrownBy([&] { call(empty); });
            EXPECT_EQ(thrown.text, "The attribute name can't be an empty string.") << function;
            EXPECT_EQ(thrown.function, string("base::AttribMap::") + function);
        }
    EXPECT_EQ(map.size(), 0u);
}

TEST(AttribMap, AbsenceIsSilentAndAWrongTypeIsNot) {
    AttribMap map;
    LogCapture log;
    EXPECT_EQ(map.findAttribute(named("float")), nullptr);
    EXPECT_EQ(map.findAttribute<float>(named("float")), nullptr);
    EXPECT_EQ(map.findVecAttribute<float>(named("float")), nullptr);
    EXPECT_EQ(map.findMap(named("float")), nullptr);
    EXPECT_TRUE(log.entries().empty());

    fill(map);
    EXPECT_EQ(map.findMap(named("float")), nullptr);
    EXPECT_EQ(map.findArray(named("map")), nullptr);
    EXPECT_TRUE(log.entries().empty());
    EXPECT_EQ(*map.findAttribute<float>(named("float")), 1.5f);
    EXPECT_EQ(map.findAttribute<double>(named("float")), nullptr);
    EXPECT_EQ(map.findVecAttribute<float>(named("ints")), nullptr);
    EXPECT_EQ(linesOf(log),
              "3 map attribute| Detected invalid access to attribute 'float'. Expected 'double', "
              "actual attribute type - 'float'\n"
              "3 map attribute| Detected invalid access to attribute 'ints'. Expected type "
              "'float[]', actual attribute type - 'i32[]'!\n");
}

TEST(AttribMap, ThrowingAccessNamesBothTypes) {
    AttribMap map;
    fill(map);
    map.attribute(named("link"), new AttribLink);
    double number = 0;
    const std::pair<std::function<void()>, const char*> cases[] = {
        {[&] { map.attribute<double>(named("float")); },
         "Detected invalid access to attribute 'float'. Expected type 'double', attribute type - "
         "'float'."},
        {[&] { map.syncAttribute(named("ints"), number); },
         "Detected invalid access to attribute 'ints'. Expected type 'double', attribute type - "
         "'i32[]'."},
        {[&] { map.attribute<float>(named("link")); },
         "Detected invalid access to attribute 'link'. Expected type 'float', attribute type - "
         "'link'."},
        {[&] { map.arrayAttribute(named("map")); },
         "Detected invalid access to attribute 'map'. Expected type 'array', attribute type - "
         "'map'."},
        {[&] { map.attribute(named("new"), nullptr); }, "Can't set invalid attribute"}};
    for (const auto& [call, text] : cases)
        EXPECT_EQ(thrownBy(call).text, text);
}

TEST(AttribMap, TypesThatTheFactoryLacksAreReportedTwice) {
    AttribFactory bare;
    AttribMap map(bare);
    LogCapture log;
    EXPECT_EQ(thrownBy([&] { map.attribute<float>(named("x")); }).text,
              "Trying to access not registered attribute type 'float'.");
    EXPECT_EQ(linesOf(log), "3 factory: Trying to create am item with unknown type float.\n");
    EXPECT_EQ(map.size(), 0u);
}

TEST(AttribMap, SyncBindsInBothDirections) {
    AttribMap map;
    i32 value = 7;
    map.syncAttribute(named("x"), value);
    EXPECT_EQ(map.size(), 1u);
    EXPECT_EQ(*map.findAttribute<i32>(named("x")), 7);
    map.attribute<i32>(named("x")) = 9;
    map.syncAttribute(named("x"), value);
    EXPECT_EQ(value, 9);

    map.attribute(named("link"), new AttribLink);
    map.syncAttribute(named("link"), value);
    EXPECT_EQ(value, 9);
    EXPECT_TRUE(map.findAttribute(named("link"), false)->asLink());
}

TEST(AttribMap, ParentsSupplyWhatIsMissing) {
    AttribMap map;
    {
        AttribMap parent, grandparent;
        parent.setParent(&grandparent);
        map.setParent(&parent);
        grandparent.attribute<i32>(named("far")) = 1;
        parent.attribute<i32>(named("near")) = 2;
        EXPECT_EQ(*map.findAttribute<i32>(named("far")), 1);
        EXPECT_EQ(*map.findAttribute<i32>(named("near")), 2);
        EXPECT_EQ(map.findAttribute(named("near"), true, false), nullptr);
        const auto copy = std::unique_ptr<Attribute>(map.clone());
        EXPECT_EQ(copy->asMap()->parent(), &parent);
        map.attribute<i32>(named("near")) = 3;
        EXPECT_EQ(*parent.findAttribute<i32>(named("near")), 2);
        grandparent.setParent(&map);
        EXPECT_EQ(map.findAttribute(named("nowhere")), nullptr);
    }
    EXPECT_EQ(map.parent(), nullptr);
    EXPECT_EQ(map.findAttribute(named("far")), nullptr);
}

TEST(AttribMap, PuttingAnAttributeTakesItOver) {
    AttribMap map, donor;
    fill(map);
    fill(donor);
    donor.attribute<float>(named("float")) = 8;
    donor.vecAttribute<i32>(named("ints")).push_back(3);
    donor.findMap(named("map"))->attribute<i32>(named("y")) = 4;
    donor.findMap(named("map"))->setTypeName(named("other"));
    donor.findArray(named("array"))->append(nullptr);

    // The same type: the old attribute stays, with its flags, and has the new value.
    for (const char* name : {"float", "ints", "map", "array"}) {
        Attribute* old = map.findAttribute(named(name));
        old->setFlags(attribAnimated);
        Attribute* given = donor.findAttribute(named(name))->clone();
        given->setFlags(attribTransient);
        map.attribute(named(name), given);
        EXPECT_EQ(map.findAttribute(named(name)), old) << name;
        EXPECT_EQ(old->flags(), attribAnimated) << name;
        EXPECT_EQ(old->compare(donor.findAttribute(named(name))->data()), 0) << name;
        map.attribute(named(name), old);
        EXPECT_EQ(map.findAttribute(named(name)), old) << name;
    }
    EXPECT_EQ(map.findMap(named("map"))->typeName(), named("other"));

    // Another type: the new attribute stands in its place.
    auto* replacement = new TypedAttribute<string>("s");
    map.attribute(named("map"), replacement);
    EXPECT_EQ(map.findAttribute(named("map")), replacement);
    EXPECT_EQ(map.size(), 4u);
}

TEST(AttribMap, ArraysOfMapsGrowAndNeverShrink) {
    AttribFactory own;
    AttribMap map(own);
    EXPECT_EQ(map.attribute(0, named("maps")), nullptr);
    AttribMap* first = map.attribute(2, named("maps"));
    ASSERT_TRUE(first);
    EXPECT_EQ(&first->factory(), &own);
    EXPECT_EQ(map.attribute(1, named("maps")), first);
    EXPECT_EQ(map.findArray(named("maps"))->size(), 2u);
    map.attribute(named("number"), new TypedAttribute<i32>(1));
    EXPECT_TRUE(map.attribute(1, named("number")));
    EXPECT_EQ(map.findAttribute(named("number"))->type(), n_array);
}

TEST(AttribMap, AssignByMode) {
    struct Case {
        u32 mode;
        float kept;
        const char* both;
        u32 inner; ///< attributes of the map that both have
    };
    // Mode 0 replaces whole attributes; merging keeps scalars; copying goes into maps.
    const Case cases[] = {{assignAdopt, 2, "string", 1},
                          {assignMerge, 1.5f, "i32", 2},
                          {assignCopy, 2, "string", 2},
                          {assignCopy | assignMerge, 2, "string", 2}};
    for (const Case& c : cases) {
        AttribMap own, other;
        fill(own);
        own.attribute<i32>(named("both")) = 1;
        own.attribute<i32>(named("mine")) = 1;
        other.attribute<float>(named("float")) = 2;
        other.attribute<string>(named("both")) = "b";
        other.attribute<i32>(named("theirs")) = 2;
        other.mapAttribute(named("map"), {}).attribute<i32>(named("y")) = 4;
        EXPECT_TRUE(own.assign(other, c.mode));
        EXPECT_EQ(*own.findAttribute<float>(named("float")), c.kept) << c.mode;
        EXPECT_EQ(own.findAttribute(named("both"))->type().view(), c.both) << c.mode;
        EXPECT_EQ(own.findMap(named("map"))->size(), c.inner) << c.mode;
        EXPECT_TRUE(own.findAttribute(named("mine")) && own.findAttribute(named("theirs")));
        EXPECT_EQ(own.size(), 7u);
        EXPECT_TRUE(own.assign(own, c.mode));
        EXPECT_EQ(own.size(), 7u);
        EXPECT_FALSE(own.assign(TypedAttribute<i32>(1), c.mode));
    }
}

TEST(AttribMap, AssignsBetweenAMapAndItsOwnParts) {
    for (const u32 mode : {0u, 1u, 2u, 3u}) {
        AttribMap outer;
        AttribMap& inner = outer.mapAttribute(named("part"), {});
        inner.mapAttribute(named("part"), {}).attribute<i32>(named("x")) = 1;
        inner.attribute<i32>(named("y")) = 2;
        EXPECT_TRUE(inner.assign(outer, mode));
        EXPECT_TRUE(outer.assign(*outer.findMap(named("part")), mode));
        EXPECT_EQ(*outer.findAttribute<i32>(named("y")), 2) << mode;
    }
}

TEST(AttribMap, ItemsByIndexFollowTheOrderOfHandles) {
    AttribMap map;
    for (const char* name : {"order/c", "order/a"})
        nameServer().id(name);
    map.attribute<i32>(named("order/a")) = 1;
    map.attribute<i32>(named("order/c")) = 2;
    EXPECT_EQ(*static_cast<const i32*>(map.data(0)), 2);
    EXPECT_EQ(map.data(2), nullptr);
    EXPECT_FALSE(map.removeItem(2));
    EXPECT_TRUE(map.removeItem(0));
    EXPECT_EQ(map.findAttribute(named("order/c")), nullptr);
    EXPECT_EQ(map.byteSize(), 8u);
}

} // namespace
} // namespace base
