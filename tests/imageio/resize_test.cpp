#include "i_image.h"
#include "log_capture.h"

#include "b_filter.h"

#include <algorithm>
#include <cmath>
#include <gtest/gtest.h>
#include <numbers>
#include <random>

namespace iio {
namespace {

using test_support::LogCapture;

double sincOf(double t) {
    return t == 0 ? 1 : std::sin(t) / t;
}

/// The Bessel function by its integral: the mean of exp(z cos t) over half a turn.
double bessel0(double z) {
    constexpr int steps = 32; // the mean of so smooth a wave needs no more
    double sum = 0;
    for (int i = 0; i < steps; ++i)
        sum += std::exp(z * std::cos((i + 0.5) / steps * std::numbers::pi));
    return sum / steps;
}

double kaiser(double x, double width) {
    const double square = 1 - x * x / (width * width);
    return square < 0 ? 0
                      : sincOf(std::numbers::pi * x) * bessel0(4 * std::sqrt(square)) / bessel0(4);
}

TEST(Filter, EvaluatesByName) {
    struct Row {
        const char* word;
        const char* name;
        float width;
        float at[5]; ///< 0, 0.4, 0.9, 1.25, 2.5
    };
    // By hand from the formulas; the windows and sincs with a calculator of 12 digits.
    const Row rows[] = {
        {"nearest", "box", 0.5f, {1, 1, 0, 0, 0}},
        {"bilinear", "triangle", 1, {1, 0.6f, 0.1f, 0, 0}},
        {"bell", "quadratic", 1.5f, {0.75f, 0.59f, 0.18f, 0.03125f, 0}},
        {"quadtratic", "quadratic", 1.5f, {0.75f, 0.59f, 0.18f, 0.03125f, 0}},
        {"cubic", "cubic", 1, {1, 0.696f, 0.0685f, -0.0703125f, 0}},
        {"bspline", "bspline", 2, {0.6666667f, 0.5386667f, 0.2211667f, 0.0703125f, 0}},
        {"mitchell", "mitchell", 2, {0.8888889f, 0.6435556f, 0.1193889f, -0.0234375f, 0}},
        {"catmull", "catmullrom", 2, {1, 0.696f, 0.0685f, -0.0703125f, 0}},
        {"lanczos", "lanczos", 3, {1, 0.734888f, 0.0938159f, -0.132871f, 0.0243171f}},
        {"sinc", "sinc", 3, {1, 0.7568267f, 0.1092924f, -0.1800633f, 0.127324f}},
        {"gauss", "gaussian", 1.5f, {0.7978846f, 0.5793831f, 0.1579003f, 0.0350566f, 3e-06f}},
        {"blackman", "blackman", 1, {1, 0.0402129f, 0.8492299f, 0, 0}},
        {"blackman-harris", "blackman-harris", 1, {6e-05f, 0.7938335f, 0.0109823f, 0, 0}},
    };
    const float places[] = {0, 0.4f, 0.9f, 1.25f, 2.5f};
    for (const Row& row : rows) {
        const auto filter = base::createFilter(row.word);
        ASSERT_TRUE(filter) << row.word;
        EXPECT_STREQ(filter->name(), row.name);
        EXPECT_EQ(filter->width, row.width) << row.word;
        EXPECT_EQ(base::createFilter(row.word, 7)->width, 7);
        for (int i = 0; i < 5; ++i) {
            EXPECT_NEAR(filter->evaluate(places[i]), row.at[i], 2e-6) << row.word << places[i];
            EXPECT_EQ(filter->evaluate(-places[i]), filter->evaluate(places[i])) << row.word;
        }
    }
    EXPECT_EQ(base::createFilter("quadratic"), nullptr);
    EXPECT_EQ(base::createFilter("Box"), nullptr);

    const auto window = base::createFilter("kaiser");
    EXPECT_EQ(window->width, 2);
    for (float x = -2.5f; x < 2.5f; x += 0.01f)
        EXPECT_NEAR(window->evaluate(x), kaiser(x, 2), 3e-6) << x;
    // Below the argument where the quotient gives way to the series, and at it.
    const auto sinc = base::createFilter("sinc");
    for (const float x : {0.00003f, 0.0000319f, 0.00004f})
        EXPECT_FLOAT_EQ(sinc->evaluate(x), 1.0f);
    // Integral of 1 - |x| from 0.25 to 1.25, halved: the mean of the part up to 1.
    EXPECT_NEAR(base::TriangleFilter().sampleBox(0.25f, 1, 32), 0.28125, 1e-3);
}

struct Tap {
    i64 position;
    double weight;
};

/// The taps of one target position for the Kaiser filter of `width`, in double.
std::vector<Tap> slowTaps(u32 source, u32 target, u32 i, double width) {
    const double scale = double(target) / source, filterScale = std::min(scale, 1.0);
    const double centre = (i + 0.5) / scale, half = width / filterScale;
    auto first = i64(std::floor(centre - half)), last = i64(std::ceil(centre + half));
    // A window that is too long gives one tap back, near the start of the line at its left.
    if (last - first >= i64(std::ceil(2 * half)) + 1)
        half - 1 > double(first) ? ++first : --last;
    std::vector<Tap> taps;
    double sum = 0;
    for (i64 j = first; j <= last; ++j) {
        double weight = 0;
        for (int k = 0; k < 32; ++k)
            weight += kaiser((double(j) - centre + (k + 0.5) / 32) * filterScale, width) / 32;
        taps.push_back({j, weight});
        sum += weight;
    }
    for (Tap& tap : taps)
        tap.weight /= sum;
    return taps;
}

enum class Edge { cut, wrap, extend };

/// One pass in double over `lines` lines of `source` values; what is stored as integers is
/// truncated to parts of `max`, 0 for real numbers.
std::vector<double> slowPass(const std::vector<double>& values, u32 lines, u32 source, u32 target,
                             double width, Edge edge, double max) {
    std::vector<double> out(size_t(lines) * target);
    for (u32 i = 0; i < target; ++i) {
        std::vector<Tap> taps = slowTaps(source, target, i, width);
        const i64 n = source;
        if (edge == Edge::cut) {
            std::erase_if(taps, [&](const Tap& t) { return t.position < 0 || t.position >= n; });
            double sum = 0;
            for (const Tap& tap : taps)
                sum += tap.weight;
            for (Tap& tap : taps)
                tap.weight /= sum;
        }
        for (u32 line = 0; line < lines; ++line) {
            double sum = 0;
            for (const Tap& tap : taps) {
                const i64 at = edge == Edge::wrap ? ((tap.position % n) + n) % n
                                                  : std::clamp<i64>(tap.position, 0, n - 1);
                sum += tap.weight * values[size_t(line) * source + size_t(at)];
            }
            out[size_t(line) * target + i] = max > 0 ? std::trunc(sum * max) / max : sum;
        }
    }
    return out;
}

std::vector<double> turned(const std::vector<double>& values, u32 rows, u32 columns) {
    std::vector<double> out(values.size());
    for (u32 y = 0; y < rows; ++y) {
        for (u32 x = 0; x < columns; ++x)
            out[size_t(x) * rows + y] = values[size_t(y) * columns + x];
    }
    return out;
}

/// One channel of a picture resized in double.
std::vector<double> slowResize(const Image& image, u32 channel, u32 width, u32 height,
                               double filterWidth, Edge edge, double max) {
    std::vector<double> values;
    std::vector<float> row(size_t(image.width()) * image.channelCount());
    for (u32 y = 0; y < image.height(); ++y) {
        image.getRow(row.data(), y, 0);
        for (u32 x = 0; x < image.width(); ++x)
            values.push_back(row[size_t(x) * image.channelCount() + channel]);
    }
    const auto wide =
        slowPass(values, image.height(), image.width(), width, filterWidth, edge, max);
    const auto columns = turned(wide, image.height(), width);
    return turned(slowPass(columns, width, image.height(), height, filterWidth, edge, max), width,
                  height);
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
        const auto resized = source->resize(base::KaiserFilter(1.5f), row.newWidth, row.newHeight,
                                            1, row.edge == Edge::wrap, row.edge == Edge::extend);
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
                slowResize(*source, c, row.newWidth, row.newHeight, 1.5, row.edge, row.max);
            double most = 0, sum = 0;
            for (u32 y = 0; y < row.newHeight; ++y) {
                resized->getRow(values.data(), y, 0);
                for (u32 x = 0; x < row.newWidth; ++x) {
                    const double difference =
                        values[size_t(x) * channels + c] - expected[size_t(y) * row.newWidth + x];
                    most = std::max(most, std::abs(difference));
                    sum += difference;
                }
            }
            EXPECT_LE(most, tolerance);
            EXPECT_LE(std::abs(sum) / (row.newWidth * row.newHeight), tolerance / 8);
        }
    }
}

