#include "b_attribute_map.h"

#include "b_exception.h"
#include "b_factory.h"

#include <cmath>
#include <gtest/gtest.h>
#include <memory>

namespace base {
namespace {

std::unique_ptr<Attribute> create(string_view type) {
    return std::unique_ptr<Attribute>(attribFactory().create(nameServer().id(type)));
}

template <class T>
std::unique_ptr<TypedVectorAttribute<T>> makeVector(vector<T> values, u32 flags = 0) {
    auto made = std::make_unique<TypedVectorAttribute<T>>(std::move(values));
    made->setFlags(flags);
    return made;
}

struct TypeCase {
    const char* type;
    int elementCode;
    u32 byteSize;
    const char* fresh; ///< text of a new value
    const char* text;  ///< text of another one
    const char* broken;
};

const TypeCase scalarCases[] = {
    {"bool", 0, 1, "false", "true", "2"},
    {"u8", 1, 1, "0", "255", "256"},
    {"i16", 4, 2, "0", "-32768", "32768"},
    {"u16", 3, 2, "0", "65535", "-1"},
    {"mat22f", 10, 16, "1 0 0 1", "1 2 3 4", "1 2 3"},
    {"i32", 6, 4, "0", "-2147483648", "1.5"},
    {"u32", 5, 4, "0", "4294967295", "+1"},
    {"float", 10, 4, "0", "-12.25", "1 2"},
    {"double", 11, 8, "0", "1000000.5", ""},
    {"vec3f", 10, 12, "0 0 0", "1 -2.5 0.125", "1 2 3 4"},
    {"vec4f", 10, 16, "0 0 0 0", "1 2 3 4", "1 2 x 4"},
    {"vec3d", 11, 24, "0 0 0", "1 2 3", "1,2,3"},
    {"quatf", 10, 16, "0 0 0 1", "0.5 0.5 -0.5 0.5", "1 2 3"},
    {"color4f", 10, 16, "0 0 0 1", "0.25 0.5 0.75 0", "red"},
    {"mat33d", 11, 72, "1 0 0 0 1 0 0 0 1", "1 2 3 4 5 6 7 8 9", "1"},
    {"mat44f", 10, 64, "1 0 0 0 0 1 0 0 0 0 1 0 0 0 0 1", "1 2 3 4 5 6 7 8 9 10 11 12 13 14 15 16",
     "1"},
    {"box2i", 6, 16, "2147483647 2147483647 -2147483648 -2147483648", "1 2 3 4", "1 2 3"},
    {"box3u", 5, 24, "4294967295 4294967295 4294967295 0 0 0", "1 2 3 4 5 6", "-1 2 3 4 5 6"},
    {"box3d", 11, 48, "1.8e+308 1.8e+308 1.8e+308 -1.8e+308 -1.8e+308 -1.8e+308", "1 2 3 4 5 6",
     "1"},
    {"vec2i8", 2, 2, "0 0", "-128 127", "128 0"},
    {"vec4u8", 1, 4, "0 0 0 0", "0 1 2 255", "0 1 2 256"},
    {"timecode", 8, 8, "0", "-46186158000", "1.5"},
    {"datetime", -1, 8, "0000-00-00 00:00:00", "2024-02-29 23:59:07", "2024-13-01 00:00:00"},
    {"rational", -1, 8, "0/0", "-3/4", "3"},
    {"string", -1, 4, "", "any text, with  blanks ", nullptr}};

TEST(ScalarAttribute, TypesHaveTheirTextsCodesAndSizes) {
    for (const TypeCase& c : scalarCases) {
        const auto a = create(c.type);
        ASSERT_TRUE(a) << c.type;
        EXPECT_EQ(a->type().view(), c.type);
        EXPECT_EQ(a->elementCode(), c.elementCode) << c.type;
        EXPECT_EQ(a->byteSize(), c.byteSize) << c.type;
        EXPECT_EQ(a->size(), 1u) << c.type;
        EXPECT_EQ(a->hash(), 0u) << c.type;
        EXPECT_EQ(a->toString(), c.fresh) << c.type;
        EXPECT_TRUE(a->fromString(c.text)) << c.type;
        EXPECT_EQ(a->toString(), c.text) << c.type;
        if (c.broken) {
            EXPECT_FALSE(a->fromString(c.broken)) << c.type;
            EXPECT_EQ(a->toString(), c.text) << c.type << ": a broken text changed the value";
        }

        const auto same = std::unique_ptr<Attribute>(a->clone());
        EXPECT_EQ(same->type(), a->type());
        EXPECT_EQ(a->compare(same->data()), 0) << c.type;
        const auto fresh = create(c.type);
        EXPECT_NE(a->compare(fresh->data()), 0) << c.type;
        EXPECT_FALSE(fresh->assign(*a, assignAdopt | assignMerge)) << c.type;
        EXPECT_TRUE(fresh->assign(*a, assignCopy)) << c.type;
        EXPECT_EQ(a->compare(fresh->data()), 0) << c.type;
    }
}

TEST(ScalarAttribute, IndicesNameComponents) {
    const auto a = create("vec3f");
    const float value = 7.5f;
    a->setData(&value, 1);
    a->setData(&value, 3);
    EXPECT_TRUE(a->fromString("-2", 2));
    EXPECT_FALSE(a->fromString("-2", 3));
    EXPECT_EQ(a->toString(), "0 7.5 -2");
    EXPECT_EQ(*static_cast<const float*>(a->data(2)), -2);
    EXPECT_EQ(a->data(3), nullptr);
    EXPECT_EQ(a->compare(&value, 0), -1);
    EXPECT_EQ(a->compare(&value, 1), 0);
    const auto text = create("string");
    EXPECT_EQ(text->data(0), text->data());
    EXPECT_EQ(text->data(1), nullptr);
}

TEST(ScalarAttribute, ComparesByTheFirstDifference) {
    const float nan = std::nanf("");
    struct Case {
        vec2f own, argument;
        int expected;
    };
    const Case cases[] = {{{1, 2}, {1, 2}, 0},   {{1, 2}, {1, 3}, -1},  {{2, 0}, {1, 9}, 1},
                          {{nan, 0}, {1, 0}, 1}, {{1, 0}, {nan, 0}, 1}, {{1, nan}, {2, 0}, -1}};
    for (const Case& c : cases)
        EXPECT_EQ(TypedAttribute<vec2f>(c.own).compare(&c.argument), c.expected);
}

TEST(VectorAttribute, TypesHaveTheirCodesAndSizes) {
    struct Case {
        const char* type;
        int elementCode;
        u32 sizeOfTwo;
        const char* text;
    };
    // A count of four bytes, then two elements. The affine matrix has 60 bytes, not its padded 64.
    const Case cases[] = {
        {"i8[]", 2, 4 + 2, "-1, 2"},
        {"u8[]", 1, 4 + 2, "1, 2"},
        {"float[]", 10, 4 + 8, "1.5, -2"},
        {"vec3f[]", 10, 4 + 24, "1 2 3, 4 5 6"},
        {"normal[]", 10, 4 + 24, "1 0 0, 0 0 1"},
        {"mat43[]", 10, 4 + 120, "1 2 3 4 5 6 7 8 9 10 11 12, 0 0 0 0 0 0 0 0 0 0 0 0"},
        {"timecode[]", 8, 4 + 16, "1, -1"},
        {"string[]", -1, 4 + (4 + 1) + (4 + 2), "a, bc"},
        {"box3f[]", 10, 4 + 48, "1 2 3 4 5 6, 6 5 4 3 2 1"}};
    for (const Case& c : cases) {
        const auto a = create(c.type);
        ASSERT_TRUE(a) << c.type;
        EXPECT_EQ(a->type().view(), c.type);
        EXPECT_EQ(a->elementCode(), c.elementCode) << c.type;
        EXPECT_EQ(a->byteSize(), 4u) << c.type;
        EXPECT_TRUE(a->fromString(c.text)) << c.type;
        EXPECT_EQ(a->size(), 2u) << c.type;
        EXPECT_EQ(a->byteSize(), c.sizeOfTwo) << c.type;
        EXPECT_EQ(a->toString(), c.text) << c.type;
        const auto same = std::unique_ptr<Attribute>(a->clone());
        EXPECT_EQ(a->compare(same->data()), 0) << c.type;
        EXPECT_EQ(a->hash(), same->hash()) << c.type;
        EXPECT_TRUE(a->removeItem(0));
        EXPECT_FALSE(a->removeItem(1));
        EXPECT_EQ(a->compare(same->data()), -1) << c.type;
        EXPECT_NE(a->hash(), same->hash()) << c.type;
    }
    EXPECT_FALSE(attribFactory().has(nameServer().id("i8")));
    EXPECT_FALSE(attribFactory().has(nameServer().id("bool[]")));
}

TEST(VectorAttribute, HashIsTheOneOfThePublishedFunction) {
    EXPECT_EQ(makeVector<u8>({})->hash(), 0x02CC5D05u);
    EXPECT_EQ(makeVector<u8>({'a', 'b', 'c'})->hash(), 0x32D153FFu);
    // Padding between the matrix and the translation is no part of the value.
    alignas(mat43) unsigned char ones[sizeof(mat43)];
    std::memset(ones, 0xff, sizeof ones);
    mat43& dirty = *reinterpret_cast<mat43*>(ones);
    dirty.m = {};
    dirty.t = {};
    EXPECT_EQ(makeVector<mat43>(vector<mat43>::view(&dirty, 1))->hash(),
              makeVector<mat43>({mat43()})->hash());
}

TEST(VectorAttribute, TextsOfLengthsAndElements) {
    EXPECT_EQ(makeVector<i32>({1, 2, 3, 4})->toString(), "1, 2, 3, 4");
    EXPECT_EQ(makeVector<i32>({1, 2, 3, 4, 5})->toString(), "i32[][5]");
    const auto a = makeVector<i32>({1, 2});
    EXPECT_FALSE(a->fromString("1, x"));
    EXPECT_FALSE(a->fromString("7", 2));
    EXPECT_TRUE(a->fromString("7", 1));
    EXPECT_EQ(a->toString(), "1, 7");
    EXPECT_TRUE(a->fromString(""));
    EXPECT_EQ(a->size(), 0u);
}

TEST(VectorAttribute, AssignFollowsModeAndFlags) {
    constexpr u32 merge = attribMergeOnAssign, duplicates = attribMergeDuplicates;
    struct Case {
        const char* what;
        vector<i32> own, other;
        u32 flags, mode;
        vector<i32> expected;
    };
    const Case cases[] = {
        {"replaces", {1}, {2, 2}, 0, assignCopy, {2, 2}},
        {"fills an empty one", {}, {2}, 0, assignMerge, {2}},
        {"keeps", {1}, {2}, 0, assignMerge, {1}},
        {"keeps without the merge flag", {1}, {2}, duplicates, assignAdopt, {1}},
        {"merges", {1, 2}, {2, 3, 3}, merge, assignAdopt, {1, 2, 3}},
        {"merges with duplicates", {1, 2}, {2, 3, 3}, merge | duplicates, 0, {1, 2, 2, 3, 3}}};
    for (const Case& c : cases) {
        const auto own = makeVector(c.own, c.flags);
        EXPECT_TRUE(own->assign(*makeVector(c.other), c.mode)) << c.what;
        EXPECT_EQ(own->value(), c.expected) << c.what;
        EXPECT_EQ(own->flags(), c.flags) << c.what;
        EXPECT_TRUE(own->assign(*own, c.mode)) << c.what;
        EXPECT_EQ(own->value(), c.expected) << c.what << ", assigned to itself";
    }
}

TEST(VectorAttribute, TakesScalarsOfItsElementType) {
    const auto a = makeVector<i32>({1, 2});
    EXPECT_TRUE(a->assign(TypedAttribute<i32>(2), 0));
    EXPECT_TRUE(a->assign(TypedAttribute<i32>(3), 0, 0));
    EXPECT_FALSE(a->assign(TypedAttribute<i32>(4), 0, 9));
    EXPECT_FALSE(a->assign(TypedAttribute<u32>(4), assignCopy));
    EXPECT_EQ(a->value(), (vector<i32>{3, 1, 2}));
}

TEST(PluginAttributes, KeepFlagsPathsAndNames) {
    PluginFactory factory;
    const ref<IPlugin> object = factory.create(nameServer().id("thing"));
    object->attribute<string>(nameServer().id("name")) = "lamp";

    PluginAttribute one(object);
    one.path = AttribPath(*object);
    EXPECT_EQ(one.toString(), "lamp");
    EXPECT_FALSE(one.fromString("lamp"));
    EXPECT_EQ(one.elementCode(), 5);
    const auto copy = std::unique_ptr<Attribute>(one.clone());
    EXPECT_EQ(dynamic_cast<PluginAttribute&>(*copy).path, one.path);
    PluginAttribute target;
    EXPECT_TRUE(target.assign(one, assignCopy));
    EXPECT_EQ(target.path, one.path);

    const auto many = create("plugin[]");
    EXPECT_TRUE(many->hasFlag(attribMergeOnAssign));
    EXPECT_TRUE(many->assign(one, assignAdopt));
    EXPECT_TRUE(many->assign(one, assignAdopt));
    EXPECT_EQ(many->toString(), "lamp");
    EXPECT_EQ(many->byteSize(), 8u);
}

TEST(ArrayAttribute, HoldsGapsEverywhere) {
    AttribArray a;
    a.setTypeName(TypeTraits<i32>::n_name);
    a.setItem(2, new TypedAttribute<i32>(5));
    a.append(nullptr);
    a.setFlags(attribTransient);
    EXPECT_EQ(a.size(), 4u);
    EXPECT_EQ(a.byteSize(), 8u);
    EXPECT_FALSE(a.isAnimated());
    EXPECT_EQ(a.data(0), nullptr);
    EXPECT_EQ(*static_cast<const i32*>(a.data(2)), 5);

    const auto copy = std::unique_ptr<Attribute>(a.clone());
    EXPECT_EQ(a.compare(copy->data()), 0);
    EXPECT_EQ(copy->flags(), a.flags());
    EXPECT_EQ(copy->asArray()->typeName(), a.typeName());
    EXPECT_NE(copy->asArray()->item(2), a.item(2));
    copy->asArray()->item(2)->setFlags(attribAnimated);
    EXPECT_TRUE(copy->isAnimated());
    EXPECT_TRUE(copy->removeItem(2));
    EXPECT_EQ(a.compare(copy->data()), 1);
    EXPECT_TRUE(copy->assign(a, assignMerge));
    EXPECT_EQ(copy->size(), 3u);
    EXPECT_TRUE(copy->assign(a, assignCopy));
    EXPECT_TRUE(copy->assign(*copy, assignCopy));
    EXPECT_EQ(a.compare(copy->data()), 0);
}

TEST(Clone, EndsAt256Levels) {
    const name_id child = nameServer().id("child");
    AttribMap root;
    AttribMap* last = &root;
    for (int depth = 2; depth <= 256; ++depth)
        last = &last->mapAttribute(child, {});
    delete root.clone();
    last->arrayAttribute(child);
    EXPECT_THROW(delete root.clone(), exception);
    last->removeAttribute(child);
    delete root.clone();
}

} // namespace
} // namespace base
