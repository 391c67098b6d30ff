#include "assimp/key_track.h"

#include "assimp/quaternion.h"

#include <algorithm>
#include <cmath>

namespace assimp {

using base::quatf;
using base::TimeCode;
using base::vec3d;
using base::vec3f;

namespace {

/// Largest differences of components that are alike. Translations and weights: share of the larger
/// value. Rotations and scales: absolute; some readers take these from matrices of six digits.
constexpr double translationSlack = 1e-6;
constexpr float rotationSlack = 1e-6f;
constexpr float scaleSlack = 1e-5f;
constexpr float weightSlack = 1e-6f;

float mix(float a, float b, double u) {
    return static_cast<float>(a * (1 - u) + b * u);
}
template <class T>
base::base_vec3<T> mix(const base::base_vec3<T>& a, const base::base_vec3<T>& b, double u) {
    const auto component = [&](T base::base_vec3<T>::*c) {
        return static_cast<T>(double(a.*c) * (1 - u) + double(b.*c) * u);
    };
    using V = base::base_vec3<T>;
    return {component(&V::x), component(&V::y), component(&V::z)};
}

/// Along the shorter arc.
quatf mix(const quatf& a, const quatf& b, double u) {
    double c = double(a.x) * b.x + double(a.y) * b.y + double(a.z) * b.z + double(a.w) * b.w;
    const double side = c < 0 ? -1 : 1;
    c = std::min(c * side, 1.0);
    double wa = 1 - u, wb = u;
    if (c < 0.9999999) {
        const double angle = std::acos(c), sine = std::sin(angle);
        wa = std::sin(wa * angle) / sine;
        wb = std::sin(wb * angle) / sine;
    }
    wb *= side;
    return normalized(
        {a.x * wa + b.x * wb, a.y * wa + b.y * wb, a.z * wa + b.z * wb, a.w * wa + b.w * wb});
}

} // namespace

template <class T>
T valueAt(const KeyTrack<T>& track, const Moment& moment) {
    const TimeCode *first = track.times.cbegin(), *end = track.times.cend();
    const TimeCode* key = moment.isAfter ? std::upper_bound(first, end, moment.time)
                                         : std::lower_bound(first, end, moment.time);
    const auto next = static_cast<std::size_t>(key - first);
    if (next == 0 || key == end)
        return track.values[next == 0 ? 0 : next - 1];
    if (*key == moment.time)
        return track.values[next];
    const double span = static_cast<double>(key[0].ticks - key[-1].ticks);
    const double u = static_cast<double>(moment.time.ticks - key[-1].ticks) / span;
    return mix(track.values[next - 1], track.values[next], u);
}

template vec3d valueAt(const KeyTrack<vec3d>&, const Moment&);
template quatf valueAt(const KeyTrack<quatf>&, const Moment&);
template vec3f valueAt(const KeyTrack<vec3f>&, const Moment&);
template float valueAt(const KeyTrack<float>&, const Moment&);

bool areAlike(const vec3d& a, const vec3d& b) {
    const double size = std::max(
        {std::abs(a.x), std::abs(a.y), std::abs(a.z), std::abs(b.x), std::abs(b.y), std::abs(b.z)});
    const double slack = translationSlack * size;
    return std::abs(a.x - b.x) <= slack && std::abs(a.y - b.y) <= slack &&
           std::abs(a.z - b.z) <= slack;
}

bool areAlike(const quatf& a, const quatf& b) {
    const float side = a.x * b.x + a.y * b.y + a.z * b.z + a.w * b.w < 0 ? -1.0f : 1.0f;
    const auto differ = [&](float p, float q) { return std::abs(p - q * side) > rotationSlack; };
    return !differ(a.x, b.x) && !differ(a.y, b.y) && !differ(a.z, b.z) && !differ(a.w, b.w);
}

bool areAlike(const vec3f& a, const vec3f& b) {
    const auto differ = [](float p, float q) {
        return std::abs(p - q) > scaleSlack * std::max(1.0f, std::abs(p));
    };
    return !differ(a.x, b.x) && !differ(a.y, b.y) && !differ(a.z, b.z);
}

bool areAlike(float a, float b) {
    return std::abs(a - b) <= weightSlack * std::max(std::abs(a), std::abs(b));
}

} // namespace assimp
