#include "b_filter.h"

#include <cmath>
#include <gtest/gtest.h>
#include <numbers>

namespace base {
namespace {

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
        const auto filter = createFilter(row.word);
        ASSERT_TRUE(filter) << row.word;
        EXPECT_STREQ(filter->name(), row.name);
        EXPECT_EQ(filter->width, row.width) << row.word;
        EXPECT_EQ(createFilter(row.word, 7)->width, 7);
        for (int i = 0; i < 5; ++i) {
            EXPECT_NEAR(filter->evaluate(places[i]), row.at[i], 2e-6) << row.word << places[i];
            EXPECT_EQ(filter->evaluate(-places[i]), filter->evaluate(places[i])) << row.word;
        }
    }
    EXPECT_EQ(createFilter("quadratic"), nullptr);
    EXPECT_EQ(createFilter("Box"), nullptr);

    const auto window = createFilter("kaiser");
    EXPECT_EQ(window->width, 2);
    for (float x = -2.5f; x < 2.5f; x += 0.01f)
        EXPECT_NEAR(window->evaluate(x), kaiser(x, 2), 3e-6) << x;
    // Below the argument where the quotient gives way to the series, and at it.
    const auto sinc = createFilter("sinc");
    for (const float x : {0.00003f, 0.0000319f, 0.00004f})
        EXPECT_FLOAT_EQ(sinc->evaluate(x), 1.0f);
    // Integral of 1 - |x| from 0.25 to 1.25, halved: the mean of the part up to 1.
    EXPECT_NEAR(TriangleFilter().sampleBox(0.25f, 1, 32), 0.28125, 1e-3);
}

} // namespace
} // namespace base
