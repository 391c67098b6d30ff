#include "assimp/node_motion.h"

#include "b_vector_math.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace assimp {

using base::mat43;
using base::quatf;
using base::TimeCode;
using base::vec3d;
using base::vec3f;
using base::vector;

namespace {

/// Difference between a column of a matrix and the same of its parts, as share of its length, that
/// is no shear.
constexpr float shearSlack = 1e-4f;

mat43 compose(const vec3d& translation, const quatf& q, const vec3f& s) {
    const float x = q.x, y = q.y, z = q.z, w = q.w;
    return {
        {{(1 - 2 * (y * y + z * z)) * s.x, 2 * (x * y - z * w) * s.y, 2 * (x * z + y * w) * s.z},
         {2 * (x * y + z * w) * s.x, (1 - 2 * (x * x + z * z)) * s.y, 2 * (y * z - x * w) * s.z},
         {2 * (x * z - y * w) * s.x, 2 * (y * z + x * w) * s.y, (1 - 2 * (x * x + y * y)) * s.z}},
        translation};
}

quatf product(const quatf& a, const quatf& b) {
    return {a.w * b.x + a.x * b.w + a.y * b.z - a.z * b.y,
            a.w * b.y - a.x * b.z + a.y * b.w + a.z * b.x,
            a.w * b.z + a.x * b.y - a.y * b.x + a.z * b.w,
            a.w * b.w - a.x * b.x - a.y * b.y - a.z * b.z};
}

quatf normalized(const quatf& q) {
    const double length =
        std::sqrt(double(q.x) * q.x + double(q.y) * q.y + double(q.z) * q.z + double(q.w) * q.w);
    const auto share = [&](float v) { return static_cast<float>(v / length); };
    return {share(q.x), share(q.y), share(q.z), share(q.w)};
}

/// True if `matrix` has shear that its parts, composed to `composed`, have not.
bool isSheared(const mat43& matrix, const mat43& composed) {
    const vec3f* rows[] = {&matrix.m.r0, &matrix.m.r1, &matrix.m.r2};
    const vec3f* others[] = {&composed.m.r0, &composed.m.r1, &composed.m.r2};
    for (float vec3f::*column : {&vec3f::x, &vec3f::y, &vec3f::z}) {
        float size = 0, difference = 0;
        for (int r = 0; r < 3; ++r) {
            size = std::max(size, std::abs(rows[r]->*column));
            difference = std::max(difference, std::abs(rows[r]->*column - others[r]->*column));
        }
        if (difference > shearSlack * size)
            return true;
    }
    return false;
}

/// One factor with its parts.
class Factor {
public:
    explicit Factor(const MotionFactor& source) : source_(source) {
        const scene::TransformParts parts = scene::decomposeTransform(source.transform);
        rotation_ = parts.rotation;
        scale_ = parts.scale;
        isPlain_ = source.motion || !isSheared(source.transform, compose({}, rotation_, scale_));
    }

    const NodeMotion& motion() const {
        static const NodeMotion none;
        return source_.motion ? *source_.motion : none;
    }
    bool isPlain() const { return isPlain_; }

    vec3d translationAt(TimeCode time) const {
        const auto& track = motion().translation;
        return track.isEmpty() ? source_.transform.t : valueAt(track, time);
    }
    quatf rotationAt(TimeCode time) const {
        const auto& track = motion().rotation;
        return track.isEmpty() ? rotation_ : valueAt(track, time);
    }
    vec3f scaleAt(TimeCode time) const {
        const auto& track = motion().scale;
        return track.isEmpty() ? scale_ : valueAt(track, time);
    }
    mat43 matrixAt(TimeCode time) const {
        return source_.motion ? compose(translationAt(time), rotationAt(time), scaleAt(time))
                              : source_.transform;
    }

    bool movesRotation() const { return !isConstant(motion().rotation); }
    bool movesScale() const { return !isConstant(motion().scale); }
    bool translates() const {
        return !isConstant(motion().translation) || translationAt({}) != vec3d{};
    }
    bool rotates() const { return movesRotation() || !areAlike(rotationAt({}), quatf{}); }
    bool scales() const { return movesScale() || !areAlike(scaleAt({}), vec3f{1, 1, 1}); }

private:
    const MotionFactor& source_;
    quatf rotation_;
    vec3f scale_;
    bool isPlain_;
};

/// True if translation, rotation and scale of the product can be told from those of the factors
/// one by one: no more than one rotation moves, no translation comes behind a motion of another
/// kind and no rotation behind a scale.
bool isSeparable(const vector<Factor>& factors) {
    bool rotationMoves = false, scales = false, bendsPath = false;
    for (const Factor& factor : factors) {
        if (!factor.isPlain() || (bendsPath && factor.translates()) ||
            (scales && factor.rotates()) || (rotationMoves && factor.movesRotation()) ||
            (scales && factor.movesScale()))
            return false;
        rotationMoves |= factor.movesRotation();
        scales |= factor.scales();
        bendsPath |= factor.movesRotation() || factor.movesScale();
    }
    return true;
}

void makeUnique(vector<TimeCode>& times) {
    std::ranges::sort(times);
    times.resize(static_cast<std::size_t>(std::ranges::unique(times).begin() - times.begin()));
}

class Composer {
public:
    Composer(const vector<MotionFactor>& factors, const MotionSampling& sampling,
             MotionFaults& faults)
        : sampling_(sampling), faults_(faults) {
        for (const MotionFactor& factor : factors)
            factors_.emplace_back(factor);
    }

