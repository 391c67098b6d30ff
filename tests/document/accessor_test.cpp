#include "document_support.h"

#include "b_exception.h"

#include <cmath>
#include <random>

namespace document_test {
namespace {

using Type = Accessor::Type;

TEST(Accessors, ReadAndWriteEveryComponentType) {
    const struct {
        i32 componentType;
        i32 byteLength;
        float wanted, stored; // the value after a write and a read
    } rows[] = {{componentI8, 1, -128.9f, -128},
                {componentI8, 1, 500, 127},
                {componentU8, 1, -3, 0},
                {componentU8, 1, 255.9f, 255},
                {componentI16, 2, -40000, -32768},
                {componentU16, 2, 65535, 65535},
                {componentU32, 4, 5e9f, 4294967296.0f},
                {componentU32, 4, 16777215, 16777215},
                {componentU32, 4, NAN, 0},
                {componentFloat, 4, -1.5f, -1.5f}};
    for (const auto& row : rows) {
        EXPECT_EQ(Accessor::componentByteLength(row.componentType), row.byteLength);
        const auto view = viewOf(std::vector<u8>(64, 0xcd));
        view->byteOffset = 1;
        Accessor accessor(Type::vec2, row.componentType, 2, 3, view);
        const float in[2] = {row.wanted, 1};
        float out[2] = {};
        ASSERT_TRUE(accessor.writeComponentsAtIndex(2, in));
        ASSERT_TRUE(accessor.getComponentsAtIndex(2, out));
        EXPECT_EQ(out[0], row.stored);
        EXPECT_EQ(out[1], 1);
        // The element lies at view offset 1 + accessor offset 2 + 2 elements.
        const u8* bytes = view->buffer->data;
        EXPECT_EQ(bytes[3 + 4 * row.byteLength - 1], 0xcd);
        EXPECT_EQ(bytes[3 + 6 * row.byteLength], 0xcd);
    }
}

TEST(Accessors, TolerateWhatIsNotThere) {
    float values[16] = {5, 5, 5, 5};
    Accessor unknown(Type::vec2, 5124, 0, 4, viewOf(std::vector<u8>(64)));
    EXPECT_FALSE(unknown.getComponentsAtIndex(0, values));
    EXPECT_FALSE(unknown.computeMinMax());
    EXPECT_EQ(unknown.getByteStride(), 0);
    Accessor noType(static_cast<Type>(7), componentFloat);
    EXPECT_TRUE(noType.getComponentsAtIndex(0, values));

    // Three of four elements lie in the buffer, the third only with its first component.
    Accessor cut(Type::vec2, componentU16, 2, 4, viewOf(std::vector<base::u16>{9, 1, 2, 3, 4, 5}));
    EXPECT_TRUE(cut.getComponentsAtIndex(2, values));
    EXPECT_EQ(values[0], 5);
    EXPECT_EQ(values[1], 0);
    for (const i32 index : {3, 1000000000, -1}) {
        values[0] = 7;
        EXPECT_TRUE(cut.getComponentsAtIndex(index, values));
        EXPECT_EQ(values[0], 0);
    }
    values[0] = 6;
    EXPECT_TRUE(cut.writeComponentsAtIndex(2, values));
    cut.count = std::numeric_limits<i32>::max();
    ASSERT_TRUE(cut.computeMinMax());
    EXPECT_EQ(cut.min[0], 0);
    EXPECT_EQ(cut.max[0], 6);
    cut.byteOffset = -4;
    EXPECT_TRUE(cut.getComponentsAtIndex(3, values));
    EXPECT_EQ(values[0], 0);
}

TEST(Accessors, OwnACopyOfTheirData) {
    std::vector<base::u16> values{4, 1, 3};
    Accessor accessor(Type::scalar, componentU16, values.data(), 3, 34963);
    values[0] = 100;
    EXPECT_EQ(accessor.max[0], 4);
    EXPECT_EQ(accessor.bufferView->byteLength, 6);
    EXPECT_EQ(accessor.bufferView->target, 34963);
    EXPECT_TRUE(accessor.bufferView->buffer->ownsData);
    for (const i32 count : {0, -5}) {
        Accessor empty(Type::scalar, componentU16, values.data(), count, 34963);
        EXPECT_EQ(empty.bufferView->byteLength, 0);
        EXPECT_EQ(written(empty), R"({"bufferView":-1,"byteOffset":0,"componentType":5123,)"
                                  R"("count":0,"type":"SCALAR"})");
    }
    EXPECT_THROW(Accessor(Type::mat4, componentFloat, values.data(), 1 << 26, -1), base::exception);
}

TEST(Accessors, WriteIntegerBoundsTruncatedToI32) {
    const std::vector<u32> values{7, 0xffffffffu};
    Accessor accessor(Type::scalar, componentU32, values.data(), 2, -1);
    accessor.bufferView.reset();
    accessor.min[0] = -2.9f;
    EXPECT_EQ(written(accessor),
              R"({"componentType":5125,"count":2,"max":[2147483647],"min":[-2],"type":"SCALAR"})");
}

/// Bounds by the plain loop over the typed values, compared as floats.
template <class T>
void checkBounds(Type type, i32 componentType, bool isStrided, i32 count, std::mt19937& random) {
    const auto components = static_cast<std::size_t>(Accessor::numberOfComponents(type));
    const std::size_t stride = components + (isStrided ? 3 : 0);
    std::vector<T> values(stride * static_cast<std::size_t>(count) + 1);
    for (T& value : values) {
        value = static_cast<T>(static_cast<std::make_signed_t<u32>>(random()));
        if (std::is_floating_point_v<T> && random() % 8 == 0)
            value = static_cast<T>(NAN);
    }
    Accessor accessor(type, componentType, 0, count, viewOf(values));
    if (isStrided)
        accessor.bufferView->byteStride = static_cast<i32>(stride * sizeof(T));
    ASSERT_TRUE(accessor.computeMinMax());
    for (std::size_t c = 0; c < components; ++c) {
        float low = static_cast<float>(values[c]), high = low;
        for (std::size_t i = 1; i < static_cast<std::size_t>(count); ++i) {
            const float value = static_cast<float>(values[i * stride + c]);
            if (value < low)
                low = value;
            if (value > high)
                high = value;
        }
        const bool isNan = std::isnan(low);
        EXPECT_TRUE(isNan ? std::isnan(accessor.min[c]) : accessor.min[c] == low)
            << componentType << " " << components << " x " << count;
        EXPECT_TRUE(isNan ? std::isnan(accessor.max[c]) : accessor.max[c] == high)
            << componentType << " " << components << " x " << count;
    }
}

TEST(Accessors, ComputeBoundsLikeThePlainLoop) {
    std::mt19937 random(3);
    for (const Type type : {Type::scalar, Type::vec2, Type::vec3, Type::vec4, Type::mat3}) {
        for (const bool isStrided : {false, true}) {
            for (const i32 count : {1, 2, 3, 4, 5, 7, 8, 15, 16, 17, 33, 100}) {
                checkBounds<base::i8>(type, componentI8, isStrided, count, random);
                checkBounds<u8>(type, componentU8, isStrided, count, random);
                checkBounds<base::i16>(type, componentI16, isStrided, count, random);
                checkBounds<base::u16>(type, componentU16, isStrided, count, random);
                checkBounds<u32>(type, componentU32, isStrided, count, random);
                checkBounds<float>(type, componentFloat, isStrided, count, random);
            }
        }
    }
}

TEST(Buffers, WriteTheirUriByTheOptions) {
    const struct {
        bool embed, binary;
        const char* text;
    } rows[] = {
        {true, false, R"({"byteLength":3,"uri":"data:application/octet-stream;base64,TWFu"})"},
        {true, true, R"({"byteLength":3})"},
        {false, false, R"({"byteLength":3,"uri":"s\"2.bin"})"},
        {false, true, R"({"byteLength":3,"uri":"s\"2.bin"})"}};
    for (const auto& row : rows) {
        Options options;
        options.name = "s\"";
        options.embedBuffers = row.embed;
        options.binary = row.binary;
        Buffer buffer("Man", 3, false);
        buffer.id = 2;
        EXPECT_EQ(written(buffer, options), row.text);
        EXPECT_EQ(buffer.uri, !row.embed   ? "s\"2.bin"
                              : row.binary ? ""
                                           : "data:application/octet-stream;base64,TWFu");
    }
}

} // namespace
} // namespace document_test