ref<Image> makeRow(u8 type, const std::vector<float>& values) {
    auto image = base::makeRef<Image>(u32(values.size()), 1u, 1u, 1u, u8(Image::kRed), type);
    image->setRow(values.data(), 0, 0);
    return image;
}

TEST(Resize, KeepsTheLowBitsOfOvershoots) {
    // A step, enlarged: Kaiser's negative lobes go beyond white before it and below black behind.
    // An integer of 8 or 16 bits starts again at 0 there; what is below black is 0. The other types
    // are clamped, and real numbers stand as they are.
    const auto source = makeRow(Image::kFloat, {1, 1, 1, 1, 1, 0, 0, 0, 0, 0});
    const base::KaiserFilter filter(2);
    const auto exact = source->resize(filter, 40, 1);
    std::vector<float> sums(40);
    exact->getRow(sums.data(), 0, 0);
    ASSERT_GT(*std::ranges::max_element(sums), 1.02f);
    ASSERT_LT(*std::ranges::min_element(sums), -0.02f);
    struct Row {
        u8 type;
        double max;
        bool keepsLowBits, isSigned;
    };
    const Row rows[] = {
        {Image::IT_UNSIGNED_BYTE, 255, true, false},
        {Image::IT_UNSIGNED_SHORT, 65535, true, false},
        {Image::IT_UNSIGNED_INT, 4294967295.0, false, false},
        {Image::IT_BYTE, 127, false, true},
        {Image::IT_SHORT, 32767, false, true},
    };
    for (const Row& row : rows) {
        std::vector<float> read(40);
        makeRow(row.type, {1, 1, 1, 1, 1, 0, 0, 0, 0, 0})
            ->resize(filter, 40, 1)
            ->getRow(read.data(), 0, 0);
        for (u32 x = 0; x < 40; ++x) {
            // The second pass, over one row, multiplies by 1 and takes the truncated value again,
            // which may lose one more.
            double expected = std::trunc(double(sums[x]) * row.max);
            if (row.isSigned)
                expected = std::clamp(expected, -row.max - 1, row.max);
            else if (expected < 0)
                expected = 0;
            else if (row.keepsLowBits)
                expected = std::fmod(expected, row.max + 1);
            else
                expected = std::min(expected, row.max);
            const double slack = row.type == Image::IT_UNSIGNED_INT ? 1024 : 1.01;
            EXPECT_NEAR(double(read[x]) * row.max, expected, slack) << typeName(row.type) << x;
        }
    }
}