    NodeMotion run() {
        if (std::as_const(factors_).size() != 1 && !isSeparable(factors_))
            return sampleProduct();
        NodeMotion result;
        compose(&NodeMotion::translation, result, [&](TimeCode t) { return productAt(t).t; });
        compose(&NodeMotion::rotation, result, [&](TimeCode t) { return rotationAt(t); });
        compose(&NodeMotion::scale, result, [&](TimeCode t) { return scaleAt(t); });
        return result;
    }

private:
    /// The times of all keys of moving tracks.
    template <class T>
    vector<TimeCode> findTimes(KeyTrack<T> NodeMotion::*track) const {
        vector<TimeCode> times;
        for (const Factor& factor : factors_)
            if (const KeyTrack<T>& own = factor.motion().*track; !isConstant(own))
                times.append(own.times.cbegin(), own.times.cend());
        makeUnique(times);
        return times;
    }
    /// The time of some key, for what does not move.
    TimeCode anyTime() const {
        for (const Factor& factor : factors_) {
            const NodeMotion& motion = factor.motion();
            for (const auto* times :
                 {&motion.translation.times, &motion.rotation.times, &motion.scale.times})
                if (!times->empty())
                    return times->front();
        }
        return {};
    }
    vector<TimeCode> listFrames(TimeCode first, TimeCode last) {
        bool isTooLong = false;
        vector<TimeCode> frames = assimp::listFrames(first, last, sampling_.frameTicks, isTooLong);
        faults_.longMotions += isTooLong;
        return frames;
    }

    /// Fills one track of the product of factors that are separable.
    template <class T, class ValueAt>
    void compose(KeyTrack<T> NodeMotion::*track, NodeMotion& result, const ValueAt& valueOf) {
        const KeyTrack<T>& own = std::as_const(factors_)[0].motion().*track;
        KeyTrack<T>& to = result.*track;
        if (std::as_const(factors_).size() == 1 && (!sampling_.everyFrame || isConstant(own))) {
            to = own;
            return;
        }
        to.times = findTimes(track);
        if (std::as_const(to.times).empty())
            to.times.push_back(anyTime());
        if (sampling_.everyFrame && to.times.size() > 1)
            to.times = listFrames(to.times.front(), to.times.back());
        for (const TimeCode time : std::as_const(to.times))
            to.values.push_back(valueOf(time));
    }

    mat43 productAt(TimeCode time) const {
        mat43 matrix = factors_[0].matrixAt(time);
        for (std::size_t i = 1; i < factors_.size(); ++i)
            matrix = scene::multiply(matrix, factors_[i].matrixAt(time));
        return matrix;
    }
    quatf rotationAt(TimeCode time) const {
        quatf rotation = factors_[0].rotationAt(time);
        for (std::size_t i = 1; i < factors_.size(); ++i)
            rotation = normalized(product(rotation, factors_[i].rotationAt(time)));
        return rotation;
    }
    vec3f scaleAt(TimeCode time) const {
        vec3f scale{1, 1, 1};
        for (const Factor& factor : factors_) {
            const vec3f s = factor.scaleAt(time);
            scale = {scale.x * s.x, scale.y * s.y, scale.z * s.z};
        }
        return scale;
    }

    /// Takes the product apart at all times of keys and on every frame.
    NodeMotion sampleProduct() {
        vector<TimeCode> times = findTimes(&NodeMotion::translation);
        for (const vector<TimeCode>& others :
             {findTimes(&NodeMotion::rotation), findTimes(&NodeMotion::scale)})
            times.append(others.cbegin(), others.cend());
        makeUnique(times);
        if (std::as_const(times).empty())
            times.push_back(anyTime());
        if (std::as_const(times).size() > 1) {
            const vector<TimeCode> frames = listFrames(times.front(), times.back());
            if (sampling_.everyFrame && frames.size() > 2)
                times.clear();
            times.append(frames.cbegin(), frames.cend());
            makeUnique(times);
        }
        NodeMotion result;
        bool isSomewhereSheared = false;
        for (const TimeCode time : std::as_const(times)) {
            const mat43 matrix = productAt(time);
            const scene::TransformParts parts = scene::decomposeTransform(matrix);
            isSomewhereSheared |=
                isSheared(matrix, assimp::compose({}, parts.rotation, parts.scale));
            result.translation.values.push_back(matrix.t);
            result.rotation.values.push_back(parts.rotation);
            result.scale.values.push_back(parts.scale);
        }
        faults_.shearedNodes += isSomewhereSheared;
        result.translation.times = result.rotation.times = result.scale.times = times;
        return result;
    }

    vector<Factor> factors_;
    const MotionSampling& sampling_;
    MotionFaults& faults_;
};

} // namespace

NodeMotion composeMotion(const vector<MotionFactor>& factors, const MotionSampling& sampling,
                         MotionFaults& faults) {
    return Composer(factors, sampling, faults).run();
}

} // namespace assimp
