#include "assimp/key_track.h"

#include <algorithm>
#include <cmath>

namespace assimp {

using base::i64;
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
    const double x = a.x * wa + b.x * wb, y = a.y * wa + b.y * wb;
    const double z = a.z * wa + b.z * wb, w = a.w * wa + b.w * wb;
    const double f = 1 / std::sqrt(x * x + y * y + z * z + w * w);
    return {static_cast<float>(x * f), static_cast<float>(y * f), static_cast<float>(z * f),
            static_cast<float>(w * f)};
}

} // namespace

template <class T>
T valueAt(const KeyTrack<T>& track, TimeCode time) {
    const TimeCode* first = track.times.cbegin();
    const auto next =
        static_cast<std::size_t>(std::upper_bound(first, track.times.cend(), time) - first);
    if (next == 0 || next == track.times.size())
        return track.values[next == 0 ? 0 : next - 1];
    const double span = static_cast<double>(first[next].ticks - first[next - 1].ticks);
    const double u = static_cast<double>(time.ticks - first[next - 1].ticks) / span;
    return mix(track.values[next - 1], track.values[next], u);
}

template vec3d valueAt(const KeyTrack<vec3d>&, TimeCode);
template quatf valueAt(const KeyTrack<quatf>&, TimeCode);
template vec3f valueAt(const KeyTrack<vec3f>&, TimeCode);
template float valueAt(const KeyTrack<float>&, TimeCode);

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

base::vector<TimeCode> listFrames(TimeCode first, TimeCode last, i64 frameTicks, bool& isTooLong) {
    base::vector<TimeCode> times{first};
    if ((last.ticks - first.ticks) / frameTicks >= maxFrames) {
        isTooLong = true;
    } else {
        const i64 whole = first.ticks / frameTicks - (first.ticks % frameTicks < 0);
        for (i64 t = (whole + 1) * frameTicks; t < last.ticks; t += frameTicks)
            times.push_back({t});
    }
    if (first < last)
        times.push_back(last);
    return times;
}

} // namespace assimp
