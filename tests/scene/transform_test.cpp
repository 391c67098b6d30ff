#include "scene_transform.h"

#include "log_capture.h"
#include "scene.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>

namespace {

using namespace scene;
using namespace base;
using test_support::LogCapture;

constexpr float half = 0.70710678f;
constexpr float nan = std::numeric_limits<float>::quiet_NaN();
constexpr float inf = std::numeric_limits<float>::infinity();

vec3d image(const mat43& m, const vec3d& p) {
    const auto row = [&](const vec3f& r) { return r.x * p.x + r.y * p.y + r.z * p.z; };
    return {row(m.m.r0) + m.t.x, row(m.m.r1) + m.t.y, row(m.m.r2) + m.t.z};
}

void expectNear(const vec3d& a, const vec3d& b, double tolerance = 1e-6) {
    EXPECT_NEAR(a.x, b.x, tolerance);
    EXPECT_NEAR(a.y, b.y, tolerance);
    EXPECT_NEAR(a.z, b.z, tolerance);
}
void expectNear(const mat43& a, const mat43& b, double tolerance = 1e-6) {
    for (const vec3d p : {vec3d{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {0, 0, 1}})
        expectNear(image(a, p), image(b, p), tolerance);
}

class Transform : public testing::Test {
protected:
    static void SetUpTestSuite() {
        base::PluginFactory factory;
        register_scene_schema(factory);
    }
    mat43 compose() {
        bool repaired = false;
        const mat43 result = composeTransform(node_, repaired);
        EXPECT_FALSE(repaired);
        return result;
    }
    template <class T>
    void put(base::name_id name, const T& value) {
        node_.attribute(name, new base::TypedAttribute<T>(value));
    }
    base::AttribMap node_;
};

TEST_F(Transform, EulerOrders) {
    // A quarter turn about each axis, followed by hand for each order.
    const struct {
        base::u8 order;
        vec3d x, y, z; // where the axes go
    } cases[] = {{0, {0, 0, -1}, {0, 1, 0}, {1, 0, 0}}, {1, {0, 1, 0}, {1, 0, 0}, {0, 0, -1}},
                 {2, {-1, 0, 0}, {0, 0, 1}, {0, 1, 0}}, {3, {0, 1, 0}, {-1, 0, 0}, {0, 0, 1}},
                 {4, {1, 0, 0}, {0, 0, 1}, {0, -1, 0}}, {5, {0, 0, 1}, {0, -1, 0}, {1, 0, 0}},
                 {6, {0, 0, -1}, {0, 1, 0}, {1, 0, 0}}};
    write(node_, node_schema::n_rotateMode) = 0;
    write(node_, node_schema::n_rotateEuler) = {90, 90, 90};
    for (const auto& c : cases) {
        SCOPED_TRACE(int(c.order));
        write(node_, node_schema::n_rotateOrder) = c.order;
        const mat43 m = compose();
        EXPECT_EQ(image(m, {1, 0, 0}), c.x); // quarter turns are exact
        EXPECT_EQ(image(m, {0, 1, 0}), c.y);
        EXPECT_EQ(image(m, {0, 0, 1}), c.z);
    }
}

TEST_F(Transform, RotationForms) {
    // All turn x to y about z.
    write(node_, node_schema::n_rotateEuler) = {0, 0, 90};
    write(node_, node_schema::n_rotateAxisAngle) = {0, 0, 8, 90};
    write(node_, node_schema::n_rotate) = {0, 0, 3, 3};
    for (const Enumeration mode : base::vector<Enumeration>{0, 1, 2, 3}) {
        SCOPED_TRACE(int(mode));
        write(node_, node_schema::n_rotateMode) = mode;
        expectNear(image(compose(), {1, 0, 0}), {0, 1, 0});
        expectNear(image(compose(), {0, 0, 1}), {0, 0, 1});
    }
    write(node_, node_schema::n_rotateAxisAngle) = {1, 1, 1, 120}; // x to y to z to x
    write(node_, node_schema::n_rotateMode) = 1;
    expectNear(image(compose(), {1, 0, 0}), {0, 1, 0});
    expectNear(image(compose(), {0, 0, 1}), {1, 0, 0});
    // Those without a length are no rotation.
    write(node_, node_schema::n_rotateAxisAngle) = {0, 0, 0, 90};
    EXPECT_EQ(compose(), mat43());
    write(node_, node_schema::n_rotateMode) = 2;
    write(node_, node_schema::n_rotate) = {0, 0, 0, 0};
    EXPECT_EQ(compose(), mat43());
}

TEST_F(Transform, ScaleActsBeforeShear) {
    write(node_, node_schema::n_scale) = {1, 10, 100};
    write(node_, node_schema::n_shear) = {2, 3, 4};
    EXPECT_EQ(compose(), (mat43{{{1, 20, 300}, {0, 10, 400}, {0, 0, 100}}, {}}));
}

TEST_F(Transform, PivotsStayInPlace) {
    write(node_, node_schema::n_rotate) = {0, 0, 1, 0}; // half a turn about z
    write(node_, node_schema::n_rotatePivot) = {1, 0, 0};
    expectNear(image(compose(), {1, 0, 0}), {1, 0, 0});
    expectNear(image(compose(), {0, 0, 0}), {2, 0, 0});

    node_.clear();
    write(node_, node_schema::n_scale) = {3, 3, 3};
    write(node_, node_schema::n_scalePivot) = {0, 1, 0};
    EXPECT_EQ(image(compose(), {0, 1, 0}), (vec3d{0, 1, 0}));
    EXPECT_EQ(image(compose(), {0, 2, 0}), (vec3d{0, 4, 0}));

    // Together: scaled about its pivot, then turned about the other, then moved.
    write(node_, node_schema::n_rotate) = {0, 0, 1, 0};
    write(node_, node_schema::n_rotatePivot) = {1, 0, 0};
    write(node_, node_schema::n_translate) = {100, 0, 0};
    write(node_, node_schema::n_translatePivot) = {7, 7, 7};
    expectNear(image(compose(), {0, 2, 0}), {102, -4, 0});
}

TEST_F(Transform, AimedNodesLookAtTheirTarget) {
    const vec3d target{5, 6, 7};
    write(node_, node_schema::n_transformation) = 1;
    write(node_, node_schema::n_targetPosition) = target;
    write(node_, node_schema::n_distance) = 2;
    write(node_, node_schema::n_translate) = {50, 50, 50};
    const struct {
        float azimuth, altitude;
        vec3d offset, up;
    } cases[] = {{0, 0, {0, 0, 2}, {0, 1, 0}},
                 {90, 0, {2, 0, 0}, {0, 1, 0}},
                 {0, 90, {0, 2, 0}, {0, 0, -1}},
                 {0, -90, {0, -2, 0}, {0, 0, 1}},
                 {180, 30, {0, 1, -1.7320508}, {0, 0.8660254, 0.5}}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.azimuth);
        SCOPED_TRACE(c.altitude);
        write(node_, node_schema::n_azimuth) = c.azimuth;
        write(node_, node_schema::n_altitude) = c.altitude;
        const mat43 m = compose();
        expectNear(m.t, {5 + c.offset.x, 6 + c.offset.y, 7 + c.offset.z});
        expectNear(image(m, {0, 0, -2}), target);
        expectNear(image(m, {0, 1, 0}), {m.t.x + c.up.x, m.t.y + c.up.y, m.t.z + c.up.z});
    }
    // Its own turn and scale come first.
    write(node_, node_schema::n_azimuth) = 0;
    write(node_, node_schema::n_altitude) = 0;
    write(node_, node_schema::n_rotationAxes) = {0, 0, 90};
    write(node_, node_schema::n_scale) = {3, 1, 1};
    expectNear(image(compose(), {1, 0, 0}), {5, 9, 9});
}

TEST_F(Transform, ValuesMayHaveTheOtherPrecision) {
    const LogCapture log;
    put(node_schema::n_translate, vec3f{1, 2, 3});
    put(node_schema::n_scale, vec3d{2, 2, 2});
    put(node_schema::n_rotate, base::quatd{0, 0, 1, 1});
    const mat43 expected{{{0, -2, 0}, {2, 0, 0}, {0, 0, 2}}, {1, 2, 3}};
    expectNear(compose(), expected);
    put(node_schema::n_rotate, base::vec4f{0, 0, 1, 1});
    expectNear(compose(), expected);
    put(node_schema::n_rotate, base::vec4d{0, 0, 1, 1});
    expectNear(compose(), expected);
    EXPECT_TRUE(log.entries().empty());

    put(node_schema::n_translate, base::string("far"));
    expectNear(compose(), {expected.m, {}});
    EXPECT_EQ(log.entries().size(), 1u);
}

TEST_F(Transform, NumbersThatAreNotFiniteCountAsDefaults) {
    write(node_, node_schema::n_translate) = {1, 2, nan};
    write(node_, node_schema::n_scale) = {2, 2, 2};
    bool repaired = false;
    EXPECT_EQ(composeTransform(node_, repaired), (mat43{{{2, 0, 0}, {0, 2, 0}, {0, 0, 2}}, {}}));
    EXPECT_TRUE(repaired);

    const auto expectIdentity = [&] {
        repaired = false;
        EXPECT_EQ(composeTransform(node_, repaired), mat43());
        EXPECT_TRUE(repaired);
    };
    node_.clear();
    write(node_, node_schema::n_scale) = {1, -inf, 1};
    write(node_, node_schema::n_rotate) = {0, 0, 0, nan};
    expectIdentity();
    node_.clear();
    write(node_, node_schema::n_translate) = {1e300, 0, 0}; // too far for a float
    expectIdentity();
    node_.clear();
    write(node_, node_schema::n_scale) = {1, 1, 3e38f};
    write(node_, node_schema::n_shear) = {0, 0, 3e38f};
    expectIdentity();
}

TEST_F(Transform, DecompositionByHand) {
    const struct {
        const char* what;
        base::mat33f m;
        vec3f scale;
        quatf rotation;
    } cases[] = {
        {"identity", {}, {1, 1, 1}, {0, 0, 0, 1}},
        {"scale", {{2, 0, 0}, {0, 3, 0}, {0, 0, 4}}, {2, 3, 4}, {0, 0, 0, 1}},
        {"quarter turn", {{0, -2, 0}, {2, 0, 0}, {0, 0, 2}}, {2, 2, 2}, {0, 0, half, half}},
        {"half turn x", {{1, 0, 0}, {0, -1, 0}, {0, 0, -1}}, {1, 1, 1}, {1, 0, 0, 0}},
        {"half turn y", {{-1, 0, 0}, {0, 1, 0}, {0, 0, -1}}, {1, 1, 1}, {0, 1, 0, 0}},
        {"half turn z", {{-1, 0, 0}, {0, -1, 0}, {0, 0, 1}}, {1, 1, 1}, {0, 0, 1, 0}},
        {"half turn xy", {{0, 1, 0}, {1, 0, 0}, {0, 0, -1}}, {1, 1, 1}, {half, half, 0, 0}},
        {"half turn xz", {{0, 0, 1}, {0, -1, 0}, {1, 0, 0}}, {1, 1, 1}, {half, 0, half, 0}},
        {"half turn yz", {{-1, 0, 0}, {0, 0, 1}, {0, 1, 0}}, {1, 1, 1}, {0, half, half, 0}},
        // One negative scale is three of them and half a turn about that axis.
        {"mirror x", {{-1, 0, 0}, {0, 1, 0}, {0, 0, 1}}, {-1, -1, -1}, {1, 0, 0, 0}},
        {"mirror z", {{2, 0, 0}, {0, 3, 0}, {0, 0, -4}}, {-2, -3, -4}, {0, 0, 1, 0}},
        {"shear", {{1, 5, 7}, {0, 2, 9}, {0, 0, 3}}, {1, 2, 3}, {0, 0, 0, 1}},
        {"nothing", {{0, 0, 0}, {0, 0, 0}, {0, 0, 0}}, {0, 0, 0}, {0, 0, 0, 1}},
        {"flat", {{2, 0, 0}, {0, 0, 0}, {0, 0, 2}}, {2, 0, 2}, {0, 0, 0, 1}}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        const TransformParts parts = decomposeTransform({c.m, {1, 2, 3}});
        EXPECT_EQ(parts.translation, (vec3f{1, 2, 3}));
        expectNear(widened(parts.scale), widened(c.scale));
        const quatf& q = parts.rotation;
        expectNear(vec3d{q.x, q.y, q.z}, {c.rotation.x, c.rotation.y, c.rotation.z});
        EXPECT_NEAR(q.w, c.rotation.w, 1e-6);
    }
}

TEST_F(Transform, ProductsAndInverses) {
    const mat43 move{{}, {1, 2, 3}};
    const mat43 grow{{{2, 0, 0}, {0, 4, 0}, {0, 0, 8}}, {}};
    EXPECT_EQ(multiply(move, grow), (mat43{grow.m, {1, 2, 3}}));
    EXPECT_EQ(multiply(grow, move), (mat43{grow.m, {2, 8, 24}}));
    mat43 inverse;
    ASSERT_TRUE(invert(multiply(move, grow), inverse));
    EXPECT_EQ(inverse,
              (mat43{{{0.5f, 0, 0}, {0, 0.25f, 0}, {0, 0, 0.125f}}, {-0.5, -0.5, -0.375}}));
    const mat43 turn{{{0, 0, 3}, {2, 0, 0}, {1, 1, 0}}, {4, 5, 6}};
    ASSERT_TRUE(invert(turn, inverse));
    expectNear(multiply(turn, inverse), mat43());
    // Small is not singular; flat is.
    EXPECT_TRUE(invert({{{1e-8f, 0, 0}, {0, 1e-8f, 0}, {0, 0, 1e-8f}}, {}}, inverse));
    const mat43 before = inverse;
    EXPECT_FALSE(invert({{{1, 2, 3}, {4, 5, 6}, {7, 8, 9}}, {}}, inverse));
    EXPECT_FALSE(invert({{{1, 0, 0}, {0, 0, 0}, {0, 0, 1}}, {}}, inverse));
    EXPECT_FALSE(invert({{{nan, 0, 0}, {0, 1, 0}, {0, 0, 1}}, {}}, inverse));
    EXPECT_EQ(inverse, before);
}

/// The matrix with the given columns.
mat43 matrixOf(const vec3f& a, const vec3f& b, const vec3f& c) {
    return {{{a.x, b.x, c.x}, {a.y, b.y, c.y}, {a.z, b.z, c.z}}, {1e6 + 0.125, -2, 3}};
}

/// Greatest error of a column, as a share of its length.
double errorOf(const mat43& found, const mat43& wanted) {
    double worst = 0;
    for (const vec3d& axis : {vec3d{1, 0, 0}, vec3d{0, 1, 0}, vec3d{0, 0, 1}}) {
        const vec3d w = image({wanted.m, {}}, axis), f = image({found.m, {}}, axis);
        const double length = std::hypot(w.x, w.y, w.z);
        const double error = std::hypot(f.x - w.x, f.y - w.y, f.z - w.z);
        worst = std::max(worst, length > 0 ? error / length : error);
    }
    return worst;
}

TEST_F(Transform, StoredTransformsComposeToThemselves) {
    const auto stored = [&](const mat43& wanted) {
        storeTransform(node_, wanted);
        const mat43 found = compose();
        EXPECT_EQ(found.t, wanted.t);
        return errorOf(found, wanted);
    };
    std::mt19937 random(7);
    std::uniform_real_distribution<float> number(-1, 1);
    const auto column = [&](float size) {
        return vec3f{number(random) * size, number(random) * size, number(random) * size};
    };
    for (int i = 0; i < 2000; ++i) {
        const vec3f a = column(1), b = column(std::pow(10.0f, 6 * number(random))), c = column(30);
        const vec3f along{a.x * 3, a.y * 3, a.z * 3};
        const vec3f nearly{along.x + 1e-4f * b.x, along.y, along.z};
        // Sheared, nearly flat, flat in a plane, without extent along an axis, mirrored or not.
        for (const mat43& m : {matrixOf(a, b, c), matrixOf(c, a, nearly), matrixOf(a, along, c),
                               matrixOf({}, b, c), matrixOf(a, {}, {}), matrixOf(a, c, along)})
            EXPECT_LT(stored(m), 5e-7);
    }
    EXPECT_LT(stored(matrixOf({}, {}, {})), 1e-15);
    EXPECT_LT(stored(matrixOf({0, 0, -1}, {0, 1, 0}, {1, 0, 0})), 1e-15);
    EXPECT_LT(stored(matrixOf({1, 0, 0}, {2, 1, 0}, {0, 0, -1})), 1e-15);
    EXPECT_LT(stored(matrixOf({3e38f, 3e38f, 0}, {0, 1e-45f, 0}, {0, 1e-45f, 1})), 1);
}

TEST_F(Transform, StoringReplacesWhatWasThere) {
    base::AttribMap parent;
    node_.setParent(&parent);
    write(parent, node_schema::n_shear) = {1, 0, 0};
    write(node_, node_schema::n_transformation) = 1;
    write(node_, node_schema::n_rotateMode) = 0;
    write(node_, node_schema::n_rotateEuler) = {1, 2, 3};
    write(node_, node_schema::n_rotatePivot) = {1, 2, 3};
    write(node_, node_schema::n_scalePivot) = {4, 5, 6};
    put(node_schema::n_translate, vec3f{9, 9, 9});
    const mat43 wanted{{{-1, 0, 0}, {0, 2, 0}, {0, 0, 3}}, {1, 2, 3}};
    storeTransform(node_, wanted);
    EXPECT_EQ(compose(), wanted); // mirrored without a rotation, which would not be exact
    node_.setParent(nullptr);

    node_.clear();
    storeTransform(node_, {{{0, -1, 0}, {1, 0, 0}, {0, 0, 1}}, {}});
    EXPECT_EQ(node_.size(), 1u); // the rotation
    storeTransform(node_, {});
    EXPECT_EQ(node_.size(), 0u);
}

} // namespace