TEST(Resize, TruncatesInBothPasses) {
    // The rows' means 3.5 and 4.5 become 3 and 4, whose mean 3.5 becomes 3. The mean of all four is
    // 4, which rounding at the end alone would give, as would rounding to the nearest.
    auto image = base::makeRef<Image>(2u, 2u, 1u, 1u, u8(Image::kRed), u8(Image::IT_UNSIGNED_BYTE));
    const u8 pixels[] = {3, 4, 4, 5};
    std::copy(std::begin(pixels), std::end(pixels), image->data());
    const auto one = image->resize(base::BoxFilter(0.5f), 1, 1);
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
    EXPECT_EQ(base::makeRef<Image>(4u, 4u, 1u, 1u, u8(Image::kDXT1), u8(0))->resize(box, 2, 2),
              nullptr);
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
    auto volume =
        base::makeRef<Image>(2u, 4u, 2u, 1u, u8(Image::kRed), u8(Image::IT_UNSIGNED_SHORT));
    std::fill_n(reinterpret_cast<u16*>(volume->data()), 8, u16(0));
    std::fill_n(reinterpret_cast<u16*>(volume->slice(1)), 8, u16(200));
    const auto flat = volume->resize(base::TriangleFilter(), 2, 2, 2);
    ASSERT_EQ(flat->depth(), 2U);
    for (u32 i = 0; i < 4; ++i) {
        EXPECT_EQ(reinterpret_cast<u16*>(flat->slice(0))[i], 0);
        EXPECT_NEAR(reinterpret_cast<u16*>(flat->slice(1))[i], 200, 2);
    }
    // Faces of 0 and one of 240 among them: its neighbours in the stack take part of it.
    auto cube = base::makeRef<Image>();
    cube->createCube(4, 4, 1, Image::kRed, Image::IT_UNSIGNED_BYTE);
    std::fill_n(cube->data(), 96, u8(0));
    std::fill_n(cube->face(2), 16, u8(240));
    const auto smaller = cube->resize(base::TriangleFilter(), 2, 2);
    ASSERT_EQ(smaller->kind(), Image::kindCube);
    EXPECT_GT(smaller->face(1)[2], 0);
    EXPECT_GT(smaller->face(3)[0], 0);
    EXPECT_EQ(smaller->face(1)[0], 0);
    EXPECT_EQ(smaller->face(4)[0], 0);
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
    auto image = base::makeRef<Image>(2u, 1u, 1u, 1u, u8(Image::kLuminanceAlpha),
                                      u8(Image::IT_UNSIGNED_BYTE));
    const u8 pixels[] = {100, 51, 200, 204};
    std::copy(std::begin(pixels), std::end(pixels), image->data());
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
