#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_types.h"

/// Reconstruction filters: the weight of a sample by its distance from the centre.
namespace base {

/// A filter. `width` is the distance from the centre, in samples, at which a kernel is cut.
/// Evaluation changes nothing and may run on several threads.
class BASE1_API Filter {
public:
    explicit Filter(float filterWidth) noexcept : width(filterWidth) {}
    virtual ~Filter();
    /// Weight at the signed distance `x`, in samples.
    virtual float evaluate(float x) const = 0;
    virtual const char* name() const = 0;
    /// Mean of `evaluate` at the middles of `samples` equal parts of [x, x + 1], times `scale`.
    float sampleBox(float x, float scale, u32 samples) const;

    float width;
};

class BASE1_API BoxFilter final : public Filter {
public:
    explicit BoxFilter(float filterWidth = 0.5f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

class BASE1_API TriangleFilter final : public Filter {
public:
    explicit TriangleFilter(float filterWidth = 1.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

class BASE1_API QuadraticFilter final : public Filter {
public:
    explicit QuadraticFilter(float filterWidth = 1.5f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

class BASE1_API CubicFilter final : public Filter {
public:
    explicit CubicFilter(float filterWidth = 1.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

/// The uniform cubic B-spline.
class BASE1_API BSplineFilter final : public Filter {
public:
    explicit BSplineFilter(float filterWidth = 2.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

/// The family of cubics of D. Mitchell and A. Netravali, "Reconstruction Filters in Computer
/// Graphics", 1988.
class BASE1_API MitchellFilter final : public Filter {
public:
    explicit MitchellFilter(float filterWidth = 2.0f) noexcept;
    /// The B and C of the paper, 1/3 each at first.
    void setParameters(float b, float c) noexcept;
    float evaluate(float x) const override;
    const char* name() const override;

private:
    float inner_[3]; ///< factors of 1, a^2, a^3 for a < 1
    float outer_[4]; ///< factors of 1, a, a^2, a^3 for 1 <= a < 2
};

class BASE1_API LanczosFilter final : public Filter {
public:
    explicit LanczosFilter(float filterWidth = 3.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

class BASE1_API SincFilter final : public Filter {
public:
    explicit SincFilter(float filterWidth = 3.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

/// Sinc under the window of J. Kaiser.
class BASE1_API KaiserFilter final : public Filter {
public:
    explicit KaiserFilter(float filterWidth) noexcept;
    /// `alpha` shapes the window (4 at first), `stretch` scales the sinc's argument (1 at first).
    void setParameters(float alpha, float stretch) noexcept;
    float evaluate(float x) const override;
    const char* name() const override;

private:
    float alpha_;
    float stretch_;
    float besselOfAlpha_;
};

class BASE1_API GaussianFilter final : public Filter {
public:
    /// Width 1.5 and a variance of 1/4.
    GaussianFilter() noexcept;
    /// A third of the width is the standard deviation.
    explicit GaussianFilter(float filterWidth) noexcept;
    float evaluate(float x) const override;
    const char* name() const override;

private:
    float variance_;
    float factor_; ///< makes the integral 1
};

/// A window whose cosine arguments are twice the usual ones: it rises again toward the edge.
class BASE1_API BlackmanFilter final : public Filter {
public:
    explicit BlackmanFilter(float filterWidth = 1.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

/// A window that is zero at the centre.
class BASE1_API BlackmanHarrisFilter final : public Filter {
public:
    explicit BlackmanHarrisFilter(float filterWidth = 1.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

class BASE1_API CatmullRomFilter final : public Filter {
public:
    explicit CatmullRomFilter(float filterWidth = 2.0f) noexcept : Filter(filterWidth) {}
    float evaluate(float x) const override;
    const char* name() const override;
};

/// A filter by its word: "kaiser"; "gauss" or "gaussian"; "cubic"; "box", "near" or "nearest";
/// "linear", "bilinear" or "triangle"; "quadtratic" or "bell"; "bspline"; "mitchell"; "lanczos";
/// "sinc"; "blackman"; "blackman-harris"; "catmull" or "catmullrom". Null for any other. A width
/// of 0 takes the filter's own; the Kaiser filter has 2 then.
BASE1_API std::unique_ptr<Filter> createFilter(string_view name, float width = 0);

} // namespace base
