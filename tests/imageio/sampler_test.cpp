#include "i_sampler.h"
#include "log_capture.h"
#include "picture_builder.h"

#include "b_exception.h"

#include <array>
#include <cmath>

namespace iio {
namespace {

using test_support::LogCapture;
using Colour = std::array<float, 4>;

Colour texelOf(const Sampler& sampler, i32 x, i32 y) {
    float out[4];
    sampler.texel(out, x, y);
    return {out[0], out[1], out[2], out[3]};
}

float sampleRed(const Sampler& sampler, float u, float v) {
    float out[4];
    sampler.sample(out, {u, v});
    return out[0];
}

TEST(Sampler, WrapsCoordinates) {
    // The columns hold their numbers; 9 is the border.
    const auto image = rowOf(Image::kRed, Image::kFloat, {0, 1, 2, 3});
    const i32 places[] = {-9, -8, -5, -4, -2, -1, 0, 3, 4, 7, 8, INT32_MIN, INT32_MAX};
    const float expected[][13] = {
        {3, 0, 3, 0, 2, 3, 0, 3, 0, 3, 0, 0, 3}, // repeat
        // The quotient is cut toward zero, so that -1 to -3 count as the first picture and -4 to
        // -7 as one that is mirrored.
        {3, 0, 0, 3, 2, 3, 0, 3, 3, 0, 0, 0, 0}, // mirror
        {0, 0, 0, 0, 0, 0, 0, 3, 3, 3, 3, 0, 3}, // clamp
        {9, 9, 9, 9, 9, 9, 0, 3, 9, 9, 9, 9, 9}, // border
    };
    for (u32 mode = 0; mode < 4; ++mode) {
        SamplerOptions options{.filter = 0, .wrapU = mode, .wrapV = SamplerOptions::repeat};
        for (float& component : options.borderColor)
            component = 9;
        const auto sampler = createSampler(*image, options);
        for (size_t i = 0; i < std::size(places); ++i)
            EXPECT_EQ(texelOf(*sampler, places[i], 5)[0], expected[mode][i]) << mode << places[i];
    }
    // Either axis alone makes the border.
    const SamplerOptions border{.wrapU = 3, .wrapV = 3, .borderColor = {1, 2, 3, 4}};
    const auto sampler = createSampler(*image, border);
    EXPECT_EQ(texelOf(*sampler, 1, -1), (Colour{1, 2, 3, 4}));
    EXPECT_EQ(texelOf(*sampler, -1, 0), (Colour{1, 2, 3, 4}));
    EXPECT_EQ(texelOf(*sampler, 1, 0), (Colour{1, 1, 1, 1}));
}

TEST(Sampler, MixesFourTexels) {
    const auto image = imageOf(2, 2, Image::kRed, Image::kFloat, {0, 8, 16, 32});
    struct Row {
        u32 filter, wrap;
        float u, v, value;
    };
    const Row rows[] = {
        {1, 0, 0.25f, 0.25f, 0},       // the middle of the first texel
        {1, 0, 0.375f, 0.625f, 15.5f}, // 0.25 along x: 2 and 20; 0.75 along y
        {1, 0, 0, 0.25f, 4},           // the first and the last column
        {1, 2, 0, 0.25f, 0},           // the edge alone
        {1, 3, 0, 0.25f, -0.5f},       // half of the border's -1
        {1, 0, -0.25f, 0.25f, 8},      // column -1
        {0, 0, 0.49f, 0.99f, 16},
        {0, 0, -0.4f, 0, 0}, // cut toward zero
        {0, 0, 2.5f, 0, 8},
        {0, 0, NAN, 0, 0},
        {0, 2, 1e30f, 0, 8},
        {0, 2, -INFINITY, 0, 0},
    };
    for (const Row& row : rows) {
        SamplerOptions options{.filter = row.filter, .wrapU = row.wrap, .wrapV = row.wrap};
        options.borderColor[0] = -1;
        EXPECT_EQ(sampleRed(*createSampler(*image, options), row.u, row.v), row.value)
            << row.filter << " " << row.wrap << " " << row.u << " " << row.v;
    }
    // Coordinates that no texel has must not read outside.
    for (const float place : {NAN, INFINITY, -INFINITY, 1e30f, -1e30f, 1e9f}) {
        for (u32 filter : {0U, 1U, 3U}) {
            const auto sampler = createSampler(*image, {.filter = filter});
            sampleRed(*sampler, place, -place);
        }
    }
}

TEST(Sampler, ReadsFormatsAndTypes) {
    struct Row {
        const char* name;
        ref<Image> image;
        Colour expected;
    };
    const Row rows[] = {
        {"rgba", rowOf(Image::kRGBA, 1, {51, 102, 255, 0}), {0.2f, 0.4f, 1, 0}},
        {"bgr", rowOf(Image::kBGR, 1, {51, 102, 255}), {1, 0.4f, 0.2f, 1}},
        {"bgra", rowOf(Image::kBGRA, 3, {0, 13107, 65535, 26214}), {1, 0.2f, 0, 0.4f}},
        {"rg", rowOf(Image::kRG, 2, {-127, 127}), {-1, 1, 0, 1}},
        {"grey and alpha",
         rowOf(Image::kLuminanceAlpha, 7, {0.25, -0.75}),
         {0.25f, 0.25f, 0.25f, -0.75f}},
        {"alpha", rowOf(Image::kAlpha, 1, {102}), {0.4f, 0.4f, 0.4f, 0.4f}},
        {"blue", rowOf(Image::kBlue, 8, {7}), {7, 7, 7, 7}},
    };
    for (const Row& row : rows) {
        const Colour read = texelOf(*createSampler(*row.image), 0, 0);
        for (size_t c = 0; c < 4; ++c)
            EXPECT_FLOAT_EQ(read[c], row.expected[c]) << row.name << c;
    }
    for (const u8 type : {Image::IT_SHORT, Image::IT_UNSIGNED_INT, Image::IT_INT, Image::kDouble})
        EXPECT_THROW(createSampler(Image(1, 1, 1, 1, Image::kRGB, type)), base::switch_exception);
    for (const u8 format : {Image::kBC6HSigned, Image::kBC7, Image::kETC1, Image::kETC2RG})
        EXPECT_THROW(createSampler(Image(4, 4, 1, 1, format, 0)), base::switch_exception);
    LogCapture log;
    EXPECT_EQ(createSampler(Image()), nullptr);
    EXPECT_EQ(log.entries().size(), 1U);
}

TEST(Sampler, DecodesTheBlockOfTheTexel) {
    // Two blocks of one colour each, red and blue as 5:6:5 with all indices 0.
    const auto colours =
        imageOf(8, 4, Image::kDXT1, 0, {0x00, 0xF8, 0, 0, 0, 0, 0, 0, 0x1F, 0, 0, 0, 0, 0, 0, 0});
    const auto sampler = createSampler(*colours, {.wrapU = 2, .wrapV = 2});
    EXPECT_EQ(texelOf(*sampler, 3, 3), (Colour{1, 0, 0, 1}));
    EXPECT_EQ(texelOf(*sampler, 4, 0), (Colour{0, 0, 1, 1}));
    EXPECT_EQ(texelOf(*sampler, 99, 99), (Colour{0, 0, 1, 1}));
    // End points 255 and 0; index 1 at texel (1, 0), which is the second end point.
    const auto grey = imageOf(4, 4, Image::kRGTC1, 0, {255, 0, 1 << 3, 0, 0, 0, 0, 0});
    EXPECT_EQ(texelOf(*createSampler(*grey), 0, 0), (Colour{1, 1, 1, 1}));
    EXPECT_EQ(texelOf(*createSampler(*grey), 1, 0), (Colour{0, 0, 0, 0}));
    for (const u8 format : {Image::kRGTC2, Image::kLATC2}) {
        const auto two =
            imageOf(4, 4, format, 0, {255, 0, 1 << 3, 0, 0, 0, 0, 0, 255, 255, 0, 0, 0, 0, 0, 0});
        const Colour expected = format == Image::kRGTC2 ? Colour{0, 1, 0, 1} : Colour{0, 0, 0, 1};
        EXPECT_EQ(texelOf(*createSampler(*two), 1, 0), expected);
    }
}

TEST(Sampler, StaysInTheFaceOfACube) {
    Image cube;
    cube.createCube(2, 2, 1, Image::kRed, Image::kFloat);
    auto* values = reinterpret_cast<float*>(cube.data());
    for (int i = 0; i < 24; ++i)
        values[i] = float(i);
    const auto sampler = createSampler(cube, {.filter = 1, .wrapU = 0, .wrapV = 0});
    // Face 2 holds 8, 9 / 10, 11 and fills v from 2 / 6 to 3 / 6.
    EXPECT_FLOAT_EQ(sampleRed(*sampler, 0.5f, 2.5f / 6), 9.5f);
    EXPECT_NEAR(sampleRed(*sampler, 0, 2.001f / 6), 8, 1e-4);
    EXPECT_NEAR(sampleRed(*sampler, 1, 2.999f / 6), 11, 1e-4);
    EXPECT_EQ(sampleRed(*sampler, 1, 1), 23);
    EXPECT_EQ(sampleRed(*sampler, 0, -3), 0);
    EXPECT_EQ(texelOf(*sampler, -1, 5)[0], 10);
    EXPECT_EQ(texelOf(*sampler, 5, 99)[0], 23);
}

TEST(Sampler, AreaIsTheMeanOfTheFootprint) {
    // Columns 0, 4, 8, 12 repeat: their mean is 6. Rows do not matter.
    const auto image = imageOf(4, 2, Image::kRed, Image::kFloat, {0, 4, 8, 12, 0, 4, 8, 12});
    struct Row {
        base::vec2f dx, dy;
        float limit, value;
    };
    const Row rows[] = {
        {{0, 0}, {0, 0}, 1, 4},     {{1, 0}, {0, 0.5f}, 16, 6}, {{0, 0.5f}, {1, 0}, 16, 6},
        {{0.5f, 0}, {0, 0}, 16, 4}, // texels 0.5 left and right of column 1: 2 and 6
        {{1, 0}, {0, 0}, 1, 4},     // no more lookups along the footprint than across it
    };
    for (const Row& row : rows) {
        const auto sampler =
            createSampler(*image, {.filter = SamplerOptions::area, .anisotropyLimit = row.limit});
        float out[4];
        sampler->sampleArea(out, {0.375f, 0.5f}, row.dx, row.dy);
        EXPECT_FLOAT_EQ(out[0], row.value) << row.dx.x << row.limit;
    }
    float out[4];
    createSampler(*image, {.filter = 1})->sampleArea(out, {0.375f, 0.5f}, {1, 0}, {0, 1});
    EXPECT_EQ(out[0], 4);
}

TEST(Sampler, ReadsBlocksWrapped) {
    const auto image = imageOf(3, 2, Image::kRed, 1, {0, 51, 102, 153, 204, 255});
    for (u32 mode = 0; mode < 4; ++mode) {
        const auto sampler = createSampler(*image, {.wrapU = mode, .wrapV = mode});
        std::vector<float> block(7 * 6 * 4);
        sampler->readBlock(block.data(), -2, -2, 7, 6);
        for (i32 y = 0; y < 6; ++y) {
            for (i32 x = 0; x < 7; ++x) {
                const float* read = &block[size_t(y * 7 + x) * 4];
                EXPECT_EQ((Colour{read[0], read[1], read[2], read[3]}),
                          texelOf(*sampler, x - 2, y - 2))
                    << mode << " " << x << " " << y;
            }
        }
    }
}

} // namespace
} // namespace iio
