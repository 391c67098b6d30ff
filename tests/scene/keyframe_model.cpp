#include "keyframe_model.h"

#include <algorithm>
#include <cmath>

namespace keyframe_model {

namespace {

constexpr double ticksPerSecond = 46186158000.0;

double seconds(std::int64_t ticks) {
    return static_cast<double>(ticks) / ticksPerSecond;
}

Numbers mix(const Numbers& a, double wa, const Numbers& b, double wb) {
    Numbers sum(a.size());
    for (std::size_t i = 0; i < a.size(); ++i)
        sum[i] = a[i] * wa + b[i] * wb;
    return sum;
}

/// De Casteljau.
double bezier(double p0, double p1, double p2, double p3, double u) {
    const auto between = [u](double a, double b) { return a + (b - a) * u; };
    const double q0 = between(p0, p1), q1 = between(p1, p2), q2 = between(p2, p3);
    return between(between(q0, q1), between(q1, q2));
}

/// Where the axis, which only rises, reaches `x`.
double parameterOf(double x, double p0, double p1, double p2, double p3) {
    double low = 0, high = 1;
    while (high - low > 1e-15) {
        const double middle = (low + high) / 2;
        if (middle == low || middle == high)
            break;
        (bezier(p0, p1, p2, p3, middle) < x ? low : high) = middle;
    }
    return (low + high) / 2;
}

class Segment {
public:
    Segment(const Curve& c, std::size_t end)
        : c_(c), end_(end), span_(seconds(c.times[end] - c.times[end - 1])) {}

    Numbers at(std::int64_t time) const {
        const double x = seconds(time - c_.times[end_ - 1]);
        switch (codeHere()) {
        case 0:
            return a();
        case 1:
            return c_.isQuaternion ? turn(x / span_) : mix(a(), 1 - x / span_, b(), x / span_);
        case 2:
            return spline(x);
        default:
            return tangential(x);
        }
    }

    /// False where the time axis of a spline turns back, so that a time has several values.
    bool isSingleValued() const {
        if (codeHere() != 2)
            return true;
        const double x1 = reach(splineTangent(true));
        const double x2 = span_ - reach(splineTangent(false));
        double before = 0;
        for (int i = 1; i <= 1000; ++i) {
            const double x = bezier(0, x1, x2, span_, i / 1000.0);
            if (x <= before)
                return false;
            before = x;
        }
        return true;
    }

    struct Tangent {
        double time;
        Numbers value;
    };
    /// At the start or the end of the segment.
    Tangent splineTangent(bool atStart) const {
        const std::size_t last = c_.times.size() - 1, key = atStart ? end_ - 1 : end_;
        const bool closed = c_.values.front() == c_.values.back();
        if (!closed && (key == 0 || key == last))
            return {span_, Numbers(a().size())};
        const Numbers p = point(key), q = pointBeside(key, -1), r = pointBeside(key, 1);
        Numbers tangent(p.size());
        if (c_.tightness <= 1e-6) {
            tangent = mix(r, c_.tension / 2, q, -c_.tension / 2);
        } else {
            const double d0 = distance(p, q), d1 = distance(p, r);
            const double scale = (atStart ? d1 : d0) * c_.tension;
            for (std::size_t i = 0; i < p.size(); ++i)
                tangent[i] =
                    scale * ((p[i] - q[i]) / d0 - (r[i] - q[i]) / (d0 + d1) + (r[i] - p[i]) / d1);
        }
        return {tangent[0], Numbers(tangent.begin() + 1, tangent.end())};
    }

private:
    int codeHere() const { return c_.codes[c_.codes.size() > 1 ? end_ : 0]; }
    const Numbers& a() const { return c_.values[end_ - 1]; }
    const Numbers& b() const { return c_.values[end_]; }

    /// Time in seconds, then the value.
    Numbers point(std::size_t key) const {
        Numbers p{seconds(c_.times[key] - c_.times[0])};
        p.insert(p.end(), c_.values[key].begin(), c_.values[key].end());
        return p;
    }
    /// The neighbour, around the ends of a closed curve by a period in time.
    Numbers pointBeside(std::size_t key, int side) const {
        const std::size_t last = c_.times.size() - 1;
        const double period = seconds(c_.times[last] - c_.times[0]);
        Numbers p;
        if (side < 0) {
            p = point(key == 0 ? last - 1 : key - 1);
            p[0] -= key == 0 ? period : 0;
        } else {
            p = point(key == last ? 1 : key + 1);
            p[0] += key == last ? period : 0;
        }
        return p;
    }
    double distance(const Numbers& p, const Numbers& q) const {
        double squares = 0;
        for (std::size_t i = 0; i < p.size(); ++i)
            squares += (p[i] - q[i]) * (p[i] - q[i]);
        return std::pow(std::max(std::sqrt(squares), 1e-10), c_.tightness);
    }

