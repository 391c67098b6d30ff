#include "picture_builder.h"

namespace iio {
namespace {

/// The components of the plain formats in the order of their pixels.
constexpr string_view layouts[] = {"rgb", "rgba", "bgr", "bgra", "rg", "r",
                                   "g",   "b",    "a",   "l",    "la"};

/// The letter of the component that becomes `wanted`; '0' and '1' for none and the full value, '?'
/// for a mixture.
char originOf(char wanted, string_view source) {
    if (source.find(wanted) != string_view::npos)
        return wanted;
    if (wanted == 'a')
        return '1';
    if (wanted != 'l')
        return source[0] == 'l' ? 'l' : '0';
    if (source.substr(0, 3) == "rgb" || source.substr(0, 3) == "bgr")
        return '?';
    return source.size() == 1 && source != "a" ? source[0] : '0';
}

/// The full value of the types as little endian bytes.
string fullBytes(u8 type) {
    const string_view last[] = {"",     "\xFF", "\x7F", "\xFF",     "\x7F",
                                "\xFF", "\x7F", "\x3C", "\x80\x3F", "\xF0\x3F"};
    const bool isReal = type >= Image::kHalf;
    const string_view end = last[type];
    return string(componentBits(type) / 8 - end.size(), isReal ? '\0' : '\xFF').append(end);
}

string componentBytes(const Image& image, u32 x, u32 y, size_t index) {
    const u32 size = componentBits(image.type()) / 8;
    const u8* at = image.row(y) + (x * image.channelCount() + index) * size;
    return string(reinterpret_cast<const char*>(at), size);
}

void expectCopies(const Image& source, const Image& target) {
    const string_view from = layouts[source.format()], to = layouts[target.format()];
    for (u32 i = 0; i < source.width() * source.height(); ++i) {
        const u32 x = i % source.width(), y = i / source.width();
        for (size_t c = 0; c < to.size(); ++c) {
            const char origin = originOf(to[c], from);
            if (origin == '?')
                continue;
            string expected(componentBits(source.type()) / 8, '\0');
            if (origin == '1')
                expected = fullBytes(source.type());
            else if (origin != '0')
                expected = componentBytes(source, x, y, from.find(origin));
            ASSERT_EQ(componentBytes(target, x, y, c), expected)
                << from << " to " << to << " of " << typeName(source.type()) << ", component " << c
                << " of pixel " << x << ", " << y;
        }
    }
}

TEST(ConvertFormat, CopiesComponentsOfAllPairs) {
    for (u32 pair = 0; pair < 11 * 11; ++pair) {
        const auto from = static_cast<u8>(pair % 11), to = static_cast<u8>(pair / 11);
        for (u8 type = 1; type < 10; ++type) {
            // Bytes of colours may go several at once, and then a rest.
            const bool hasAnyLength = type < 3 && from < 4 && to < 4;
            for (u32 width = hasAnyLength ? 1 : 11; width <= (hasAnyLength ? 21 : 11); ++width) {
                for (const u32 alignment : {1U, 4U}) {
                    const ref<Image> source = noiseImage(width, 3, from, type, alignment);
                    const ref<Image> target = source->convertFormat(to);
                    ASSERT_TRUE(target);
                    ASSERT_EQ(target->format(), to);
                    ASSERT_EQ(target->type(), type);
                    ASSERT_EQ(target->byteAlignment(), alignment);
                    expectCopies(*source, *target);
                }
            }
        }
    }
}

TEST(ConvertFormat, MixesLuminance) {
    using Types = ImageTypes;
    struct Row {
        u8 format, type;
        std::initializer_list<double> pixel;
        bool isWeighted;
        double expected, tolerance;
    };
    const Row rows[] = {
        // 0.299 * 10 + 0.587 * 20 + 0.114 * 32 = 18.378
        {Types::kRGB, Types::IT_UNSIGNED_BYTE, {10, 20, 32}, true, 18, 0},
        {Types::kBGR, Types::IT_UNSIGNED_BYTE, {32, 20, 10}, true, 18, 0},
        {Types::kRGBA, Types::IT_UNSIGNED_BYTE, {10, 20, 32, 7}, false, 20, 0},
        {Types::kRGB, Types::IT_BYTE, {-100, -50, -1}, false, -50, 0},
        {Types::kRGB, Types::IT_UNSIGNED_SHORT, {1000, 2000, 60001}, true, 8313, 0},
        {Types::kRGB, Types::IT_UNSIGNED_INT, {~0u, ~0u, ~0u}, false, ~0u, 0},
        {Types::kRGB, Types::kFloat, {-1, 2.5, 9}, false, 3.5, 1e-6},
        {Types::kRGB, Types::kFloat, {1, 2, 4}, true, 1.929, 1e-6},
        {Types::kBGRA, Types::kDouble, {0.25, 0.5, 0.75, 9}, false, 0.5, 1e-7},
    };
    for (const Row& row : rows) {
        const auto grey = rowOf(row.format, row.type, row.pixel)->toGreyscale(row.isWeighted);
        EXPECT_NEAR(componentAt(*grey, 0), row.expected, row.tolerance) << typeName(row.type);
    }
    for (u32 v = 0; v < 256; ++v)
        EXPECT_EQ(rowOf(Types::kRGB, 1, {v * 1., v * 1., v * 1.})->toGreyscale()->data()[0], v);
}

TEST(ConvertFormat, TurnsToTheGreyThatKeepsAlpha) {
    const u8 greyFormats[] = {9, 10, 9, 10, 9, 9, 9, 9, 8, 9, 10, 9, 10, 10, 10, 15, 9, 17, 10};
    for (u8 format = 0; format < std::size(greyFormats); ++format) {
        const u8 type = format > 10 ? 0 : 1;
        const ref<Image> source = noiseImage(4, 4, format, type);
        const ref<Image> grey = source->toGreyscale();
        ASSERT_TRUE(grey) << formatInfo(format).name;
        EXPECT_EQ(grey->format(), greyFormats[format]) << formatInfo(format).name;
        EXPECT_EQ(grey.get() == source.get(), format == greyFormats[format]);
    }
}

} // namespace
} // namespace iio
