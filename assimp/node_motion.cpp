#include "assimp/node_motion.h"

#include "assimp/quaternion.h"

#include "scene_schema.h"
#include "scene_transform.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace assimp {

using base::mat43;
using base::quatf;
using base::TimeCode;
using base::u64;
using base::vec3d;
using base::vec3f;
using base::vector;

namespace {

/// Difference between a column of a matrix and the same of its parts, as share of its length, that
/// is no shear.
constexpr float shearSlack = 1e-4f;
/// The code of `rotateMode` for quaternions.
constexpr base::u8 quaternionMode = 2;

mat43 compose(const vec3d& translation, const quatf& rotation, const vec3f& scale) {
    scene::TransformValues values;
    values.rotateMode = quaternionMode;
    values.translate = translation;
    values.rotate = scene::widened(rotation);
    values.scale = scene::widened(scale);
    bool repaired = false;
    return scene::composeTransform(values, repaired);
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

/// One factor with its parts at rest, as nodes store them: what has no keys goes with keys that are
/// meant for them.
class Factor {
public:
    explicit Factor(const MotionFactor& source) : source_(source) {
        base::AttribMap node;
        scene::storeTransform(node, source.transform);
        rotation_ = read(node, scene::node_schema::n_rotate);
        scale_ = read(node, scene::node_schema::n_scale);
        isPlain_ = source.motion || !isSheared(source.transform, compose({}, rotation_, scale_));
    }

    const NodeMotion& motion() const {
        static const NodeMotion none;
        return source_.motion ? *source_.motion : none;
    }
    bool isPlain() const { return isPlain_; }

    vec3d translationAt(const Moment& moment) const {
        const auto& track = motion().translation;
        return track.isEmpty() ? source_.transform.t : valueAt(track, moment);
    }
    quatf rotationAt(const Moment& moment) const {
        const auto& track = motion().rotation;
        return track.isEmpty() ? rotation_ : valueAt(track, moment);
    }
    vec3f scaleAt(const Moment& moment) const {
        const auto& track = motion().scale;
        return track.isEmpty() ? scale_ : valueAt(track, moment);
    }
    mat43 matrixAt(const Moment& moment) const {
        return source_.motion ? compose(translationAt(moment), rotationAt(moment), scaleAt(moment))
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

void makeUnique(vector<Moment>& moments) {
    std::ranges::sort(moments);
    moments.resize(
        static_cast<std::size_t>(std::ranges::unique(moments).begin() - moments.begin()));
}

template <class T>
void appendMoments(const KeyTrack<T>& track, vector<Moment>& moments) {
    for (std::size_t i = 0; i < track.times.size(); ++i) {
        const bool isStep = i + 1 < track.times.size() && track.times[i] == track.times[i + 1];
        moments.push_back({track.times[i], !isStep});
    }
}

class Composer {
public:
    Composer(const vector<MotionFactor>& factors, FrameSampler& frames, u64& shearedNodes)
        : frames_(frames), shearedNodes_(shearedNodes) {
        for (const MotionFactor& factor : factors)
            factors_.emplace_back(factor);
    }

    NodeMotion run() {
        if (std::as_const(factors_).size() != 1 && !isSeparable(factors_))
            return sampleProduct();
        NodeMotion result;
        compose(&NodeMotion::translation, result, [&](const Moment& m) { return productAt(m).t; });
        compose(&NodeMotion::rotation, result, [&](const Moment& m) { return rotationAt(m); });
        compose(&NodeMotion::scale, result, [&](const Moment& m) { return scaleAt(m); });
        return result;
    }

private:
    /// Those of one kind that change.
    template <class T>
    vector<const KeyTrack<T>*> findMoving(KeyTrack<T> NodeMotion::*track) const {
        vector<const KeyTrack<T>*> moving;
        for (const Factor& factor : factors_)
            if (const KeyTrack<T>& own = factor.motion().*track; !isConstant(own))
                moving.push_back(&own);
        return moving;
    }
    /// The moments of all keys of moving tracks.
    template <class T>
    vector<Moment> findMoments(KeyTrack<T> NodeMotion::*track) const {
        vector<Moment> moments;
        for (const KeyTrack<T>* moving : findMoving(track))
            appendMoments(*moving, moments);
        makeUnique(moments);
        return moments;
    }
    /// That of some key, for what does not move.
    Moment anyMoment() const {
        for (const Factor& factor : factors_) {
            const NodeMotion& motion = factor.motion();
            for (const auto* times :
                 {&motion.translation.times, &motion.rotation.times, &motion.scale.times})
                if (!times->empty())
                    return {times->front()};
        }
        return {};
    }
    /// Adds frames to `moments` for `trackCount` tracks, or puts them in their place.
    void addFrames(vector<Moment>& moments, base::i64 trackCount) {
        const TimeCode first = moments.front().time, last = moments.back().time;
        if (first == last)
            return;
        const vector<TimeCode> frames = frames_.listFrames(first, last, trackCount);
        if (frames_.everyFrame() && !frames.empty())
            moments.clear();
        for (const TimeCode time : frames)
            moments.push_back({time});
        makeUnique(moments);
    }

    /// Fills one track of the product of factors that are separable.
    template <class T, class ValueAt>
    void compose(KeyTrack<T> NodeMotion::*track, NodeMotion& result, const ValueAt& valueOf) {
        const KeyTrack<T>& own = std::as_const(factors_)[0].motion().*track;
        KeyTrack<T>& to = result.*track;
        if (std::as_const(factors_).size() == 1 && (!frames_.everyFrame() || isConstant(own))) {
            to = own;
            return;
        }
        vector<Moment> moments = findMoments(track);
        if (std::as_const(moments).empty())
            moments.push_back(anyMoment());
        if (frames_.everyFrame())
            addFrames(moments, 1);
        for (const Moment& moment : std::as_const(moments)) {
            to.times.push_back(moment.time);
            to.values.push_back(valueOf(moment));
        }
        // Beyond the keys too, the product does what the only factor that moves does.
        if (const auto moving = findMoving(track); moving.size() == 1) {
            to.preExtrapolation = moving[0]->preExtrapolation;
            to.postExtrapolation = moving[0]->postExtrapolation;
        }
    }

    mat43 productAt(const Moment& moment) const {
        mat43 matrix = factors_[0].matrixAt(moment);
        for (std::size_t i = 1; i < factors_.size(); ++i)
            matrix = scene::multiply(matrix, factors_[i].matrixAt(moment));
        return matrix;
    }
    quatf rotationAt(const Moment& moment) const {
        quatf rotation = factors_[0].rotationAt(moment);
        for (std::size_t i = 1; i < factors_.size(); ++i)
            rotation = product(rotation, factors_[i].rotationAt(moment));
        return rotation;
    }
    vec3f scaleAt(const Moment& moment) const {
        vec3f scale{1, 1, 1};
        for (const Factor& factor : factors_) {
            const vec3f s = factor.scaleAt(moment);
            scale = {scale.x * s.x, scale.y * s.y, scale.z * s.z};
        }
        return scale;
    }

    /// Takes the product apart at all times of keys and on every frame.
    NodeMotion sampleProduct() {
        vector<Moment> moments = findMoments(&NodeMotion::translation);
        for (const vector<Moment>& others :
             {findMoments(&NodeMotion::rotation), findMoments(&NodeMotion::scale)})
            moments.append(others.cbegin(), others.cend());
        makeUnique(moments);
        if (std::as_const(moments).empty())
            moments.push_back(anyMoment());
        addFrames(moments, 3);
        NodeMotion result;
        bool isSomewhereSheared = false;
        for (const Moment& moment : std::as_const(moments)) {
            const mat43 matrix = productAt(moment);
            const scene::TransformParts parts = scene::decomposeTransform(matrix);
            isSomewhereSheared |=
                isSheared(matrix, assimp::compose({}, parts.rotation, parts.scale));
            result.translation.times.push_back(moment.time);
            result.translation.values.push_back(matrix.t);
            result.rotation.values.push_back(parts.rotation);
            result.scale.values.push_back(parts.scale);
        }
        shearedNodes_ += isSomewhereSheared;
        result.rotation.times = result.scale.times = result.translation.times;
        return result;
    }

    vector<Factor> factors_;
    FrameSampler& frames_;
    u64& shearedNodes_;
};

} // namespace

NodeMotion composeMotion(const vector<MotionFactor>& factors, FrameSampler& frames,
                         u64& shearedNodes) {
    return Composer(factors, frames, shearedNodes).run();
}

} // namespace assimp