    /// How far a tangent takes the control points of the time axis.
    double reach(const Tangent& tangent) const {
        return c_.tightness <= 1e-6 ? tangent.time / 3 : tangent.time * 0.33333334;
    }

    Numbers spline(double x) const {
        const Tangent start = splineTangent(true), arrival = splineTangent(false);
        const double u = parameterOf(x, 0, reach(start), span_ - reach(arrival), span_);
        Numbers result(a().size());
        for (std::size_t i = 0; i < result.size(); ++i)
            result[i] = bezier(a()[i], a()[i] + start.value[i] / 3, b()[i] - arrival.value[i] / 3,
                               b()[i], u);
        return result;
    }

    Numbers tangential(double x) const {
        const Numbers &out = c_.tangents[2 * end_ - 1], &in = c_.tangents[2 * end_];
        const Numbers thirds(out.size(), 1.0 / 3);
        const bool weighted = !c_.weights.empty();
        const Numbers& outWeight = weighted ? c_.weights[2 * end_ - 1] : thirds;
        const Numbers& inWeight = weighted ? c_.weights[2 * end_] : thirds;
        Numbers result(a().size());
        for (std::size_t i = 0; i < result.size(); ++i) {
            const std::size_t axis = c_.isQuaternion ? 0 : i;
            const double u =
                parameterOf(x, 0, outWeight[axis] * span_, span_ - inWeight[axis] * span_, span_);
            result[i] = bezier(a()[i], a()[i] + out[i] * outWeight[i] * span_,
                               b()[i] - in[i] * inWeight[i] * span_, b()[i], u);
        }
        return result;
    }

    Numbers turn(double u) const {
        double cosine = 0;
        for (std::size_t i = 0; i < 4; ++i)
            cosine += a()[i] * b()[i];
        const double side = cosine < 0 ? -1 : 1;
        const double angle = std::acos(std::min(side * cosine, 1.0));
        Numbers result = angle < 1e-6 ? mix(a(), 1 - u, b(), side * u)
                                      : mix(a(), std::sin((1 - u) * angle) / std::sin(angle), b(),
                                            side * std::sin(u * angle) / std::sin(angle));
        return result;
    }

    const Curve& c_;
    std::size_t end_;
    double span_;
};

Numbers slope(const Curve& c, bool atStart) {
    const std::size_t last = c.values.size() - 1, end = atStart ? 1 : last;
    const Numbers none(c.values[0].size());
    const double span = seconds(c.times[end] - c.times[end - 1]);
    switch (c.codes[0]) {
    case 0:
        return none;
    case 1:
        return mix(c.values[end], 1 / span, c.values[end - 1], -1 / span);
    case 2: {
        if (c.values.front() != c.values.back())
            return none;
        const auto tangent = Segment(c, end).splineTangent(atStart);
        return mix(tangent.value, 1 / tangent.time, none, 0);
    }
    default:
        return atStart ? c.tangents.front() : c.tangents.back();
    }
}

Numbers inRange(const Curve& c, std::int64_t time) {
    std::size_t key = c.times.size() - 1;
    while (c.times[key] > time)
        --key;
    return time - c.times[key] <= 46186 ? c.values[key] : Segment(c, key + 1).at(time);
}

} // namespace

bool isSingleValued(const Curve& c) {
    for (std::size_t end = 1; end < c.times.size(); ++end)
        if (!Segment(c, end).isSingleValued())
            return false;
    return true;
}

Numbers evaluate(const Curve& c, std::int64_t time) {
    const std::int64_t first = c.times.front(), last = c.times.back(), period = last - first;
    const bool before = time < first;
    if (!before && time <= last)
        return inRange(c, time);
    const Numbers& end = before ? c.values.front() : c.values.back();
    Numbers offset(end.size());
    switch (before ? c.pre : c.post) {
    case 0:
        return end;
    case 1:
        return mix(end, 1, slope(c, before), seconds(time - (before ? first : last)));
    case 2:
    case 3:
        for (; time < first || time > last; time += before ? period : -period)
            if ((before ? c.pre : c.post) == 3)
                offset =
                    mix(offset, 1, mix(c.values.back(), 1, c.values.front(), -1), before ? -1 : 1);
        return mix(inRange(c, time), 1, offset, 1);
    default:
        while (time < first || time > last)
            time = time < first ? 2 * first - time : 2 * last - time;
        return inRange(c, time);
    }
}

} // namespace keyframe_model
