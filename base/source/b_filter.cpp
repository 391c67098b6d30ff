#include "b_filter.h"

#include <cmath>
#include <numbers>

namespace base {

namespace {

constexpr float pi = std::numbers::pi_v<float>;

/// sin(t) / t, by its series where the quotient loses digits.
float sinc(float t) {
    if (std::fabs(t) < 0.0001f)
        return (t * t * 0.008333334f - 0.16666667f) * t * t + 1.0f;
    return std::sin(t) / t;
}

/// Modified Bessel function of the first kind and order 0, by its power series.
float bessel0(float z) {
    const float half = z / 2;
    float sum = 1, power = 1;
    for (int k = 1;; ++k) {
        power *= half / static_cast<float>(k);
        const float term = power * power;
        sum += term;
        // Written so that a term that is no number ends the series too.
        if (!(term > sum * 1e-6f) || std::isinf(sum))
            return sum;
    }
}

} // namespace

Filter::~Filter() = default;

float Filter::sampleBox(float x, float scale, u32 samples) const {
    const auto count = static_cast<float>(samples);
    float sum = 0;
    for (u32 i = 0; i < samples; ++i)
        sum += evaluate((x + (static_cast<float>(i) + 0.5f) / count) * scale);
    return sum / count;
}

float BoxFilter::evaluate(float x) const {
    return x >= -width && x <= width ? 1.0f : 0.0f;
}
const char* BoxFilter::name() const {
    return "box";
}

float TriangleFilter::evaluate(float x) const {
    return std::fmax(1.0f - std::fabs(x) / width, 0.0f);
}
const char* TriangleFilter::name() const {
    return "triangle";
}

float QuadraticFilter::evaluate(float x) const {
    const float t = 1.5f * std::fabs(x) / width;
    if (t < 0.5f)
        return 0.75f - t * t;
    if (t < 1.5f)
        return 0.5f * (t - 1.5f) * (t - 1.5f);
    return 0;
}
const char* QuadraticFilter::name() const {
    return "quadratic";
}

float CubicFilter::evaluate(float x) const {
    const float t = std::fabs(x) / width;
    if (t < 1)
        return (1.5f * t - 2.5f) * t * t + 1.0f;
    if (t < 2)
        return (-4.0f - (0.5f * t - 2.5f) * t) * t + 2.0f;
    return 0;
}
const char* CubicFilter::name() const {
    return "cubic";
}

float BSplineFilter::evaluate(float x) const {
    const float a = std::fabs(x);
    if (a < 1)
        return a * a * (0.5f * a - 1.0f) + 0.6666667f;
    if (a < 2) {
        const float t = 2.0f - a;
        return t * t * t * 0.16666667f;
    }
    return 0;
}
const char* BSplineFilter::name() const {
    return "bspline";
}

MitchellFilter::MitchellFilter(float filterWidth) noexcept : Filter(filterWidth) {
    setParameters(1.0f / 3.0f, 1.0f / 3.0f);
}
void MitchellFilter::setParameters(float b, float c) noexcept {
    inner_[0] = (6 - 2 * b) / 6;
    inner_[1] = (-18 + 12 * b + 6 * c) / 6;
    inner_[2] = (12 - 9 * b - 6 * c) / 6;
    outer_[0] = (8 * b + 24 * c) / 6;
    outer_[1] = (-12 * b - 48 * c) / 6;
    outer_[2] = (6 * b + 30 * c) / 6;
    outer_[3] = (-b - 6 * c) / 6;
}
float MitchellFilter::evaluate(float x) const {
    const float a = std::fabs(x);
    if (a < 1)
        return inner_[0] + a * a * (inner_[1] + a * inner_[2]);
    if (a < 2)
        return outer_[0] + a * (outer_[1] + a * (outer_[2] + a * outer_[3]));
    return 0;
}
const char* MitchellFilter::name() const {
    return "mitchell";
}

float LanczosFilter::evaluate(float x) const {
    const float a = std::fabs(x);
    return a < width ? sinc(pi * a) * sinc(pi * a / width) : 0.0f;
}
const char* LanczosFilter::name() const {
    return "lanczos";
}

float SincFilter::evaluate(float x) const {
    return sinc(pi * x);
}
const char* SincFilter::name() const {
    return "sinc";
}

KaiserFilter::KaiserFilter(float filterWidth) noexcept : Filter(filterWidth) {
    setParameters(4.0f, 1.0f);
}
void KaiserFilter::setParameters(float alpha, float stretch) noexcept {
    alpha_ = alpha;
    stretch_ = stretch;
    besselOfAlpha_ = bessel0(alpha);
}
float KaiserFilter::evaluate(float x) const {
    const float t = x / width;
    const float square = 1.0f - t * t;
    if (square < 0)
        return 0;
    return sinc(pi * x * stretch_) * (bessel0(alpha_ * std::sqrt(square)) / besselOfAlpha_);
}
const char* KaiserFilter::name() const {
    return "kaiser";
}

GaussianFilter::GaussianFilter() noexcept
    : Filter(1.5f), variance_(0.25f), factor_(1.0f / std::sqrt(2.0f * pi * variance_)) {}
GaussianFilter::GaussianFilter(float filterWidth) noexcept
    : Filter(filterWidth), variance_(filterWidth * filterWidth / 9.0f),
      factor_(1.0f / std::sqrt(2.0f * pi * variance_)) {}
float GaussianFilter::evaluate(float x) const {
    return std::exp(-0.5f * x * x / variance_) * factor_;
}
const char* GaussianFilter::name() const {
    return "gaussian";
}

float BlackmanFilter::evaluate(float x) const {
    const float a = std::fabs(x);
    if (!(a < width))
        return 0;
    const float t = pi * a / width;
    return 0.42f + 0.5f * std::cos(2 * t) + 0.08f * std::cos(4 * t);
}
const char* BlackmanFilter::name() const {
    return "blackman";
}

float BlackmanHarrisFilter::evaluate(float x) const {
    const float a = std::fabs(x);
    if (!(a < width))
        return 0;
    const float t = pi * a / width;
    return 0.35875f - 0.48829f * std::cos(2 * t) + 0.14128f * std::cos(4 * t) -
           0.01168f * std::cos(6 * t);
}
const char* BlackmanHarrisFilter::name() const {
    return "blackman-harris";
}

float CatmullRomFilter::evaluate(float x) const {
    const float a = std::fabs(x);
    if (a < 1)
        return 0.5f * (2.0f + a * a * (3.0f * a - 5.0f));
    if (a < 2)
        return 0.5f * (4.0f + a * (-8.0f + a * (5.0f - a)));
    return 0;
}
const char* CatmullRomFilter::name() const {
    return "catmullrom";
}

namespace {

template <class T>
std::unique_ptr<Filter> make(float width) {
    if (width != 0)
        return std::make_unique<T>(width);
    if constexpr (std::is_default_constructible_v<T>)
        return std::make_unique<T>();
    else
        return std::make_unique<T>(2.0f);
}

struct Word {
    string_view text;
    std::unique_ptr<Filter> (*make)(float width);
};

constexpr Word words[] = {
    {"kaiser", make<KaiserFilter>},
    {"gauss", make<GaussianFilter>},
    {"gaussian", make<GaussianFilter>},
    {"cubic", make<CubicFilter>},
    {"box", make<BoxFilter>},
    {"near", make<BoxFilter>},
    {"nearest", make<BoxFilter>},
    {"linear", make<TriangleFilter>},
    {"bilinear", make<TriangleFilter>},
    {"triangle", make<TriangleFilter>},
    {"quadtratic", make<QuadraticFilter>},
    {"bell", make<QuadraticFilter>},
    {"bspline", make<BSplineFilter>},
    {"mitchell", make<MitchellFilter>},
    {"lanczos", make<LanczosFilter>},
    {"sinc", make<SincFilter>},
    {"blackman", make<BlackmanFilter>},
    {"blackman-harris", make<BlackmanHarrisFilter>},
    {"catmull", make<CatmullRomFilter>},
    {"catmullrom", make<CatmullRomFilter>},
};

} // namespace

std::unique_ptr<Filter> createFilter(string_view name, float width) {
    for (const Word& word : words) {
        if (word.text == name)
            return word.make(width);
    }
    return nullptr;
}

} // namespace base
