#include "document_support.h"

#include "b_exception.h"

#include <functional>
#include <random>

namespace document_test {
namespace {

using Type = Accessor::Type;

/// A document whose only mesh has the given accessors as attributes, in this order.
class Packing : public testing::Test {
protected:
    Packing() { asset_.getDefaultScene().nodes.push_back(meshNode(primitive_)); }

    ref<Accessor> add(Type type, i32 componentType, i32 byteOffset, i32 count,
                      ref<BufferView> view) {
        auto accessor = makeRef<Accessor>(type, componentType, byteOffset, count, view);
        primitive_->attributes["A" + std::to_string(1000 + primitive_->attributes.size())] =
            accessor;
        return accessor;
    }

    static string place(const Accessor& accessor) {
        return std::to_string(accessor.bufferView->byteOffset) + "+" +
               std::to_string(accessor.byteOffset);
    }

    Asset asset_;
    ref<Primitive> primitive_ = makeRef<Primitive>();
};

TEST_F(Packing, PlacesLongStridesFirstAndCountsSharedViewsForEachAccessor) {
    constexpr i32 array = BufferView::arrayBuffer, elements = BufferView::elementArrayBuffer;
    const auto shared = viewOf(std::vector<u32>{0, 1, 2, 3, 4, 5}, elements);
    const auto strided = viewOf(std::vector<u8>(36, 9), array);
    strided->byteStride = 12;
    const ref<Accessor> accessors[] = {
        add(Type::scalar, componentU32, 0, 3, shared),
        add(Type::scalar, componentU32, 12, 3, shared),
        add(Type::scalar, componentU8, 0, 3, strided),
        add(Type::vec3, componentFloat, 0, 1, viewOf(std::vector<float>{1, 2, 3}, array)),
        add(Type::vec2, componentU16, 0, 1, viewOf(std::vector<base::u16>{8, 9}, array)),
        add(Type::vec4, componentFloat, 0, 1, viewOf(std::vector<float>{4, 5, 6, 7}, -1)),
        add(Type::scalar, componentFloat, 0, 1, viewOf(std::vector<float>{1}, -1)),
    };
    const ref<Buffer> buffer = asset_.packAccessors();

    // 16: one view; 12: three bytes, a gap, twelve bytes; 4: no target, array, elements.
    const char* places[] = {"40+0", "40+12", "16+0", "16+4", "36+0", "0+0", "32+0"};
    for (std::size_t i = 0; i < std::size(places); ++i)
        EXPECT_EQ(place(*accessors[i]), places[i]) << i;
    // Two times 24 for the shared view, then 36, 12, 4, 16 and 4.
    EXPECT_EQ(buffer->byteLength, 120);
    const std::vector<u8> expected = [] {
        std::vector<u8> bytes(120, 0);
        const float floats[] = {4, 5, 6, 7, 1, 2, 3, 1};
        std::memcpy(&bytes[0], floats, 16);
        bytes[16] = bytes[17] = bytes[18] = 9;
        std::memcpy(&bytes[20], floats + 4, 12);
        std::memcpy(&bytes[32], floats + 7, 4);
        bytes[36] = 8, bytes[38] = 9;
        for (u8 i = 1; i < 6; ++i)
            bytes[40u + 4u * i] = i;
        return bytes;
    }();
    EXPECT_EQ(std::vector<u8>(buffer->data, buffer->data + 120), expected);
    const i32 strides[] = {0, 0, 12, 12, 4, 0, 0};
    for (std::size_t i = 0; i < std::size(strides); ++i)
        EXPECT_EQ(accessors[i]->bufferView->byteStride, strides[i]) << i;
    EXPECT_EQ(accessors[0]->bufferView->byteLength, 24);
    EXPECT_EQ(accessors[2]->bufferView->byteLength, 16);
}

TEST_F(Packing, RoundsU32ToFloatsAndSaturates) {
    struct Row {
        u32 value, packed;
    };
    const Row rows[] = {{0, 0},
                        {16777216, 16777216},
                        {16777217, 16777216},
                        {16777219, 16777220},
                        {0x7fffffff, 0x80000000},
                        {0x80000080, 0x80000000},
                        {0x80000180, 0x80000200},
                        {0xffffff7f, 0xffffff00},
                        {0xffffff80, 0xffffffff},
                        {0xffffffff, 0xffffffff}};
    std::vector<u32> values;
    for (const auto& row : rows)
        values.push_back(row.value);
    add(Type::scalar, componentU32, 0, 10, viewOf(values, -1));
    const ref<Buffer> buffer = asset_.packAccessors();
    for (std::size_t i = 0; i < std::size(rows); ++i) {
        u32 packed;
        std::memcpy(&packed, buffer->data + i * 4, 4);
        EXPECT_EQ(packed, rows[i].packed);
    }
}

/// Adds an accessor of random layout and returns what its elements must read as.
template <class T>
std::vector<float> addRandom(std::mt19937& random,
                             const std::function<void(Type, i32, i32, ref<BufferView>)>& add) {
    const auto below = [&](u32 n) { return static_cast<u32>(random()) % n; };
    const auto type = static_cast<Type>(below(7));
    const auto components = static_cast<u32>(Accessor::numberOfComponents(type));
    const u32 stride = components + (below(2) ? below(4) : 0), count = below(6), first = below(3);
    std::vector<T> values(first + stride * count + components);
    for (T& value : values)
        value = static_cast<T>(static_cast<i32>(random()) >> below(32));
    const auto view = viewOf(values, below(2) ? BufferView::arrayBuffer : BufferView::noTarget);
    view->byteStride = stride == components && below(2) ? 0 : static_cast<i32>(stride * sizeof(T));
    add(type, static_cast<i32>(first * sizeof(T)), static_cast<i32>(count), view);
    std::vector<float> expected;
    for (u32 i = 0; i < count * components; ++i)
        expected.push_back(
            static_cast<float>(values[first + i / components * stride + i % components]));
    return expected;
}

TEST_F(Packing, KeepsEveryElement) {
    std::mt19937 random(11);
    std::vector<ref<Accessor>> accessors;
    std::vector<std::vector<float>> expected;
    const auto addOf = [&]<class T>(T, i32 componentType) {
        const auto addAccessor = [&](Type type, i32 byteOffset, i32 count, ref<BufferView> view) {
            accessors.push_back(add(type, componentType, byteOffset, count, view));
        };
        expected.push_back(addRandom<T>(random, addAccessor));
    };
    for (int i = 0; i < 70; ++i) {
        addOf(base::i8(), componentI8);
        addOf(u8(), componentU8);
        addOf(base::i16(), componentI16);
        addOf(base::u16(), componentU16);
        addOf(u32(), componentU32);
        addOf(float(), componentFloat);
    }
    const ref<Buffer> buffer = asset_.packAccessors();
    for (std::size_t n = 0; n < accessors.size(); ++n) {
        const Accessor& accessor = *accessors[n];
        ASSERT_EQ(accessor.bufferView->buffer, buffer);
        // In a packed view the elements of an accessor are adjacent, whatever the view's stride.
        Accessor tight(accessor.type, accessor.componentType,
                       accessor.bufferView->byteOffset + accessor.byteOffset, accessor.count,
                       makeRef<BufferView>(0, buffer->byteLength, buffer, -1));
        std::vector<float> found;
        float values[16];
        for (i32 i = 0; i < accessor.count; ++i) {
            tight.getComponentsAtIndex(i, values);
            found.insert(found.end(), values, values + tight.getNumberOfComponents());
        }
        EXPECT_EQ(found, expected[n]) << n;
    }
}

// A shared output stands once per channel in the list; its data lies at the last place.
TEST_F(Packing, LeavesTheFirstPlaceOfARepeatedAccessorEmpty) {
    const auto output =
        makeRef<Accessor>(Type::scalar, componentFloat, 0, 1, viewOf(std::vector<float>{5}, -1));
    asset_.animations.push_back(makeRef<Animation>());
    for (int i = 0; i < 2; ++i) {
        auto channel = makeRef<Animation::Channel>();
        channel->sampler.output = output;
        channel->sampler.input = makeRef<Accessor>(Type::scalar, componentFloat, 0, 1,
                                                   viewOf(std::vector<float>{1}, -1));
        asset_.animations[0]->channels.push_back(channel);
    }
    EXPECT_EQ(asset_.getAllAccessors().size(), 4u);
    const ref<Buffer> buffer = asset_.packAccessors();
    ASSERT_EQ(buffer->byteLength, 16);
    const float* floats = reinterpret_cast<const float*>(buffer->data);
    EXPECT_EQ(std::vector<float>(floats, floats + 4), (std::vector<float>{1, 0, 1, 5}));
    EXPECT_EQ(output->byteOffset, 12);
}

TEST_F(Packing, ReadsZeroWhereThereIsNoData) {
    const auto none = makeRef<BufferView>(0, 8, nullptr, -1);
    const auto past = add(Type::vec2, componentU16, 2, 2, viewOf(std::vector<base::u16>{1, 2}, -1));
    const auto missing = add(Type::vec2, componentFloat, 0, 1, none);
    const auto unknown = add(Type::vec2, 5124, 0, 3, viewOf(std::vector<u8>(5), -1));
    const ref<Buffer> buffer = asset_.packAccessors();
    // The new views need eight bytes each and none; the old ones had 4, 8 and 5.
    ASSERT_EQ(buffer->byteLength, 17);
    EXPECT_EQ(place(*missing), "0+0");
    EXPECT_EQ(place(*past), "8+0");
    EXPECT_EQ(unknown->bufferView->byteLength, 0);
    std::vector<u8> expected(17, 0);
    expected[8] = 2;
    EXPECT_EQ(std::vector<u8>(buffer->data, buffer->data + 17), expected);
}

TEST_F(Packing, RefusesMoreThanABufferHolds) {
    const auto huge =
        makeRef<BufferView>(0, std::numeric_limits<i32>::max(), makeRef<Buffer>(1), -1);
    const auto first = add(Type::scalar, componentU8, 0, 1, huge);
    EXPECT_EQ(huge->buffer->byteLength, 1);
    add(Type::scalar, componentU8, 0, 1, huge);
    EXPECT_THROW(asset_.packAccessors(), base::exception);
    EXPECT_EQ(first->bufferView, huge);
}

} // namespace
} // namespace document_test
