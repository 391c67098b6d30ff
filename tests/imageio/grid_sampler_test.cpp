#include "i_grid_sampler.h"

#include "i_sampler.h"
#include "picture_builder.h"

#include "b_exception.h"

namespace iio {
namespace {

void expectSamplersAgree(const Image& image, u32 width, u32 height) {
    const auto sampler = createSampler(image);
    GridSampler grid(image, width, height);
    for (u32 i = 0; i < 2 * height; ++i) {
        const u32 y = i < height ? i : 2 * height - 1 - i; // down and up again
        for (u32 channel = 0; channel < 4; ++channel) {
            const float* row = grid.row(channel, y);
            const GridSampler::StoredRow stored = grid.storedRow(channel, y);
            for (u32 x = 0; x < width; ++x) {
                float expected[4];
                sampler->sample(expected,
                                {(static_cast<float>(x) + 0.5f) / static_cast<float>(width),
                                 (static_cast<float>(y) + 0.5f) / static_cast<float>(height)});
                // What is not a number has to be none in both.
                const bool areEqual = row[x] == expected[channel] ||
                                      (row[x] != row[x] && expected[channel] != expected[channel]);
                ASSERT_TRUE(areEqual) << "channel " << channel << " at " << x << ", " << y << ": "
                                      << row[x] << " instead of " << expected[channel];
                if (stored.first) {
                    ASSERT_EQ(stored.first[x * stored.step] / 255.0f, row[x]);
                }
            }
        }
    }
}

TEST(GridSampler, GivesTheNumbersOfASampler) {
    const struct {
        u32 width, height, gridWidth, gridHeight;
    } sizes[] = {{1, 1, 1, 1},       {1, 1, 3, 2},      {7, 5, 7, 5},  {8, 2, 16, 4},
                 {5, 3, 8, 8},       {16, 16, 4, 2},    {9, 7, 2, 3},  {3, 1000, 2, 700},
                 {1000, 3, 1000, 3}, {1000, 1, 999, 1}, {41, 1, 82, 1}};
    for (u8 format = 0; format <= Image::kLuminanceAlpha; ++format)
        for (const u8 type : {Image::IT_UNSIGNED_BYTE, Image::IT_BYTE, Image::IT_UNSIGNED_SHORT,
                              Image::kHalf, Image::kFloat})
            for (const auto& size : sizes) {
                SCOPED_TRACE(testing::Message() << formatInfo(format).name << " " << typeName(type)
                                                << ", row " << &size - sizes);
                // With padded rows; noise in real types is infinite or no number at places.
                const auto image = noiseImage(size.width, size.height, format, type, 8);
                expectSamplersAgree(*image, size.gridWidth, size.gridHeight);
            }
}

TEST(GridSampler, RefusesWhatHasNoSampler) {
    for (const u8 type : {Image::IT_SHORT, Image::IT_UNSIGNED_INT, Image::IT_INT, Image::kDouble})
        EXPECT_THROW(GridSampler(*makeImage(2, 2, Image::kRGB, type), 2, 2),
                     base::switch_exception);
    EXPECT_THROW(GridSampler(*makeImage(4, 4, Image::kDXT1, 0), 2, 2), base::switch_exception);
}

} // namespace
} // namespace iio
