#include "log_capture.h"
#include "picture_builder.h"

#include "b_filter.h"

#include <algorithm>
#include <cmath>
#include <random>

namespace iio {
namespace {

using test_support::LogCapture;

struct Tap {
    i64 position;
    double weight;
};

/// The taps of one target position, in double.
std::vector<Tap> slowTaps(u32 source, u32 target, u32 i, const base::Filter& filter) {
    const double scale = double(target) / source, filterScale = std::min(scale, 1.0);
    const double centre = (i + 0.5) / scale, half = double(filter.width) / filterScale;
    auto first = i64(std::floor(centre - half)), last = i64(std::ceil(centre + half));
    // A window that is too long gives one tap back, near the start of the line at its left.
    if (last - first >= i64(std::ceil(2 * half)) + 1)
        half - 1 > double(first) ? ++first : --last;
    std::vector<Tap> taps;
    for (i64 j = first; j <= last; ++j) {
        double weight = 0;
        for (int k = 0; k < 32; ++k)
            weight +=
                filter.evaluate(float((double(j) - centre + (k + 0.5) / 32) * filterScale)) / 32;
        taps.push_back({j, weight});
    }
    return taps;
}

enum class Edge { cut, wrap, extend };

/// Values of which `lines` lines of `count` stand, by their strides.
struct Lines {
    u32 lines, count;
    size_t lineStride, stride;
};

/// One pass in double from `values` to `target` values a line; what is stored as integers is
/// truncated to parts of `max`, 0 for real numbers.
std::vector<double> slowPass(const std::vector<double>& values, const Lines& from, const Lines& to,
                             const base::Filter& filter, Edge edge, double max) {
    std::vector<double> out(size_t(to.lines) * to.count);
    for (u32 i = 0; i < to.count; ++i) {
        std::vector<Tap> taps = slowTaps(from.count, to.count, i, filter);
        const i64 n = from.count;
        if (edge == Edge::cut)
            std::erase_if(taps, [&](const Tap& t) { return t.position < 0 || t.position >= n; });
        double total = 0;
        for (const Tap& tap : taps)
            total += tap.weight;
        for (u32 line = 0; line < from.lines; ++line) {
            double sum = 0;
            for (const Tap& tap : taps) {
                const i64 at = edge == Edge::wrap ? ((tap.position % n) + n) % n
                                                  : std::clamp<i64>(tap.position, 0, n - 1);
                sum +=
                    tap.weight / total * values[line * from.lineStride + size_t(at) * from.stride];
            }
            out[line * to.lineStride + i * to.stride] = max > 0 ? std::trunc(sum * max) / max : sum;
        }
    }
    return out;
}

/// One channel of a picture resized in double.
std::vector<double> slowResize(const Image& image, u32 channel, u32 width, u32 height,
                               const base::Filter& filter, Edge edge, double max) {
    const u32 from = image.width(), rows = image.height();
    std::vector<double> values;
    std::vector<float> row(size_t(from) * image.channelCount());
    for (u32 y = 0; y < rows; ++y) {
        image.getRow(row.data(), y, 0);
        for (u32 x = 0; x < from; ++x)
            values.push_back(row[size_t(x) * image.channelCount() + channel]);
    }
    const auto wide =
        slowPass(values, {rows, from, from, 1}, {rows, width, width, 1}, filter, edge, max);
    return slowPass(wide, {width, rows, 1, width}, {width, height, 1, width}, filter, edge, max);
}

/// Waves and noise between 0.2 and 0.8, where no overshoot leaves 0..1.
ref<Image> makeSmoothImage(u32 width, u32 height, u8 format, u8 type) {
    auto image = base::makeRef<Image>(width, height, 1u, 4u, format, type);
    std::mt19937 random(7);
    std::uniform_real_distribution<float> noise(-0.05f, 0.05f);
    const u32 channels = image->channelCount();
    std::vector<float> row(size_t(width) * channels);
    for (u32 y = 0; y < height; ++y) {
        for (u32 x = 0; x < width; ++x) {
            for (u32 c = 0; c < channels; ++c) {
                const float wave = std::sin(0.3f * float(x) + float(c)) * std::cos(0.2f * float(y));
                row[size_t(x) * channels + c] = 0.5f + 0.25f * wave + noise(random);
            }
        }
        image->setRow(row.data(), y, 0);
    }
    return image;
}

TEST(Resize, EqualsTheSumsInDouble) {
    struct Row {
        u32 width, height, newWidth, newHeight;
        u8 format, type;
        Edge edge;
        double max; ///< of an integer type
    };
    const u8 u8Type = Image::IT_UNSIGNED_BYTE, u16Type = Image::IT_UNSIGNED_SHORT;
    const Row rows[] = {
        {64, 48, 32, 24, Image::kRGB, u8Type, Edge::cut, 255},
        {64, 48, 37, 61, Image::kRGBA, u8Type, Edge::cut, 255},
        {33, 17, 100, 3, Image::kLuminanceAlpha, u8Type, Edge::cut, 255},
        {50, 50, 7, 50, Image::kRed, u8Type, Edge::extend, 255},
        {50, 41, 20, 90, Image::kRGB, u8Type, Edge::wrap, 255},
        {2, 3, 9, 8, Image::kRGB, u8Type, Edge::wrap, 255},
        {64, 48, 31, 25, Image::kRGB, u16Type, Edge::cut, 65535},
        {31, 29, 64, 64, Image::kBGRA, Image::IT_SHORT, Edge::extend, 32767},
        {64, 48, 31, 25, Image::kRG, Image::IT_UNSIGNED_INT, Edge::cut, 4294967295},
        {64, 48, 31, 25, Image::kRGB, Image::kHalf, Edge::cut, 0},
        {64, 48, 31, 100, Image::kRGBA, Image::kFloat, Edge::wrap, 0},
        {64, 48, 70, 25, Image::kLuminance, Image::kDouble, Edge::cut, 0},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(base::format("{} x {} {} {} to {} x {}", row.width, row.height,
                                  formatInfo(row.format).name, typeName(row.type), row.newWidth,
                                  row.newHeight));
        const auto source = makeSmoothImage(row.width, row.height, row.format, row.type);
        const base::KaiserFilter filter(1.5f);
        const auto resized = source->resize(filter, row.newWidth, row.newHeight, 1,
                                            row.edge == Edge::wrap, row.edge == Edge::extend);
        ASSERT_TRUE(resized);
        ASSERT_EQ(resized->width(), row.newWidth);
        ASSERT_EQ(resized->height(), row.newHeight);
        EXPECT_EQ(resized->format(), row.format);
        EXPECT_EQ(resized->type(), row.type);
        EXPECT_EQ(resized->byteAlignment(), 4U);
        const u32 channels = resized->channelCount();
        std::vector<float> values(size_t(row.newWidth) * channels);
        // A float sum next to a whole number may fall on the other side of it than the double one.
        const double floatNoise = row.type == Image::kHalf ? 1.0 / 1024 : 4e-6;
        const double tolerance = std::max(row.max > 0 ? 1.001 / row.max : 0, floatNoise);
        for (u32 c = 0; c < channels; ++c) {
            const auto expected =
                slowResize(*source, c, row.newWidth, row.newHeight, filter, row.edge, row.max);
            for (u32 y = 0; y < row.newHeight; ++y) {
                resized->getRow(values.data(), y, 0);
                for (u32 x = 0; x < row.newWidth; ++x)
                    ASSERT_NEAR(values[size_t(x) * channels + c],
                                expected[size_t(y) * row.newWidth + x], tolerance)
                        << x << ", " << y;
            }
        }
    }
}

/// A picture of three columns made to one is three times the middle less the others.
class Sharpening final : public base::Filter {
public:
    Sharpening() : Filter(0.5f) {}
    float evaluate(float x) const override { return std::abs(x) < 1 / 6.0f ? 3.0f : -1.0f; }
    const char* name() const override { return "sharpening"; }
};

TEST(Resize, KeepsTheLowBitsOfOvershoots) {
    // Above white, integers of 8 or 16 bits start again at 0; what is below black is 0. The other
    // types are clamped, and real numbers stand as they are.
    struct Row {
        u8 type;
        std::initializer_list<double> pixels;
        double expected, tolerance;
    };
    const Row rows[] = {
        {Image::IT_UNSIGNED_BYTE, {0, 128, 0}, 384 - 256, 2},
        {Image::IT_UNSIGNED_BYTE, {100, 10, 0}, 0, 0},
        {Image::IT_UNSIGNED_SHORT, {0, 40000, 0}, 120000 - 65536, 2},
        {Image::IT_UNSIGNED_SHORT, {9, 2, 0}, 0, 0},
        {Image::IT_UNSIGNED_INT, {0, 2e9, 0}, 4294967295, 1024},
        {Image::IT_BYTE, {0, 100, 0}, 127, 0},
        {Image::IT_BYTE, {100, 0, 100}, -127.5, 0.5},
        {Image::IT_SHORT, {0, 20000, 0}, 32767, 0},
        {Image::kHalf, {1, 0, 1}, -2, 0.002},
        {Image::kFloat, {0, 1, 0}, 3, 1e-5},
    };
    for (const Row& row : rows) {
        const auto one = rowOf(Image::kRed, row.type, row.pixels)->resize(Sharpening(), 1, 1);
        EXPECT_NEAR(componentAt(*one, 0), row.expected, row.tolerance) << typeName(row.type);
    }
}

TEST(Resize, TruncatesInBothPasses) {
    // The rows' means 3.5 and 4.5 become 3 and 4, whose mean 3.5 becomes 3. The mean of all four is
    // 4, which rounding at the end alone would give, as would rounding to the nearest.
    const auto one = imageOf(2, 2, Image::kRed, 1, {3, 4, 4, 5})->resize(base::BoxFilter(), 1, 1);
    EXPECT_EQ(one->data()[0], 3);
}

TEST(Resize, AnswersWithoutResampling) {
    const base::BoxFilter box;
    auto image = base::makeRef<Image>(4u, 4u, 1u, 1u, u8(Image::kRGB), u8(Image::IT_BYTE));
    std::fill_n(image->data(), 48, u8(1));
    image->level(1, true);
    LogCapture log;
    EXPECT_EQ(image->resize(box, 4, 4, 9), image);
    EXPECT_EQ(image->resize(box, 0, 4), nullptr);
    EXPECT_EQ(image->resize(box, 4, 0), nullptr);
    EXPECT_EQ(Image().resize(box, 4, 4), nullptr);
    EXPECT_TRUE(log.entries().empty());
    EXPECT_EQ(image->resize(box, 2, 2, 2), nullptr);
    EXPECT_EQ(log.entries().size(), 1U);
    image->setPath("a/b.png");
    const auto smaller = image->resize(box, 2, 2);
    EXPECT_EQ(smaller->path(), "a/b.png");
    EXPECT_EQ(smaller->levelCount(), 0U);
}

TEST(Resize, TreatsSlicesAloneAndFacesAsOnePicture) {
    // Slices 0 and 200: nothing of one may reach the other.
    Image volume(2, 4, 2, 1, Image::kRed, Image::IT_UNSIGNED_SHORT);
    for (u32 i = 0; i < 16; ++i)
        setComponent(volume, i, i < 8 ? 0 : 200);
    const auto flat = volume.resize(base::TriangleFilter(), 2, 2, 2);
    ASSERT_EQ(flat->depth(), 2U);
    for (u32 i = 0; i < 8; ++i)
        EXPECT_NEAR(componentAt(*flat, i), i < 4 ? 0 : 200, 2);
    // Faces of 0 and one of 240 among them: its neighbours in the stack take part of it.
    Image cube;
    cube.createCube(4, 4, 1, Image::kRed, Image::IT_UNSIGNED_BYTE);
    std::fill_n(cube.data(), 96, u8(0));
    std::fill_n(cube.face(2), 16, u8(240));
    const auto smaller = cube.resize(base::TriangleFilter(), 2, 2);
    ASSERT_EQ(smaller->kind(), Image::kindCube);
    EXPECT_GT(smaller->face(1)[2], 0);
    EXPECT_GT(smaller->face(3)[0], 0);
    EXPECT_EQ(smaller->face(1)[0], 0);
    EXPECT_LT(smaller->face(2)[0], 240);
}

/// Takes numbers to their squares and back.
class Squares final : public ColorConverter {
public:
    void toWorking(float* values, u32 pixelCount, u32 channelCount) const override {
        std::transform(values, values + u64(pixelCount) * channelCount, values,
                       [](float v) { return v * v; });
    }
    void fromWorking(float* values, u32 pixelCount, u32 channelCount) const override {
        std::transform(values, values + u64(pixelCount) * channelCount, values,
                       [](float v) { return std::sqrt(std::max(v, 0.0f)); });
    }
};

TEST(Resize, GoesThroughTheColourTransform) {
    // Grey by the table: 100 is 0.6, 200 is 0.8; alpha as it stands. The mean of the squares of
    // 0.6 and 0.8 is 0.5, whose root times 255 is 180.3; of alpha 51 and 204, 0.2 and 0.8: 0.34,
    // whose root times 255 is 148.6. The pass over one row takes the table's value of 180, which is
    // 180 / 255 here, and comes to the same pixel.
    const auto image = rowOf(Image::kLuminanceAlpha, 1, {100, 51, 200, 204});
    auto transform = base::makeRef<ColorTransform>();
    transform->table.resize(256);
    for (int i = 0; i < 256; ++i)
        transform->table[size_t(i)] = i == 100 ? 0.6f : i == 200 ? 0.8f : (float(i) + 0.1f) / 255;
    transform->converter = base::makeRef<Squares>();
    image->setColorTransform(transform);
    const auto one = image->resize(base::BoxFilter(0.5f), 1, 1);
    ASSERT_TRUE(one);
    EXPECT_EQ(one->data()[0], 180);
    EXPECT_NEAR(one->data()[1], 148, 1);
}

} // namespace
} // namespace iio
