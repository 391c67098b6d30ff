#include "b_attribute_binary.h"
#include "b_exception.h"

#include "binary_stream.h"
#include "log_capture.h"

#include <gtest/gtest.h>

using namespace base;
using namespace test_support;

namespace {

name_id named(string_view text) {
    return nameServer().id(text);
}

Bytes written(const Attribute& attribute) {
    Bytes bytes;
    Stream stream = vectorStream(bytes);
    BinaryWriteOptions options;
    attribute.write(stream, options);
    EXPECT_EQ(options.state, nullptr);
    return bytes;
}

bool readInto(Attribute& attribute, const Bytes& bytes, bool throwsOnShortRead = true) {
    Stream stream = viewOf(bytes, throwsOnShortRead);
    BinaryReadOptions options;
    return attribute.read(stream, options);
}

template <class T>
std::unique_ptr<Attribute> scalar(T value) {
    return std::make_unique<TypedAttribute<T>>(value);
}

template <class T>
std::unique_ptr<Attribute> elements(vector<T> values) {
    return std::make_unique<TypedVectorAttribute<T>>(std::move(values));
}

std::unique_ptr<Attribute> pathOfAllKinds() {
    AttribPath path;
    path.step(PathStepKind::plugin, nameServer().emptyName(), 7);
    path.attribute(named("list")).element(3).component(1);
    return std::make_unique<AttribLink>(path);
}

std::unique_ptr<Attribute> arrayOfTwo() {
    auto array = std::make_unique<AttribArray>();
    array->setTypeName(named("kind"));
    array->append(nullptr);
    array->append(new TypedAttribute<u8>(u8{9}));
    return array;
}

std::unique_ptr<Attribute> mapInMap() {
    auto map = std::make_unique<AttribMap>();
    map->setFlags(0x41);
    map->mapAttribute(named("inner"), named("kind"));
    auto* hidden = new TypedAttribute<i32>(1);
    hidden->setFlags(attribTransient);
    map->attribute(named("hidden"), hidden);
    return map;
}

TEST(BinaryValue, HasTheseBytes) {
    constexpr unsigned one = 0x3f800000, two = 0x40000000;
    mat43 matrix; // the identity, but for the translation
    matrix.t = {1, 0, 2};
    ByteList matrixBytes;
    matrixBytes.u32(one).u32(0).u32(0).u32(0).u32(one).u32(0).u32(0).u32(0).u32(one);
    matrixBytes.u32(0).u32(0x3ff00000).u32(0).u32(0).u32(0).u32(0x40000000);
    ASSERT_EQ(matrixBytes.size(), 60u);

    struct Case {
        const char* name;
        std::unique_ptr<Attribute> attribute;
        ByteList value; // behind the flags
    };
    Case cases[] = {
        {"bool", scalar(true), ByteList().u8(1)},
        {"i16", scalar<i16>(-2), ByteList().u16(0xfffe)},
        {"u32", scalar<u32>(0x01020304), ByteList().u8(4).u8(3).u8(2).u8(1)},
        {"float", scalar(1.0f), ByteList().u32(one)},
        {"double", scalar(2.0), ByteList().u32(0).u32(0x40000000)},
        {"vec3f", scalar(vec3f{1, 0, 2}), ByteList().u32(one).u32(0).u32(two)},
        {"box2i", scalar(base_box<base_vec2<i32>>{{1, 2}, {3, 4}}),
         ByteList().u32(1).u32(2).u32(3).u32(4)},
        {"datetime", scalar(DateTime{2024, 12, 31, 23, 59, 58, 0}),
         ByteList().u16(2024).u8(12).u8(31).u8(23).u8(59).u8(58).u8(0)},
        {"timecode", scalar(TimeCode{-1}), ByteList().u32(0xffffffff).u32(0xffffffff)},
        {"rational", scalar(rational{1, -1}), ByteList().u32(1).u32(0xffffffff)},
        {"string", scalar<string>("two"), ByteList().text("two")},
        {"empty string", scalar<string>(""), ByteList().u32(0)},
        {"plugin", std::make_unique<PluginAttribute>(), ByteList().u32(0xffffffff)},
        {"u16[]", elements<u16>({1, 2}), ByteList().u32(2).u16(1).u16(2)},
        {"normal[]", elements<normal>({{0, 1, 2}}), ByteList().u32(1).u32(0).u32(one).u32(two)},
        {"mat43[]", elements<mat43>({matrix, matrix}),
         ByteList().u32(2).add(matrixBytes).add(matrixBytes)},
        {"string[]", elements<string>({"a", ""}), ByteList().u32(2).text("a").u32(0)},
        {"link", pathOfAllKinds(),
         ByteList()
             .u32(4)
             .u32(0)
             .u32(7)
             .u8(0)
             .text("list")
             .u32(0)
             .u8(1)
             .u32(0)
             .u32(3)
             .u8(2)
             .u32(0)
             .u32(1)
             .u8(3)},
        {"array", arrayOfTwo(),
         ByteList().u32(2).text("kind").u32(0).text("u8").u32(2).u8(0).u8(9)},
        {"map", mapInMap(), ByteList().u32(1).text("inner").text("map:kind").u32(5).u8(0).u32(0)},
    };
    for (Case& test : cases) {
        ByteList expected;
        expected.u8(test.attribute->flags() & 0xff).add(test.value);
        EXPECT_EQ(written(*test.attribute), expected.bytes()) << test.name;
        const std::unique_ptr<Attribute> read(attribFactory().create(test.attribute->type()));
        EXPECT_TRUE(readInto(*read, expected.bytes())) << test.name;
        EXPECT_EQ(written(*read), expected.bytes()) << test.name;
        const bool hasHiddenPart = test.attribute->type() == n_map;
        EXPECT_EQ(read->compare(std::as_const(*test.attribute).data()) != 0, hasHiddenPart)
            << test.name;
    }
}

/// Whole elements that are there are kept, a value that is cut is neutral.
TEST(BinaryValue, ThatIsCutKeepsWhatIsWhole) {
    const Bytes scalarBytes = ByteList().u8(0).u32(1).u16(2).bytes();
    TypedAttribute<vec2f> vector2(vec2f{3, 3});
    EXPECT_FALSE(readInto(vector2, scalarBytes, false));
    EXPECT_EQ(vector2.value(), vec2f());

    const Bytes arrayBytes = ByteList().u8(0x20).u32(4).u16(1).u16(2).u8(3).bytes();
    const Bytes stringBytes = ByteList().u8(0).u32(3).text("a").text("b").u32(9).u8('c').bytes();
    TypedVectorAttribute<u16> numbers;
    EXPECT_FALSE(readInto(numbers, arrayBytes, false));
    EXPECT_EQ(numbers.value(), (vector<u16>{1, 2}));
    EXPECT_EQ(numbers.flags(), 0x20u);
    TypedVectorAttribute<string> strings;
    EXPECT_FALSE(readInto(strings, stringBytes, false));
    EXPECT_EQ(strings.value(), (vector<string>{"a", "b"}));

    const auto messageOf = [](Attribute& attribute, const Bytes& bytes) -> string {
        try {
            readInto(attribute, bytes);
        } catch (const exception& error) {
            return error.what();
        }
        return "";
    };
    EXPECT_EQ(messageOf(vector2, scalarBytes),
              "stream 'input': trying to read 8 bytes, read 6 bytes");
    EXPECT_EQ(messageOf(numbers, arrayBytes),
              "stream 'input': trying to read 8 bytes, read 5 bytes");
    EXPECT_EQ(messageOf(strings, stringBytes),
              "stream 'input': trying to read 9 bytes, read 1 bytes");
}

/// What the bytes in front of an attribute promise is all that it gets, and all that it takes.
TEST(BinaryValue, StaysWithinItsPayload) {
    ByteList file;
    file.u8(0).u32(4);
    file.text("longer").text("i32").u32(8).u8(0).u32(5).u8(1).u16(0); // of a newer writer
    file.text("shorter").text("i32").u32(3).u8(0).u16(5);
    file.text("greedy").text("u8[]").u32(6).u8(0).u32(100).u8(7);
    file.text("last").text("u8").u32(2).u8(0).u8(9);
    AttribMap map;
    EXPECT_TRUE(readInto(map, file.bytes(), false));
    EXPECT_EQ(map.size(), 4u);
    EXPECT_EQ(*map.findAttribute<i32>(named("longer")), 5);
    EXPECT_EQ(*map.findAttribute<i32>(named("shorter")), 0);
    EXPECT_EQ(*map.findVecAttribute<u8>(named("greedy")), (vector<u8>{7}));
    EXPECT_EQ(*map.findAttribute<u8>(named("last")), 9);
}

TEST(BinaryValue, UnderOneNameIsTheLast) {
    ByteList file;
    file.u8(0).u32(4);
    file.text("twice").text("u8").u32(2).u8(0).u8(1);
    file.text("map").text("map").u32(20).u8(0).u32(1).text("u8").text("").u32(0).u8(0);
    file.text("twice").text("u16").u32(3).u8(0x10).u16(2);
    file.text("map").text("map:kind").u32(5).u8(0).u32(0);
    AttribMap map;
    const LogCapture log; // the inner attribute has no type
    EXPECT_TRUE(readInto(map, file.bytes()));
    ASSERT_EQ(map.size(), 2u);
    EXPECT_EQ(*map.findAttribute<u16>(named("twice")), 2);
    EXPECT_EQ(map.findMap(named("map"))->typeName(), named("kind"));
}

/// Whatever order the names have in this process, and whichever the map has already.
TEST(BinaryValue, InAMapIsFoundUnderAnyName) {
    constexpr u32 count = 20;
    for (const bool isRising : {true, false}) {
        AttribMap map;
        ByteList file;
        file.u8(0).u32(count);
        for (u32 i = 0; i < count; ++i) {
            const u32 value = isRising ? i : count - 1 - i;
            const name_id name = named(format("ordered {}", value));
            if (value % 3 == 0)
                map.attribute<u8>(name) = 99;
            file.text(name.view()).text("u8").u32(2).u8(0).u8(value);
        }
        map.attribute<u8>(named("own")) = 100;
        EXPECT_TRUE(readInto(map, file.bytes()));
        EXPECT_EQ(map.size(), count + 1);
        for (u32 i = 0; i < count; ++i) {
            const u8* found = map.findAttribute<u8>(named(format("ordered {}", i)));
            ASSERT_TRUE(found) << i;
            EXPECT_EQ(*found, i);
        }
    }
}

TEST(BinaryValue, ForgetsThePathOfAReference) {
    PluginFactory factory;
    IPlugin& object = *factory.create(named("thing"));
    PluginAttribute attribute(&object);
    attribute.path = AttribPath(object);
    EXPECT_TRUE(readInto(attribute, ByteList().u8(0).u32(0).bytes()));
    EXPECT_FALSE(attribute.value());
    EXPECT_TRUE(attribute.path.empty());
}

} // namespace
